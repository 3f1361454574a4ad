/// @file
/// Times on the command line, and the options for a part of the sound, which several commands have.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "audio/stream_format.hpp"
#include "kzfp/command_line/parser.hpp"

namespace kzfp {

/// A time as it is written: seconds ("90", "90.5"), minutes and seconds ("1:30.5"), or hours,
/// minutes and seconds ("1:01:30"). Behind a colon are two digits, below 60. Gives seconds, at most
/// audio::kLongestSeconds; nothing for any other text.
std::optional<double> to_seconds(std::string_view text);

/// What is wrong with a text that is not a time; `bounds` such as "from 0 to 10".
std::string not_a_time(const std::string& text, std::string_view bounds);

/// Adds --start and --length. `section` outlives the parsing.
void add_section_options(Parser& parser, audio::Section& section);

} // namespace kzfp
