/// @file
/// The options for a part of the sound, which several commands have.
#pragma once

#include <CLI/CLI.hpp>

#include "audio/stream_format.hpp"

namespace kzfp {

/// Adds --start and --length. `section` outlives the parsing.
void add_section_options(CLI::App& parser, audio::Section& section);

} // namespace kzfp
