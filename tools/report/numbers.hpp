/// @file
/// Numbers as they are written on every page, whatever the locale.
#pragma once

#include <cstdint>
#include <string>

namespace report {

/// With so many digits behind the point: "7.3". A dash for what is not a number, or beyond 1e15.
std::string number_text(double number, int decimals);

/// "1,234" beyond 9999, "1234" below.
std::string count_text(uint64_t count);

/// A share as "97.3 %".
std::string percent_text(double share);

/// "0:03.4", "2:03.4", "1:02:03.4"; with a minus sign when negative.
std::string clock_text(double seconds);

/// The same without tenths, for axes and long timelines.
std::string whole_clock_text(double seconds);

/// "12 ms" below a second, "1.2 s" above.
std::string duration_text(double seconds);

} // namespace report
