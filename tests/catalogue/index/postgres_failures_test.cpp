// What becomes of look-ups when servers die, and what a coordinator leaves to its shards.

#include <functional>
#include <iterator>
#include <memory>
#include <regex>

#include <gtest/gtest.h>

#include "catalogue/index/clips.hpp"
#include "catalogue/index/fleet.hpp"
#include "catalogue/index/index.hpp"
#include "catalogue/index/postgresql/lookups.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {
namespace {

using test::add;
using test::clip_of;
using test::Fleet;

constexpr uint64_t kTracks = 60;

IndexOptions options_for(const std::string& url, bool partial = false)
{
    IndexOptions options;
    options.write_from = 1;
    options.server = url;
    options.partial = partial;
    return options;
}

/// The track that a clip is found in; 0 when it is in none.
int64_t found(Index& index, uint64_t number)
{
    const auto places = index.find(clip_of(number, 8), 3);
    return places.empty() || places.front().position != 50 ? 0 : places.front().track;
}

size_t occurrences(const std::string& text, const std::string& pattern)
{
    const std::regex expression(pattern);
    return static_cast<size_t>(
        std::distance(std::sregex_iterator(text.begin(), text.end(), expression), {}));
}

class Shards : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        if (!kz::test::postgres_obstacle().empty()) {
            return;
        }
        fleet_ = std::make_unique<Fleet>();
        store_ = open_postgres_store(url(), Access::create);
        ids_ = add(*store_, 1, kTracks);
        open_index(*store_, options_for(url())); // which posts them
    }
    static void TearDownTestSuite()
    {
        store_.reset();
        fleet_.reset();
    }
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
    }
    void TearDown() override
    {
        if (fleet_ != nullptr && !fleet_->two.is_running()) {
            fleet_->two.start();
        }
    }

    static std::string url() { return fleet_->coordinator.url(); }

    /// Whether a track lies on the second shard.
    static bool is_on_two(int64_t track)
    {
        return fleet_->coordinator.sql("SELECT shard FROM kzcat.track WHERE id = " +
                                       std::to_string(track)) == "2\n";
    }

    static std::string plan_of(const std::string& statement, const std::string& values,
                               const std::string& session = postgresql::kSearchSession)
    {
        return fleet_->coordinator.sql(
            session + "; PREPARE lookup (bigint[], bytea) AS " + statement +
            "; EXPLAIN (VERBOSE, COSTS OFF) EXECUTE lookup (" + values + ")");
    }

    /// What a call fails with.
    static std::string failure(const std::function<void()>& act)
    {
        try {
            act();
            return "nothing failed";
        } catch (const StoreError& error) {
            return error.what();
        }
    }

    static inline std::unique_ptr<Fleet> fleet_;
    static inline std::unique_ptr<Store> store_;
    static inline std::vector<int64_t> ids_;
};

TEST_F(Shards, CountAndRankOnTheirOwnAndAtOnce)
{
    const std::string count = plan_of(postgresql::kCountStatement, "'{1,2}', ''");
    EXPECT_EQ(2U, occurrences(count, "Async Foreign Scan")) << count;
    EXPECT_EQ(2U, occurrences(count, "Remote SQL: SELECT shard, kzcat.kz_count\\(.* FROM "
                                     "kzcat.posting WHERE .*list = ANY .*GROUP BY 1"))
        << count;
    const std::string rank = plan_of(postgresql::kRankStatement, "'{1,2}', ''");
    EXPECT_EQ(2U, occurrences(rank, "Async Foreign Scan")) << rank;
    EXPECT_EQ(2U, occurrences(rank, "Remote SQL: SELECT shard, kzcat.kz_rank\\(.* FROM kzcat.trail "
                                    "WHERE .*track = ANY .*GROUP BY 1"))
        << rank;
}

TEST_F(Shards, SumTheLengthsOfListsOnTheirOwn)
{
    const std::string plan = plan_of(postgresql::kLengthsStatement, "'{}', ''");
    EXPECT_EQ(2U,
              occurrences(plan, "Remote SQL: SELECT shard, list, kzcat.kz_lengths\\(words\\) FROM "
                                "kzcat.posting WHERE .*GROUP BY 1, 2"))
        << plan;
}

TEST_F(Shards, WithoutForeignTablesAreNotPassedOver)
{
    fleet_->coordinator.sql("INSERT INTO kzcat.shard VALUES (3, 'host=nowhere')");
    const std::string text = failure([] { open_index(*store_, options_for(url(), true)); });
    fleet_->coordinator.sql("DELETE FROM kzcat.shard WHERE number = 3");
    EXPECT_NE(std::string::npos, text.find("shard 3 stands in the table kzcat.shard")) << text;
    EXPECT_NE(std::string::npos, text.find("run kzcat-shards")) << text;
    EXPECT_NO_THROW(open_index(*store_, options_for(url())));
}

