// Monitoring a stream through the C interface.

#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/door/music.hpp"

namespace {

using namespace kz::test;

Monitor new_monitor(const kzcat_monitor_options* options = nullptr)
{
    return make<Monitor>(kzcat_monitor_create, &kFormat, options).handle;
}

kzcat_status feed(const Monitor& monitor, const Catalogue& catalogue,
                  const std::vector<int16_t>& samples)
{
    return kzcat_monitor_feed(monitor.get(), catalogue.get(), samples.data(), samples.size() * 2);
}

/// "track 1 begins, ...": the events that wait.
std::string events_of(const Monitor& monitor)
{
    const char* const stages[] = {"", "begins", "goes on", "ends"};
    const char* const kinds[] = {"", "track", "gap", "silence"};
    std::string text;
    kzcat_event event;
    while (kzcat_monitor_next_event(monitor.get(), &event) == KZCAT_OK) {
        text += text.empty() ? "" : ", ";
        text += std::string(kinds[event.heard]) + " ";
        text += event.heard == KZCAT_HEARD_TRACK ? std::string(event.source) + " " : "";
        text += stages[event.stage];
    }
    return text;
}

class DoorMonitor : public ::testing::Test {
protected:
    void SetUp() override { add(catalogue_.get(), trail_of(first_).get(), "one", "First"); }

