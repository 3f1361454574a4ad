// What every store promises, whatever it keeps its tracks in. Included once by a test program,
// which has defined kzcat::test::Places: types with a member `store`, each object of which is an
// empty catalogue of its own.
#pragma once

#include <algorithm>
#include <chrono>
#include <limits>
#include <memory>
#include <optional>
#include <set>

#include <gtest/gtest.h>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/rules.hpp"
#include "catalogue/store/store.hpp"
#include "tests/catalogue/store/tracks.hpp"

namespace kzcat::test {
namespace {

template <class Place>
class EveryStore : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (place_.store == nullptr) {
            GTEST_SKIP() << "no server can be started here";
        }
    }

    Store& store() { return *place_.store; }

    TrackInfo info(int64_t track) { return store().find_track(track).value(); }

    void expect_error(StoreError::Kind kind, const std::function<void()>& act)
    {
        try {
            act();
            FAIL() << "nothing was thrown";
        } catch (const StoreError& error) {
            EXPECT_EQ(kind, error.kind()) << error.what();
        }
    }

    void expect_refused(const NewTrack& track, StoreError::Kind kind = StoreError::Kind::invalid)
    {
        const std::vector<NewTrack> batch = {make_track(1), track};
        expect_error(kind, [&] { store().add(batch); });
        EXPECT_EQ(0U, store().track_count());
        EXPECT_EQ(0, store().last_change());
        EXPECT_FALSE(store().find_source(make_source(1).uri));
    }

private:
    Place place_;
};

TYPED_TEST_SUITE(EveryStore, Places);

TYPED_TEST(EveryStore, BeginsEmpty)
{
    Store& store = this->store();
    EXPECT_EQ(0U, store.track_count());
    EXPECT_EQ(0U, store.code_count());
    EXPECT_EQ(0, store.last_change());
    EXPECT_TRUE(store.changes(0, 10).empty());
    EXPECT_TRUE(track_ids(store).empty());
    EXPECT_EQ(std::nullopt, store.find_track(1));
    EXPECT_EQ(std::nullopt, store.trail(1));
    EXPECT_EQ(std::nullopt, store.document_bands(1));
    EXPECT_FALSE(store.find_source("x"));
    EXPECT_FALSE(store.find_hash(make_hash(1)));
    EXPECT_FALSE(store.remove(1));
    EXPECT_FALSE(store.remove_source("x"));
    EXPECT_TRUE(faults(store).empty());
    EXPECT_EQ(Profile::standard, store.profile());
}