TEST_F(Shards, OfOtherCataloguesAreRefused)
{
    fleet_->coordinator.sql("ALTER SERVER kzcat_shard_2 OPTIONS (SET host '" + fleet_->one.host() +
                            "', SET port '" + std::to_string(fleet_->one.port()) + "')");
    const std::string text = failure([] { open_index(*store_, options_for(url(), true)); });
    EXPECT_NE(std::string::npos, text.find("shard 2: the database that look-ups go to")) << text;
    EXPECT_NE(std::string::npos, text.find("kzcat_shard_2")) << text;
    // What the text says.
    test::attach_shards(url(),
                        {test::shard_address(fleet_->one), test::shard_address(fleet_->two)});
    const auto index = open_index(*store_, options_for(url()));
    EXPECT_EQ(ids_[4], found(*index, 5));
    const std::string id = fleet_->two.sql("SELECT catalogue FROM kzcat.node");
    fleet_->two.sql("UPDATE kzcat.node SET catalogue = 'another'");
    EXPECT_NE(std::string::npos,
              failure([&] { index->refresh(*store_); }).find("belongs to another one"));
    fleet_->two.sql("UPDATE kzcat.node SET catalogue = '" + id.substr(0, id.size() - 1) + "'");
}

TEST_F(Shards, ThatFailARefreshLeaveTheIndexAsItWas)
{
    const auto index = open_index(*store_, options_for(url()));
    const auto more = add(*store_, 1001, 2);
    fleet_->two.kill9();
    EXPECT_THROW(index->refresh(*store_), StoreError);
    EXPECT_EQ(kTracks, index->facts().tracks);
    fleet_->two.start();
    EXPECT_EQ(ids_[4], found(*index, 5));
    index->refresh(*store_);
    EXPECT_EQ(kTracks + 2, index->facts().tracks);
    store_->remove(more[0]);
    store_->remove(more[1]);
}

TEST_F(Shards, SendWholeTablesUnlessGroupedByShard)
{
    // Each of these is what the statements and the session are made to avoid.
    const std::string off = plan_of(postgresql::kCountStatement, "'{1,2}', ''",
                                    "SET enable_partitionwise_aggregate = off");
    EXPECT_EQ(0U, occurrences(off, "Remote SQL: .*kz_count")) << off;
    const std::string ungrouped =
        plan_of("SELECT kzcat.kz_count(segment, list, words, $2) FROM kzcat.posting "
                "WHERE list = ANY ($1)",
                "'{1,2}', ''");
    EXPECT_EQ(0U, occurrences(ungrouped, "Remote SQL: .*kz_count")) << ungrouped;
    // The installer has the database switch it on for who connects by other means.
    EXPECT_EQ("on\n", fleet_->coordinator.sql("SHOW enable_partitionwise_aggregate"));
}

TEST_F(Shards, HaveTheirPopulationKeptForOthers)
{
    fleet_->coordinator.sql("DELETE FROM kzcat.population");
    open_index(*store_, options_for(url()));
    EXPECT_EQ(std::to_string(store_->track_count()) + "|" + std::to_string(store_->code_count()) +
                  "\n",
              fleet_->coordinator.sql("SELECT tracks, codes FROM kzcat.population"));
}

TEST_F(Shards, WhoseHostsHaveGoneAreNoticed)
{
    EXPECT_EQ("2\n", fleet_->coordinator.sql(
                         "SELECT count(*) FROM pg_foreign_server WHERE srvoptions @> "
                         "'{keepalives_idle=30, keepalives_interval=10, keepalives_count=3, "
                         "tcp_user_timeout=40000}'"));
}

TEST_F(Shards, ThatDieAreNamedAndMissedUntilTheyAreBack)
{
    const auto index = open_index(*store_, options_for(url()));
    EXPECT_EQ(ids_[4], found(*index, 5));
    fleet_->two.kill9();
    for (uint64_t number = 1; number <= 3; ++number) {
        const std::string text = failure([&] { found(*index, number); });
        EXPECT_NE(std::string::npos, text.find("shard 2 of 2 gave no answer")) << text;
        EXPECT_NE(std::string::npos, text.find("--partial")) << text;
    }
    fleet_->two.start();
    for (uint64_t number = 1; number <= kTracks; number += 5) {
        EXPECT_EQ(ids_[number - 1], found(*index, number));
    }
    EXPECT_EQ(2U, index->coverage().answered);
}

