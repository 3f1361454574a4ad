// Catalogue files that something has changed: no byte that means anything changes unnoticed, and a
// log that was cut or damaged is good up to there.

#include <algorithm>
#include <filesystem>
#include <random>
#include <string>

#include <gtest/gtest.h>

#include "tests/catalogue/store/content.hpp"
#include "tests/catalogue/store/files.hpp"
#include "tests/catalogue/store/rounds.hpp"

namespace kzcat::test {
namespace {

namespace fs = std::filesystem;

NewTrack make_mixed_track(uint64_t number)
{
    NewTrack track = make_track(number, number * 37 % 1500);
    if (number % 3 == 0) {
        track.document_bands = make_bands(number, number);
    }
    if (number % 4 == 0) {
        track.tags.push_back({"comment", std::string(number * 150, 'c')});
    }
    return track;
}

/// Tracks of all kinds, and pages that are free.
void make_mixed_catalogue(const std::string& path)
{
    const auto store = open_sqlite_store(path, Access::create);
    std::vector<NewTrack> tracks;
    for (uint64_t number = 1; number <= 60; ++number) {
        tracks.push_back(make_mixed_track(number));
    }
    store->add(tracks);
    for (int64_t track = 5; track < 60; track += 7) {
        store->remove(track);
    }
    store->add_source(1, {.uri = "x", .size = -1, .mtime_ns = -1, .hash = std::nullopt});
    store->set_setting("a", "some value");
    store->set_setting("b", "another");
}

class DamagedCatalogue : public ::testing::Test {
protected:
    std::string path(const std::string& name = "a.kzc") const { return folder_.path(name); }
    kz::test::ScratchDirectory folder_;
};

enum class Outcome { refused, reported, meaningless };

/// What becomes of a file with one byte changed; `meaningless`: what is read does not differ.
Outcome examine(const std::string& path, const std::string& wanted, const std::string& where)
{
    try {
        const auto store = open_sqlite_store(path, Access::read);
        if (!faults(*store).empty()) {
            return Outcome::reported;
        }
        EXPECT_TRUE(wanted == content(*store)) << "a change goes unnoticed at " << where;
        return Outcome::meaningless;
    } catch (const StoreError&) {
        return Outcome::refused;
    }
}

TEST_F(DamagedCatalogue, NoChangedByteGoesUnnoticed)
{
    make_mixed_catalogue(path());
    const std::string bytes = read_file(path());
    const std::string wanted = content(*open_sqlite_store(path(), Access::read));
    std::mt19937_64 random(1);
    std::array<int, 3> outcomes{};
    for (uint64_t round = 0; round < rounds(1000); ++round) {
        // One in ten near the start, where the header and the schema lie.
        const size_t at = random() % (round % 10 == 0 ? 16384 : bytes.size());
        std::string changed = bytes;
        changed[at] = static_cast<char>(changed[at] ^ static_cast<char>(1 + random() % 255));
        write_file(path("b.kzc"), changed);
        ++outcomes[static_cast<size_t>(
            examine(path("b.kzc"), wanted, "byte " + std::to_string(at)))];
        fs::remove(path("b.kzc-wal"));
        fs::remove(path("b.kzc-shm"));
    }
    RecordProperty("refused", outcomes[0]);
    RecordProperty("reported", outcomes[1]);
    RecordProperty("meaningless", outcomes[2]);
    EXPECT_LT(rounds(1000) / 4, static_cast<uint64_t>(outcomes[1]));
}

TEST_F(DamagedCatalogue, ACutFileIsNeverHalfRead)
{
    make_mixed_catalogue(path());
    const std::string bytes = read_file(path());
    std::mt19937_64 random(2);
    for (uint64_t round = 0; round < rounds(100); ++round) {
        const size_t kept = 1 + random() % (bytes.size() - 1);
        write_file(path("b.kzc"), bytes.substr(0, kept));
        EXPECT_NE(Outcome::meaningless, examine(path("b.kzc"), "", std::to_string(kept)));
    }
}

/// The numbers of tracks that a store holds must be 1 to some multiple of `batch`, each one whole.
void expect_whole_prefix(Store& store, uint64_t batch, const std::string& where)
{
    EXPECT_EQ(std::vector<std::string>(), faults(store)) << where;
    const uint64_t count = store.track_count();
    EXPECT_EQ(0U, count % batch) << where;
    EXPECT_EQ(count, static_cast<uint64_t>(store.last_change())) << where;
    uint64_t number = 0;
    store.visit_trails(0, [&](int64_t, const Trail& trail) {
        EXPECT_TRUE(make_trail(++number) == trail) << where;
        return true;
    });
    EXPECT_EQ(count, number) << where;
}

/// A catalogue whose writer is killed, as it were, with everything in its log.
class DamagedLog : public DamagedCatalogue {
protected:
    static constexpr uint64_t kBatch = 3;

