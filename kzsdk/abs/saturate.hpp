/// @file
/// The one way in which a floating-point number becomes a whole one.
///
/// The language leaves the conversion of NaN and of values out of range undefined, and processors
/// differ: x86 gives INT32_MIN for all of them, ARM saturates. Here every processor agrees.
#pragma once

#include <concepts>
#include <cstdint>
#include <limits>

namespace kz {

/// Truncates towards zero. NaN gives 0; a value beyond either end gives that end.
template <std::integral Integer, std::floating_point Real>
constexpr Integer saturated(Real x) noexcept
{
    using Limits = std::numeric_limits<Integer>;
    // Both are powers of two (or zero), so every floating-point type holds them exactly.
    constexpr auto lowest = static_cast<Real>(Limits::min());
    constexpr auto beyond = static_cast<Real>(uint64_t{1} << Limits::digits);
    if (x >= beyond) {
        return Limits::max();
    }
    if (x >= lowest) {
        return static_cast<Integer>(x);
    }
    return x < lowest ? Limits::min() : Integer{0};
}

template <std::floating_point Real>
constexpr int32_t to_int32(Real x) noexcept
{
    return saturated<int32_t>(x);
}

template <std::floating_point Real>
constexpr uint32_t to_uint32(Real x) noexcept
{
    return saturated<uint32_t>(x);
}

} // namespace kz
