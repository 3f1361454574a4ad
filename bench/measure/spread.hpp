/// @file
/// Summary of a number that was measured many times: median and quartiles.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <vector>

namespace kz::bench {

struct Spread {
    double median = 0;
    double lower = 0; ///< first quartile
    double upper = 0; ///< third quartile
    double least = 0;
};

/// The value below which this share of sorted values lies, between neighbours by proportion.
inline double quantile(const std::vector<double>& sorted, double share)
{
    const double place = share * static_cast<double>(sorted.size() - 1);
    const auto below = static_cast<size_t>(place);
    const size_t above = std::min(below + 1, sorted.size() - 1);
    return std::lerp(sorted[below], sorted[above], place - std::floor(place));
}

/// @param values  At least one.
inline Spread spread_of(std::vector<double> values)
{
    std::sort(values.begin(), values.end());
    return {quantile(values, 0.5), quantile(values, 0.25), quantile(values, 0.75), values.front()};
}

} // namespace kz::bench
