/// @file
/// The bound below which no middle of a fixed-point product can wrap.
#pragma once

#include <cstdint>

namespace kz::kernels {

/// Whether C = xh l + xl m stays within a signed 32-bit word for all samples xh 2^16 + xl and all
/// taps m 2^16 + l, the low halves being unsigned.
///
/// No low half exceeds 2^16 - 1, so |C| <= (2^16 - 1) (|xh| + |m|), which is below 2^31 while
/// |xh| + |m| <= 2^15. `loudest_high` bounds the complement of negative high halves, where |xh| is
/// greater by one.
///
/// @param loudest_high  The largest xh or ~xh.
/// @param largest_tap   The largest |m|.
[[gnu::always_inline]] constexpr bool no_cross_product_wraps(int32_t loudest_high,
                                                             int32_t largest_tap) noexcept
{
    return loudest_high + largest_tap < (1 << 15);
}

} // namespace kz::kernels
