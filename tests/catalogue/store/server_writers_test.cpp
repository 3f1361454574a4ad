// Writers that wait, fail, or die, and servers that do.

#include <csignal>
#include <future>
#include <thread>

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include "catalogue/store/postgresql/postgres_store.hpp"
#include "tests/catalogue/store/content.hpp"
#include "tests/catalogue/store/databases.hpp"
#include "tests/catalogue/store/files.hpp"
#include "tests/catalogue/store/tracks.hpp"

namespace kzcat::test {
namespace {

using Kind = StoreError::Kind;
using Transaction = postgresql::Transaction;

class Writers : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
    }

    static std::unique_ptr<Store> open(const Databases& databases, Access access = Access::create)
    {
        return open_postgres_store(databases.url(), access);
    }
};

TEST_F(Writers, WaitForEachOther)
{
    const Databases databases{1};
    const auto first = open(databases);
    const auto second = open_postgres_store(databases.url(), Access::write,
                                            {.patience = std::chrono::milliseconds(50)});
    {
        Transaction holds(connection_of(*first), Transaction::Kind::write);
        add(*first, make_track(1));
        const Failure failure = failure_of([&] { add(*second, make_track(2)); });
        EXPECT_EQ(Kind::busy, failure.kind) << failure.text;
        EXPECT_EQ(0U, second->track_count()) << "readers do not wait, and see what is committed";
        holds.commit();
    }
    EXPECT_EQ(2, add(*second, make_track(2)).track);
}

TEST_F(Writers, TakePartInTheCallersTransaction)
{
    for (const size_t count : {size_t{1}, size_t{3}}) {
        const Databases databases{count};
        const auto store = open(databases);
        add_tracks(*store, 1, 3);
        const std::string before = content(*store);
        {
            const Transaction undone(connection_of(*store), Transaction::Kind::write);
            add_tracks(*store, 4, 5);
            store->remove(2);
        }
        EXPECT_EQ(before, content(*store));
        {
            Transaction kept(connection_of(*store), Transaction::Kind::write);
            add_tracks(*store, 4, 5);
            store->remove(2);
            kept.commit();
        }
        EXPECT_EQ(7U, store->track_count());
        add(*store, make_track(20));
        EXPECT_EQ(std::vector<std::string>(), faults(*store));
    }
}

TEST_F(Writers, KeepCodesOfTracksThatAreThere)
{
    const Databases databases{3};
    const auto store = open(databases);
    add_tracks(*store, 1, 6);
    connection_of(*store).execute("INSERT INTO pending SELECT id, shard FROM track");
    store->set_setting("a", "b"); // a writer, which looks for what others have left
    EXPECT_EQ(std::vector<std::string>(), faults(*store));
}

TEST_F(Writers, MustNotCommitWhatHasFailed)
{
    const Databases databases{1};
    const auto store = open(databases);
    Transaction transaction(connection_of(*store), Transaction::Kind::write);
    add(*store, make_track(1));
    EXPECT_THROW(connection_of(*store).execute("SELECT 1 / 0"), StoreError);
    EXPECT_THROW(transaction.commit(), StoreError);
}

TEST_F(Writers, LetReadersMissNoChange)
{
    const Databases databases{3};
    open(databases);
    std::vector<std::future<void>> writers;
    for (uint64_t writer = 0; writer < 3; ++writer) {
        writers.push_back(std::async(std::launch::async, [&, writer] {
            const auto store = open(databases, Access::write);
            for (uint64_t number = 0; number < 12; ++number) {
                add(*store, make_track(100 * writer + number));
            }
        }));
    }
    const auto reader = open(databases, Access::read);
    int64_t cursor = 0;
    for (size_t seen = 0; seen < 36;) {
        for (const Change& change : reader->changes(cursor, 5)) {
            ASSERT_EQ(cursor + 1, change.cursor) << "none comes below one that was seen";
            cursor = change.cursor;
            ++seen;
            ASSERT_TRUE(reader->trail(change.track));
        }
    }
    EXPECT_EQ(std::vector<std::string>(), faults(*reader));
}

TEST_F(Writers, ConnectAgainToAServerThatWasGone)
{
    kz::test::PostgresServer own;
    const auto store = open_postgres_store(own.url(), Access::create);
    add(*store, make_track(1));
    own.kill9();
    const Failure failure = failure_of([&] { add(*store, make_track(2)); });
    EXPECT_NE(Kind::damaged, failure.kind) << failure.text;
    own.start();
    EXPECT_EQ(make_trail(1), store->trail(1));
    EXPECT_TRUE(add(*store, make_track(2)).is_new);
    own.restart(); // ends the session in an orderly way, which is seen before the next statement
    EXPECT_EQ(2U, store->track_count());
}

/// A catalogue of which one shard lies on a server of its own.
class BrokenShard : public Writers {
protected:
    void SetUp() override
    {
        Writers::SetUp();
        if (IsSkipped()) {
            return;
        }
        postgresql::Connection session(url_ = server().new_database());
        session.execute("CREATE SCHEMA kzcat; CREATE TABLE kzcat.shard (number INTEGER PRIMARY "
                        "KEY, address TEXT NOT NULL)");
        far_ = std::make_unique<kz::test::PostgresServer>();
        for (const auto& [number, address] :
             {std::pair(int64_t{1}, server().new_database()), std::pair(int64_t{2}, far_->url())}) {
            session.query("INSERT INTO shard (number, address) VALUES ($1::bigint, $2)", number,
                          std::string_view{address});
        }
        store_ = open_postgres_store(url_, Access::create);
        add_tracks(*store_, 1, 8);
    }

