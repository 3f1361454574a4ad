// Sessions with servers and shards: what they begin with, what they wait for, and what becomes of
// writers whose sessions end.

#include <fstream>
#include <future>
#include <thread>

#include <gtest/gtest.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include "catalogue/store/postgresql/code_writer.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"
#include "tests/catalogue/store/databases.hpp"
#include "tests/catalogue/store/files.hpp"
#include "tests/catalogue/store/tracks.hpp"
#include "tests/support/scratch_directory.hpp"

namespace kzcat::test {
namespace {

using Kind = StoreError::Kind;
using postgresql::Connection;
using postgresql::ConnectionOptions;

class Session : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
    }

    static int64_t process_of(Connection& session)
    {
        return session.query("SELECT pg_backend_pid()").integer(0, 0);
    }

    /// Ends a session, and returns when it has gone.
    static void end(Connection& other, int64_t process)
    {
        other.query("SELECT pg_terminate_backend($1::integer)", process);
        while (!other.query("SELECT FROM pg_stat_activity WHERE pid = $1", process).empty()) {
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
    }

    static int socket_option(const Connection& session, int option)
    {
        int value = 0;
        socklen_t size = sizeof value;
        ::getsockopt(postgresql::PQsocket(session.handle()), IPPROTO_TCP, option, &value, &size);
        return value;
    }

    /// A server that is connected to by 127.0.0.1, with a password.
    static kz::test::PostgresServer& guarded()
    {
        static kz::test::PostgresServer server({.tcp = true, .password = "right", .settings = {}});
        return server;
    }
};

TEST_F(Session, HasItsSettingsWhenMadeAnew)
{
    Connection other(server().url());
    Connection session(server().url(), {.session = "SET jit = off; SET work_mem = '3MB'"});
    EXPECT_EQ("3MB", session.query("SHOW work_mem").text(0, 0));
    end(other, process_of(session));
    try {
        session.query("SELECT 1");
    } catch (const StoreError&) { // it may meet the end, and the next one connects again
    }
    EXPECT_EQ("3MB", session.query("SHOW work_mem").text(0, 0));
}

TEST_F(Session, IsNotUsedWithoutItsSettings)
{
    Connection other(server().url());
    other.execute("CREATE ROLE acting");
    Connection session(server().url(), {.session = "SET ROLE acting"});
    end(other, process_of(session));
    other.execute("DROP ROLE acting");
    for (int i = 0; i < 3; ++i) {
        EXPECT_NE("", failure_of([&] { session.query("SELECT current_user"); }).text) << i;
    }
    other.execute("CREATE ROLE acting");
    EXPECT_EQ("acting", session.query("SELECT current_user").text(0, 0));
}

TEST_F(Session, NoticesAHostThatHasGone)
{
    const std::string url = guarded().tcp_url("postgres", "postgres:right");
    Connection usual(url);
    EXPECT_EQ(30, socket_option(usual, TCP_KEEPIDLE));
    EXPECT_EQ(10, socket_option(usual, TCP_KEEPINTVL));
    EXPECT_EQ(3, socket_option(usual, TCP_KEEPCNT));
    EXPECT_EQ(40'000, socket_option(usual, TCP_USER_TIMEOUT));
    // And so is a client that has, by the server: it may hold a lock.
    EXPECT_EQ("30", usual.query("SHOW tcp_keepalives_idle").text(0, 0));
    EXPECT_EQ("10", usual.query("SHOW tcp_keepalives_interval").text(0, 0));
    EXPECT_EQ("3", usual.query("SHOW tcp_keepalives_count").text(0, 0));
    const Connection chosen(url + "?keepalives_idle=77&tcp_user_timeout=5000");
    EXPECT_EQ(77, socket_option(chosen, TCP_KEEPIDLE));
    EXPECT_EQ(5000, socket_option(chosen, TCP_USER_TIMEOUT));
}

/// A catalogue on the guarded server whose one shard has a database of its own there.
class ShardSession : public Session {
protected:
    void SetUp() override
    {
        Session::SetUp();
        if (IsSkipped()) {
            return;
        }
        const std::string number = std::to_string(++count_);
        guarded().sql("CREATE DATABASE own" + number);
        guarded().sql("CREATE DATABASE shard" + number);
        own_ = "own" + number;
        shard_ = "shard" + number;
        setenv("PGPASSFILE", file_.c_str(), 1);
    }
    void TearDown() override { unsetenv("PGPASSFILE"); }

    void set_shard(const std::string& login)
    {
        Connection session(guarded().url(own_));
        session.execute("CREATE SCHEMA kzcat; CREATE TABLE kzcat.shard (number INTEGER PRIMARY "
                        "KEY, address TEXT NOT NULL)");
        const std::string address =
            "host=127.0.0.1 port=" + std::to_string(guarded().port()) + " dbname=" + shard_ + login;
        session.query("INSERT INTO shard (number, address) VALUES (1, $1)",
                      std::string_view{address});
    }

    /// ~/.pgpass with the right password for these databases.
    void keep_password(const std::vector<std::string>& databases)
    {
        std::ofstream file(file_);
        for (const std::string& database : databases) {
            file << "127.0.0.1:" << guarded().port() << ':' << database << ":postgres:right\n";
        }
        file.close();
        ::chmod(file_.c_str(), S_IRUSR | S_IWUSR);
    }

    /// What adding a track meets; nothing when it is added.
    std::string adding(const std::string& user)
    {
        try {
            add(*open_postgres_store(guarded().tcp_url(own_, user), Access::create), make_track(1));
            return "";
        } catch (const StoreError& error) {
            return error.what();
        }
    }

    static inline int count_ = 0;
    kz::test::ScratchDirectory folder_;
    std::string file_ = folder_.path("pgpass");
    std::string own_;
    std::string shard_;
};

TEST_F(ShardSession, IsGivenNoPasswordOfAFile)
{
    set_shard("");
    keep_password({own_});
    const std::string text = adding("postgres");
    EXPECT_NE(std::string::npos, text.find("shard 1: the server wants a password")) << text;
    keep_password({own_, shard_});
    EXPECT_EQ("", adding("postgres"));
}

TEST_F(ShardSession, IsGivenThePasswordOfTheAddress)
{
    set_shard("");
    keep_password({});
    EXPECT_EQ("", adding("postgres:right"));
}

TEST_F(ShardSession, OfANamedUserIsGivenNoPassword)
{
    set_shard(" user=postgres");
    keep_password({});
    const std::string text = adding("postgres:right");
    EXPECT_NE(std::string::npos, text.find("shard 1: the server wants a password")) << text;
    keep_password({shard_});
    EXPECT_EQ("", adding("postgres:right"));
}

TEST_F(Session, ThatHasEndedWritesNoCodes)
{
    const Databases databases{2};
    const auto store = open_postgres_store(databases.url(), Access::create);
    add(*store, make_track(1));
    Connection shard(databases.shard(1));
    Connection other(databases.url());
    auto turn =
        std::make_unique<postgresql::Transaction>(shard, postgresql::Transaction::Kind::write);
    shard.query(postgresql::kTakeTurn);
    const int64_t process = process_of(connection_of(*store));
    auto adding = std::async(std::launch::async,
                             [&] { return failure_of([&] { add(*store, make_track(2)); }); });
    while (shard
               .query("SELECT FROM pg_locks WHERE locktype = 'advisory' AND NOT granted AND "
                      "database = (SELECT oid FROM pg_database WHERE datname = "
                      "current_database())")
               .empty()) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    end(other, process); // `pending` may be cleared from now on
    turn.reset();
    EXPECT_NE("", adding.get().text);
    EXPECT_EQ(1, shard.query("SELECT count(*) FROM trail").integer(0, 0));
}

} // namespace
} // namespace kzcat::test
