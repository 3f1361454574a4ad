/// @file
/// The fraction with small terms near a number, from its continued fraction.
///
/// All of it is done in double precision; only the result becomes two words, which saturate. The
/// resampler takes its factors L / M from here, so the steps decide which ratios there are.
#include "kzsdk/abs/mathfn.h"
#include "kzsdk/abs/saturate.hpp"
#include "kzsdk/dsp/resampler.h"

namespace {

/// Whole numbers, as long as they fit 53 bits.
struct Fraction {
    double numerator;
    double denominator;
};

constexpr Fraction kNone{0, 0};

// Terms of at least 2 in magnitude double both parts: long before this many they leave the range
// of int32_t.
constexpr int kMaxTerms = 64;

// The first convergent h / k of the continued fraction of x that lies within the tolerance. Its
// terms are the nearest integers, not the floors, so there are few of them. 0 / 0 when none is near
// enough.
Fraction nearest_convergent(double x, double tolerance) noexcept
{
    Fraction previous{0, 1};
    Fraction current{1, 0};
    double r = x;
    for (int term = 0; term < kMaxTerms; ++term) {
        const double a = kz_floor(r + 0.5);
        const Fraction next{a * current.numerator + previous.numerator,
                            a * current.denominator + previous.denominator};
        previous = current;
        current = next;
        if (r - a == 0 || kz_fabs(current.numerator / current.denominator - x) < tolerance) {
            return current;
        }
        r = 1.0 / (r - a);
    }
    return kNone;
}

// The special cases come first: what is within the tolerance of 1 is 1 / 1, however near 0 it may
// be; else what is below the tolerance has no fraction.
Fraction fraction_near(double x, double tolerance) noexcept
{
    if (kz_fabs(x - 1) < tolerance) {
        return {1, 1};
    }
    if (x < tolerance) {
        return kNone;
    }
    // Terms below zero can leave both parts negative.
    const Fraction found = nearest_convergent(x, tolerance);
    return found.denominator < 0 ? Fraction{-found.numerator, -found.denominator} : found;
}

} // namespace

void KZDSP_Rationalize(double x, int32_t* numerator, int32_t* denominator,
                       double tolerance) noexcept
{
    const double sign = x < 0 ? -1.0 : 1.0;
    const Fraction found = fraction_near(x * sign, kz_fabs(tolerance));
    if (numerator != nullptr) {
        *numerator = kz::to_int32(found.numerator * sign);
    }
    if (denominator != nullptr) {
        *denominator = kz::to_int32(found.denominator);
    }
}
