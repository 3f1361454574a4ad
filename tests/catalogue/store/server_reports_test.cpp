// What servers report, as sentences with cures: which one is meant, and what to do about it.

#include <gtest/gtest.h>

#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/failures.hpp"
#include "tests/catalogue/store/databases.hpp"
#include "tests/catalogue/store/files.hpp"

namespace kzcat::test {
namespace {

using Kind = StoreError::Kind;
using postgresql::Connection;
using postgresql::ServerReport;

void expect_report(const Failure& failure, Kind kind, const std::string& words)
{
    EXPECT_EQ(kind, failure.kind) << failure.text;
    EXPECT_NE(std::string::npos, failure.text.find(words)) << failure.text;
}

void expect_report(const ServerReport& report, Kind kind, const std::string& words)
{
    const StoreError error =
        postgresql::describe_failure("music", report, std::chrono::milliseconds(100));
    expect_report(Failure{.kind = error.kind(), .text = error.what()}, kind, words);
}

TEST(Report, OfAMissingExtensionNamesItsCure)
{
    expect_report(
        {.state = "42883", .text = "function kzcat.kz_scan(bigint, bytea, bytea) does not exist"},
        Kind::failed, "CREATE EXTENSION kzmatch SCHEMA kzcat");
    expect_report({.state = "58P01", .text = "could not access file \"$libdir/kzmatch\": No such"},
                  Kind::failed, "postgresql-15-kzmatch");
    expect_report({.state = "42883", .text = "function other() does not exist"}, Kind::failed,
                  "the server reported");
}

TEST(Report, HasTheServersOwnCure)
{
    expect_report({.state = "22023", .text = "kzmatch: it is odd", .hint = "Use one version."},
                  Kind::failed, "kzmatch: it is odd; Use one version.");
}

TEST(Report, OfAStandbysConflictBlamesNoWriters)
{
    expect_report({.state = "40001", .text = "canceling statement due to conflict with recovery"},
                  Kind::busy, "max_standby_streaming_delay");
    expect_report({.state = "40P01", .text = "deadlock detected"}, Kind::busy, "other writers");
}

TEST(Report, OfAShardSaysSo)
{
    for (const char* state : {"53100", "XX001", "40P01", "55P03"}) {
        expect_report({.state = state,
                       .text = "it is so",
                       .context = "remote SQL command: SELECT codes FROM kzcat.trail"},
                      state == std::string_view("53100")   ? Kind::full
                      : state == std::string_view("XX001") ? Kind::damaged
                                                           : Kind::busy,
                      "music, one of the shards: ");
    }
}

TEST(Report, OfAServerThatRecoversHasOneTryAgain)
{
    for (const char* text : {"FATAL:  the database system is in recovery mode",
                             "FATAL:  the database system is not yet accepting connections"}) {
        const StoreError error = postgresql::describe_refusal("music", text);
        EXPECT_EQ(Kind::busy, error.kind()) << error.what();
    }
}

class Server : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
    }

    static Failure connecting(const std::string& url)
    {
        return failure_of([&] { const Connection session(url); });
    }
};

TEST_F(Server, MayRefuseAUserOrADatabase)
{
    const std::string url = server().new_database();
    Connection session(url);
    session.execute("CREATE ROLE idle; CREATE ROLE guest LOGIN");
    expect_report(connecting(url + "&user=idle"), Kind::cannot_open, "ALTER ROLE ... LOGIN");
    session.execute("DO $$ BEGIN EXECUTE format('REVOKE CONNECT ON DATABASE %I FROM PUBLIC', "
                    "current_database()); END $$");
    expect_report(connecting(url + "&user=guest"), Kind::cannot_open, "GRANT CONNECT ON DATABASE");
    const std::string database(session.query("SELECT current_database()::text").text(0, 0));
    Connection(server().url()).execute("ALTER DATABASE " + database + " ALLOW_CONNECTIONS false");
    expect_report(connecting(url), Kind::cannot_open, "refuses the connection");
}

TEST_F(Server, PassesOnWhatItsShardsReport)
{
    Connection session(server().new_database());
    session.execute(
        "CREATE SCHEMA kzcat; CREATE EXTENSION postgres_fdw; CREATE VIEW worn AS SELECT 1 / "
        "(oid::int - oid::int) AS "
        "codes FROM pg_class; "
        "CREATE SERVER far FOREIGN DATA WRAPPER postgres_fdw OPTIONS (host '" +
        server().host() + "', port '" + std::to_string(server().port()) +
        "', dbname 'none'); CREATE FOREIGN TABLE far (codes integer) SERVER far OPTIONS "
        "(schema_name 'kzcat', table_name 'worn')");
    const auto reading = [&] {
        return failure_of([&] { session.query("SELECT codes FROM far"); });
    };
    expect_report(reading(), Kind::cannot_open, "CREATE USER MAPPING");
    session.execute("CREATE USER MAPPING FOR CURRENT_USER SERVER far OPTIONS (user 'postgres')");
    expect_report(reading(), Kind::failed, "server far: the server has no such database");
    session.execute("DO $$ BEGIN EXECUTE format('ALTER SERVER far OPTIONS (SET dbname %L)', "
                    "current_database()); END $$");
    expect_report(reading(), Kind::failed, "one of the shards: the server reported: division");
}

} // namespace
} // namespace kzcat::test