TYPED_TEST(EveryStore, GivesBackWhatWasAdded)
{
    Store& store = this->store();
    NewTrack track = make_track(7);
    track.document_bands = make_bands(7);
    track.added = 1'600'000'000;
    const Added added = add(store, track);
    EXPECT_TRUE(added.is_new);
    EXPECT_TRUE(added.has_source);
    const TrackInfo info = this->info(added.track);
    EXPECT_EQ(added.track, info.id);
    EXPECT_EQ(content_key(track.trail), info.key);
    EXPECT_EQ(Profile::standard, info.profile);
    EXPECT_EQ(track.trail.samples, info.samples);
    EXPECT_EQ(track.trail.codes.size(), info.codes);
    EXPECT_TRUE(info.has_document_bands);
    EXPECT_EQ(1'600'000'000, info.added);
    EXPECT_EQ(track.tags, info.tags);
    EXPECT_EQ(std::vector{track.source}, info.sources);
    EXPECT_EQ(track.trail, store.trail(added.track));
    EXPECT_EQ(track.document_bands, store.document_bands(added.track));
}

TYPED_TEST(EveryStore, CountsTracksAndCodes)
{
    add_tracks(this->store(), 1, 3);
    EXPECT_EQ(3U, this->store().track_count());
    EXPECT_EQ(150U, this->store().code_count());
    this->store().remove(1);
    EXPECT_EQ(2U, this->store().track_count());
    EXPECT_EQ(100U, this->store().code_count());
}

TYPED_TEST(EveryStore, DatesWhatHasNoDate)
{
    const int64_t before = seconds_now();
    const Added added = add(this->store(), make_track(1));
    EXPECT_LE(before, this->info(added.track).added);
    EXPECT_GE(seconds_now(), this->info(added.track).added);
}

TYPED_TEST(EveryStore, KeepsTrailsOfAnyLength)
{
    for (const size_t codes : {size_t{0}, size_t{1}, size_t{127}, size_t{1000}, size_t{100'000}}) {
        const NewTrack track = make_track(codes, codes);
        EXPECT_EQ(track.trail, this->store().trail(add(this->store(), track).track)) << codes;
    }
    EXPECT_TRUE(faults(this->store()).empty());
}

TYPED_TEST(EveryStore, HasNoBandsUnlessGiven)
{
    const Added added = add(this->store(), make_track(1));
    EXPECT_FALSE(this->info(added.track).has_document_bands);
    EXPECT_EQ(std::nullopt, this->store().document_bands(added.track));
}

TYPED_TEST(EveryStore, JoinsTheSameFeatures)
{
    const NewTrack first = make_track(1);
    NewTrack second = first;
    second.source = make_source(2);
    const Added one = add(this->store(), first);
    const Added two = add(this->store(), second);
    EXPECT_FALSE(two.is_new);
    EXPECT_EQ(one.track, two.track);
    EXPECT_EQ(1U, this->store().track_count());
    EXPECT_EQ((std::vector{first.source, second.source}), this->info(one.track).sources);
    EXPECT_EQ(1, this->store().last_change());
}

TYPED_TEST(EveryStore, JoinsTheSameFeaturesInABatch)
{
    std::vector<NewTrack> batch(2, make_track(1));
    batch[1].source = make_source(2);
    const std::vector<Added> added = this->store().add(batch);
    EXPECT_TRUE(added[0].is_new);
    EXPECT_FALSE(added[1].is_new);
    EXPECT_EQ(added[0].track, added[1].track);
    EXPECT_EQ(2U, this->info(added[0].track).sources.size());
}

TYPED_TEST(EveryStore, TellsTrailsApartByTheirSamples)
{
    NewTrack longer = make_track(1);
    longer.trail.samples += 1;
    longer.source = make_source(2);
    EXPECT_NE(add(this->store(), make_track(1)).track, add(this->store(), longer).track);
}

TYPED_TEST(EveryStore, AnotherSourceAddsMissingTagsOnly)
{
    NewTrack second = make_track(1);
    second.source = make_source(2);
    second.tags = {{"title", "Other"}, {"album", "A"}};
    const int64_t track = add(this->store(), make_track(1)).track;
    add(this->store(), second);
    EXPECT_EQ((std::vector<Tag>{{"title", "Track 1"}, {"artist", "Nobody"}, {"album", "A"}}),
              this->info(track).tags);
}

TYPED_TEST(EveryStore, TheSameSourceReplacesTheTags)
{
    NewTrack again = make_track(1);
    again.tags = {{"title", "Corrected"}};
    again.source.mtime_ns += 1;
    again.source.hash = make_hash(99);
    const int64_t track = add(this->store(), make_track(1)).track;
    add(this->store(), again);
    EXPECT_EQ(again.tags, this->info(track).tags);
    EXPECT_EQ(std::vector{again.source}, this->info(track).sources);
    again.tags.clear();
    add(this->store(), again);
    EXPECT_EQ(1U, this->info(track).tags.size()) << "no tags given: the known ones stay";
}

TYPED_TEST(EveryStore, KeepsSeveralTagsOfOneName)
{
    NewTrack track = make_track(1);
    track.tags = {{"artist", "A"}, {"artist", "B"}, {"artist", "A"}, {"note", ""}};
    EXPECT_EQ(track.tags, this->info(add(this->store(), track).track).tags);
}

TYPED_TEST(EveryStore, GainsDocumentBandsLater)
{
    NewTrack track = make_track(1);
    const int64_t id = add(this->store(), track).track;
    track.document_bands = make_bands(1);
    add(this->store(), track);
    EXPECT_EQ(track.document_bands, this->store().document_bands(id));
    EXPECT_TRUE(this->info(id).has_document_bands);
    track.document_bands = make_bands(2);
    add(this->store(), track);
    EXPECT_EQ(make_bands(1), this->store().document_bands(id)) << "the first stay";
}

TYPED_TEST(EveryStore, AnOverwrittenFileTakesItsPlace)
{
    NewTrack other = make_track(2);
    other.source.uri = make_source(1).uri;
    const int64_t old = add(this->store(), make_track(1)).track;
    const int64_t now = add(this->store(), other).track;
    EXPECT_NE(old, now);
    EXPECT_EQ(std::vector{now}, track_ids(this->store()));
    EXPECT_EQ(now, this->store().find_source(other.source.uri)->track);
    EXPECT_EQ(3, this->store().last_change());
}

TYPED_TEST(EveryStore, AnOverwrittenFileLeavesOtherCopies)
{
    const int64_t old = add(this->store(), make_track(1)).track;
    this->store().add_source(old, make_source(5));
    NewTrack other = make_track(2);
    other.source.uri = make_source(1).uri;
    add(this->store(), other);
    EXPECT_EQ(std::vector{make_source(5)}, this->info(old).sources);
}

TYPED_TEST(EveryStore, AYieldingSourceStaysWhereItIs)
{
    NewTrack other = make_track(2);
    other.source.uri = make_source(1).uri;
    other.yields = true;
    const int64_t old = add(this->store(), make_track(1)).track;
    const Added added = add(this->store(), other);
    EXPECT_TRUE(added.is_new);
    EXPECT_FALSE(added.has_source);
    EXPECT_EQ(old, this->store().find_source(other.source.uri)->track);
    EXPECT_TRUE(this->info(added.track).sources.empty());
    EXPECT_TRUE(add(this->store(), make_track(1)).has_source) << "its own is no conflict";
}

TYPED_TEST(EveryStore, AYieldingTrackOnlyAddsToWhatIsKnown)
{
    const int64_t id = add(this->store(), make_track(1)).track;
    NewTrack again = make_track(1);
    again.tags = {{"title", "Other"}, {"album", "A"}};
    again.source.size = 5;
    again.yields = true;
    add(this->store(), again);
    EXPECT_EQ(std::vector{make_source(1)}, this->info(id).sources);
    EXPECT_EQ((std::vector<Tag>{{"title", "Track 1"}, {"artist", "Nobody"}, {"album", "A"}}),
              this->info(id).tags);
}

TYPED_TEST(EveryStore, KeepsTracksWithoutSources)
{
    NewTrack track = make_track(1);
    track.source = {};
    const int64_t id = add(this->store(), track).track;
    EXPECT_TRUE(this->info(id).sources.empty());
    EXPECT_FALSE(this->store().find_source(""));
    EXPECT_TRUE(faults(this->store()).empty());
    this->store().add_source(id, make_source(1));
    EXPECT_EQ(1U, this->info(id).sources.size());
}

TYPED_TEST(EveryStore, AddsSourcesToATrack)
{
    const int64_t one = add(this->store(), make_track(1)).track;
    const int64_t two = add(this->store(), make_track(2)).track;
    const Source bare{.uri = "elsewhere", .size = -1, .mtime_ns = -1, .hash = std::nullopt};
    this->store().add_source(one, bare);
    EXPECT_EQ((std::vector{make_source(1), bare}), this->info(one).sources);
    this->store().add_source(one, make_source(2));
    EXPECT_EQ(3U, this->info(one).sources.size());
    EXPECT_EQ(std::nullopt, this->store().find_track(two)) << "its only source moved";
    this->expect_error(StoreError::Kind::not_found,
                       [&] { this->store().add_source(two, make_source(9)); });
    EXPECT_FALSE(this->store().find_source(make_source(9).uri));
}

TYPED_TEST(EveryStore, ARefreshedSourceKeepsItsPlace)
{
    const int64_t id = add(this->store(), make_track(1)).track;
    this->store().add_source(id, make_source(2));
    Source again = make_source(1);
    again.size = 5;
    again.hash.reset();
    this->store().add_source(id, again);
    EXPECT_EQ((std::vector{again, make_source(2)}), this->info(id).sources);
}

TYPED_TEST(EveryStore, FindsSourcesByPathAndHash)
{
    add_tracks(this->store(), 1, 3);
    const auto by_uri = this->store().find_source(make_source(2).uri);
    ASSERT_TRUE(by_uri);
    EXPECT_EQ(make_source(2), by_uri->source);
    const auto by_hash = this->store().find_hash(make_hash(2));
    ASSERT_TRUE(by_hash);
    EXPECT_EQ(by_uri->track, by_hash->track);
    EXPECT_EQ(make_source(2), by_hash->source);
    EXPECT_FALSE(this->store().find_source("Music/2.fla"));
    EXPECT_FALSE(this->store().find_hash(make_hash(50)));
}

TYPED_TEST(EveryStore, PathsAreAnyBytes)
{
    NewTrack track = make_track(1);
    track.source.uri = "a\xff\xfe'\"\n% ?#.mp3";
    const int64_t id = add(this->store(), track).track;
    EXPECT_EQ(id, this->store().find_source(track.source.uri)->track);
    EXPECT_EQ(track.source, this->info(id).sources.at(0));
    EXPECT_TRUE(faults(this->store()).empty());
}

TYPED_TEST(EveryStore, RemovesATrackWithItsSources)
{
    const int64_t id = add(this->store(), make_track(1)).track;
    this->store().add_source(id, make_source(2));
    EXPECT_TRUE(this->store().remove(id));
    EXPECT_FALSE(this->store().remove(id));
    EXPECT_EQ(std::nullopt, this->store().find_track(id));
    EXPECT_EQ(std::nullopt, this->store().trail(id));
    EXPECT_FALSE(this->store().find_source(make_source(1).uri));
    EXPECT_FALSE(this->store().find_source(make_source(2).uri));
    EXPECT_TRUE(faults(this->store()).empty());
}

TYPED_TEST(EveryStore, RemovesATrackWithItsLastSource)
{
    const int64_t id = add(this->store(), make_track(1)).track;
    this->store().add_source(id, make_source(2));
    EXPECT_TRUE(this->store().remove_source(make_source(1).uri));
    EXPECT_EQ(std::vector{make_source(2)}, this->info(id).sources);
    EXPECT_FALSE(this->store().remove_source(make_source(1).uri));
    EXPECT_TRUE(this->store().remove_source(make_source(2).uri));
    EXPECT_EQ(std::nullopt, this->store().find_track(id));
}

TYPED_TEST(EveryStore, NeverGivesAnIdTwice)
{
    const int64_t first = add(this->store(), make_track(1)).track;
    this->store().remove(first);
    const int64_t again = add(this->store(), make_track(1)).track;
    EXPECT_GT(first, 0);
    EXPECT_GT(again, first);
}

TYPED_TEST(EveryStore, VisitsTracksInOrderOfIds)
{
    const std::vector<Added> added = add_tracks(this->store(), 1, 6);
    this->store().remove(added[2].track);
    const std::vector<int64_t> all = track_ids(this->store());
    EXPECT_EQ(5U, all.size());
    EXPECT_TRUE(std::is_sorted(all.begin(), all.end()));
    EXPECT_EQ((std::vector{added[4].track, added[5].track}),
              track_ids(this->store(), added[3].track));
    EXPECT_EQ(3U, track_ids(this->store(), added[2].track).size()) << "after one that is gone";
    EXPECT_TRUE(track_ids(this->store(), std::numeric_limits<int64_t>::max()).empty());
    EXPECT_EQ(5U, track_ids(this->store(), std::numeric_limits<int64_t>::min()).size());
}

TYPED_TEST(EveryStore, VisitsStopWhenTold)
{
    add_tracks(this->store(), 1, 5);
    int tracks = 0;
    this->store().visit_tracks(0, [&](const TrackInfo&) { return ++tracks < 2; });
    EXPECT_EQ(2, tracks);
    int trails = 0;
    this->store().visit_trails(0, [&](int64_t, const Trail&) { return ++trails < 3; });
    EXPECT_EQ(3, trails);
    int checked = 0;
    this->store().verify([](const Fault&) {}, [&](uint64_t, uint64_t) { return ++checked < 2; });
    EXPECT_EQ(2, checked);
}

TYPED_TEST(EveryStore, VisitsMayLookAtTheStore)
{
    add_tracks(this->store(), 1, 5);
    size_t seen = 0;
    this->store().visit_tracks(0, [&](const TrackInfo& info) {
        EXPECT_EQ(info.codes, this->store().trail(info.id)->codes.size());
        seen += track_ids(this->store(), info.id).size();
        return true;
    });
    EXPECT_EQ(10U, seen);
}

TYPED_TEST(EveryStore, VisitsEveryTrail)
{
    const std::vector<Added> added = add_tracks(this->store(), 1, 4);
    uint64_t number = 2;
    this->store().visit_trails(added[0].track, [&](int64_t track, const Trail& trail) {
        EXPECT_EQ(added[number - 1].track, track);
        EXPECT_EQ(make_trail(number), trail);
        ++number;
        return true;
    });
    EXPECT_EQ(5U, number);
}

TYPED_TEST(EveryStore, LogsWhatComesAndGoes)
{
    const std::vector<Added> added = add_tracks(this->store(), 1, 2);
    this->store().remove(added[0].track);
    const std::vector<Change> changes = this->store().changes(0, 100);
    ASSERT_EQ(3U, changes.size());
    EXPECT_EQ(added[0].track, changes[0].track);
    EXPECT_EQ(added[1].track, changes[1].track);
    EXPECT_EQ(added[0].track, changes[2].track);
    EXPECT_EQ(ChangeKind::added, changes[1].kind);
    EXPECT_EQ(ChangeKind::removed, changes[2].kind);
    EXPECT_LT(changes[0].cursor, changes[1].cursor);
    EXPECT_LT(changes[1].cursor, changes[2].cursor);
    EXPECT_EQ(changes[2].cursor, this->store().last_change());
}

TYPED_TEST(EveryStore, GivesChangesAfterACursor)
{
    add_tracks(this->store(), 1, 10);
    const std::vector<Change> all = this->store().changes(0, 100);
    const std::vector<Change> some = this->store().changes(all[3].cursor, 2);
    ASSERT_EQ(2U, some.size());
    EXPECT_EQ(all[4].cursor, some[0].cursor);
    EXPECT_EQ(all[4].mark, some[0].mark);
    EXPECT_EQ(all[5].track, some[1].track);
    EXPECT_TRUE(this->store().changes(all[9].cursor, 2).empty());
    EXPECT_TRUE(this->store().changes(0, 0).empty());
    EXPECT_TRUE(this->store().changes(std::numeric_limits<int64_t>::max(), 1).empty());
    EXPECT_EQ(10U, this->store().changes(-5, std::numeric_limits<size_t>::max()).size());
}

TYPED_TEST(EveryStore, MarksChangesAtRandom)
{
    add_tracks(this->store(), 1, 20);
    std::set<uint32_t> marks;
    for (const Change& change : this->store().changes(0, 100)) {
        marks.insert(change.mark);
    }
    EXPECT_GT(marks.size(), 18U);
}

TYPED_TEST(EveryStore, HasAnIdOfItsOwn)
{
    const std::string id = this->store().catalogue_id();
    EXPECT_EQ(32U, id.size());
    EXPECT_EQ(std::string::npos, id.find_first_not_of("0123456789abcdef"));
    EXPECT_EQ(id, this->store().catalogue_id());
    const TypeParam other;
    EXPECT_NE(id, other.store->catalogue_id());
}

TYPED_TEST(EveryStore, KeepsSettings)
{
    EXPECT_EQ(std::nullopt, this->store().setting("threshold"));
    this->store().set_setting("threshold", "10.5");
    this->store().set_setting("empty", "");
    EXPECT_EQ("10.5", this->store().setting("threshold"));
    EXPECT_EQ("", this->store().setting("empty"));
    this->store().set_setting("threshold", "11");
    EXPECT_EQ("11", this->store().setting("threshold"));
    this->expect_error(StoreError::Kind::invalid, [&] { this->store().set_setting("", "x"); });
}

TYPED_TEST(EveryStore, SettingsCannotHideItsOwn)
{
    const std::string id = this->store().catalogue_id();
    for (const char* name : {"catalogue_id", "profile", "id"}) {
        this->store().set_setting(name, "mine");
        EXPECT_EQ("mine", this->store().setting(name));
    }
    EXPECT_EQ(id, this->store().catalogue_id());
    EXPECT_EQ(Profile::standard, this->store().profile());
}

TYPED_TEST(EveryStore, RefusesAnotherProfile)
{
    NewTrack track = make_track(2);
    track.trail.profile = static_cast<Profile>(77);
    this->expect_refused(track, StoreError::Kind::other_profile);
}

TYPED_TEST(EveryStore, RefusesTagsThatAreNotText)
{
    for (const char* text : {"\xff", "\xc3", "\xe2\x82", "\xed\xa0\x80", "\xc0\x80",
                             "\xf4\x90\x80\x80", "\xf5\x80\x80\x80", "a\x80", "\xe0\x80\x80"}) {
        NewTrack track = make_track(2);
        track.tags = {{"title", text}};
        this->expect_refused(track);
        track.tags = {{text, "title"}};
        this->expect_refused(track);
    }
}

TYPED_TEST(EveryStore, KeepsTextOfEveryScript)
{
    NewTrack track = make_track(2);
    track.tags = {
        {"title", "\xc3\xa9 \xe2\x82\xac \xed\x9f\xbf \xf0\x9f\x8e\xb5 \xf4\x8f\xbf\xbf"}};
    EXPECT_EQ(track.tags, this->info(add(this->store(), track).track).tags);
}

TYPED_TEST(EveryStore, RefusesTextWithNul)
{
    using namespace std::string_literals;
    NewTrack track = make_track(2);
    track.tags = {{"title", "a\0b"s}};
    this->expect_refused(track);
    track = make_track(2);
    track.source.uri = "a\0b"s;
    this->expect_refused(track);
    this->expect_error(StoreError::Kind::invalid, [&] { this->store().set_setting("a\0"s, "x"); });
}

TYPED_TEST(EveryStore, RefusesNamelessTags)
{
    NewTrack track = make_track(2);
    track.tags = {{"", "x"}};
    this->expect_refused(track);
}

TYPED_TEST(EveryStore, RefusesPartsOfBandFrames)
{
    NewTrack track = make_track(2);
    track.document_bands.resize(16);
    this->expect_refused(track);
}

TYPED_TEST(EveryStore, RefusesTextsBeyondTheLimit)
{
    NewTrack track = make_track(2);
    track.source.uri.assign(kMaxText + 1, 'a');
    this->expect_refused(track);
    track.source.uri.pop_back();
    EXPECT_NO_THROW(add(this->store(), track));
}

TYPED_TEST(EveryStore, RefusesMoreSamplesThanCanBe)
{
    NewTrack track = make_track(2);
    track.trail.samples = uint64_t{1} << 63U;
    this->expect_refused(track);
    track.trail.samples -= 1;
    EXPECT_EQ(track.trail, this->store().trail(add(this->store(), track).track));
}

TYPED_TEST(EveryStore, AddingNothingChangesNothing)
{
    EXPECT_TRUE(this->store().add({}).empty());
    EXPECT_EQ(0, this->store().last_change());
}

TYPED_TEST(EveryStore, OneBatchMayMoveAFileTwice)
{
    NewTrack first = make_track(1);
    NewTrack second = make_track(2);
    NewTrack third = make_track(1);
    second.source = first.source;
    const std::vector<Added> added = this->store().add(std::vector{first, second, third});
    EXPECT_TRUE(added[2].is_new) << "its first copy went when the file became another";
    EXPECT_EQ(std::vector{added[2].track}, track_ids(this->store()));
    EXPECT_EQ(5, this->store().last_change());
    EXPECT_TRUE(faults(this->store()).empty());
}

TYPED_TEST(EveryStore, VerifyReportsProgress)
{
    add_tracks(this->store(), 1, 5);
    std::vector<std::pair<uint64_t, uint64_t>> seen;
    this->store().verify([](const Fault& fault) { ADD_FAILURE() << fault.text; },
                         [&](uint64_t done, uint64_t all) {
                             seen.emplace_back(done, all);
                             return true;
                         });
    ASSERT_EQ(5U, seen.size());
    EXPECT_EQ((std::pair<uint64_t, uint64_t>(5, 5)), seen.back());
}

} // namespace
} // namespace kzcat::test
