// Ticks are counted rather than added up, so that the last one is not lost to rounding.

#include "report/axis.hpp"

#include <algorithm>
#include <cmath>
#include <span>

#include "report/numbers.hpp"

namespace report {

namespace {

std::vector<double> multiples(double low, double high, double step)
{
    std::vector<double> all;
    const double first = std::ceil(low / step - 1e-9);
    const double last = std::floor(high / step + 1e-9);
    for (double i = first; i <= last; ++i) {
        all.push_back(i * step);
    }
    return all;
}

/// Whether an axis can be divided at all.
bool is_range(double low, double high, size_t most)
{
    return most > 0 && std::isfinite(low) && std::isfinite(high) && high > low;
}

} // namespace

double Scale::operator()(double number) const
{
    if (!(high > low)) {
        return from;
    }
    const double part = std::clamp((number - low) / (high - low), 0.0, 1.0);
    return from + part * (to - from);
}

std::vector<double> ticks(double low, double high, size_t most)
{
    if (!is_range(low, high, most)) {
        return {};
    }
    const double smallest = (high - low) / static_cast<double>(most);
    const double power = std::pow(10.0, std::floor(std::log10(smallest)));
    for (const double factor : {1.0, 2.0, 5.0}) {
        if (factor * power >= smallest) {
            return multiples(low, high, factor * power);
        }
    }
    return multiples(low, high, 10 * power);
}

std::vector<double> time_ticks(double low, double high, size_t most)
{
    if (!is_range(low, high, most)) {
        return {};
    }
    constexpr double steps[] = {0.1, 0.2, 0.5, 1,    2,    5,    10,    15,    30,    60,   120,
                                300, 600, 900, 1800, 3600, 7200, 10800, 21600, 43200, 86400};
    const double smallest = (high - low) / static_cast<double>(most);
    const auto* step = std::lower_bound(std::begin(steps), std::end(steps), smallest);
    if (step == std::end(steps)) {
        return multiples(low, high, 86400 * std::ceil(smallest / 86400));
    }
    return multiples(low, high, *step);
}

std::string time_label(double seconds, const std::vector<double>& ticks)
{
    const bool fine = ticks.size() > 1 && ticks[1] - ticks[0] < 0.95;
    return fine ? clock_text(seconds) : whole_clock_text(seconds);
}

} // namespace report
