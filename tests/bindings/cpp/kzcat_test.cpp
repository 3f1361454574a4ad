// The header for C++ over libkzcat: the same answers as the C interface, records with texts of
// their own, and callers' functions that throw.

#include <algorithm>
#include <cstdint>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <type_traits>
#include <vector>

#include <gtest/gtest.h>

#include "kzcat.hpp"
#include "support/melody.hpp"

namespace {

using Samples = std::vector<int16_t>;

constexpr uint32_t kRate = 11025;
constexpr kz::format kFormat{KZ_STREAM_FORMAT_PCM16, kRate, 1};

/// A tune, and one that is another because it is played faster.
Samples tune() { return kz::test::melody(kRate, 1, 40); }

Samples clip()
{
    const Samples whole = tune();
    return {whole.begin() + kRate * 11, whole.begin() + kRate * 23};
}

kz::catalogue two_tunes()
{
    auto made = kz::catalogue::in_memory().value();
    made.add(kz::trail::of(tune(), kRate, 1).value(), {"one.wav", -1, -1, {}},
             {{"title", "One"}, {"artist", "Someone"}})
        .value();
    made.add(kz::trail::of(tune(), 14000, 1).value(),
             {"two.wav", 7, 8, std::vector<uint8_t>(32, 9)})
        .value();
    return made;
}

TEST(CppCatalogue, NamesAClipAndItsPlace)
{
    const auto catalogue = two_tunes();
    const auto found = catalogue.recognise(kz::query::of(clip(), kRate, 1).value()).value();
    ASSERT_TRUE(found.matched());
    EXPECT_EQ("match", found.verdict());
    ASSERT_EQ(1U, found.matches.size());
    EXPECT_EQ("One", found.matches[0].title);
    EXPECT_EQ("Someone", found.matches[0].artist);
    EXPECT_EQ("one.wav", found.matches[0].source);
    EXPECT_NEAR(11.0, found.matches[0].offset, 0.1);
}

TEST(CppCatalogue, AnswersAsTheCInterface)
{
    const auto catalogue = two_tunes();
    const auto query = kz::query::of(clip(), kFormat).value();
    const auto found = catalogue.recognise(query).value();
    kzcat_result* result = nullptr;
    kzcat_match match;
    ASSERT_EQ(KZCAT_OK, kzcat_recognise(catalogue.handle(), query.handle(), nullptr, &result));
    ASSERT_EQ(KZCAT_OK, kzcat_result_get_candidate(result, 0, &match));
    ASSERT_FALSE(found.candidates.empty());
    EXPECT_EQ(match.score, found.candidates[0].score);
    EXPECT_EQ(match.offset, found.candidates[0].offset);
    EXPECT_EQ(match.clip_end, found.candidates[0].clip_end);
    kzcat_result_free(&result);
}

TEST(CppCatalogue, ListsTracksWithTheirTexts)
{
    const auto catalogue = two_tunes();
    const auto all = catalogue.tracks().value();
    ASSERT_EQ(2U, all.size());
    EXPECT_EQ("One", all[0].tag_value("title"));
    EXPECT_EQ("", all[0].tag_value("album"));
    EXPECT_NEAR(40.0, all[0].seconds(), 0.5);
    EXPECT_EQ(std::vector<uint8_t>(32, 9), all[1].sources[0].hash);
    EXPECT_EQ(8, all[1].sources[0].mtime_ns);
    EXPECT_EQ(all[1].id(), catalogue.find_source("two.wav")->id());
}

TEST(CppCatalogue, RemovesTracksAndSources)
{
    auto catalogue = two_tunes();
    catalogue.remove_source("two.wav").value();
    EXPECT_EQ(1U, catalogue.facts()->tracks);
    EXPECT_EQ(KZCAT_ERROR_NOT_FOUND, catalogue.remove_source("two.wav").error().status());
    catalogue.remove(catalogue.find_source("one.wav")->id()).value();
    EXPECT_TRUE(catalogue.tracks()->empty());
}

TEST(CppCatalogue, RefusesAHashOfAnotherSize)
{
    auto catalogue = kz::catalogue::in_memory().value();
    const auto trail = kz::trail::of(clip(), kFormat).value();
    const auto added = catalogue.add(trail, {"a", -1, -1, {1, 2, 3}});
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, added.error().status());
    EXPECT_EQ(0U, catalogue.facts()->tracks);
}

TEST(CppCatalogue, SaysWhatIsMissing)
{
    const auto opened = kz::catalogue::open("/nowhere/music.kzc");
    ASSERT_FALSE(opened);
    EXPECT_EQ(KZCAT_ERROR_CANNOT_OPEN, opened.error().status());
    EXPECT_NE(std::string::npos, std::string(opened.error().what()).find("/nowhere/music.kzc"));
}

