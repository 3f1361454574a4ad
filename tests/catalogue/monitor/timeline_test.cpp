// Entries in their order, and what lies between tracks.

#include <string>

#include <gtest/gtest.h>

#include "catalogue/monitor/quiet.hpp"
#include "catalogue/monitor/timeline.hpp"

namespace {

using namespace kzcat;

const char* const kStages[] = {"begins", "goes on", "ends"};
const char* const kHeard[] = {"track", "gap", "silence"};

/// "track begins 3-10, gap ends 0-3": all events, with whole seconds.
std::string events_of(Timeline& timeline)
{
    std::string text;
    for (const MonitorEvent& event : timeline.events()) {
        text += text.empty() ? "" : ", ";
        text += std::string(kHeard[static_cast<int>(event.heard)]) + " " +
                kStages[static_cast<int>(event.stage)] + " " +
                std::to_string(static_cast<int>(event.begin)) + "-" +
                std::to_string(static_cast<int>(event.end));
    }
    timeline.events().clear();
    return text;
}

TEST(MonitorTimeline, FillsWhatLiesBeforeATrack)
{
    Timeline timeline({});
    timeline.advance(40);
    timeline.begin_track({.track = 7}, 20, {{.begin = 5, .end = 9}});
    EXPECT_EQ("gap begins 0-5, gap ends 0-5, silence begins 5-9, silence ends 5-9, "
              "gap begins 9-20, gap ends 9-20, track begins 20-40",
              events_of(timeline));
}

TEST(MonitorTimeline, LeavesShortGapsOut)
{
    Timeline timeline({});
    timeline.advance(20);
    timeline.begin_track({.track = 7}, 1.5, {});
    timeline.end_track(10, 9);
    timeline.begin_track({.track = 8}, 11, {});
    EXPECT_EQ("track begins 1-20, track ends 1-10, track begins 11-20", events_of(timeline));
}

TEST(MonitorTimeline, ReportsAGapOnceWhileItGrows)
{
    Timeline timeline({});
    timeline.settle(1, {});
    EXPECT_EQ("", events_of(timeline));
    timeline.settle(6, {});
    timeline.settle(9, {});
    EXPECT_EQ("gap begins 0-6", events_of(timeline));
    timeline.finish(12, {});
    EXPECT_EQ("gap ends 0-12", events_of(timeline));
}

TEST(MonitorTimeline, SaysThatEntriesGoOnWhenWanted)
{
    Timeline timeline({.interval = 10});
    timeline.advance(4);
    timeline.begin_track({.track = 7}, 0, {});
    for (double now = 5; now <= 30; now += 5) {
        timeline.advance(now);
        timeline.continue_track(now, now);
    }
    EXPECT_EQ("track begins 0-4, track goes on 0-15, track goes on 0-25", events_of(timeline));
}

TEST(MonitorTimeline, CountsHowOftenATrackWasHeard)
{
    Timeline timeline({});
    for (uint64_t times = 0; times < 3; ++times) {
        timeline.begin_track({.track = 7}, timeline.settled(), {});
        EXPECT_EQ(times, timeline.events().back().track.repeat);
        timeline.end_track(timeline.settled() + 10, 10);
    }
    timeline.begin_track({.track = 8}, timeline.settled(), {});
    EXPECT_EQ(0U, timeline.events().back().track.repeat);
}

TEST(MonitorTimeline, LetsTracksOverlapWhenFaded)
{
    Timeline timeline({});
    timeline.begin_track({.track = 7}, 0, {});
    timeline.end_track(50, 50);
    EXPECT_EQ(38, timeline.earliest());
    timeline.begin_track({.track = 8}, 45, {});
    timeline.end_track(47, 2);
    EXPECT_EQ(50, timeline.settled()) << "time does not go back";
    timeline.settle(60, {});
    EXPECT_EQ(60, timeline.earliest());
}

TEST(MonitorTimeline, SilencesAreAsLongAsTheyMustBe)
{
    QuietMeter quiet(-60, 1);
    uint64_t frame = 0;
    const auto hear = [&](double seconds, float level) {
        for (const uint64_t end = frame + static_cast<uint64_t>(seconds * 21.5332); frame < end;) {
            quiet.hear(frame++, level);
        }
    };
    hear(3, 30);
    hear(0.4, 10);
    hear(3, 30);
    EXPECT_TRUE(quiet.silences().empty());
    hear(5, 10);
    EXPECT_TRUE(quiet.silent_since(frame - 100));
    hear(3, 30);
    ASSERT_EQ(1U, quiet.silences().size());
    EXPECT_NEAR(6.4, quiet.silences()[0].begin, 0.2);
    EXPECT_NEAR(11.4 + 0.33, quiet.silences()[0].end, 0.2) << "to the end of its last frame";
}

TEST(MonitorTimeline, SilencesThatAreReportedAreForgotten)
{
    QuietMeter quiet(-60, 1);
    for (uint64_t frame = 0; frame < 1000; ++frame) {
        quiet.hear(frame, frame % 100 < 50 ? 10 : 30);
    }
    EXPECT_EQ(10U, quiet.silences().size());
    const double last = quiet.silences().back().begin;
    quiet.forget(quiet.silences()[4].end);
    EXPECT_EQ(5U, quiet.silences().size());
    quiet.forget(1e9);
    ASSERT_EQ(1U, quiet.silences().size()) << "the last one may go on";
    EXPECT_EQ(last, quiet.silences()[0].begin);
}

TEST(MonitorTimeline, SilenceIsBelowItsLevel)
{
    // A sine at full scale has the level 41; 3 dB are one.
    QuietMeter quiet(-30.103, 0.5);
    for (uint64_t frame = 0; frame < 50; ++frame) {
        quiet.hear(frame, 31.01F);
    }
    EXPECT_TRUE(quiet.silences().empty());
    for (uint64_t frame = 50; frame < 100; ++frame) {
        quiet.hear(frame, 30.99F);
    }
    EXPECT_EQ(1U, quiet.silences().size());
}

} // namespace
