// A stream goes in, what ran from when to when comes out.

#include "catalogue/monitor/monitor.hpp"

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/match/musical_corpus.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using namespace kzcat::test;

/// An entry as it should be: track 0 is a gap, -1 silence.
struct Expected {
    int64_t track;
    double begin;
    double end;
    double place = 0; ///< of the track at the entry's begin
};
constexpr int64_t kGap = 0;
constexpr int64_t kSilence = -1;

Samples silence(double seconds) { return Samples(samples_in(seconds)); }

Samples joined(const std::vector<Samples>& parts)
{
    Samples sound;
    for (const Samples& part : parts) {
        sound.insert(sound.end(), part.begin(), part.end());
    }
    return sound;
}

/// Adds noise to a part of a sound.
void drown(Samples& sound, double begin, double seconds, double level)
{
    const auto noise = kz::test::noise(samples_in(seconds), level, 5);
    for (size_t i = 0; i < noise.size(); ++i) {
        int16_t& sample = sound[samples_in(begin) + i];
        sample = static_cast<int16_t>(std::clamp(sample / 2 + noise[i], -32768, 32767));
    }
}

class Stream {
public:
    explicit Stream(const MonitorOptions& options = {}, const SoundFormat& format = mono())
        : monitor_(format, options)
    {
    }

    void feed(std::span<const std::byte> bytes) { monitor_.feed(bytes, with_); }
    void feed(const Samples& sound) { feed(std::as_bytes(std::span(sound))); }
    void set_format(const SoundFormat& format) { monitor_.set_format(format, with_); }
    void skip(double seconds) { monitor_.skip(seconds, with_); }
    std::vector<MonitorEvent> finish()
    {
        monitor_.finish(with_);
        return {monitor_.events().begin(), monitor_.events().end()};
    }
    Monitor& monitor() { return monitor_; }

private:
    ScanSearcher searcher_{pieces().corpus()};
    Monitor::WithSearcher with_ = [this](const auto& use) { use(searcher_); };
    Monitor monitor_;
};

std::vector<MonitorEvent> events_of(const Samples& sound, const MonitorOptions& options = {})
{
    Stream stream(options);
    stream.feed(sound);
    return stream.finish();
}

std::vector<MonitorEvent> ended(const std::vector<MonitorEvent>& events)
{
    std::vector<MonitorEvent> result;
    for (const MonitorEvent& event : events) {
        if (event.stage == Stage::ends) {
            result.push_back(event);
        }
    }
    return result;
}

int64_t kind_of(const MonitorEvent& event)
{
    switch (event.heard) {
    case Heard::track:
        return event.track.track;
    case Heard::silence:
        return kSilence;
    default:
        return kGap;
    }
}

std::string text_of(const std::vector<MonitorEvent>& entries)
{
    std::string text;
    for (const MonitorEvent& entry : entries) {
        text += std::to_string(kind_of(entry)) + ": " + std::to_string(entry.begin) + " - " +
                std::to_string(entry.end) + " at " + std::to_string(entry.track.place_begin) + "\n";
    }
    return text;
}

void expect_entries(const std::vector<Expected>& expected, const std::vector<MonitorEvent>& events)
{
    const auto entries = ended(events);
    ASSERT_EQ(expected.size(), entries.size()) << text_of(entries);
    for (size_t i = 0; i < expected.size(); ++i) {
        EXPECT_EQ(expected[i].track, kind_of(entries[i])) << text_of(entries);
        EXPECT_NEAR(expected[i].begin, entries[i].begin, 1.5) << text_of(entries);
        EXPECT_NEAR(expected[i].end, entries[i].end, 1.5) << text_of(entries);
        if (expected[i].track > 0) {
            const double beside = entries[i].begin - expected[i].begin;
            EXPECT_NEAR(expected[i].place + beside, entries[i].track.place_begin, 0.1)
                << text_of(entries);
        }
    }
}

