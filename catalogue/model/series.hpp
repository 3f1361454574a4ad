/// @file
/// Sine and cosine by their power series: products and sums in one order, no function of the C
/// library, the same bits everywhere and at compile time.
#pragma once

namespace kzcat {

inline constexpr double kPi = 3.141592653589793;

/// cos(x) for -pi/2 <= x <= pi/2, to 5e-16.
constexpr double cosine(double x)
{
    double term = 1;
    double sum = 1;
    for (int n = 1; n <= 12; ++n) {
        term = -term * x * x / ((2 * n - 1) * (2 * n));
        sum = sum + term;
    }
    return sum;
}

/// sin(x) for -pi/2 <= x <= pi/2, to 5e-16.
constexpr double sine(double x)
{
    double term = x;
    double sum = x;
    for (int n = 1; n <= 12; ++n) {
        term = -term * x * x / ((2 * n) * (2 * n + 1));
        sum = sum + term;
    }
    return sum;
}

} // namespace kzcat
