/// @file
/// The threshold of a catalogue by its size.

#include "catalogue/match/thresholds.hpp"

#include <algorithm>

namespace kzcat {
namespace {

/// log2 of x >= 1, to 2^-32, by squaring: only products and comparisons, so the same bits
/// everywhere.
double binary_logarithm(double x)
{
    double result = 0;
    for (; x >= 2; x /= 2) {
        result += 1;
    }
    for (double bit = 0.5; bit > 0x1p-33; bit /= 2) {
        x *= x;
        if (x >= 2) {
            x /= 2;
            result += bit;
        }
    }
    return result;
}

double short_allowance(double seconds)
{
    const double missing = (kFullWindow - seconds) / (kFullWindow - kShortWindow);
    return kShortAllowance * std::clamp(missing, 0.0, 1.0);
}

} // namespace

double threshold_for(uint64_t codes, size_t windows, double seconds)
{
    double places = static_cast<double>(codes) / kReferenceCodes;
    places = places < 1 ? 1 : places;
    places *= windows < 1 ? 1.0 : static_cast<double>(windows);
    return kBaseThreshold - short_allowance(seconds) + kThresholdGrowth * binary_logarithm(places);
}

} // namespace kzcat
