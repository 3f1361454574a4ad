// Posting what was added, on the server that has it: a client asks for it, and others go on
// meanwhile.

#include <chrono>
#include <memory>
#include <string>
#include <thread>

#include <gtest/gtest.h>

#include "catalogue/index/clips.hpp"
#include "catalogue/index/fleet.hpp"
#include "catalogue/index/index.hpp"
#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {
namespace {

using test::add;
using test::clip_of;

constexpr uint64_t kTracks = 40;

/// A catalogue of its own for each test, whose tracks are not posted yet.
class Posting : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        if (kz::test::postgres_obstacle().empty()) {
            server_ = std::make_unique<kz::test::PostgresServer>();
        }
    }
    static void TearDownTestSuite() { server_.reset(); }
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
        url_ = server_->new_database();
        store_ = open_postgres_store(url_, Access::create,
                                     {.patience = std::chrono::milliseconds(1000)});
        ids_ = add(*store_, 1, kTracks);
        administrator_ = std::make_unique<postgresql::Connection>(url_);
    }

    std::unique_ptr<Index> open() const
    {
        IndexOptions options;
        options.write_from = 1;
        options.server = url_;
        return open_index(*store_, options);
    }
    int64_t found(Index& index, uint64_t number) const
    {
        const auto places = index.find(clip_of(number, 8), 3);
        return places.empty() ? 0 : places.front().track;
    }
    int64_t count(const std::string& what) const
    {
        return administrator_->query_once("SELECT count(*) FROM " + what).integer(0, 0);
    }
    void execute(const std::string& statements) const { administrator_->execute(statements); }

    static inline std::unique_ptr<kz::test::PostgresServer> server_;
    std::string url_;
    std::unique_ptr<Store> store_;
    std::vector<int64_t> ids_;
    std::unique_ptr<postgresql::Connection> administrator_;
};

TEST_F(Posting, RunsNoCodeOfWhoeverAsksForIt)
{
    execute(
        "DO $$ BEGIN CREATE ROLE asking; EXCEPTION WHEN duplicate_object THEN NULL; END $$;"
        "GRANT USAGE ON SCHEMA kzcat TO asking; GRANT INSERT ON kzcat.posting_request TO asking");
    execute("SET SESSION AUTHORIZATION asking;"
            "CREATE FUNCTION pg_temp.note(value pg_catalog.bytea) RETURNS boolean LANGUAGE plpgsql "
            "AS $$ BEGIN RAISE EXCEPTION 'code of a user ran as %', current_user; END $$;"
            "CREATE DOMAIN pg_temp.bytea AS pg_catalog.bytea CHECK (pg_temp.note(VALUE))");
    EXPECT_NO_THROW(execute("INSERT INTO kzcat.posting_request VALUES (0, 1)"));
    execute("RESET SESSION AUTHORIZATION");
    EXPECT_EQ(1, count("kzcat.posting WHERE list = -1"));
}

TEST_F(Posting, WritesALongTailSegmentBySegment)
{
    execute("DO $$ BEGIN EXECUTE replace(pg_get_functiondef('kzcat.post'::regproc), '16777216', "
            "'4000'); END $$");
    const auto index = open();
    EXPECT_GT(5U, index->facts().tail_tracks); // less than a tenth of the codes
    EXPECT_LE(2, count("kzcat.posting WHERE list = -1"));
    EXPECT_EQ(ids_[2], found(*index, 3));
    EXPECT_EQ(ids_[37], found(*index, 38));
}

TEST_F(Posting, ThatFailsLeavesLookUpsTheTail)
{
    execute("CREATE FUNCTION refuse() RETURNS trigger LANGUAGE plpgsql AS $$ BEGIN "
            "RAISE EXCEPTION USING ERRCODE = 'disk_full', MESSAGE = 'no space'; END $$;"
            "CREATE TRIGGER refused BEFORE INSERT ON kzcat.posting FOR EACH ROW EXECUTE FUNCTION "
            "refuse(); CREATE TRIGGER refused BEFORE INSERT ON kzcat.population FOR EACH ROW "
            "EXECUTE FUNCTION refuse()");
    const auto index = open();
    EXPECT_EQ(kTracks, index->facts().tail_tracks);
    EXPECT_EQ(ids_[8], found(*index, 9));
}

TEST_F(Posting, HoldsUpNobodyWhoRemovesATrack)
{
    execute("CREATE FUNCTION wait() RETURNS trigger LANGUAGE plpgsql AS $$ BEGIN "
            "PERFORM pg_advisory_xact_lock(7); RETURN NEW; END $$;"
            "CREATE TRIGGER waits BEFORE INSERT ON kzcat.posting FOR EACH ROW WHEN (NEW.list = -1) "
            "EXECUTE FUNCTION wait(); SELECT pg_advisory_lock(7)");
    std::thread other([this] {
        postgresql::Connection(url_).execute("INSERT INTO kzcat.posting_request VALUES (0, 1)");
    });
    while (count("pg_locks WHERE locktype = 'advisory' AND NOT granted") == 0) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    EXPECT_NO_THROW(store_->remove(ids_[4]));
    execute("SELECT pg_advisory_unlock(7)");
    other.join();
    const auto index = open();
    EXPECT_EQ(0U, index->facts().tail_tracks);
    EXPECT_EQ(kTracks - 1, index->facts().tracks);
    EXPECT_NE(ids_[4], found(*index, 5));
    for (uint64_t number = 6; number <= kTracks; number += 8) {
        EXPECT_EQ(ids_[number - 1], found(*index, number));
    }
}

/// The tail grows between the choice of the segments to join and that of the tracks, so that not
/// all fit into one segment.
TEST_F(Posting, LosesNoTrackWhenTheTailGrowsMeanwhile)
{
    const std::string request = "INSERT INTO kzcat.posting_request VALUES (0, 1)";
    execute(request);
    const int64_t codes =
        administrator_->query("SELECT sum(codes)::bigint FROM kzcat.posted").integer(0, 0);
    const auto tail = add(*store_, kTracks + 1, kTracks);
    execute("DO $$ BEGIN EXECUTE replace(replace(pg_get_functiondef('kzcat.post'::regproc), "
            "'SELECT array_agg(track) INTO tracks', 'PERFORM pg_advisory_xact_lock(7); "
            "SELECT array_agg(track) INTO tracks'), '16777216', '" +
            std::to_string(5 * codes / 2) + "'); END $$; SELECT pg_advisory_lock(7)");
    std::thread other([&] { postgresql::Connection(url_).execute(request); });
    while (count("pg_locks WHERE locktype = 'advisory' AND NOT granted") == 0) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    add(*store_, 2 * kTracks + 1, kTracks);
    execute("SELECT pg_advisory_unlock(7)");
    other.join();
    EXPECT_EQ(1, count("kzcat.posting WHERE list = -1"));
    EXPECT_LT(0, count("kzcat.tail")) << "what has no room is left to the next call";
    const auto index = open();
    EXPECT_EQ(ids_[0], found(*index, 1));
    EXPECT_EQ(ids_[kTracks - 1], found(*index, kTracks));
    EXPECT_EQ(tail[0], found(*index, kTracks + 1));
}

} // namespace
} // namespace kzcat
