// Numbers, axes and shares.

#include "report/numbers.hpp"

#include <clocale>
#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "report/axis.hpp"
#include "report/share.hpp"

namespace report {
namespace {

TEST(Numbers, HaveTheDigitsThatWereAskedFor)
{
    EXPECT_EQ("7.30", number_text(7.3, 2));
    EXPECT_EQ("7", number_text(7.3, 0));
    EXPECT_EQ("-2.5", number_text(-2.5, 1));
}

TEST(Numbers, WhatRoundsToZeroHasNoSign)
{
    EXPECT_EQ("0.0", number_text(-0.01, 1));
    EXPECT_EQ("0:00.0", clock_text(-0.01));
}

TEST(Numbers, WhatIsNoNumberIsADash)
{
    for (const double number : {std::nan(""), std::numeric_limits<double>::infinity(), -1e300}) {
        EXPECT_EQ("\u2013", number_text(number, 1));
        EXPECT_EQ("\u2013", clock_text(number));
        EXPECT_EQ("\u2013", whole_clock_text(number));
    }
}

TEST(Numbers, DoNotDependOnTheLocale)
{
    const std::string before = std::setlocale(LC_ALL, nullptr);
    std::setlocale(LC_ALL, "de_DE.UTF-8"); // where it is installed
    EXPECT_EQ("7.3", number_text(7.3, 1));
    std::setlocale(LC_ALL, before.c_str());
}

TEST(Numbers, LargeCountsHaveCommas)
{
    EXPECT_EQ("0", count_text(0));
    EXPECT_EQ("9999", count_text(9999));
    EXPECT_EQ("10,000", count_text(10000));
    EXPECT_EQ("1,234,567", count_text(1234567));
}

TEST(Numbers, TimesAreClocks)
{
    EXPECT_EQ("0:03.4", clock_text(3.4));
    EXPECT_EQ("1:00.0", clock_text(59.96));
    EXPECT_EQ("1:02:03.4", clock_text(3723.4));
    EXPECT_EQ("-0:11.0", clock_text(-11));
    EXPECT_EQ("1:02:03", whole_clock_text(3723.4));
    EXPECT_EQ("50:00:00", whole_clock_text(180000));
}

TEST(Numbers, DurationsHaveTheUnitThatSuits)
{
    EXPECT_EQ("12 ms", duration_text(0.012));
    EXPECT_EQ("999 ms", duration_text(0.999));
    EXPECT_EQ("1.0 s", duration_text(0.9999));
    EXPECT_EQ("61.5 s", duration_text(61.5));
}

TEST(Axis, PlacesStayWithinIt)
{
    const Scale scale = {.low = 10, .high = 20, .from = 100, .to = 300};
    EXPECT_DOUBLE_EQ(100, scale(10));
    EXPECT_DOUBLE_EQ(200, scale(15));
    EXPECT_DOUBLE_EQ(100, scale(-1e9));
    EXPECT_DOUBLE_EQ(300, scale(1e9));
    const Scale empty = {.low = 5, .high = 5, .from = 1, .to = 2};
    EXPECT_DOUBLE_EQ(1, empty(5));
}

TEST(Axis, TicksAreRoundAndNoMoreThanWanted)
{
    EXPECT_EQ((std::vector<double>{0, 2000, 4000, 6000}), ticks(0, 6500, 4));
    for (double high = 0.001; high < 1e6; high *= 1.7) {
        const auto all = ticks(0, high, 10);
        EXPECT_GE(all.size(), 3U) << high;
        EXPECT_LE(all.size(), 11U) << high;
        EXPECT_LE(all.back(), high * (1 + 1e-9)) << high;
    }
}

TEST(Axis, TimeTicksAreStepsOfAClock)
{
    EXPECT_EQ((std::vector<double>{0, 30, 60, 90, 120}), time_ticks(0, 128, 6));
    for (double high = 0.5; high < 1e7; high *= 1.7) {
        const auto all = time_ticks(0, high, 10);
        EXPECT_GE(all.size(), 2U) << high;
        EXPECT_LE(all.size(), 11U) << high;
    }
}

TEST(Axis, NothingIsDividedThatIsNoRange)
{
    EXPECT_TRUE(ticks(1, 1, 5).empty());
    EXPECT_TRUE(ticks(0, std::nan(""), 5).empty());
    EXPECT_TRUE(time_ticks(0, std::numeric_limits<double>::infinity(), 5).empty());
}

TEST(Share, HasWilsonsInterval)
{
    // Values of the closed formula, which the normal approximation misses widely.
    const Share all = share_of(40, 40);
    EXPECT_NEAR(0.9124, all.low, 1e-4);
    EXPECT_DOUBLE_EQ(1, all.high);
    const Share none = share_of(0, 60);
    EXPECT_DOUBLE_EQ(0, none.low);
    EXPECT_NEAR(0.0602, none.high, 1e-4);
}

TEST(Share, OfNothingAnythingIsPossible)
{
    EXPECT_DOUBLE_EQ(0, share_of(0, 0).low);
    EXPECT_DOUBLE_EQ(1, share_of(0, 0).high);
}

} // namespace
} // namespace report
