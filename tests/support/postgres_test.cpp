// The servers that tests start are themselves tested: what they promise decides what other tests
// mean.

#include "support/postgres.hpp"

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>

#include <gtest/gtest.h>
#include <unistd.h>

#include "support/process.hpp"
#include "support/scratch_directory.hpp"

namespace {

using kz::test::postgres_obstacle;
using kz::test::PostgresServer;
using kz::test::ScratchDirectory;

class Postgres : public testing::Test {
protected:
    void SetUp() override
    {
        if (!postgres_obstacle().empty()) {
            GTEST_SKIP() << postgres_obstacle();
        }
    }
};

TEST_F(Postgres, WhatWasCommittedOutlivesAKill)
{
    PostgresServer server;
    server.sql("CREATE TABLE t (i int); INSERT INTO t VALUES (7)");
    server.kill9();
    EXPECT_FALSE(server.is_running());
    EXPECT_THROW(server.sql("SELECT 1"), std::runtime_error);
    server.start();
    EXPECT_EQ("7\n", server.sql("SELECT i FROM t"));
}

TEST_F(Postgres, AStandbyHasThePrimarysRows)
{
    const PostgresServer primary;
    const auto standby = PostgresServer::standby_of(primary);
    primary.sql("SET synchronous_commit = remote_apply; CREATE TABLE t (i int);"
                "INSERT INTO t VALUES (8)");
    while (standby->sql("SELECT to_regclass('t') IS NOT NULL") != "t\n") {
    }
    EXPECT_EQ("t\n", standby->sql("SELECT pg_is_in_recovery()"));
    standby->promote();
    EXPECT_EQ("f\n", standby->sql("SELECT pg_is_in_recovery()"));
}

TEST_F(Postgres, PasswordsAreAskedForOverTcpOnly)
{
    PostgresServer server({.tcp = true, .password = "right", .settings = {}});
    EXPECT_EQ("1\n", server.sql("SELECT 1"));
    const auto connect = [&server](const std::string& user_info) {
        return kz::test::run(
            {"/usr/bin/psql", "-XAtd", server.tcp_url("postgres", user_info), "-c", "SELECT 1"});
    };
    EXPECT_EQ("1\n", connect("postgres:right").out);
    EXPECT_NE(std::string::npos,
              connect("postgres:wrong").err.find("password authentication failed"));
}

TEST_F(Postgres, EachNewDatabaseIsEmpty)
{
    PostgresServer server;
    server.sql("CREATE TABLE t (i int)", "postgres");
    EXPECT_NE(server.new_database(), server.new_database());
    EXPECT_EQ("t\n", server.sql("SELECT to_regclass('t') IS NULL", "test_2"));
}

TEST_F(Postgres, NothingIsLeftWhenATestDies)
{
    const ScratchDirectory scratch;
    ::setenv("KZ_TEST_NOTE", scratch.path("note").c_str(), 0); // the dying test is another process
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            const PostgresServer server;
            std::ofstream(std::getenv("KZ_TEST_NOTE")) << server.host() << std::flush;
            ::raise(SIGKILL);
        },
        testing::KilledBySignal(SIGKILL), "");
    std::string folder;
    std::ifstream(scratch.path("note")) >> folder;
    ASSERT_FALSE(folder.empty());
    while (std::filesystem::exists(folder)) { // CTest's limit of time ends a failure
        ::usleep(10000);
    }
}

} // namespace
