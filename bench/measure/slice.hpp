/// @file
/// A piece of work repeated for some milliseconds: the unit in which everything is measured.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <functional>
#include <utility>

#include "measure/cpu_clock.hpp"

namespace kz::bench {

class Slice {
public:
    /// Warms the work up and finds how often it is to run to fill `seconds`.
    Slice(std::function<void()> run, double seconds) : run_(std::move(run))
    {
        run_();
        double taken = time(1);
        while (taken * static_cast<double>(count_) < seconds / 4) {
            count_ *= 2;
            taken = time(count_);
        }
        const double wanted = std::max(1.0, std::round(seconds / taken));
        count_ = static_cast<uint64_t>(wanted);
    }

    /// Seconds of processor time that one run took, averaged over a slice.
    double measure() const { return time(count_); }

private:
    double time(uint64_t count) const
    {
        const double begun = cpu_now();
        for (uint64_t i = 0; i < count; ++i) {
            run_();
        }
        return (cpu_now() - begun) / static_cast<double>(count);
    }

    std::function<void()> run_;
    uint64_t count_ = 1;
};

} // namespace kz::bench
