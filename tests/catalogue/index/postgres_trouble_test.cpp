// Catalogues on servers when memory is short, the client's libraries' included, and when
// connections end in the middle of the work: what was begun is done or not, nothing leaks, and the
// next call works.

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <functional>
#include <memory>
#include <new>
#include <thread>

#include <gtest/gtest.h>

#include "catalogue/index/clips.hpp"
#include "catalogue/index/fleet.hpp"
#include "catalogue/index/index.hpp"
#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/jobs.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace {

/// What the test's thread takes from the heap.
struct Heap {
    bool armed = false;
    bool lasting = false;
    uint64_t nth = 0;
    uint64_t calls = 0;
    bool fired = false;
    int64_t live = 0; ///< blocks
};
thread_local Heap heap;

bool fails()
{
    if (!heap.armed) {
        return false;
    }
    ++heap.calls;
    const bool is_its_turn = heap.lasting ? heap.calls >= heap.nth : heap.calls == heap.nth;
    heap.fired = heap.fired || is_its_turn;
    errno = is_its_turn ? ENOMEM : errno;
    return is_its_turn;
}

} // namespace

// The C library's own, by the names that replacements go on with.
extern "C" {
void* __libc_malloc(size_t bytes);
void* __libc_calloc(size_t count, size_t bytes);
void* __libc_realloc(void* block, size_t bytes);
void __libc_free(void* block);

void* malloc(size_t bytes)
{
    void* const block = fails() ? nullptr : __libc_malloc(bytes);
    heap.live += block != nullptr ? 1 : 0;
    return block;
}

void* calloc(size_t count, size_t bytes)
{
    void* const block = fails() ? nullptr : __libc_calloc(count, bytes);
    heap.live += block != nullptr ? 1 : 0;
    return block;
}

void* realloc(void* old, size_t bytes)
{
    void* const block = fails() ? nullptr : __libc_realloc(old, bytes);
    heap.live += old == nullptr && block != nullptr ? 1 : 0;
    return block;
}

void free(void* block)
{
    heap.live -= block != nullptr ? 1 : 0;
    __libc_free(block);
}
}

namespace kzcat {
namespace {

using test::add;
using test::clip_of;
using test::Fleet;
using test::new_tracks;

constexpr uint64_t kTracks = 12;

IndexOptions options_for(const std::string& url)
{
    IndexOptions options;
    options.write_from = 1;
    options.server = url;
    return options;
}

/// Runs `act` with one allocation failing, or all from there on; whether it ended with a failure,
/// which must be one that says that memory is short, or what else became of it.
bool run_short_of_memory(const std::function<void()>& act, uint64_t nth, bool lasting)
{
    bool threw = false;
    bool says_why = true;
    heap = {.armed = true,
            .lasting = lasting,
            .nth = nth,
            .calls = 0,
            .fired = false,
            .live = heap.live};
    try {
        act();
    } catch (const std::bad_alloc&) {
        threw = true;
    } catch (const StoreError& error) {
        threw = true;
        says_why = *error.what() != '\0' && error.kind() != StoreError::Kind::damaged;
    }
    heap.armed = false;
    EXPECT_TRUE(says_why) << nth;
    EXPECT_TRUE(heap.fired || !threw) << nth;
    return threw;
}

/// `act` meets a failure at every `step`th of its allocations; `check` is called after each.
void fail_everywhere(uint64_t step, const std::function<void()>& act,
                     const std::function<void()>& check)
{
    for (const bool lasting : {false, true}) {
        uint64_t failures = 0;
        for (uint64_t nth = 1; !testing::Test::HasFailure(); nth += lasting ? 2 * step + 1 : step) {
            failures += run_short_of_memory(act, nth, lasting) ? 1U : 0U;
            const bool met = heap.fired;
            check();
            if (!met) {
                break;
            }
        }
        EXPECT_LT(3U, failures);
    }
}

std::vector<std::string> faults(Store& store)
{
    std::vector<std::string> texts;
    store.verify([&](const Fault& fault) { texts.push_back(fault.text); },
                 [](uint64_t, uint64_t) { return true; });
    return texts;
}

/// A coordinator of two shards with some tracks, and one server for all that needs no shards.
class Trouble : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        if (kz::test::postgres_obstacle().empty()) {
            fleet_ = std::make_unique<Fleet>();
            store_ = open_postgres_store(url(), Access::create);
            ids_ = add(*store_, 1, kTracks);
            open_index(*store_, options_for(url())); // which posts them
        }
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

    static std::string url() { return fleet_->coordinator.url(); }

    /// As when a network fails, or an administrator restarts.
    static void end_sessions(const kz::test::PostgresServer& server)
    {
        server.sql("SELECT pg_terminate_backend(pid, 5000) FROM pg_stat_activity "
                   "WHERE backend_type = 'client backend' AND pid <> pg_backend_pid()");
    }

    /// The tracks that another session sees.
    static uint64_t others_count()
    {
        return std::stoull(fleet_->coordinator.sql("SELECT count(*) FROM kzcat.track"));
    }

    static bool is_found(Index& index, uint64_t number)
    {
        const auto places = index.find(clip_of(number, 8), 3);
        return !places.empty() && places.front().track == ids_[number - 1] &&
               places.front().position == 50;
    }

