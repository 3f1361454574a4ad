// Tracks on their way from one catalogue to another, piece by piece, through the C interface.

#include "music.hpp"

#include <array>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace {

using namespace kz::test;

std::vector<uint16_t> bands_of(const Trail& trail)
{
    uint64_t count = 0;
    EXPECT_EQ(KZCAT_OK, kzcat_trail_get_document_bands(trail.get(), nullptr, 0, &count));
    std::vector<uint16_t> bands(count);
    EXPECT_EQ(KZCAT_OK,
              kzcat_trail_get_document_bands(trail.get(), bands.data(), bands.size(), &count));
    return bands;
}

Made<Trail> with_bands(const Trail& trail, const std::vector<uint16_t>& bands)
{
    return make<Trail>(kzcat_trail_create_with_document_bands,
                       static_cast<const kzcat_trail*>(trail.get()), bands.data(),
                       uint64_t{bands.size()});
}

bool answers_documents(const Trail& trail)
{
    kzcat_trail_facts facts;
    EXPECT_EQ(KZCAT_OK, kzcat_trail_get_facts(trail.get(), &facts));
    return facts.answers_documents != 0;
}

std::vector<uint64_t> codes_of(const Trail& trail)
{
    uint64_t count = 0;
    EXPECT_EQ(KZCAT_OK, kzcat_trail_get_codes(trail.get(), nullptr, 0, &count));
    std::vector<uint64_t> codes(count);
    EXPECT_EQ(KZCAT_OK, kzcat_trail_get_codes(trail.get(), codes.data(), codes.size(), &count));
    return codes;
}

Track track_of(const Catalogue& catalogue, int64_t id)
{
    return make<Track>(kzcat_get_track, catalogue.get(), id).handle;
}

kzcat_track_facts facts_of(const Track& track)
{
    kzcat_track_facts facts = {};
    EXPECT_EQ(KZCAT_OK, kzcat_track_get_facts(track.get(), &facts));
    return facts;
}

TEST(DoorBands, AreCopiedAndGivenBack)
{
    const std::vector<int16_t> sound = piece(1, 20);
    const Trail whole = trail_of(sound, true);
    const std::vector<uint16_t> bands = bands_of(whole);
    EXPECT_EQ(0u, bands.size() % 15);
    EXPECT_EQ(34u, bands.size() / 15) << "frames of 2.97 s, one every 0.51 s";
    const Trail plain = trail_of(sound);
    EXPECT_TRUE(bands_of(plain).empty());
    const Made<Trail> copy = with_bands(plain, bands);
    ASSERT_EQ(KZCAT_OK, copy.status) << kzcat_get_error_text();
    EXPECT_TRUE(answers_documents(copy.handle));
    EXPECT_FALSE(answers_documents(plain));
    EXPECT_EQ(bands, bands_of(copy.handle));
    EXPECT_EQ(codes_of(whole), codes_of(copy.handle));
    EXPECT_FALSE(answers_documents(with_bands(whole, {}).handle));
}

// Every length of sound has bands that its trail takes.
TEST(DoorBands, OfEveryLengthFitTheirTrail)
{
    for (double seconds = 0.4; seconds < 3.2; seconds += 0.07) {
        const std::vector<int16_t> sound = piece(1, seconds);
        const Trail trail = trail_of(sound, true);
        EXPECT_EQ(KZCAT_OK, with_bands(trail, bands_of(trail)).status)
            << seconds << ": " << kzcat_get_error_text();
    }
}

TEST(DoorBands, OfAnotherRecordingAreRefused)
{
    const Trail trail = trail_of(piece(1, 20));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              with_bands(trail, bands_of(trail_of(piece(1, 22), true))).status);
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              with_bands(trail, bands_of(trail_of(piece(1, 18), true))).status);
    std::vector<uint16_t> bands = bands_of(trail_of(piece(1, 20), true));
    bands.pop_back();
    const Made<Trail> refused = with_bands(trail, bands);
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, refused.status);
    EXPECT_EQ(nullptr, refused.handle);
}

TEST(DoorBands, NeedEnoughRoom)
{
    const Trail trail = trail_of(piece(1, 5), true);
    const size_t size = bands_of(trail).size();
    std::vector<uint16_t> room(size, 7);
    uint64_t count = 0;
    EXPECT_EQ(KZCAT_ERROR_ROOM,
              kzcat_trail_get_document_bands(trail.get(), room.data(), size - 1, &count));
    EXPECT_EQ(size, count);
    EXPECT_EQ(std::vector<uint16_t>(size, 7), room);
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              kzcat_trail_get_document_bands(trail.get(), nullptr, 1, &count));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              kzcat_trail_get_document_bands(nullptr, nullptr, 0, &count));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              kzcat_trail_get_document_bands(trail.get(), nullptr, 0, nullptr));
}

constexpr std::array<uint8_t, KZCAT_HASH_SIZE> kHash = {1, 2, 3};
const kzcat_source kSources[] = {{"first", 12, 34, kHash.data()}, {"second", -1, -1, nullptr}};
const kzcat_tag kTags[] = {{"artist", "One"}, {"title", "Song"}, {"artist", "Two"}};

