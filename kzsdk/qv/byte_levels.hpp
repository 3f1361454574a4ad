/// @file
/// The levels of an equaliser with at most 256 of them, one byte each.
///
/// They are kept where the equalised frame will be: in its first quarter, so that a frame may be
/// equalised in place. A level lies no further on than the sample it is made of, which has been
/// read by then; the values, which are four times as long, are written from the last one on
/// backwards and reach the levels when these have been read.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>

namespace kz::qv {

inline constexpr size_t kMaxByteLevels = 256;

template <class Value>
class ByteLevels {
public:
    static_assert(sizeof(Value) == 4);

    explicit ByteLevels(std::span<Value> frame) noexcept
        : frame_(frame), levels_(reinterpret_cast<uint8_t*>(frame.data()))
    {
    }

    uint8_t* from(size_t index) const noexcept { return levels_ + index; }

    /// Counts each level.
    void count(std::span<uint32_t> histogram) const noexcept
    {
        // Equal levels in a row would wait for one another's counter: so there are four of each.
        std::array<std::array<uint32_t, kMaxByteLevels>, 4> counters{};
        size_t i = 0;
        for (; i + kGroup <= frame_.size(); i += kGroup) {
            uint64_t group = load_group(i);
            for (size_t k = 0; k < kGroup; ++k, group >>= 8) {
                ++counters[k % 4][group & 0xff];
            }
        }
        for (; i < frame_.size(); ++i) {
            ++counters[0][levels_[i]];
        }
        for (size_t level = 0; level < histogram.size(); ++level) {
            histogram[level] =
                counters[0][level] + counters[1][level] + counters[2][level] + counters[3][level];
        }
    }

    /// Writes the value of each sample's level over them.
    template <class Rank>
    void replace(std::span<const Rank> ranks) const noexcept
    {
        size_t i = frame_.size();
        for (; i % kGroup != 0; --i) {
            frame_[i - 1] = static_cast<Value>(ranks[levels_[i - 1]]);
        }
        for (; i != 0; i -= kGroup) {
            std::array<uint8_t, kGroup> group; // read before anything is written
            std::memcpy(group.data(), levels_ + i - kGroup, kGroup);
            for (size_t k = 0; k < kGroup; ++k) {
                frame_[i - kGroup + k] = static_cast<Value>(ranks[group[k]]);
            }
        }
    }

private:
    static constexpr size_t kGroup = 8;

    uint64_t load_group(size_t index) const noexcept
    {
        uint64_t group = 0;
        std::memcpy(&group, levels_ + index, sizeof group);
        return group;
    }

    std::span<Value> frame_;
    uint8_t* levels_;
};

} // namespace kz::qv