    static inline std::unique_ptr<Fleet> fleet_;
    static inline std::unique_ptr<Store> store_;
    static inline std::vector<int64_t> ids_;
};

TEST_F(Trouble, ShortMemoryAddsAllOfABatchOrNone)
{
    uint64_t next = 1001;
    uint64_t count = store_->track_count();
    std::vector<NewTrack> batch = new_tracks(next, 3);
    fail_everywhere(
        5, [&] { store_->add(batch); },
        [&] {
            const uint64_t now = others_count();
            EXPECT_TRUE(now == count || now == count + 3) << now - count;
            store_->add(batch);
            EXPECT_EQ(count + 3, store_->track_count());
            count += 3;
            batch = new_tracks(next += 3, 3);
        });
    EXPECT_EQ(std::vector<std::string>(), faults(*store_));
}

TEST_F(Trouble, ShortMemoryRemovesATrackOrNot)
{
    int64_t track = add(*store_, 5001, 1).front();
    uint64_t number = 5001;
    fail_everywhere(
        3, [&] { store_->remove(track); },
        [&] {
            store_->remove(track);
            EXPECT_FALSE(store_->find_track(track));
            track = add(*store_, ++number, 1).front();
        });
    EXPECT_EQ(std::vector<std::string>(), faults(*store_));
}

TEST_F(Trouble, ShortMemoryLeavesReadersTheirSession)
{
    fail_everywhere(
        2,
        [&] {
            store_->find_track(ids_[2]);
            store_->trail(ids_[2]);
            store_->find_source("track 3");
            store_->changes(0, 3);
        },
        [&] {
            EXPECT_EQ(test::codes_of(3), store_->trail(ids_[2])->codes);
            store_->set_setting("a", "b"); // not in a transaction for readers that was left open
        });
}

TEST_F(Trouble, ShortMemoryMakesNoLookUpWrong)
{
    const auto index = open_index(*store_, options_for(url()));
    fail_everywhere(
        17, [&] { EXPECT_TRUE(is_found(*index, 5)); }, [&] { EXPECT_TRUE(is_found(*index, 6)); });
}

TEST_F(Trouble, ShortMemoryWhileOpeningLeaksNothing)
{
    const auto open_both = [] {
        const auto store = open_postgres_store(url(), Access::read);
        is_found(*open_index(*store, options_for(url())), 3);
    };
    open_both();
    open_both();
    const int64_t before = heap.live;
    open_both();
    ASSERT_EQ(before, heap.live);
    for (uint64_t nth = 1; nth < 6000 && !HasFailure(); nth += 397) {
        run_short_of_memory(open_both, nth, nth % 2 == 0);
        EXPECT_EQ(before, heap.live) << "allocation " << nth;
    }
}

TEST_F(Trouble, AConnectionThatEndsUndoesWhatWasBegun)
{
    const uint64_t count = store_->track_count();
    {
        postgresql::Transaction transaction(connection_of(*store_),
                                            postgresql::Transaction::Kind::write);
        add(*store_, 7001, 4);
        end_sessions(fleet_->coordinator);
        EXPECT_THROW(transaction.commit(), StoreError);
    }
    EXPECT_EQ(count, store_->track_count());
    add(*store_, 7001, 4);
    EXPECT_EQ(count + 4, store_->track_count());
    end_sessions(fleet_->one);
    end_sessions(fleet_->two);
    add(*store_, 7101, 4);
    EXPECT_EQ(std::vector<std::string>(), faults(*store_));
}

TEST_F(Trouble, AConnectionThatEndsMakesNoLookUpWrong)
{
    const auto index = open_index(*store_, options_for(url()));
    std::atomic<bool> is_over = false;
    std::thread network([&] {
        for (int i = 0; !is_over; ++i) {
            end_sessions(i % 2 == 0 ? fleet_->coordinator : fleet_->one);
        }
    });
    int found = 0;
    for (uint64_t i = 0; i < 40; ++i) {
        try {
            EXPECT_TRUE(is_found(*index, 1 + i % kTracks)) << i;
            ++found;
        } catch (const StoreError& error) {
            EXPECT_NE(StoreError::Kind::damaged, error.kind()) << error.what();
        }
    }
    is_over = true;
    network.join();
    EXPECT_TRUE(is_found(*index, 1));
    EXPECT_EQ(2U, index->coverage().answered);
}

TEST_F(Trouble, AConnectionThatEndsGivesItsJobToAnother)
{
    const auto first = open_jobs(url(), Access::create);
    first->add(std::vector<std::string>{"a"}, false);
    ASSERT_TRUE(first->take("one", 3));
    end_sessions(fleet_->coordinator);
    const auto second = open_jobs(url(), Access::write);
    const auto job = second->take("two", 3);
    ASSERT_TRUE(job);
    EXPECT_EQ(2, job->attempt);
    const auto tracks = new_tracks(8001, 1);
    EXPECT_THROW(first->finish(tracks, 0), StoreError);
    second->finish(tracks, 0);
    EXPECT_EQ(1U, second->counts().done);
}

} // namespace
} // namespace kzcat