kzcat_stored_track stored(const Trail& trail)
{
    return {trail.get(), kSources, 2, kTags, 3, 1'000'000, {}};
}

TEST(DoorImport, KeepsAllThatIsKnownOfATrack)
{
    const Catalogue catalogue = open_memory();
    const Trail trail = trail_of(piece(1, 5), true);
    const kzcat_stored_track track = stored(trail);
    kzcat_added added = {};
    ASSERT_EQ(KZCAT_OK, kzcat_import(catalogue.get(), &track, 1, &added)) << kzcat_get_error_text();
    EXPECT_EQ(1, added.track);
    EXPECT_EQ(1u, added.is_new);
    const Track kept = track_of(catalogue, 1);
    EXPECT_EQ(1'000'000, facts_of(kept).added);
    EXPECT_EQ(3u, facts_of(kept).tag_count);
    EXPECT_EQ(2u, facts_of(kept).source_count);
    EXPECT_EQ(1u, facts_of(kept).answers_documents);
    kzcat_source source;
    ASSERT_EQ(KZCAT_OK, kzcat_track_get_source(kept.get(), 0, &source));
    EXPECT_STREQ("first", source.uri);
    EXPECT_EQ(12, source.size);
    EXPECT_EQ(34, source.mtime_ns);
    ASSERT_NE(nullptr, source.hash);
    EXPECT_EQ(3, source.hash[2]);
    kzcat_tag tag;
    ASSERT_EQ(KZCAT_OK, kzcat_track_get_tag(kept.get(), 2, &tag));
    EXPECT_STREQ("Two", tag.value);
}

TEST(DoorImport, YieldsToWhatIsThere)
{
    const Catalogue catalogue = open_memory();
    const Trail there = trail_of(piece(2, 5));
    ASSERT_EQ(1, add(catalogue.get(), there.get(), "first"));
    const Trail trail = trail_of(piece(1, 5));
    const kzcat_stored_track tracks[] = {stored(trail),
                                         {there.get(), nullptr, 0, nullptr, 0, 0, {}}};
    std::array<kzcat_added, 2> added = {};
    for (uint32_t is_new : {1u, 0u}) { // it may be repeated
        ASSERT_EQ(KZCAT_OK, kzcat_import(catalogue.get(), tracks, 2, added.data()));
        EXPECT_EQ(2, added[0].track);
        EXPECT_EQ(is_new, added[0].is_new);
        EXPECT_EQ(1, added[1].track);
        EXPECT_EQ(0u, added[1].is_new);
        EXPECT_EQ(1u, facts_of(track_of(catalogue, 1)).source_count);
        EXPECT_EQ(1u, facts_of(track_of(catalogue, 2)).source_count);
    }
}

TEST(DoorImport, TakesAllTracksOrNone)
{
    const Catalogue catalogue = open_memory();
    const Trail good = trail_of(piece(1, 5));
    const Trail empty = trail_of(piece(1, 0.1));
    const kzcat_stored_track tracks[] = {stored(good),
                                         {empty.get(), nullptr, 0, nullptr, 0, 0, {}}};
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_import(catalogue.get(), tracks, 2, nullptr));
    kzcat_facts facts;
    kzcat_get_facts(catalogue.get(), 0, &facts);
    EXPECT_EQ(0u, facts.tracks);
    EXPECT_EQ(KZCAT_OK, kzcat_import(catalogue.get(), tracks, 1, nullptr));
}

TEST(DoorImport, ArgumentsThatCannotBeUsedAreRefused)
{
    const Catalogue catalogue = open_memory();
    const Trail trail = trail_of(piece(1, 5));
    std::array<kzcat_stored_track, 6> tracks;
    tracks.fill(stored(trail));
    tracks[0].trail = nullptr;
    tracks[1].sources = nullptr;
    tracks[2].tags = nullptr;
    tracks[3].reserved[3] = 1;
    const kzcat_source no_uri = {"", -1, -1, nullptr};
    tracks[4].sources = &no_uri;
    tracks[4].source_count = 1;
    const kzcat_tag no_value = {"title", nullptr};
    tracks[5].tags = &no_value;
    tracks[5].tag_count = 1;
    for (const kzcat_stored_track& track : tracks) {
        EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_import(catalogue.get(), &track, 1, nullptr));
    }
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_import(nullptr, tracks.data(), 0, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_import(catalogue.get(), nullptr, 1, nullptr));
    EXPECT_EQ(KZCAT_OK, kzcat_import(catalogue.get(), nullptr, 0, nullptr));
    Trail made;
    kzcat_trail* handle = trail.get();
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              kzcat_trail_create_with_document_bands(trail.get(), nullptr, 0, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              kzcat_trail_create_with_document_bands(nullptr, nullptr, 0, &handle));
    EXPECT_EQ(nullptr, handle);
}

} // namespace
