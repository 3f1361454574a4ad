/// @file
/// Sine and cosine by their power series: products and sums in one order, no function of the C
/// library, the same bits everywhere and at compile time.
#pragma once

namespace kzcat {

inline constexpr double kPi = 3.141592653589793;

inline constexpr int kSeriesTerms = 12;

/// The factors of a series in x * x with alternating signs.
struct SeriesFactors {
    double terms[kSeriesTerms];
};

/// 1 / (2n + first)! for n = 0, 1 ...
constexpr SeriesFactors make_series(int first)
{
    SeriesFactors factors{};
    double factor = 1;
    for (int n = 0; n < kSeriesTerms; ++n) {
        factors.terms[n] = factor;
        const int next = 2 * n + first + 1;
        factor = -factor / (next * (next + 1));
    }
    return factors;
}

inline constexpr SeriesFactors kCosineFactors = make_series(0);
inline constexpr SeriesFactors kSineFactors = make_series(1);

/// Of a square.
constexpr double sum_of_series(const SeriesFactors& factors, double square)
{
    double sum = factors.terms[kSeriesTerms - 1];
    for (int n = kSeriesTerms - 2; n >= 0; --n) {
        sum = sum * square + factors.terms[n];
    }
    return sum;
}

/// cos(x) for -pi/2 <= x <= pi/2, to 5e-16.
constexpr double cosine(double x) { return sum_of_series(kCosineFactors, x * x); }

/// sin(x) for -pi/2 <= x <= pi/2, to 5e-16.
constexpr double sine(double x) { return sum_of_series(kSineFactors, x * x) * x; }

} // namespace kzcat
