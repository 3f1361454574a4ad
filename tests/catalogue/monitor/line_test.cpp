// Borders out of the agreement of single codes.

#include <gtest/gtest.h>

#include "catalogue/monitor/line.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;

/// Codes every 0.186 s, of which those between two times agree by a share, the others by chance.
Agreements codes_of(double seconds, double begin, double end, double share, uint64_t seed)
{
    kz::test::Random random(seed);
    Agreements agreements;
    for (double time = 0; time < seconds; time += kCodeSeconds) {
        const double mean = time >= begin && time < end ? share : 0;
        int32_t surplus = 0;
        for (int bit = 0; bit < 48; ++bit) {
            surplus += random.unit() < mean ? 1 : -1;
        }
        agreements.push_back({.time = time, .weight = 48, .surplus = surplus});
    }
    return agreements;
}

TEST(MonitorLine, FindsTheStretchInWhichATrackIsHeard)
{
    for (uint64_t seed = 1; seed <= 20; ++seed) {
        for (const double share : {0.3, 0.9}) {
            const auto heard = heard_stretch(codes_of(50, 12, 37, share, seed));
            ASSERT_TRUE(heard);
            EXPECT_NEAR(12, heard->begin, 1) << seed;
            EXPECT_NEAR(37, heard->end, 1) << seed;
            EXPECT_NEAR(share, heard->share, 0.1) << seed;
        }
    }
}

TEST(MonitorLine, BridgesAShortHole)
{
    Agreements agreements = codes_of(50, 5, 45, 0.6, 1);
    for (CodeAgreement& one : agreements) {
        if (one.time > 20 && one.time < 23) {
            one.surplus = 0;
        }
    }
    const auto heard = heard_stretch(agreements);
    ASSERT_TRUE(heard);
    EXPECT_NEAR(5, heard->begin, 1);
    EXPECT_NEAR(45, heard->end, 1);
}

TEST(MonitorLine, SilenceBeforeATrackIsNoPartOfIt)
{
    Agreements agreements = codes_of(50, 20, 50, 0.6, 1);
    for (CodeAgreement& one : agreements) {
        if (one.time < 20) {
            const bool chance = one.time > 11 && one.time < 11 + kCodeSeconds;
            one = {.time = one.time, .weight = chance ? 48 : 0, .surplus = chance ? 24 : 0};
        }
    }
    const auto heard = heard_stretch(agreements);
    ASSERT_TRUE(heard);
    EXPECT_NEAR(20, heard->begin, 0.5);
}

TEST(MonitorLine, FindsNothingWhereNothingAgrees)
{
    EXPECT_FALSE(heard_stretch({}));
    Agreements agreements = codes_of(20, 0, 0, 0, 1);
    for (CodeAgreement& one : agreements) {
        one.surplus = -1;
    }
    EXPECT_FALSE(heard_stretch(agreements));
    for (CodeAgreement& one : agreements) {
        one = {.time = one.time, .weight = 0, .surplus = 0};
    }
    EXPECT_FALSE(heard_stretch(agreements)) << "silence";
}

TEST(MonitorLine, FindsTheEndBehindWhatIsSure)
{
    for (uint64_t seed = 1; seed <= 20; ++seed) {
        const Agreements agreements = codes_of(50, 0, 33, 0.4, seed);
        EXPECT_NEAR(33, heard_until(agreements, 20, 0.4), 1) << seed;
        EXPECT_NEAR(40, heard_until(agreements, 40, 0.4), 1) << "no earlier than that";
    }
}

TEST(MonitorLine, PlacesAndTimesAreInverse)
{
    const Line line = {.track = 1,
                       .hypothesis = {.pitch_steps = 0, .stretch = 1.04},
                       .pitch = 1,
                       .time = 1e6,
                       .at_time = 12};
    EXPECT_DOUBLE_EQ(12 + 10.4, line.place(1e6 + 10));
    EXPECT_NEAR(1e6 + 10, line.time_of(line.place(1e6 + 10)), 1e-9);
}

} // namespace
