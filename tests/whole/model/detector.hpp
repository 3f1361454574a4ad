/// @file
/// Search for the end of leading silence.
#pragma once

#include <algorithm>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <numeric>
#include <span>

namespace kz::model {

/// Signal is where the mean absolute deviation from the moving mean, each deviation clamped, passes
/// the threshold: half a window before that, but never before the block in which it happens.
class Detector {
public:
    explicit Detector(uint32_t window = 128, uint32_t threshold = 100, int32_t max_deviation = 1000)
        : window_(window), threshold_(threshold), max_deviation_(max_deviation)
    {
    }

    void reset() { primed_ = false; }

    /// Index in `block` at which signal begins, or its size. Samples are scaled by 2^-shift,
    /// towards zero.
    size_t offset_in(std::span<const int32_t> block, uint32_t shift)
    {
        return offset_in(block, [shift](int32_t sample) {
            return static_cast<int32_t>(sample / (int64_t{1} << shift));
        });
    }

    /// The same of samples of any type; `scaled` makes a level of one.
    template <class Sample, class Scaled>
    requires std::invocable<Scaled, Sample> size_t offset_in(std::span<const Sample> block,
                                                             Scaled scaled)
    {
        if (!primed_) {
            levels_.assign(window_, 0);
            deviations_.assign(window_, 0);
            std::ranges::transform(block.first(std::min(window_, block.size())), levels_.begin(),
                                   scaled);
            level_sum_ = std::accumulate(levels_.begin(), levels_.end(), int64_t{0});
            deviation_sum_ = 0;
            primed_ = true;
        }
        size_t offset = block.size();
        for (size_t i = 0; i < block.size(); ++i) {
            const int64_t level = scaled(block[i]);
            level_sum_ += slide(levels_, level);
            const int64_t deviation = std::abs(level - level_sum_ / count());
            deviation_sum_ += slide(deviations_, std::min<int64_t>(deviation, max_deviation_));
            if (offset == block.size() && deviation_sum_ / count() > threshold_) {
                offset = i > window_ / 2 ? i - window_ / 2 : 0;
            }
        }
        return offset;
    }

private:
    /// Replaces the oldest value; returns by how much the sum changes.
    static int64_t slide(std::deque<int64_t>& ring, int64_t value)
    {
        const int64_t oldest = ring.front();
        ring.pop_front();
        ring.push_back(value);
        return value - oldest;
    }

    int64_t count() const { return static_cast<int64_t>(window_); }

    size_t window_;
    int64_t threshold_;
    int64_t max_deviation_;
    bool primed_ = false;
    int64_t level_sum_ = 0;
    int64_t deviation_sum_ = 0;
    std::deque<int64_t> levels_;
    std::deque<int64_t> deviations_;
};

} // namespace kz::model
