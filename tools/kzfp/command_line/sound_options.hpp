/// @file
/// How sound is read, by all commands that keep or look up what it sounds like.
#pragma once

#include <optional>

#include <CLI/CLI.hpp>

#include "audio/input.hpp"

namespace kzfp {

struct SoundOptions {
    audio::Section section = {};
    std::optional<audio::StreamFormat> raw = {}; ///< files without a header look like this
    bool strict = false; ///< a damaged file is a failure, not a result with a warning
    std::optional<double> timeout = {}; ///< seconds after which a file is given up
};

/// Adds --raw, --start, --length, --strict and --timeout. `options` outlives the parsing.
void add_sound_options(CLI::App& parser, SoundOptions& options);

} // namespace kzfp