    int64_t shard_of(int64_t track)
    {
        return connection_of(*store_)
            .query("SELECT shard FROM track WHERE id = $1", track)
            .integer(0, 0);
    }

    /// Tracks whose codes are, or would be, on the shard.
    std::vector<int64_t> tracks_on(int64_t shard)
    {
        std::vector<int64_t> tracks;
        for (const int64_t track : track_ids(*store_)) {
            if (shard_of(track) == shard) {
                tracks.push_back(track);
            }
        }
        return tracks;
    }

    int64_t pending()
    {
        return connection_of(*store_).query("SELECT count(*) FROM pending").integer(0, 0);
    }

    std::string url_;
    std::unique_ptr<kz::test::PostgresServer> far_;
    std::unique_ptr<Store> store_;
};

TEST_F(BrokenShard, FailsWhatNeedsItAndIsNamed)
{
    const auto here = tracks_on(1);
    const auto there = tracks_on(2);
    ASSERT_FALSE(here.empty());
    ASSERT_FALSE(there.empty());
    const int64_t before = store_->last_change();
    far_->kill9();
    EXPECT_TRUE(store_->trail(here.front()));
    for (const std::function<void()>& act : std::vector<std::function<void()>>{
             [&] { store_->trail(there.front()); }, [&] { add_tracks(*store_, 20, 12); },
             [&] { faults(*store_); },
             [&] { store_->visit_trails(0, [](int64_t, const Trail&) { return true; }); }}) {
        const Failure failure = failure_of(act);
        EXPECT_NE(std::string::npos, failure.text.find("shard 2")) << failure.text;
        EXPECT_NE(Kind::damaged, failure.kind);
    }
    EXPECT_EQ(before, store_->last_change()) << "a batch is added as a whole or not at all";
    EXPECT_GT(pending(), 0) << "codes may be left on the other shard";
    far_->start();
    add_tracks(*store_, 20, 12);
    EXPECT_EQ(0, pending());
    EXPECT_EQ(std::vector<std::string>(), faults(*store_));
    EXPECT_EQ(20U, store_->track_count());
}

TEST_F(BrokenShard, DoesNotKeepTracksFromBeingRemoved)
{
    const int64_t gone = tracks_on(2).front();
    far_->kill9();
    EXPECT_TRUE(store_->remove(gone));
    EXPECT_EQ(std::nullopt, store_->trail(gone));
    EXPECT_EQ(1, pending());
    far_->start();
    store_->set_setting("a", "b");
    EXPECT_EQ(0, pending());
    EXPECT_EQ(std::vector<std::string>(), faults(*store_));
    EXPECT_EQ("0\n",
              far_->sql("SELECT count(*) FROM kzcat.trail WHERE track = " + std::to_string(gone)));
}

TEST_F(BrokenShard, MustBePartOfThisCatalogue)
{
    postgresql::Connection(url_).execute(
        "UPDATE shard SET address = (SELECT address FROM shard WHERE number = 1) WHERE number = 2");
    const auto store = open_postgres_store(url_, Access::read);
    const Failure failure = failure_of([&] { store->trail(tracks_on(2).front()); });
    EXPECT_EQ(Kind::cannot_open, failure.kind);
    EXPECT_NE(std::string::npos, failure.text.find("another part")) << failure.text;
}

/// Adds tracks until it is killed, and writes a byte for each that was kept.
[[noreturn]] void add_for_ever(const std::string& url, uint64_t first, int acknowledge)
{
    try {
        const auto store = open_postgres_store(url, Access::write);
        for (uint64_t number = first;; ++number) {
            add(*store, make_track(number, 2000));
            static_cast<void>(!::write(acknowledge, "", 1));
        }
    } catch (const std::exception& error) {
        std::fprintf(stderr, "%s\n", error.what());
    }
    _exit(1);
}

/// Kills a writer some time after its first track; how many it had reported as kept.
uint64_t killed_after(std::chrono::milliseconds time, const std::string& url, uint64_t first)
{
    int pipes[2] = {};
    EXPECT_EQ(0, ::pipe(pipes));
    const pid_t child = fork();
    if (child == 0) {
        add_for_ever(url, first, pipes[1]);
    }
    ::close(pipes[1]);
    char byte = 0;
    uint64_t count = ::read(pipes[0], &byte, 1) == 1 ? 1 : 0;
    std::this_thread::sleep_for(time);
    ::kill(child, SIGKILL);
    ::waitpid(child, nullptr, 0);
    while (::read(pipes[0], &byte, 1) == 1) {
        ++count;
    }
    ::close(pipes[0]);
    return count;
}

TEST_F(Writers, LoseNothingAndLeaveNothingWhenKilled)
{
    const Databases databases{3};
    const auto store = open(databases);
    uint64_t number = 1;
    for (int round = 0; round < 8; ++round) {
        const uint64_t kept =
            killed_after(std::chrono::milliseconds(20 + 7 * round), databases.url(), number);
        for (uint64_t one = number; one < number + kept; ++one) {
            ASSERT_TRUE(store->find_source(make_source(one).uri)) << one;
        }
        number += kept + 1; // one more may have been kept than was reported
        store->set_setting("round", std::to_string(round)); // the next writer clears up
        ASSERT_EQ(std::vector<std::string>(), faults(*store));
    }
    EXPECT_GT(number, 16U) << "each writer added tracks";
    EXPECT_EQ(0, connection_of(*store).query("SELECT count(*) FROM pending").integer(0, 0));
}

} // namespace
} // namespace kzcat::test
