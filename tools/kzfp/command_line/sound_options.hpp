/// @file
/// How sound is read, by all commands that keep or look up what it sounds like.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "audio/input.hpp"
#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/parser.hpp"

namespace kzfp {

struct SoundOptions {
    audio::Section section = {};
    std::optional<audio::StreamFormat> raw = {}; ///< files without a header look like this
    bool strict = false; ///< a damaged file is a failure, not a result with a warning
    std::optional<double> timeout = {}; ///< seconds without a byte after which a file is given up
};

inline constexpr Choice<audio::Encoding> kEncodings[] = {
    {"u8", audio::Encoding::u8, "8 bits, silence at 128"},
    {"s16", audio::Encoding::s16, "16 bits, signed, little endian"},
    {"alaw", audio::Encoding::alaw, "G.711 A-law"},
    {"ulaw", audio::Encoding::ulaw, "G.711 mu-law"},
    {"f32", audio::Encoding::f32, "32-bit floating point, little endian, full scale at 1"},
};

/// Adds --raw, --start, --length, --strict and --timeout. `options` outlives the parsing.
void add_sound_options(Parser& parser, SoundOptions& options);

/// Adds --raw alone. Which rates there are, a command may narrow with refuse_raw_rate().
void add_raw_option(Parser& parser, std::optional<audio::StreamFormat>& raw);

/// Adds --strict. `strict` outlives the parsing.
void add_strict_option(Parser& parser, bool& strict);

/// Adds --timeout. `timeout` outlives the parsing.
void add_timeout_option(Parser& parser, std::optional<double>& timeout);

/// Ends the parsing because of a rate of --raw. `rates` names those that are possible.
[[noreturn]] void refuse_raw_rate(uint32_t rate, const std::string& rates);

} // namespace kzfp
