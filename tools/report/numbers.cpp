// std::to_chars knows no locale, so that a decimal comma never gets into a coordinate.

#include "report/numbers.hpp"

#include <charconv>
#include <cmath>

namespace report {

namespace {

constexpr double kLargest = 1e15; ///< what is above is no time and no count
constexpr const char* kDash = "\u2013";

std::string two_digits(int64_t number)
{
    const std::string digits = std::to_string(number);
    return digits.size() < 2 ? "0" + digits : digits;
}

std::string clock_of(int64_t seconds)
{
    const int64_t minutes = seconds / 60;
    const std::string end = ":" + two_digits(seconds % 60);
    return minutes < 60 ? std::to_string(minutes) + end
                        : std::to_string(minutes / 60) + ":" + two_digits(minutes % 60) + end;
}

} // namespace

std::string number_text(double number, int decimals)
{
    if (!(std::fabs(number) <= kLargest)) {
        return kDash;
    }
    char text[64];
    const auto end =
        std::to_chars(std::begin(text), std::end(text), number, std::chars_format::fixed, decimals);
    std::string result(text, end.ptr);
    // What rounds to 0 has no sign.
    return result.find_first_not_of("-0.") == std::string::npos && result.front() == '-'
               ? result.substr(1)
               : result;
}

std::string count_text(uint64_t count)
{
    std::string text = std::to_string(count);
    if (count > 9999) {
        for (size_t place = text.size(); place > 3; place -= 3) {
            text.insert(place - 3, ",");
        }
    }
    return text;
}

std::string percent_text(double share) { return number_text(share * 100, 1) + " %"; }

std::string clock_text(double seconds)
{
    if (!(std::fabs(seconds) <= kLargest)) {
        return kDash;
    }
    const int64_t tenths = std::llround(std::fabs(seconds) * 10);
    const std::string sign = seconds < 0 && tenths > 0 ? "-" : "";
    return sign + clock_of(tenths / 10) + "." + std::to_string(tenths % 10);
}

std::string whole_clock_text(double seconds)
{
    if (!(std::fabs(seconds) <= kLargest)) {
        return kDash;
    }
    const int64_t whole = std::llround(std::fabs(seconds));
    return (seconds < 0 && whole > 0 ? "-" : "") + clock_of(whole);
}

std::string duration_text(double seconds)
{
    return std::fabs(seconds) < 0.9995 ? number_text(seconds * 1000, 0) + " ms"
                                       : number_text(seconds, 1) + " s";
}

} // namespace report
