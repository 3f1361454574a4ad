#include <cmath>
#include <limits>
#include <numeric>

#include <gtest/gtest.h>

#include "kzsdk/dsp/resampler.h"
#include "support/signals.hpp"
#include "support/wide.hpp"

namespace kz::test {

namespace {

struct Fraction {
    int32_t numerator;
    int32_t denominator;
    bool operator==(const Fraction&) const = default;
};

void PrintTo(const Fraction& f, std::ostream* out) { *out << f.numerator << '/' << f.denominator; }

Fraction rationalize(double x, double tolerance)
{
    Fraction f{77, 77};
    KZDSP_Rationalize(x, &f.numerator, &f.denominator, tolerance);
    return f;
}

// As a resampler calls it.
Fraction ratio_of(double input_rate, double output_rate)
{
    const double ratio = static_cast<float>(output_rate) / static_cast<float>(input_rate);
    return rationalize(ratio, ratio * 1e-6);
}

Fraction reduced(uint32_t numerator, uint32_t denominator)
{
    const uint32_t divisor = std::gcd(numerator, denominator);
    return {static_cast<int32_t>(numerator / divisor), static_cast<int32_t>(denominator / divisor)};
}

// |f - p/q| < 1 / scale, in whole numbers.
bool closer_than(const Fraction& f, int64_t p, int64_t q, int64_t scale)
{
    const Wide distance = Wide{f.numerator} * q - Wide{p} * f.denominator;
    return (distance < 0 ? -distance : distance) * scale < Wide{f.denominator} * q;
}

constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr Fraction kNone{0, 0};

} // namespace

TEST(Rationalize, SupportedRatesGiveTheirFactors)
{
    const std::pair<uint32_t, Fraction> rates[] = {
        {48000, {147, 640}},  {44100, {1, 4}},       {32000, {441, 1280}}, {24000, {147, 320}},
        {22050, {1, 2}},      {16000, {441, 640}},   {11025, {1, 1}},      {8000, {441, 320}},
        {96000, {147, 1280}}, {192000, {147, 2560}}, {88200, {1, 8}},      {1, {11025, 1}},
    };
    for (const auto& [rate, factors] : rates) {
        EXPECT_EQ(factors, ratio_of(rate, 11025)) << rate;
    }
}

TEST(Rationalize, KnownFractions)
{
    EXPECT_EQ((Fraction{1, 4}), rationalize(0.25, 2.5e-7));
    EXPECT_EQ((Fraction{-1, 2}), rationalize(-0.5, 5e-7));
    EXPECT_EQ((Fraction{2, 3}), rationalize(2.0 / 3, 1e-9)); // 1 - 1/3
    EXPECT_EQ((Fraction{355, 113}), rationalize(3.14159265358979, 1e-6));
    EXPECT_EQ((Fraction{-355, 113}), rationalize(-3.14159265358979, 1e-6));
    EXPECT_EQ((Fraction{7, 1}), rationalize(7, 1e-6));
}

TEST(Rationalize, WithinTheToleranceOfOneIsOne)
{
    EXPECT_EQ((Fraction{1, 1}), rationalize(1.0000001, 1e-6));
    EXPECT_EQ((Fraction{1, 1}), rationalize(0.9999999, 1e-6));
    EXPECT_EQ((Fraction{-1, 1}), rationalize(-1.0000001, 1e-6));
    EXPECT_EQ((Fraction{1, 1}), rationalize(0.001, 1.0)); // though nearer to 0
}

TEST(Rationalize, BelowTheToleranceIsNothing)
{
    EXPECT_EQ(kNone, rationalize(1e-7, 1e-6));
    EXPECT_EQ(kNone, rationalize(-1e-7, 1e-6));
    EXPECT_EQ(kNone, rationalize(0, 1e-6));
    EXPECT_EQ(kNone, rationalize(-0.0, 1e-6));
}

TEST(Rationalize, TheSignOfTheToleranceDoesNotMatter)
{
    EXPECT_EQ((Fraction{355, 113}), rationalize(3.14159265358979, -1e-6));
    EXPECT_EQ((Fraction{1, 1}), rationalize(1.0000001, -1e-6));
}

// A tolerance that nothing is closer than leaves only the fractions that come out exactly.
TEST(Rationalize, EndsWithoutAToleranceAsWell)
{
    for (const double tolerance : {0.0, -0.0, kNaN}) {
        EXPECT_EQ((Fraction{1, 4}), rationalize(0.25, tolerance));
        EXPECT_EQ((Fraction{-3, 1}), rationalize(-3, tolerance));
        EXPECT_EQ((Fraction{1, 1}), rationalize(1, tolerance));
        EXPECT_EQ((Fraction{0, 1}), rationalize(0, tolerance));
    }
    Random random(1);
    for (int i = 0; i < 20000; ++i) {
        const double x = std::ldexp(random.unit(), static_cast<int>(random.below(80)) - 40);
        const Fraction f = rationalize(x, i % 2 == 0 ? 0 : kNaN);
        EXPECT_TRUE(f.denominator >= 0 && (x < 0 ? f.numerator <= 0 : f.numerator >= 0)) << x;
    }
}

TEST(Rationalize, WhatIsNoNumberIsNoFraction)
{
    for (const double x : {kNaN, -kNaN, kInfinity, -kInfinity}) {
        for (const double tolerance : {1e-6, 0.0, kNaN, kInfinity}) {
            EXPECT_EQ(kNone, rationalize(x, tolerance)) << x << ' ' << tolerance;
        }
    }
}

TEST(Rationalize, PartsBeyondTheRangeSaturate)
{
    EXPECT_EQ((Fraction{INT32_MAX, 1}), rationalize(1e30, 1));
    EXPECT_EQ((Fraction{INT32_MIN, 1}), rationalize(-1e30, 1));
    EXPECT_EQ((Fraction{1, INT32_MAX}), rationalize(1e-30, 1e-36));
    EXPECT_EQ((Fraction{INT32_MAX, 1}), rationalize(std::numeric_limits<double>::max(), 0));
}

TEST(Rationalize, NullResultsAreNotWritten)
{
    int32_t part = 0;
    KZDSP_Rationalize(0.25, nullptr, &part, 1e-6);
    EXPECT_EQ(4, part);
    KZDSP_Rationalize(0.25, &part, nullptr, 1e-6);
    EXPECT_EQ(1, part);
    KZDSP_Rationalize(0.25, nullptr, nullptr, 1e-6);
}

// A fraction with a denominator below 1000 differs from every other one by more than 10^-6: it must
// come back unchanged, although x is not exactly p/q.
TEST(Rationalize, SmallFractionsComeBackInLowestTerms)
{
    for (uint32_t q = 1; q < 300; ++q) {
        for (uint32_t p = 1; p < 600; ++p) {
            const double x = static_cast<double>(p) / q;
            ASSERT_EQ(reduced(p, q), rationalize(x, 1e-9)) << p << '/' << q;
            const Fraction back = rationalize(-x, 1e-9);
            ASSERT_EQ(reduced(p, q), (Fraction{-back.numerator, back.denominator}));
        }
    }
}

TEST(Rationalize, RandomFractionsAreMetToTheTolerance)
{
    Random random(2);
    for (int i = 0; i < 200000; ++i) {
        const uint32_t p = 1 + random.below(1U << (1 + random.below(20)));
        const uint32_t q = 1 + random.below(1U << (1 + random.below(20)));
        const double x = static_cast<double>(p) / q;
        const Fraction f = rationalize(x, 1e-6);
        if (f == kNone) {
            EXPECT_LE(p, q * 1e-6);
            continue;
        }
        // A little beyond the tolerance, for what p / q lost when it became a double.
        ASSERT_TRUE(closer_than(f, p, q, 999999)) << p << '/' << q;
        ASSERT_EQ(1, std::gcd(f.numerator, f.denominator)) << p << '/' << q;
        // No larger than it need be: p / q itself would do.
        const Fraction whole = reduced(p, q);
        ASSERT_LE(f.denominator, whole.denominator) << p << '/' << q;
    }
}

// The nearest-integer terms, in whole numbers: the convergents of p / q by Euclid's division with
// the remainder of least magnitude. The first that meets the tolerance is the answer.
TEST(Rationalize, AgreesWithConvergentsInExactArithmetic)
{
    Random random(3);
    int compared = 0;
    for (int i = 0; i < 100000; ++i) {
        const int64_t p = 1 + random.below(1U << (1 + random.below(18)));
        const int64_t q = 1 + random.below(1U << (1 + random.below(18)));
        const int64_t scale = 10'000'000;
        if (p * scale < q * 2 || std::abs(p - q) * scale < q * 2) {
            continue; // near 0 or 1
        }
        int64_t h = 1, h_before = 0, k = 0, k_before = 1;
        int64_t dividend = p, divisor = q;
        bool sure = true; // no halves, which rounding of p / q decides, and no close calls
        while (sure) {
            // floor(dividend / divisor + 1/2)
            const int64_t up = dividend * 2 + divisor;
            const int64_t down = divisor * 2;
            int64_t a = up / down;
            if (up % down != 0 && (up < 0) != (down < 0)) {
                --a;
            }
            sure = up % down != 0;
            h = std::exchange(h_before, h) + a * h_before;
            k = std::exchange(k_before, k) + a * k_before;
            const int64_t rest = dividend - a * divisor;
            const Wide distance = Wide{h} * q - Wide{p} * k;
            const auto off = static_cast<double>(distance < 0 ? -distance : distance) /
                             (std::abs(static_cast<double>(k)) * static_cast<double>(q));
            sure = sure && std::abs(off * static_cast<double>(scale) - 1) > 1e-6;
            if (rest == 0 || off * static_cast<double>(scale) < 1) {
                break;
            }
            dividend = std::exchange(divisor, rest);
        }
        if (sure) {
            ++compared;
            const auto sign = k < 0 ? -1 : 1;
            ASSERT_EQ((Fraction{static_cast<int32_t>(sign * h), static_cast<int32_t>(sign * k)}),
                      rationalize(static_cast<double>(p) / static_cast<double>(q),
                                  1.0 / static_cast<double>(scale)))
                << p << '/' << q;
        }
    }
    EXPECT_GT(compared, 50000);
}

// Whatever the rates, the tolerance of a millionth keeps both factors below a million or so:
// filters stay within some 90 MB.
TEST(Rationalize, WholeRatesToAGigahertzKeepWithinTheBound)
{
    const auto check = [](uint32_t rate) {
        const Fraction f = ratio_of(rate, 11025);
        ASSERT_GT(f.numerator, 0) << rate;
        ASSERT_GT(f.denominator, 0) << rate;
        ASSERT_LE(std::max(f.numerator, f.denominator), 1 << 20) << rate;
        const double ratio = 11025.0 / rate;
        const double met = static_cast<double>(f.numerator) / f.denominator;
        ASSERT_NEAR(ratio, met, ratio * 1.13e-6) << rate; // 2^-23 is lost in single precision
    };
    for (uint32_t rate = 1; rate < 400000; ++rate) {
        check(rate);
    }
    Random random(4);
    for (int i = 0; i < 400000; ++i) {
        check(1 + random.below(1'000'000'000U));
    }
}

} // namespace kz::test