TEST(CppCatalogue, EndsWorkWhenACallersFunctionThrows)
{
    auto catalogue = two_tunes();
    EXPECT_EQ(0U, catalogue.verify().value());
    const auto throws = [](uint64_t, uint64_t) -> bool { throw std::runtime_error("no"); };
    EXPECT_EQ(KZCAT_ERROR_CANCELLED, catalogue.verify({}, throws).error().status());
    const auto stops = [](uint64_t, uint64_t) { return false; };
    EXPECT_EQ(KZCAT_ERROR_CANCELLED, catalogue.merge(two_tunes(), stops).error().status());
    EXPECT_EQ(2U, catalogue.merge(two_tunes())->tracks_known);
}

TEST(CppCatalogue, ServesManyThreads)
{
    const auto catalogue = two_tunes();
    const auto query = kz::query::of(clip(), kFormat).value();
    std::vector<std::string> titles(4);
    std::vector<std::thread> threads;
    for (std::string& title : titles) {
        threads.emplace_back([&catalogue, &query, &title] {
            title = catalogue.recognise(query).value().matches.at(0).title;
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(std::vector<std::string>(4, "One"), titles);
}

TEST(CppCatalogue, OutlivedByWhatItGave)
{
    auto catalogue = std::make_unique<kz::catalogue>(two_tunes());
    const auto answer = catalogue->recognise(kz::query::of(clip(), kFormat).value()).value();
    const auto trail = catalogue->get_trail(answer.matches[0].track).value();
    catalogue.reset();
    EXPECT_EQ("One", answer.matches[0].title);
    EXPECT_FALSE(trail.codes()->empty());
}

TEST(CppTrail, IsTheSameFromPiecesAndFromAFile)
{
    static_assert(!std::is_copy_constructible_v<kz::trail>);
    const auto whole = kz::trail::of(tune(), kFormat).value();
    auto builder = kz::trail_builder::create(kFormat).value();
    const Samples samples = tune();
    for (size_t at = 0; at < samples.size(); at += 777) {
        builder.feed({samples.data() + at, std::min<size_t>(777, samples.size() - at)}).value();
    }
    EXPECT_EQ(whole.cut(0, 9)->codes().value(), builder.so_far()->cut(0, 9)->codes().value());
    EXPECT_EQ(whole.codes().value(), builder.finish()->codes().value());
    EXPECT_EQ(whole.codes().value(), kz::trail::read(whole.write().value())->codes().value());
    EXPECT_EQ(10U, whole.cut(5, 10)->facts()->code_count);
    EXPECT_EQ(0.0, kz::align(whole, whole)->error_rate);
}

TEST(CppTrail, RefusesSamplesOfAnotherType)
{
    auto builder = kz::trail_builder::create(kFormat).value();
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, builder.feed(std::vector<double>(10)).error().status());
    EXPECT_EQ(KZCAT_ERROR_NOT_READABLE, kz::trail::read(std::string("no trail")).error().status());
}

TEST(CppQuery, IsMadeOfTrailsAndFingerprints)
{
    auto catalogue = kz::catalogue::in_memory().value();
    const auto trail = kz::trail::of(tune(), kFormat, true).value();
    catalogue.add(trail, {"one.wav"}, {{"title", "One"}}).value();
    const auto numbers = kz::fingerprint_of(tune(), kRate, 1).value();
    const auto by_trail = catalogue.recognise(kz::query::of(*trail.cut(50, 80)).value()).value();
    EXPECT_TRUE(by_trail.matched());
    for (auto query : {0, 1}) {
        const auto document = query == 0 ? kz::query::of_fingerprint(numbers)
                                         : kz::query::of_document(numbers.document);
        const auto found = catalogue.recognise(*document).value();
        EXPECT_EQ(uint32_t{KZCAT_BY_DOCUMENT}, found.summary.by);
        EXPECT_TRUE(found.matched());
    }
    EXPECT_EQ(KZCAT_ERROR_NOT_READABLE, kz::query::of_document("<no/>").error().status());
}

TEST(CppMonitor, ReportsWhatRan)
{
    const auto catalogue = two_tunes();
    auto monitor = kz::monitor::create(kFormat).value();
    auto events = monitor.feed(catalogue, tune()).value();
    for (auto& event : monitor.finish(catalogue).value()) {
        events.push_back(event);
    }
    ASSERT_GE(events.size(), 2U);
    EXPECT_EQ("One", events[0].title);
    EXPECT_EQ(nullptr, events[0].facts.title);
    EXPECT_EQ(uint32_t{KZCAT_STAGE_ENDS}, events.back().facts.stage);
    EXPECT_EQ(KZCAT_ERROR_ORDER, monitor.feed(catalogue, tune()).error().status());
}

} // namespace