TEST(Monitoring, TwoMinutesHaveTheirTimeline)
{
    Samples noisy = part_of(piece(1), 5, 25);
    drown(noisy, 0, 25, 0.05);
    const auto events =
        events_of(joined({part_of(piece(0), 0, 25), part_of(piece(20), 5, 20), silence(8), noisy,
                          part_of(piece(2), 0, 20), part_of(piece(0), 10, 22)}));
    expect_entries({{1, 0, 25, 0},
                    {kGap, 25, 45},
                    {kSilence, 45, 53},
                    {2, 53, 78, 5},
                    {3, 78, 98, 0},
                    {1, 98, 120, 10}},
                   events);
    EXPECT_EQ(1U, events.back().track.repeat);
}

TEST(Monitoring, ATrackIsReportedSoonAfterItBegan)
{
    const auto events = events_of(joined({part_of(piece(20), 0, 20), part_of(piece(4), 0, 40)}));
    for (const MonitorEvent& event : events) {
        EXPECT_LE(event.known - (event.stage == Stage::ends ? event.end : event.begin), 30);
        if (event.heard == Heard::track && event.stage == Stage::begins) {
            EXPECT_LT(event.known, 20 + 16);
        }
    }
}

TEST(Monitoring, CutsMakeNoDifference)
{
    const Samples sound = joined({part_of(piece(3), 7, 25), silence(4), part_of(piece(21), 0, 12)});
    const std::string whole = text_of(events_of(sound));
    EXPECT_NE("", whole);
    for (uint64_t seed = 1; seed <= 2; ++seed) {
        kz::test::Random random(seed);
        Stream stream;
        for (auto left = std::as_bytes(std::span(sound)); !left.empty();) {
            const size_t count = std::min<size_t>(1 + random.below(20000), left.size());
            stream.feed(left.first(count));
            left = left.subspan(count);
        }
        EXPECT_EQ(whole, text_of(stream.finish()));
    }
}

TEST(Monitoring, ABadPassageDoesNotSplitATrack)
{
    Samples sound = part_of(piece(5), 0, 55);
    drown(sound, 22, 10, 0.5);
    expect_entries({{6, 0, 55, 0}}, events_of(sound));
}

TEST(Monitoring, ACrossfadeLetsTracksOverlap)
{
    constexpr double kFade = 6;
    const Samples first = part_of(piece(5), 10, 30);
    const Samples second = part_of(piece(6), 0, 30);
    Samples sound =
        joined({first, Samples(second.begin() + static_cast<std::ptrdiff_t>(samples_in(kFade)),
                               second.end())});
    const size_t count = samples_in(kFade);
    for (size_t i = 0; i < count; ++i) {
        const double share = static_cast<double>(i) / static_cast<double>(count);
        sound[samples_in(30 - kFade) + i] = static_cast<int16_t>(
            first[samples_in(30 - kFade) + i] * (1 - share) + second[i] * share);
    }
    const auto entries = ended(events_of(sound));
    ASSERT_EQ(2U, entries.size()) << text_of(entries);
    EXPECT_EQ(6, kind_of(entries[0]));
    EXPECT_EQ(7, kind_of(entries[1]));
    EXPECT_NEAR(27, entries[0].end, 3.5);
    EXPECT_NEAR(27, entries[1].begin, 3.5);
    EXPECT_NEAR(54, entries[1].end, 1);
}

TEST(Monitoring, TheSameTrackFromItsBeginningIsARepeat)
{
    const auto events = events_of(joined({part_of(piece(7), 0, 30), part_of(piece(7), 0, 30)}));
    expect_entries({{8, 0, 30, 0}, {8, 30, 60, 0}}, events);
    EXPECT_EQ(1U, events.back().track.repeat);
}

TEST(Monitoring, LostSoundDoesNotEndATrack)
{
    expect_entries({{8, 0, 43, 0}},
                   events_of(joined({part_of(piece(7), 0, 20), part_of(piece(7), 23, 23)})));
}

