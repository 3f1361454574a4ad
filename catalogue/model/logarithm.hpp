/// @file
/// Logarithms whose bits do not depend on the processor: no function of the C library is called,
/// and every product and sum is rounded on its own, in the order written here.
#pragma once

#include <bit>
#include <cstdint>

namespace kzcat {

/// A number as 2^exponent * (1 + fraction), with 1 + fraction in [sqrt(1/2), sqrt(2)).
struct SplitNumber {
    int32_t exponent;
    float fraction;
};

/// The bits of the largest float below sqrt(1/2).
inline constexpr int32_t kRootOfHalf = 0x3f3504f3;

/// `x` is a normal number above 0.
inline SplitNumber split(float x)
{
    const auto bits = std::bit_cast<int32_t>(x);
    const int32_t exponent = (bits - kRootOfHalf) >> 23;
    return {exponent, std::bit_cast<float>(bits - exponent * (1 << 23)) - 1.0F};
}

/// log2(1 + t) / t for t in [sqrt(1/2) - 1, sqrt(2) - 1], lowest power first: the interpolation of
/// degree 8 at Chebyshev nodes. t times it is within 1.5e-8 of the logarithm before rounding.
inline constexpr float kLogarithmTerms[] = {
    1.4426950036F,   -0.72134746825F, 0.48091075346F,  -0.36069326814F, 0.28790326092F,
    -0.23916988140F, 0.21607822552F,  -0.20586188051F, 0.12310968467F,
};

/// log2(1 + t) to 1e-7.
inline float log2_of_one_plus(float t)
{
    float sum = kLogarithmTerms[8];
    for (int power = 7; power >= 0; --power) {
        sum = sum * t + kLogarithmTerms[power];
    }
    return sum * t;
}

/// log2(a) - log2(b). The whole parts are subtracted exactly, so that close numbers far from 1 keep
/// their difference.
inline float log2_ratio(float a, float b)
{
    const SplitNumber x = split(a);
    const SplitNumber y = split(b);
    return static_cast<float>(x.exponent - y.exponent) +
           (log2_of_one_plus(x.fraction) - log2_of_one_plus(y.fraction));
}

inline float log2_of(float x) { return log2_ratio(x, 1.0F); }

} // namespace kzcat
