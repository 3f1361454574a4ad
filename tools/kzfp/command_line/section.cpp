// Times are bounded, so that no count of samples wraps.

#include "kzfp/command_line/section.hpp"

#include <cmath>
#include <string>

namespace kzfp {

namespace {

std::string check_seconds(const std::string& text)
{
    double seconds = 0;
    if (CLI::detail::lexical_cast(text, seconds) && std::isfinite(seconds) && seconds >= 0 &&
        seconds <= audio::kLongestSeconds) {
        return {};
    }
    return "'" + text + "' is not a number of seconds from 0 to 1000000000";
}

} // namespace

void add_section_options(CLI::App& parser, audio::Section& section)
{
    parser.add_option("--start,--offset", section.start, "Start at this time")
        ->type_name("SECONDS")
        ->check(check_seconds);
    parser.add_option("--length", section.length, "Use no more than this much sound")
        ->type_name("SECONDS")
        ->check(check_seconds);
}

} // namespace kzfp
