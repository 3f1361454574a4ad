/// @file
/// The natural logarithm of a fixed-point pair: log2 from a table of quadratics, times ln 2.
///
/// All of it is done with pairs of a signed mantissa and an exponent, m * 2^(e - 31), normalised
/// after each step. The error is 1e-8 to 2e-8. 0 has no logarithm and gives a number without
/// meaning.
#include "kzsdk/dsp/fxp.h"
#include "kzsdk/dsp/log_segments.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"

namespace {

using kz::fxp::LogSegment;
using kz::fxp::normalised;
using kz::fxp::Pair;
using kz::fxp::shift_left;
using kz::fxp::shift_right;
using kz::fxp::wrap_add;
using kz::fxp::wrap_sub;

constexpr int32_t kLn2Q31 = 0x58b90bfb; ///< ln 2, truncated

/// Two Q31 fractions multiplied to a third: the high word of their product is Q30.
int32_t times(int32_t a, int32_t b) noexcept
{
    return shift_left(KZDSP_SMUL_HIGH_FxpType(a, b), 1);
}

/// The sum of two pairs, normalised. Both are brought to the larger exponent and halved before they
/// are added, so the sum cannot overflow; the lost bit is accepted.
Pair halved_sum(Pair a, Pair b) noexcept
{
    const int32_t apart = wrap_sub(a.exponent, b.exponent);
    if (apart < 0) {
        a = {shift_right(a.mantissa, wrap_sub(0, apart)), b.exponent};
    } else {
        b.mantissa = shift_right(b.mantissa, apart);
    }
    const int32_t mantissa = wrap_add(a.mantissa >> 1, b.mantissa >> 1);
    return normalised({mantissa, wrap_add(a.exponent, 1)});
}

/// log2(M) of M = x / 2^31 in [1, 2), from the quadratic of its segment.
Pair log2_of_fraction(uint32_t x) noexcept
{
    // The top seven bits behind the leading one select the segment.
    const LogSegment& fit = kz::fxp::kLogSegments[(x >> 24) & 0x7f];
    const auto m = static_cast<int32_t>(x >> 1); // M as a pair has exponent 1
    const auto m_squared = static_cast<int32_t>(KZDSP_UMUL_HIGH_FxpUType(x, x) >> 1);

    // A coefficient, having 29 fraction bits, has exponent 2.
    const Pair square = normalised({m_squared, 2});
    const Pair quadratic = normalised({times(fit.a, square.mantissa), square.exponent + 2});
    const Pair linear = normalised({times(fit.b, m), 3});
    return halved_sum(halved_sum(quadratic, linear), {fit.c, 2});
}

/// An integer other than 0 as a pair.
Pair from_integer(int32_t n) noexcept
{
    const int32_t zeros = kz::fxp::leading_zeros(kz::fxp::magnitude(n));
    return {shift_left(n, zeros - 1), 32 - zeros};
}

} // namespace

FxpType kzlog_fixed(FxpUType mantissa, int32_t exponent, int32_t* out_exponent) noexcept
{
    const int32_t zeros = kz::fxp::leading_zeros(mantissa);
    const int32_t whole = wrap_sub(wrap_sub(exponent, 1), zeros);
    Pair log2 = log2_of_fraction(shift_left(mantissa, zeros));
    if (whole != 0) {
        log2 = halved_sum(from_integer(whole), log2);
    }
    const Pair natural = normalised({times(log2.mantissa, kLn2Q31), log2.exponent});
    *out_exponent = natural.exponent;
    return natural.mantissa;
}
