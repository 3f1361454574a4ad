/// @file
/// The levels of an equaliser with at most 256 of them, one byte each.
///
/// They are kept where the equalised frame will be: in its first quarter, so that a frame may be
/// equalised in place. A level lies no further on than the sample it is made of, which has been
/// read by then; the values, which are four times as long, are written from the last one on
/// backwards and reach the levels when these have been read.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "kzsdk/kernels/kernels.hpp"

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

    /// Writes the value of each sample's level over them.
    template <class Rank>
    void replace(std::span<const Rank> ranks) const noexcept
    {
        static_assert(sizeof(Rank) == sizeof(Value));
        kernels::active().replace_levels(ranks.data(), levels_, frame_.data(),
                                         static_cast<uint32_t>(frame_.size()));
    }

private:
    std::span<Value> frame_;
    uint8_t* levels_;
};

} // namespace kz::qv