TEST_F(Shards, ThatAreLeftAnswerWhenThatIsEnough)
{
    auto index = open_index(*store_, options_for(url(), true));
    EXPECT_EQ(2U, index->coverage().answered);
    fleet_->two.kill9();
    size_t missed = 0;
    for (uint64_t number = 1; number <= kTracks; number += 5) {
        const bool is_lost = is_on_two(ids_[number - 1]);
        EXPECT_EQ(is_lost ? 0 : ids_[number - 1], found(*index, number)) << number;
        missed += is_lost;
    }
    EXPECT_LT(0U, missed);
    EXPECT_EQ(1U, index->coverage().answered);
    EXPECT_EQ(2U, index->coverage().of);
    // One that is opened meanwhile.
    EXPECT_EQ(1U, open_index(*store_, options_for(url(), true))->coverage().answered);
    fleet_->two.start();
    index->refresh(*store_);
    EXPECT_EQ(2U, index->coverage().answered);
    EXPECT_EQ(ids_[10], found(*index, 11));
}

TEST_F(Shards, ThatAreLeftDoNotSettleThePopulation)
{
    fleet_->coordinator.sql("DELETE FROM kzcat.population");
    fleet_->two.kill9();
    open_index(*store_, options_for(url(), true));
    const std::string count = "SELECT count(*) FROM kzcat.population";
    EXPECT_EQ("0\n", fleet_->coordinator.sql(count));
    fleet_->two.start();
    open_index(*store_, options_for(url()));
    EXPECT_EQ("1\n", fleet_->coordinator.sql(count));
}

TEST_F(Shards, AllOfThemDeadAnswerNothing)
{
    const auto index = open_index(*store_, options_for(url(), true));
    fleet_->one.kill9();
    fleet_->two.kill9();
    const std::string text = failure([&] { found(*index, 1); });
    EXPECT_NE(std::string::npos, text.find("shards 1, 2 of 2 gave no answer")) << text;
    fleet_->one.start();
}

TEST_F(Shards, WithoutTheExtensionAreRefusedWithTheCure)
{
    const auto index = open_index(*store_, options_for(url()));
    fleet_->one.sql("ALTER EXTENSION kzmatch SET SCHEMA public");
    const std::string text = failure([&] { found(*index, 1); });
    EXPECT_NE(std::string::npos, text.find("shard 1 of 2 gave no answer")) << text;
    EXPECT_NE(std::string::npos, text.find("kzcat.kz_version")) << text;
    EXPECT_NE(std::string::npos, text.find("ALTER EXTENSION kzmatch SET SCHEMA kzcat")) << text;
    EXPECT_NE("nothing failed", failure([&] { open_index(*store_, options_for(url())); }));
    fleet_->one.sql("ALTER EXTENSION kzmatch SET SCHEMA kzcat");
    EXPECT_EQ(ids_[4], found(*index, 5));
}

class Extension : public testing::Test {};

TEST_F(Extension, MissingOnTheServerIsNamedWithItsCure)
{
    if (!kz::test::postgres_obstacle().empty()) {
        GTEST_SKIP() << kz::test::postgres_obstacle();
    }
    const kz::test::PostgresServer server;
    const auto store = open_postgres_store(server.url(), Access::create);
    const auto ids = add(*store, 1, 10);
    const auto expect_cure = [&](const std::string& cure) {
        try {
            open_index(*store, options_for(server.url()));
            ADD_FAILURE() << "nothing failed";
        } catch (const StoreError& error) {
            const std::string text = error.what();
            EXPECT_NE(std::string::npos, text.find(cure)) << text;
        }
    };
    server.sql("ALTER EXTENSION kzmatch SET SCHEMA public");
    expect_cure("ALTER EXTENSION kzmatch SET SCHEMA kzcat");
    server.sql("ALTER EXTENSION kzmatch SET SCHEMA kzcat;"
               "UPDATE pg_extension SET extversion = '0.9' WHERE extname = 'kzmatch'");
    expect_cure("ALTER EXTENSION kzmatch UPDATE TO '1.0'");
    server.sql("DROP EXTENSION kzmatch");
    expect_cure("CREATE EXTENSION kzmatch SCHEMA kzcat");
    // A few tracks are searched in memory.
    IndexOptions options = options_for(server.url());
    options.write_from = 1'000'000;
    EXPECT_EQ(ids[4], found(*open_index(*store, options), 5));
}

