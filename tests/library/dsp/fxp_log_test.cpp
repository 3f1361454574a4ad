#include <array>
#include <cmath>
#include <cstdint>
#include <iomanip>
#include <limits>
#include <numbers>
#include <sstream>

#include <gtest/gtest.h>

#include "kzsdk/dsp/fxp.h"
#include "kzsdk/dsp/log_segments.hpp"
#include "support/signals.hpp"

namespace {

using kz::fxp::kLogSegments;
using kz::fxp::LogSegment;
using kz::test::Random;

constexpr long double kUnit = 0x1p-29L; // of a coefficient

std::array<int32_t, 3> words(const LogSegment& row) { return {row.a, row.b, row.c}; }

// ---- The table ------------------------------------------------------------------------------

/// Coefficients of the parabola through the segment's 1024 points with the smallest sum of squares.
/// Solved around the mean of the points, where the normal equations separate into small ones.
std::array<long double, 3> fit(uint32_t row)
{
    constexpr int kPoints = 1024;
    const long double start = 1 + row / 128.0L;
    const long double mean = start + (kPoints - 1) / 2.0L / (128 * kPoints);
    long double s2 = 0;
    long double s4 = 0;
    long double t0 = 0;
    long double t1 = 0;
    long double t2 = 0;
    for (int i = 0; i < kPoints; ++i) {
        const long double d = start + static_cast<long double>(i) / (128 * kPoints) - mean;
        const long double y = std::log1p(d / mean); // of what the value adds to that of the mean
        s2 += d * d;
        s4 += d * d * d * d;
        t0 += y;
        t1 += y * d;
        t2 += y * d * d;
    }
    const long double scale = std::numbers::log2e_v<long double> / kUnit;
    const long double determinant = kPoints * s4 - s2 * s2;
    const long double q2 = (kPoints * t2 - s2 * t0) / determinant * scale;
    const long double q1 = t1 / s2 * scale;
    const long double q0 = (s4 * t0 - s2 * t2) / determinant * scale + std::log2(mean) / kUnit;
    return {q2, q1 - 2 * q2 * mean, q0 - q1 * mean + q2 * mean * mean};
}

TEST(LogSegments, AreTheTruncatedLeastSquaresFits)
{
    EXPECT_EQ((std::array{-384268000, 1543067654, -1158799648}), words(kLogSegments.front()));
    EXPECT_EQ((std::array{-97197461, 776059155, -626457555}), words(kLogSegments.back()));
    constexpr long double kSlack = 0.01L; // for platforms where long double is double
    for (uint32_t row = 0; row < kLogSegments.size(); ++row) {
        const auto fitted = fit(row);
        const auto stored = words(kLogSegments[row]);
        for (size_t i = 0; i < 3; ++i) {
            const long double cut_off = std::fabs(fitted[i]) - std::fabs(1.0L * stored[i]);
            EXPECT_TRUE(-kSlack < cut_off && cut_off < 1 + kSlack)
                << "row " << row << ", coefficient " << i << ": " << stored[i] << " for "
                << std::setprecision(14) << fitted[i];
        }
    }
}

TEST(LogSegments, StayWithin13BillionthsOfLog2)
{
    constexpr int kSteps = 500;
    long double worst = 0;
    for (uint32_t row = 0; row < kLogSegments.size(); ++row) {
        const LogSegment& s = kLogSegments[row];
        for (int i = 0; i <= kSteps; ++i) {
            const long double m = 1 + (row + static_cast<long double>(i) / kSteps) / 128;
            const long double value = ((s.a * m + s.b) * m + s.c) * kUnit;
            worst = std::fmax(worst, std::fabs(value - std::log2(m)));
        }
    }
    EXPECT_LT(worst, 1.3e-8L);
    EXPECT_GT(worst, 1.2e-8L) << "the header states 1.286e-8";
}

// ---- The logarithm --------------------------------------------------------------------------

struct Log {
    int32_t mantissa;
    int32_t exponent;
    long double value() const { return std::ldexp(1.0L * mantissa, exponent - 31); }
    bool operator==(const Log&) const = default;
};

Log fixed_log(uint32_t mantissa, int32_t exponent)
{
    Log log{};
    log.mantissa = kzlog_fixed(mantissa, exponent, &log.exponent);
    return log;
}

long double true_log(uint32_t mantissa, int32_t exponent)
{
    return std::log(1.0L * mantissa) + (exponent - 32.0L) * std::numbers::ln2_v<long double>;
}

bool is_normalised(int32_t m) { return m == 0 || (m < -0x40000000 || m >= 0x40000000); }

/// The steps again, in 64-bit arithmetic and one shift at a time.
class Model {
public:
    static Log log(uint32_t m, int64_t e)
    {
        int64_t whole = e - 1;
        for (int i = 0; i < 32 && m >> 31 == 0; ++i) {
            m <<= 1;
            --whole;
        }
        const LogSegment& row = kLogSegments[m >> 24 & 127];
        Pair square = normalised({static_cast<int64_t>((uint64_t{m} * m) >> 33), 2});
        Pair quadratic = normalised({times(row.a, square.m), square.e + 2});
        Pair linear = normalised({times(row.b, m >> 1), 3});
        Pair sum = add(add(quadratic, linear), {row.c, 2});
        if (whole != 0) {
            int64_t n = whole;
            int64_t exponent = 31;
            while (n < 0x40000000 && n > -0x40000000) {
                n *= 2;
                --exponent;
            }
            sum = add({n, exponent}, sum);
        }
        sum = normalised({times(sum.m, 1488522235), sum.e});
        return {static_cast<int32_t>(sum.m), static_cast<int32_t>(sum.e)};
    }

private:
    struct Pair {
        int64_t m;
        int64_t e;
    };
    static int64_t times(int64_t a, int64_t b) { return 2 * (a * b / (int64_t{1} << 32)); }
    static Pair normalised(Pair p)
    {
        while (p.m != 0 && p.m >= -0x40000000 && p.m < 0x40000000) {
            p.m *= 2;
            --p.e;
        }
        return p;
    }
    static Pair add(Pair a, Pair b)
    {
        while (a.e < b.e) {
            a = {a.m >> 1, a.e + 1};
        }
        while (b.e < a.e) {
            b = {b.m >> 1, b.e + 1};
        }
        return normalised({(a.m >> 1) + (b.m >> 1), a.e + 1});
    }
};

TEST(FixedLog, OfOneAndTwoIsWithinTheFit)
{
    const Log of_one = fixed_log(0x80000000, 1);
    EXPECT_LT(std::fabs(of_one.value()), 2e-8L);
    EXPECT_NE(0, of_one.mantissa) << "the fit is not exact at 1";
    EXPECT_LT(std::fabs(fixed_log(0x80000000, 2).value() - std::numbers::ln2_v<long double>),
              1e-8L);
}

TEST(FixedLog, LiesWithin20BillionthsOfTheTruth)
{
    Random random(1);
    long double worst = 0;
    for (int i = 0; i < 1'000'000; ++i) {
        const uint32_t mantissa = (random.next() >> random.below(32)) | 1;
        const auto bound = 1u << random.below(21); // exponents of all sizes up to a million
        const auto exponent =
            static_cast<int32_t>(random.below(2 * bound)) - static_cast<int32_t>(bound);
        const Log log = fixed_log(mantissa, exponent);
        const long double truth = true_log(mantissa, exponent);
        const long double error =
            std::fabs(log.value() - truth) / std::fmax(1.0L, std::fabs(truth));
        ASSERT_LT(error, 2e-8L) << mantissa << " with exponent " << exponent;
        ASSERT_TRUE(is_normalised(log.mantissa)) << mantissa << " with exponent " << exponent;
        worst = std::fmax(worst, error);
    }
    std::ostringstream text;
    text << worst;
    RecordProperty("worst_error", text.str());
}

TEST(FixedLog, LiesWithin16BillionthsBetweenOneAndTwo)
{
    for (uint64_t x = 0x80000000; x <= 0xffffffff; x += 4001) {
        const auto mantissa = static_cast<uint32_t>(x);
        const long double truth = std::log1p((mantissa - 0x80000000) / 0x1p31L);
        ASSERT_LT(std::fabs(fixed_log(mantissa, 1).value() - truth), 1.6e-8L) << mantissa;
    }
}

TEST(FixedLog, FollowsItsStepsWordForWord)
{
    Random random(2);
    for (int i = 0; i < 1'000'000; ++i) {
        const uint32_t mantissa = random.next() >> random.below(32);
        const int32_t exponent =
            static_cast<int32_t>(random.next() >> random.below(32)) >> (1 + random.below(3));
        const Log model = Model::log(mantissa, exponent);
        const Log log = fixed_log(mantissa, exponent);
        ASSERT_EQ(model, log) << mantissa << " with exponent " << exponent;
    }
}

TEST(FixedLog, OfTheSameValueWrittenDifferentlyIsTheSame)
{
    Random random(3);
    for (int i = 0; i < 10'000; ++i) {
        const uint32_t mantissa = random.next() | 0x80000000;
        const auto zeros = static_cast<int32_t>(random.below(31));
        const uint32_t shifted = mantissa >> zeros << zeros;
        EXPECT_EQ(fixed_log(shifted, 3), fixed_log(shifted >> zeros, 3 + zeros)) << shifted;
    }
}

TEST(FixedLog, OfZeroIsFiniteAndMeansNothing)
{
    const Log log = fixed_log(0, 0);
    EXPECT_TRUE(is_normalised(log.mantissa));
    EXPECT_LT(std::fabs(log.value()), 64.0L);
    EXPECT_EQ(Model::log(0, 0), log);
}

TEST(FixedLog, TakesTheLastExponents)
{
    constexpr int32_t kLast = std::numeric_limits<int32_t>::max();
    EXPECT_NEAR(1.0, static_cast<double>(fixed_log(1u << 31, kLast).value() / 1488522235.0L), 1e-6);
    // n = e - 1 - z wraps at the other end: finite, and of the wrong sign.
    EXPECT_GT(fixed_log(1, -kLast - 1).value(), 1e9L);
}

} // namespace
