// Shards whose hosts say nothing: who waits for them, and how often.

#include <atomic>
#include <csignal>
#include <thread>

#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"
#include "catalogue/store/postgresql/shards.hpp"
#include "tests/catalogue/store/databases.hpp"
#include "tests/catalogue/store/files.hpp"
#include "tests/catalogue/store/tracks.hpp"

namespace kzcat::test {
namespace {

using postgresql::Connection;
using postgresql::Transaction;

class Silence : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
    }
};

/// Whether a writer of the session's catalogue is in its turn.
bool is_in_a_turn(Connection& session)
{
    const Transaction look(session, Transaction::Kind::write);
    return !session.query("SELECT pg_try_advisory_xact_lock(1264206657)").boolean(0, 0);
}

/// In a database that has no catalogue yet.
void make_shards(Connection& session, const std::vector<std::string>& addresses)
{
    session.execute("CREATE SCHEMA kzcat; CREATE TABLE kzcat.shard (number INTEGER PRIMARY "
                    "KEY, address TEXT NOT NULL)");
    int64_t number = 0;
    for (const std::string& address : addresses) {
        session.query("INSERT INTO shard (number, address) VALUES ($1::bigint, $2)", ++number,
                      std::string_view{address});
    }
}

/// Accepts connections, says nothing for a while and ends them.
class SilentHost {
public:
    explicit SilentHost(const std::string& catalogue)
        : listener_(::socket(AF_INET, SOCK_STREAM, 0)), observer_(catalogue)
    {
        sockaddr_in address = {};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        EXPECT_EQ(0, ::bind(listener_, reinterpret_cast<sockaddr*>(&address), size));
        EXPECT_EQ(0, ::listen(listener_, 8));
        ::getsockname(listener_, reinterpret_cast<sockaddr*>(&address), &size);
        port_ = ntohs(address.sin_port);
        thread_ = std::thread([this] { run(); });
    }
    ~SilentHost()
    {
        ::shutdown(listener_, SHUT_RDWR);
        thread_.join();
        ::close(listener_);
    }
    SilentHost(const SilentHost&) = delete;
    SilentHost& operator=(const SilentHost&) = delete;

    std::string address() const
    {
        return "host=127.0.0.1 port=" + std::to_string(port_) +
               " dbname=a sslmode=disable gssencmode=disable";
    }
    int connections() const { return connections_; }
    int in_a_turn() const { return in_a_turn_; }

private:
    void run()
    {
        for (int one = ::accept(listener_, nullptr, nullptr); one >= 0;
             one = ::accept(listener_, nullptr, nullptr)) {
            ++connections_;
            in_a_turn_ += is_in_a_turn(observer_) ? 1 : 0;
            std::this_thread::sleep_for(std::chrono::milliseconds(1100));
            ::close(one);
        }
    }

    int listener_;
    int port_ = 0;
    Connection observer_;
    std::atomic<int> connections_ = 0;
    std::atomic<int> in_a_turn_ = 0; ///< connections that a writer waited for in its turn
    std::thread thread_;
};

TEST_F(Silence, OfAShardIsWaitedForOnceBeforeTheTurn)
{
    const std::string url = server().new_database();
    const std::string shard = server().new_database();
    Connection session(url);
    const SilentHost silent(url);
    make_shards(session, {shard, silent.address()});
    const auto store = open_postgres_store(url, Access::create);
    session.execute("INSERT INTO pending VALUES (999, 2)"); // as an interrupted writer leaves it
    for (const char* value : {"a", "b", "c"}) {
        store->set_setting("name", value);
    }
    EXPECT_EQ(1, silent.connections());
    const Failure failure = failure_of([&] { add_tracks(*store, 1, 8); });
    EXPECT_NE(std::string::npos, failure.text.find("shard 2")) << failure.text;
    EXPECT_EQ(1, silent.connections());
    EXPECT_EQ(0, silent.in_a_turn());
}

/// A session whose server's process says nothing for a while, and then ends.
TEST_F(Silence, OfASessionIsWaitedForBeforeTheTurn)
{
    const Databases databases{3};
    const auto store = open_postgres_store(databases.url(), Access::create);
    add_tracks(*store, 1, 8); // which makes sessions with both shards
    Connection own(databases.url());
    Connection shard(databases.shard(2));
    const auto process = static_cast<pid_t>(
        shard
            .query("SELECT pid FROM pg_stat_activity WHERE datname = current_database() AND pid <> "
                   "pg_backend_pid() AND backend_type = 'client backend'")
            .integer(0, 0));
    own.execute("INSERT INTO pending VALUES (999, 2)"); // as an interrupted writer leaves it
    bool was_in_a_turn = false;
    ASSERT_EQ(0, ::kill(process, SIGSTOP));
    std::thread end([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(1200));
        was_in_a_turn = is_in_a_turn(own);
        ::kill(process, SIGTERM);
        ::kill(process, SIGCONT);
    });
    store->set_setting("name", "a");
    end.join();
    EXPECT_FALSE(was_in_a_turn);
    store->set_setting("name", "b");
    EXPECT_EQ(1, own.query("SELECT count(*) FROM pending").integer(0, 0)) << "it is let be";
}

TEST_F(Silence, OfAShardThatIsNotNeededKeepsNobody)
{
    const std::string url = server().new_database();
    Connection session(url);
    make_shards(session, {server().new_database()});
    add_tracks(*open_postgres_store(url, Access::create), 1, 2);
    const SilentHost silent(url);
    session.query("INSERT INTO shard (number, address) VALUES (2, $1)",
                  std::string_view{silent.address()});
    postgresql::Shards shards(session, "");
    uint64_t number = 10;
    while (shards.place_of(content_key(make_trail(number))) == 2) {
        ++number;
    }
    EXPECT_TRUE(add(*open_postgres_store(url, Access::write), make_track(number)).is_new);
    EXPECT_EQ(0, silent.connections());
}

} // namespace
} // namespace kzcat::test
