// The time of day of a stream that is interrupted, and how times are shown.

#include <gtest/gtest.h>

#include "kzfp/monitor/entry.hpp"

namespace {

using namespace kzfp;

constexpr int64_t kSecond = 1000000000;
constexpr int64_t kBegin = 1795341600 * kSecond; // 2026-11-22, 10:00 UTC

TEST(MonitorClock, RunsWithTheStream)
{
    WallClock clock(kBegin);
    EXPECT_EQ(kBegin, clock.at(0));
    EXPECT_EQ(kBegin + 90 * kSecond, clock.at(90));
    EXPECT_EQ(0, clock.resume(100, kBegin + 100 * kSecond + kSecond / 2)) << "as usual";
    EXPECT_EQ(0, clock.resume(100, kBegin + 40 * kSecond)) << "sound that came in advance";
    EXPECT_EQ(kBegin + 200 * kSecond, clock.at(200));
}

TEST(MonitorClock, GoesOnAfterAnInterruption)
{
    WallClock clock(kBegin);
    EXPECT_NEAR(60, clock.resume(100, kBegin + 160 * kSecond), 1e-6);
    EXPECT_EQ(kBegin + 99 * kSecond, clock.at(99)) << "what was before stays where it was";
    EXPECT_EQ(kBegin + 160 * kSecond, clock.at(100));
    EXPECT_EQ(kBegin + 170 * kSecond, clock.at(110));
    EXPECT_NEAR(5, clock.resume(110, kBegin + 175 * kSecond), 1e-6);
    EXPECT_EQ(kBegin + 175 * kSecond, clock.at(110));
}

TEST(MonitorClock, ForgetsInterruptionsOfLongAgo)
{
    WallClock clock(kBegin);
    for (int64_t hour = 1; hour <= 5000; ++hour) { // each is interrupted for a minute
        EXPECT_NEAR(60,
                    clock.resume(static_cast<double>(hour * 3600), kBegin + hour * 3660 * kSecond),
                    1e-6);
    }
    EXPECT_EQ(kBegin + 5000 * 3660 * kSecond, clock.at(5000.0 * 3600));
    EXPECT_LT(clock.at(0), clock.at(1)) << "before what is kept, it is only less exact";
}

TEST(MonitorClock, ShowsTheTimeOfDayInUtc)
{
    const WallClock wall(kBegin);
    EXPECT_EQ("2026-11-22T10:01:30.5Z", Clock(wall).utc(90.5));
    EXPECT_EQ("1:30.5", Clock().text(90.5));
}

} // namespace
