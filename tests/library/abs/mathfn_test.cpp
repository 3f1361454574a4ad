#include "kzsdk/abs/mathfn.h"

#include <bit>
#include <cerrno>
#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "support/signals.hpp"

using kz::test::Random;

namespace {

uint64_t bits(double x) { return std::bit_cast<uint64_t>(x); }

TEST(Math, ForwardsToTheMathLibrary)
{
    Random random(1);
    for (int i = 0; i < 20000; ++i) {
        const double x = std::ldexp(random.unit(), static_cast<int>(random.below(60)) - 30);
        const double y = random.unit() * 8;
        EXPECT_EQ(bits(std::fabs(x)), bits(kz_fabs(x)));
        EXPECT_EQ(bits(std::floor(x)), bits(kz_floor(x)));
        EXPECT_EQ(bits(std::exp(y)), bits(kz_exp(y)));
        EXPECT_EQ(bits(std::cos(x)), bits(kz_cos(x)));
        EXPECT_EQ(bits(std::sin(x)), bits(kz_sin(x)));
        EXPECT_EQ(bits(std::sqrt(std::fabs(x))), bits(kz_sqrt(std::fabs(x))));
        EXPECT_EQ(bits(std::log(std::fabs(x))), bits(kz_log(std::fabs(x))));
        EXPECT_EQ(bits(std::pow(std::fabs(x), y)), bits(kz_pow(std::fabs(x), y)));
    }
}

TEST(Math, KnownValues)
{
    EXPECT_EQ(2.5, kz_fabs(-2.5));
    EXPECT_EQ(1024.0, kz_pow(2, 10));
    EXPECT_EQ(1.0, kz_exp(0));
    EXPECT_EQ(0.0, kz_log(1));
    EXPECT_EQ(-3.0, kz_floor(-2.1));
    EXPECT_EQ(1.0, kz_cos(0));
    EXPECT_EQ(0.0, kz_sin(0));
    EXPECT_EQ(1.5, kz_sqrt(2.25));
    EXPECT_EQ(bits(-0.0), bits(kz_sqrt(-0.0)));
}

TEST(Math, ARootBelowZeroSetsTheErrorState)
{
    errno = 0;
    EXPECT_TRUE(std::isnan(kz_sqrt(-1)));
    EXPECT_EQ(EDOM, errno);
}

TEST(Math, MinOfWholeNumbers)
{
    constexpr int32_t lowest = std::numeric_limits<int32_t>::min();
    constexpr int32_t highest = std::numeric_limits<int32_t>::max();
    EXPECT_EQ(-1, kz_min(-1, 1));
    EXPECT_EQ(-1, kz_min(1, -1));
    EXPECT_EQ(5, kz_min(5, 5));
    EXPECT_EQ(lowest, kz_min(highest, lowest));
}

} // namespace