    std::vector<int16_t> first_ = piece(1, 40);
    Catalogue catalogue_ = open_memory();
};

TEST_F(DoorMonitor, NamesWhatRuns)
{
    const Monitor monitor = new_monitor();
    EXPECT_EQ(KZCAT_OK, feed(monitor, catalogue_, first_));
    EXPECT_EQ(KZCAT_OK, kzcat_monitor_finish(monitor.get(), catalogue_.get()));
    kzcat_event event;
    ASSERT_EQ(KZCAT_OK, kzcat_monitor_next_event(monitor.get(), &event));
    EXPECT_EQ(uint32_t{KZCAT_STAGE_BEGINS}, event.stage);
    EXPECT_EQ(uint32_t{KZCAT_HEARD_TRACK}, event.heard);
    EXPECT_EQ(1, event.track);
    EXPECT_STREQ("one", event.source);
    EXPECT_STREQ("First", event.title);
    EXPECT_EQ(nullptr, event.artist);
    EXPECT_GT(event.score, event.threshold);
    EXPECT_NEAR(0, event.begin, 0.5);
    EXPECT_NEAR(event.begin, event.place_begin, 0.1);
    EXPECT_EQ(1, event.speed);
    ASSERT_EQ(KZCAT_OK, kzcat_monitor_next_event(monitor.get(), &event));
    EXPECT_EQ(uint32_t{KZCAT_STAGE_ENDS}, event.stage);
    EXPECT_NEAR(40, event.end, 0.5);
    EXPECT_EQ(KZCAT_ERROR_NOT_FOUND, kzcat_monitor_next_event(monitor.get(), &event));
    EXPECT_EQ(0, event.track);
}

TEST_F(DoorMonitor, FindsTracksThatAreAddedMeanwhile)
{
    const Monitor monitor = new_monitor();
    const auto second = piece(2, 60);
    const std::vector<int16_t> begin(second.begin(), second.begin() + 30 * kRate);
    const std::vector<int16_t> rest(second.begin() + 30 * kRate, second.end());
    EXPECT_EQ(KZCAT_OK, feed(monitor, catalogue_, begin));
    EXPECT_EQ("gap begins", events_of(monitor));
    add(catalogue_.get(), trail_of(second).get(), "two", "Second");
    EXPECT_EQ(KZCAT_OK, feed(monitor, catalogue_, rest));
    EXPECT_EQ("gap ends, track two begins", events_of(monitor));
}

TEST_F(DoorMonitor, KeepsTheNameOfATrackThatGoes)
{
    const Monitor monitor = new_monitor();
    EXPECT_EQ(KZCAT_OK, feed(monitor, catalogue_, first_));
    EXPECT_EQ(KZCAT_OK, kzcat_remove_track(catalogue_.get(), 1));
    EXPECT_EQ(KZCAT_OK, kzcat_monitor_finish(monitor.get(), catalogue_.get()));
    EXPECT_EQ("track one begins, track one ends", events_of(monitor));
}

TEST_F(DoorMonitor, ReportsWhatGoesOnWhenWanted)
{
    kzcat_monitor_options options;
    kzcat_initialize_monitor_options(&options);
    options.report_every = 10;
    const Monitor monitor = new_monitor(&options);
    EXPECT_EQ(KZCAT_OK, feed(monitor, catalogue_, first_));
    EXPECT_EQ("track one begins, track one goes on, track one goes on", events_of(monitor));
}

TEST_F(DoorMonitor, CallsOutOfOrderAreRefused)
{
    const Monitor monitor = new_monitor();
    EXPECT_EQ(KZCAT_OK, kzcat_monitor_finish(monitor.get(), catalogue_.get()));
    EXPECT_EQ(KZCAT_ERROR_ORDER, kzcat_monitor_finish(monitor.get(), catalogue_.get()));
    EXPECT_EQ(KZCAT_ERROR_ORDER, feed(monitor, catalogue_, first_));
    EXPECT_EQ(KZCAT_ERROR_ORDER, kzcat_monitor_skip(monitor.get(), catalogue_.get(), 1));
    EXPECT_EQ(KZCAT_ERROR_ORDER,
              kzcat_monitor_set_format(monitor.get(), catalogue_.get(), &kFormat));
}

TEST_F(DoorMonitor, BadArgumentsAreRefusedAndChangeNothing)
{
    const Monitor monitor = new_monitor();
    kzcat_monitor* const handle = monitor.get();
    kzcat_catalogue* const catalogue = catalogue_.get();
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_feed(nullptr, catalogue, "ab", 2));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_feed(handle, nullptr, "ab", 2));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_feed(handle, catalogue, nullptr, 2));
    EXPECT_EQ(KZCAT_OK, kzcat_monitor_feed(handle, catalogue, nullptr, 0));
    for (const double seconds : {-1.0, 86401.0, std::numeric_limits<double>::quiet_NaN()}) {
        EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_skip(handle, catalogue, seconds));
    }
    const kzcat_format unusable = {99, kRate, 1, 0};
    EXPECT_EQ(KZCAT_ERROR_FORMAT, kzcat_monitor_set_format(handle, catalogue, &unusable));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_set_format(handle, catalogue, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_finish(nullptr, catalogue));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_next_event(handle, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_monitor_free(nullptr));
    EXPECT_EQ(KZCAT_OK, feed(monitor, catalogue_, first_));
    EXPECT_EQ(KZCAT_OK, kzcat_monitor_finish(handle, catalogue));
    EXPECT_EQ("track one begins, track one ends", events_of(monitor));
}

TEST_F(DoorMonitor, OptionsOutOfRangeAreRefused)
{
    const auto refused = [](auto change) {
        kzcat_monitor_options options;
        kzcat_initialize_monitor_options(&options);
        change(options);
        const auto made = make<Monitor>(kzcat_monitor_create, &kFormat,
                                        static_cast<const kzcat_monitor_options*>(&options));
        return made.status == KZCAT_ERROR_INVALID_ARGUMENT && made.handle == nullptr;
    };
    EXPECT_TRUE(refused([](auto& options) { options.silence_level = 1; }));
    EXPECT_TRUE(refused([](auto& options) { options.silence_level = -121; }));
    EXPECT_TRUE(refused([](auto& options) { options.least_silence = 0; }));
    EXPECT_TRUE(refused([](auto& options) { options.least_gap = -1; }));
    EXPECT_TRUE(refused([](auto& options) { options.report_every = 2e9; }));
    EXPECT_TRUE(refused([](auto& options) { options.speeds = 2; }));
    EXPECT_TRUE(refused([](auto& options) { options.reserved[10] = 1; }));
    EXPECT_FALSE(refused([](auto& options) { options.least_silence = 0.5; }));
}

} // namespace