TEST(Monitoring, TracksAreFollowedAtAnotherSpeed)
{
    const SoundFormat faster = mono(kWorkingRate * 104 / 100);
    Stream stream({}, faster);
    stream.feed(piece(2));
    const auto entries = ended(stream.finish());
    ASSERT_EQ(1U, entries.size()) << text_of(entries);
    EXPECT_EQ(3, kind_of(entries[0]));
    EXPECT_NEAR(1.04, entries[0].track.speed, 0.005);
    EXPECT_NEAR(0, entries[0].begin, 1.5);
    EXPECT_NEAR(60 / 1.04, entries[0].end, 1.5);
}

TEST(Monitoring, AnotherFormatChangesNothing)
{
    Stream stream;
    const Samples sound = part_of(piece(4), 0, 50);
    const Samples begin = part_of(sound, 0, 24);
    stream.feed(begin);
    std::vector<float> wide;
    for (size_t i = begin.size(); i < sound.size(); ++i) {
        wide.insert(wide.end(), 2, static_cast<float>(sound[i]) / 32768);
    }
    stream.set_format({.encoding = KZ_STREAM_FORMAT_FLOAT32, .rate = kWorkingRate, .channels = 2});
    stream.feed(std::as_bytes(std::span(wide)));
    expect_entries({{5, 0, 50, 0}}, stream.finish());
}

TEST(Monitoring, AFormatThatCannotBeUsedChangesNothing)
{
    Stream stream;
    stream.feed(part_of(piece(4), 0, 15));
    EXPECT_THROW(stream.set_format({.encoding = 99, .rate = 0, .channels = 0}),
                 std::invalid_argument);
    stream.feed(part_of(piece(4), 15, 15));
    expect_entries({{5, 0, 30, 0}}, stream.finish());
}

TEST(Monitoring, TimesStayExactForDays)
{
    constexpr double kDays = 5;
    Stream stream;
    stream.feed(part_of(piece(1), 0, 20));
    for (int day = 0; day < static_cast<int>(kDays); ++day) {
        stream.skip(86400);
    }
    stream.feed(part_of(piece(2), 0, 30));
    const double begin = 20 + kDays * 86400; // more than 2^32 samples at the working rate
    expect_entries({{2, 0, 20, 0}, {kSilence, 20, begin}, {3, begin, begin + 30, 0}},
                   stream.finish());
    EXPECT_NEAR(begin + 30, stream.monitor().seconds(), 0.01);
}

TEST(Monitoring, NothingHasNoEntries)
{
    EXPECT_TRUE(events_of({}).empty());
    EXPECT_TRUE(events_of(Samples(100, 1000)).empty());
}

TEST(Monitoring, AStreamThatIsShorterThanAWindowIsSearched)
{
    expect_entries({{4, 0, 9, 20}}, events_of(part_of(piece(3), 20, 9)));
}

TEST(Monitoring, SilenceIsSilence) { expect_entries({{kSilence, 0, 40}}, events_of(silence(40))); }

TEST(Monitoring, StrangersAreGaps)
{
    for (size_t number = 30; number < 33; ++number) {
        expect_entries({{kGap, 0, 60}}, events_of(piece(number)));
    }
    expect_entries({{kGap, 0, 60}}, events_of(kz::test::noise(samples_in(60), 0.3, 1)));
}

TEST(Monitoring, GoesOnWhenTheCatalogueCouldNotBeRead)
{
    ScanSearcher searcher(pieces().corpus());
    int calls = 0;
    const Monitor::WithSearcher with = [&](const auto& use) {
        if (++calls % 2 == 1) {
            throw std::runtime_error("busy");
        }
        use(searcher);
    };
    Monitor monitor(mono(), {});
    const Samples sound = part_of(piece(3), 0, 40);
    size_t failures = 0;
    for (auto left = std::as_bytes(std::span(sound)); !left.empty();) {
        const size_t count = std::min<size_t>(22050, left.size());
        try {
            monitor.feed(left.first(count), with);
        } catch (const std::runtime_error&) {
            ++failures;
        }
        left = left.subspan(count);
    }
    EXPECT_GT(failures, 0U);
    calls = 1;
    monitor.finish(with);
    expect_entries({{4, 0, 40, 0}}, {monitor.events().begin(), monitor.events().end()});
}

} // namespace