TEST_F(Extension, JoinsWhatParallelWorkersFind)
{
    if (!kz::test::postgres_obstacle().empty()) {
        GTEST_SKIP() << kz::test::postgres_obstacle();
    }
    const kz::test::PostgresServer server;
    const auto store = open_postgres_store(server.url(), Access::create);
    add(*store, 1, kTracks);
    IndexOptions options = options_for(server.url());
    options.plan = Plan::scan;
    const auto alone = open_index(*store, options);
    server.sql("ALTER TABLE kzcat.trail SET (parallel_workers = 2);"
               "ALTER DATABASE postgres SET parallel_setup_cost = 0;"
               "ALTER DATABASE postgres SET parallel_tuple_cost = 0;"
               "ALTER DATABASE postgres SET min_parallel_table_scan_size = 0;"
               "ALTER DATABASE postgres SET parallel_leader_participation = off");
    const std::string plan =
        server.sql("EXPLAIN SELECT shard, kzcat.kz_scan(track, codes, '') FROM kzcat.trail "
                   "GROUP BY shard");
    EXPECT_EQ(1U, occurrences(plan, "Partial \\w*Aggregate")) << plan;
    const auto together = open_index(*store, options);
    for (uint64_t number = 1; number <= kTracks; number += 9) {
        const Reading clip = clip_of(number, 8);
        const auto expected = alone->find(clip, 10);
        const auto found = together->find(clip, 10);
        ASSERT_EQ(expected.size(), found.size());
        for (size_t i = 0; i < found.size(); ++i) {
            EXPECT_EQ(expected[i].track, found[i].track) << number;
            EXPECT_EQ(expected[i].position, found[i].position) << number;
        }
    }
}

class Standby : public testing::Test {};

TEST_F(Standby, TakesOverAfterOneLookUpAtMost)
{
    if (!kz::test::postgres_obstacle().empty()) {
        GTEST_SKIP() << kz::test::postgres_obstacle();
    }
    const kz::test::PostgresServer coordinator;
    kz::test::PostgresServer shard;
    const auto standby = kz::test::PostgresServer::standby_of(shard);
    // Adding goes to whichever may be written, looking up to whichever answers.
    test::attach_shards(coordinator.url(),
                        {"host=" + shard.host() + "," + standby->host() + " port=" +
                         std::to_string(shard.port()) + "," + std::to_string(standby->port()) +
                         " dbname=postgres user=postgres target_session_attrs=any"});
    const auto store = open_postgres_store(coordinator.url(), Access::create);
    const auto ids = add(*store, 1, 20);
    const auto index = open_index(*store, options_for(coordinator.url()));
    test::await_replay(shard, *standby);
    int failed = 0;
    for (int i = 0; i < 60; ++i) {
        if (i == 20) {
            shard.kill9();
        }
        const auto number = static_cast<uint64_t>(i % 20) + 1;
        try {
            EXPECT_EQ(ids[number - 1], found(*index, number)) << i;
        } catch (const StoreError&) {
            ++failed;
        }
    }
    EXPECT_GE(1, failed);
    EXPECT_EQ(1U, index->coverage().answered);
}

TEST_F(Standby, OfTheCataloguesServerAnswersToo)
{
    if (!kz::test::postgres_obstacle().empty()) {
        GTEST_SKIP() << kz::test::postgres_obstacle();
    }
    kz::test::PostgresServer server;
    const auto ids = add(*open_postgres_store(server.url(), Access::create), 1, 10);
    const auto standby = kz::test::PostgresServer::standby_of(server);
    test::await_replay(server, *standby);
    const std::string both = "postgresql://postgres@/postgres?host=" + server.host() + "," +
                             standby->host() + "&port=" + std::to_string(server.port()) + "," +
                             std::to_string(standby->port());
    for (const std::string& url : {standby->url(), both, both}) {
        const auto store = open_postgres_store(url, Access::read);
        EXPECT_EQ(ids[4], found(*open_index(*store, options_for(url)), 5)) << url;
        if (url == both && server.is_running()) {
            server.kill9(); // the second time round the standby is the only one
        }
    }
}

TEST_F(Standby, ThatLagsHidesNothingFromAWriter)
{
    if (!kz::test::postgres_obstacle().empty()) {
        GTEST_SKIP() << kz::test::postgres_obstacle();
    }
    const kz::test::PostgresServer primary;
    add(*open_postgres_store(primary.url(), Access::create), 1, 10);
    const auto standby = kz::test::PostgresServer::standby_of(primary);
    test::await_replay(primary, *standby);
    standby->sql("SELECT pg_wal_replay_pause()");
    const std::string both = "postgresql://postgres@/postgres?host=" + standby->host() + "," +
                             primary.host() + "&port=" + std::to_string(standby->port()) + "," +
                             std::to_string(primary.port());
    const auto store = open_postgres_store(both, Access::write);
    const auto ids = add(*store, 11, 1);
    EXPECT_EQ(ids[0], found(*open_index(*store, options_for(both)), 11));
    const auto reader = open_postgres_store(both, Access::read);
    EXPECT_EQ(10U, reader->track_count()) << "which the standby serves";
    EXPECT_EQ(0, found(*open_index(*reader, options_for(both)), 11));
}

} // namespace
} // namespace kzcat
