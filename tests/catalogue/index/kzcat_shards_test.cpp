// What kzcat-shards makes of a coordinator and its shards, and what running it again changes.

#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/index/clips.hpp"
#include "catalogue/index/fleet.hpp"
#include "catalogue/index/index.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {
namespace {

using test::add;
using test::attach_shards;
using test::clip_of;

/// One server, on which each shard has a database.
class KzcatShards : public testing::Test {
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
        own_ = database_of(url_);
        for (std::string& database : databases_) {
            database = database_of(server_->new_database());
        }
        one_ = test::shard_address(*server_, databases_[0]);
        two_ = test::shard_address(*server_, databases_[1]);
    }

    static std::string database_of(const std::string& url)
    {
        const size_t end = url.find('?');
        const size_t begin = url.rfind('/', end) + 1;
        return url.substr(begin, end - begin);
    }

    /// What a run is refused with.
    std::string refusal(const std::vector<std::string>& shards) const
    {
        try {
            attach_shards(url_, shards);
            return "nothing was refused";
        } catch (const std::runtime_error& error) {
            return error.what();
        }
    }

    std::unique_ptr<Index> open(Store& store) const
    {
        IndexOptions options;
        options.write_from = 1;
        options.server = url_;
        return open_index(store, options);
    }
    static int64_t found(Index& index, uint64_t number)
    {
        const auto places = index.find(clip_of(number, 8), 3);
        return places.empty() || places.front().position != 50 ? 0 : places.front().track;
    }
    std::string sql(const std::string& statements) const { return server_->sql(statements, own_); }

    static inline std::unique_ptr<kz::test::PostgresServer> server_;
    std::string url_;
    std::string own_;
    std::string databases_[2];
    std::string one_;
    std::string two_;
};

TEST_F(KzcatShards, KeepTheirNumbers)
{
    attach_shards(url_, {one_, two_});
    EXPECT_NO_THROW(attach_shards(url_, {one_, two_}));
    const std::string text = refusal({two_});
    EXPECT_NE(std::string::npos, text.find("name all shards in their order")) << text;
    EXPECT_EQ("2\n", sql("SELECT count(*) FROM kzcat.shard"));
}

TEST_F(KzcatShards, WithoutTracksAreSearchedToo)
{
    attach_shards(url_, {one_, two_});
    const auto store = open_postgres_store(url_, Access::create);
    const auto ids = add(*store, 1, 1);
    EXPECT_EQ(ids.at(0), found(*open(*store), 1));
}

TEST_F(KzcatShards, AddedLaterAreSearchedAtOnce)
{
    attach_shards(url_, {one_});
    const auto store = open_postgres_store(url_, Access::create);
    const auto ids = add(*store, 1, 10);
    const auto before = open(*store);
    attach_shards(url_, {one_, two_});
    EXPECT_EQ(ids[4], found(*before, 5)) << "of a program that runs";
    const auto after = open(*store);
    EXPECT_EQ(2U, after->coverage().of);
    EXPECT_EQ(ids[4], found(*after, 5));
    const auto another = open_postgres_store(url_, Access::write);
    const auto more = add(*another, 11, 10);
    EXPECT_LT(0U, std::stoul(server_->sql("SELECT count(*) FROM kzcat.trail", databases_[1])));
    after->refresh(*another);
    for (uint64_t number = 11; number <= 20; ++number) {
        EXPECT_EQ(more[number - 11], found(*after, number)) << number;
    }
}

TEST_F(KzcatShards, ThatLostTheirTablesAreGivenThemAgain)
{
    attach_shards(url_, {one_, two_});
    const auto store = open_postgres_store(url_, Access::create);
    const auto ids = add(*store, 1, 1);
    const bool is_on_two = sql("SELECT shard FROM kzcat.track") == "2\n";
    const std::string& empty = databases_[is_on_two ? 0 : 1];
    server_->sql("DROP SCHEMA kzcat CASCADE", empty); // as when the first writer did not reach it
    try {
        open(*store);
        ADD_FAILURE() << "nothing is missing";
    } catch (const StoreError& error) {
        const std::string text = error.what();
        EXPECT_NE(std::string::npos, text.find("run kzcat-shards with all shards")) << text;
    }
    attach_shards(url_, {one_, two_});
    EXPECT_EQ(ids[0], found(*open(*store), 1));
    EXPECT_EQ("0\n", server_->sql("SELECT count(*) FROM kzcat.trail", empty));
}

TEST_F(KzcatShards, AreNotForACatalogueWithoutAny)
{
    add(*open_postgres_store(url_, Access::create), 1, 1);
    const std::string text = refusal({one_});
    EXPECT_NE(std::string::npos, text.find("kzfp merge")) << text;
    EXPECT_EQ("1\n", sql("SELECT count(*) FROM kzcat.trail"));
}

TEST_F(KzcatShards, KeepOfTheirLoginWhatIsNotNamed)
{
    const std::string options = "SELECT array_to_string(umoptions, ' ') FROM pg_user_mappings";
    attach_shards(url_, {one_ + " password=a'b"});
    EXPECT_EQ("user=postgres password=a'b\n", sql(options));
    attach_shards(url_, {one_});
    EXPECT_EQ("user=postgres password=a'b\n", sql(options));
    attach_shards(url_, {one_ + " password=other"});
    EXPECT_EQ("user=postgres password=other\n", sql(options));
}

TEST_F(KzcatShards, MayHaveTimesOfTheirOwn)
{
    attach_shards(url_, {one_ + " connect_timeout=3 keepalives_idle=7", two_});
    EXPECT_EQ("1|f\n2|t\n", sql("SELECT right(srvname, 1), srvoptions @> '{connect_timeout=10, "
                                "keepalives_idle=30, keepalives_interval=10, keepalives_count=3, "
                                "tcp_user_timeout=40000}' FROM pg_foreign_server ORDER BY 1"));
    EXPECT_EQ("1\n", sql("SELECT count(*) FROM pg_foreign_server WHERE srvoptions @> "
                         "'{connect_timeout=3, keepalives_idle=7}'"));
}

} // namespace
} // namespace kzcat
