// Times are bounded, so that no count of samples wraps.

#include "kzfp/command_line/section.hpp"

#include <cmath>

#include <CLI/CLI.hpp>

namespace kzfp {

namespace {

/// "05" and "05.5", from 0 to below 60.
bool is_below_sixty(std::string_view text)
{
    const size_t whole = std::min(text.find('.'), text.size());
    const auto is_digit = [](char c) { return c >= '0' && c <= '9'; };
    return whole == 2 && text[0] <= '5' && is_digit(text[0]) && is_digit(text[1]);
}

std::optional<double> to_number(std::string_view text)
{
    double number = 0;
    const bool is_number = CLI::detail::lexical_cast(std::string(text), number);
    return is_number && number >= 0 && number <= audio::kLongestSeconds ? std::optional(number)
                                                                        : std::nullopt;
}

/// The hours, or the minutes where there are no hours: digits only.
std::optional<double> to_first_number(std::string_view text)
{
    return text.find_first_not_of("0123456789") == std::string_view::npos ? to_number(text)
                                                                          : std::nullopt;
}

std::string check_time(const std::string& text)
{
    return to_seconds(text) ? std::string() : not_a_time(text, "from 0 to 1000000000 s");
}

void add_time_option(Parser& parser, const char* names, const char* help,
                     const std::function<void(double)>& take)
{
    parser
        .add_option(
            names, [take](const std::string& text) { take(*to_seconds(text)); }, help)
        ->type_name("TIME")
        ->check(check_time);
}

} // namespace

std::optional<double> to_seconds(std::string_view text)
{
    size_t colon = text.find(':');
    auto seconds =
        colon == std::string_view::npos ? to_number(text) : to_first_number(text.substr(0, colon));
    for (int colons = 1; seconds && colon != std::string_view::npos; ++colons) {
        text.remove_prefix(colon + 1);
        colon = text.find(':');
        const std::string_view part = text.substr(0, colon);
        const bool is_last = colon == std::string_view::npos;
        const auto more = is_last ? to_number(part) : to_first_number(part);
        if (!more || !is_below_sixty(part) || colons > 2) {
            return {};
        }
        seconds = *seconds * 60 + *more;
    }
    return seconds && *seconds <= audio::kLongestSeconds ? seconds : std::nullopt;
}

std::string not_a_time(const std::string& text, std::string_view bounds)
{
    return "'" + text + "' is not a time: a number of seconds, M:SS or H:MM:SS, " +
           std::string(bounds);
}

void add_section_options(Parser& parser, audio::Section& section)
{
    add_time_option(parser, "--start,--offset", "Start at this time: 90, 1:30 or 0:01:30.5",
                    [&section](double seconds) { section.start = seconds; });
    add_time_option(parser, "--length", "Use no more than this much sound",
                    [&section](double seconds) { section.length = seconds; });
}

} // namespace kzfp
