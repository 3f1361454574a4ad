/// @file
/// From numbers to places along an axis, and where its ticks are.
#pragma once

#include <string>
#include <vector>

namespace report {

/// Maps [low, high] to [from, to]; what lies outside goes to the nearer end.
struct Scale {
    double low = 0;
    double high = 1;
    double from = 0;
    double to = 1;

    double operator()(double number) const;
};

/// Round numbers within [low, high]: multiples of 1, 2 or 5 times a power of ten, at most `most`.
std::vector<double> ticks(double low, double high, size_t most);

/// The same for seconds: steps of 1, 2, 5, 10, 15, 30 of a unit, in seconds, minutes and hours.
std::vector<double> time_ticks(double low, double high, size_t most);

/// What a tick of time_ticks() is called.
std::string time_label(double seconds, const std::vector<double>& ticks);

} // namespace report