    void SetUp() override
    {
        const auto store = open_sqlite_store(path(), Access::create);
        for (uint64_t number = 1; number < 60; number += kBatch) {
            add_tracks(*store, number, kBatch);
        }
        main_ = read_file(path());
        log_ = read_file(path("a.kzc-wal"));
        ASSERT_GT(log_.size(), 100'000U);
    }

    uint64_t tracks_with_log(const std::string& log, const std::string& where)
    {
        for (const char* name : {"b.kzc", "b.kzc-wal", "b.kzc-shm"}) {
            fs::remove(path(name));
        }
        write_file(path("b.kzc"), main_);
        write_file(path("b.kzc-wal"), log);
        const auto store = open_sqlite_store(path("b.kzc"), Access::write);
        expect_whole_prefix(*store, kBatch, where);
        const uint64_t count = store->track_count();
        add_tracks(*store, count + 1, kBatch);
        expect_whole_prefix(*store, kBatch, where + ", and after more was added");
        return count;
    }

    std::string main_;
    std::string log_;
};

TEST_F(DamagedLog, CutAnywhereOpensAsAWholePrefix)
{
    std::mt19937_64 random(3);
    uint64_t fewest = 60;
    uint64_t most = 0;
    for (uint64_t round = 0; round < rounds(100); ++round) {
        const size_t kept = random() % (log_.size() + 1);
        const uint64_t count =
            tracks_with_log(log_.substr(0, kept), "cut after " + std::to_string(kept));
        fewest = std::min(fewest, count);
        most = std::max(most, count);
    }
    EXPECT_LT(fewest + 10, most) << "cuts at the beginning keep less than cuts at the end";
    EXPECT_EQ(60U, tracks_with_log(log_, "whole"));
    EXPECT_EQ(0U, tracks_with_log("", "lost"));
}

TEST_F(DamagedLog, ChangedAnywhereOpensAsAWholePrefix)
{
    std::mt19937_64 random(4);
    for (uint64_t round = 0; round < rounds(100); ++round) {
        const size_t at = random() % log_.size();
        std::string changed = log_;
        changed[at] = static_cast<char>(changed[at] ^ static_cast<char>(1 + random() % 255));
        tracks_with_log(changed, "changed at " + std::to_string(at));
    }
}

/// Changes that leave the structure of the file whole.
const char* const kChangesOfValues[] = {

    "UPDATE catalogue SET id = replace(id, substr(id, 1, 1), 'g')",
    "UPDATE setting SET value = 'other' WHERE name = 'a'",
    "UPDATE setting SET name = 'c' WHERE name = 'a'",
    "UPDATE track SET samples = samples + 1 WHERE id = 3",
    "UPDATE track SET codes = codes + 1 WHERE id = 3",
    "UPDATE track SET added = added + 1 WHERE id = 3",
    "UPDATE track SET key = randomblob(16) WHERE id = 3",
    "UPDATE track SET key = randomblob(15) WHERE id = 3",
    "UPDATE trail SET crc = crc + 1 WHERE track = 3",
    "UPDATE trail SET codes = randomblob(length(codes)) WHERE track = 3",
    "UPDATE trail SET codes = x'' WHERE track = 3",
    "DELETE FROM trail WHERE track = 3",
    "INSERT INTO trail VALUES (1000, 0, x'')",
    "INSERT INTO tag VALUES (1000, 0, 'a', 'b', 0)",
    "UPDATE document_bands SET bands = randomblob(length(bands)) WHERE track = 3",
    "UPDATE document_bands SET bands = x'00' WHERE track = 3",
    "UPDATE tag SET value = 'other' WHERE track = 3 AND place = 0",
    "UPDATE tag SET name = 'other' WHERE track = 3 AND place = 0",
    "DELETE FROM tag WHERE track = 3 AND place = 0",
    "UPDATE source SET uri = 'other' WHERE track = 3",
    "UPDATE source SET track = 4 WHERE track = 3",
    "UPDATE source SET size = NULL WHERE track = 3",
    "UPDATE source SET mtime_ns = 0 WHERE track = 3",
    "UPDATE source SET hash = NULL WHERE track = 3",
    "UPDATE source SET hash = x'00' WHERE track = 3",
    "UPDATE source SET hash = randomblob(32) WHERE track = 3",
    "UPDATE change SET track = 99 WHERE id = 3",
    "UPDATE change SET kind = 2 WHERE id = 3",
    "UPDATE change SET kind = 3, total = track + 3 + mark WHERE id = 3",
    "UPDATE change SET mark = mark + 1 WHERE id = 3",
    "DELETE FROM change WHERE id = 3",
    "UPDATE change SET id = 1000 WHERE id = 68",
    ("DELETE FROM change WHERE id = 68;"
     "UPDATE sqlite_sequence SET seq = 67 WHERE name = 'change'"),
    "UPDATE sqlite_sequence SET seq = 30 WHERE name = 'track'",
    "UPDATE sqlite_sequence SET seq = 30 WHERE name = 'change'",
    "UPDATE sqlite_sequence SET name = 'trbck' WHERE name = 'track'",
    "DELETE FROM sqlite_sequence WHERE name = 'change'",
    "INSERT INTO sqlite_sequence VALUES ('track', 30)",
    "INSERT INTO track VALUES (1000, randomblob(16), 0, 0, 0, 0)"};

TEST_F(DamagedCatalogue, NoChangedValueGoesUnnoticed)
{
    make_mixed_catalogue(path());
    const std::string bytes = read_file(path());
    for (const char* change : kChangesOfValues) {
        write_file(path(), bytes);
        Database(path()).execute(change);
        EXPECT_EQ(Outcome::reported, examine(path(), "", change)) << change;
    }
}

TEST_F(DamagedCatalogue, RefusesOneThatHasLostItsId)
{
    make_mixed_catalogue(path());
    Database(path()).execute("DELETE FROM catalogue");
    EXPECT_EQ(StoreError::Kind::damaged,
              failure_of([&] { open_sqlite_store(path(), Access::read); }).kind);
}

TEST_F(DamagedCatalogue, NamesTheTrackThatIsDamaged)
{
    make_mixed_catalogue(path());
    Database(path()).execute("UPDATE trail SET codes = zeroblob(length(codes)) WHERE track = 3");
    const auto store = open_sqlite_store(path(), Access::write);
    std::vector<int64_t> tracks;
    store->verify([&](const Fault& fault) { tracks.push_back(fault.track); },
                  [](uint64_t, uint64_t) { return true; });
    EXPECT_EQ(std::vector<int64_t>{3}, tracks);
    EXPECT_EQ(StoreError::Kind::damaged, failure_of([&] { store->trail(3); }).kind);
    EXPECT_EQ(make_mixed_track(4).trail, store->trail(4)) << "the others are as good as before";
    store->remove(3);
    EXPECT_TRUE(faults(*store).empty()) << "as the message says";
}

/// Callers make room for as many codes as the store reports.
TEST_F(DamagedCatalogue, BelievesNoNumberThatCannotBe)
{
    for (const char* number : {"-1", "1000000000", "9223372036854775807"}) {
        make_catalogue(path(), 3);
        Database(path()).execute(std::string("UPDATE track SET codes = ") + number);
        const auto store = open_sqlite_store(path(), Access::read);
        EXPECT_EQ(StoreError::Kind::damaged, failure_of([&] { store->code_count(); }).kind);
        EXPECT_EQ(StoreError::Kind::damaged, failure_of([&] { store->trail(1); }).kind);
        EXPECT_FALSE(faults(*store).empty());
        fs::remove(path());
    }
}

TEST_F(DamagedCatalogue, ReportsEveryDamagedTrack)
{
    make_mixed_catalogue(path());
    Database(path()).execute("UPDATE tag SET crc = crc + 1 WHERE track IN (1, 2, 60)");
    const auto store = open_sqlite_store(path(), Access::read);
    EXPECT_LE(3U, faults(*store).size());
}

} // namespace
} // namespace kzcat::test
