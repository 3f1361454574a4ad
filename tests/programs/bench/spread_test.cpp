#include "measure/spread.hpp"

#include <gtest/gtest.h>

namespace {

using kz::bench::spread_of;

TEST(Spread, QuartilesAreTakenInOrderOfSize)
{
    const auto spread = spread_of({50, 10, 40, 20, 30});
    EXPECT_EQ(spread.least, 10);
    EXPECT_EQ(spread.lower, 20);
    EXPECT_EQ(spread.median, 30);
    EXPECT_EQ(spread.upper, 40);
}

TEST(Spread, BetweenTwoValuesItGoesByProportion)
{
    const auto spread = spread_of({1, 2, 3, 4});
    EXPECT_DOUBLE_EQ(spread.lower, 1.75);
    EXPECT_DOUBLE_EQ(spread.median, 2.5);
    EXPECT_DOUBLE_EQ(spread.upper, 3.25);
}

TEST(Spread, OneValueIsAllOfThem)
{
    const auto spread = spread_of({7});
    EXPECT_EQ(spread.least, 7);
    EXPECT_EQ(spread.lower, 7);
    EXPECT_EQ(spread.median, 7);
    EXPECT_EQ(spread.upper, 7);
}

} // namespace
