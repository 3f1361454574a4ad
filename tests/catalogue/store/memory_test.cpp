// Every allocation of every call fails in turn, those of SQLite too: the call throws
// std::bad_alloc, has changed nothing, leaves nothing allocated, and can be repeated.

#include <cstdlib>
#include <functional>
#include <memory>
#include <new>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>
#include <sqlite3.h>

#include "catalogue/store/memory/memory_store.hpp"
#include "tests/catalogue/store/content.hpp"
#include "tests/catalogue/store/faulty_files.hpp"
#include "tests/catalogue/store/files.hpp"

namespace {

struct Heap {
    bool armed = false;
    bool lasting = false;
    uint64_t nth = 0;
    uint64_t calls = 0;
    bool fired = false;
    int64_t live = 0; ///< blocks of operator new
};
Heap heap;

bool fails()
{
    if (!heap.armed) {
        return false;
    }
    ++heap.calls;
    const bool is_its_turn = heap.lasting ? heap.calls >= heap.nth : heap.calls == heap.nth;
    heap.fired = heap.fired || is_its_turn;
    return is_its_turn;
}

sqlite3_mem_methods usual;

/// SQLite's own allocator, which fails when its turn comes.
void make_sqlite_fail()
{
    sqlite3_config(SQLITE_CONFIG_GETMALLOC, &usual);
    sqlite3_mem_methods failing = usual;
    failing.xMalloc = [](int bytes) { return fails() ? nullptr : usual.xMalloc(bytes); };
    failing.xRealloc = [](void* block, int bytes) {
        return fails() ? nullptr : usual.xRealloc(block, bytes);
    };
    sqlite3_config(SQLITE_CONFIG_MALLOC, &failing);
    // Without it SQLite takes its small blocks from a store of its own, which never fails.
    sqlite3_config(SQLITE_CONFIG_LOOKASIDE, 0, 0);
    sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 1);
}

} // namespace

void* operator new(size_t bytes)
{
    void* block = fails() ? nullptr : std::malloc(bytes == 0 ? 1 : bytes);
    if (block == nullptr) {
        throw std::bad_alloc();
    }
    ++heap.live;
    return block;
}

void operator delete(void* block) noexcept
{
    if (block != nullptr) {
        --heap.live;
        std::free(block);
    }
}

void operator delete(void* block, size_t) noexcept { operator delete(block); }

namespace kzcat::test {
namespace {

class Memory : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        static const bool once = [] {
            make_sqlite_fail();
            return faulty_files() != nullptr;
        }();
        static_cast<void>(once);
    }

    std::string path() const { return folder_.path("a.kzc"); }

    std::unique_ptr<Store> open(Access access = Access::create) const
    {
        return open_sqlite_store(path(), access, {.vfs = faulty_files()});
    }

    kz::test::ScratchDirectory folder_;
};

using Act = std::function<void(Store&)>;

/// Runs `act` with one allocation failing, or all from there on; whether it met the failure.
bool run_short_of_memory(const Act& act, Store& store, uint64_t nth, bool lasting)
{
    bool threw = false;
    heap = {.armed = true,
            .lasting = lasting,
            .nth = nth,
            .calls = 0,
            .fired = false,
            .live = heap.live};
    try {
        act(store);
    } catch (const std::bad_alloc&) {
        threw = true;
    }
    heap.armed = false;
    EXPECT_TRUE(heap.fired || !threw);
    return threw;
}

/// What a store is made of anew for each round.
using Maker = std::function<std::unique_ptr<Store>()>;

/// `act` fails at each of its allocations, and changes nothing; repeated, it does what it should.
void fail_everywhere(const Maker& make, const Act& act)
{
    std::string done;
    {
        const auto store = make();
        act(*store);
        done = content(*store, false);
    }
    for (const bool lasting : {false, true}) {
        for (uint64_t nth = 1;; nth += lasting ? 5 : 1) {
            const auto store = make();
            const std::string before = content(*store);
            const bool threw = run_short_of_memory(act, *store, nth, lasting);
            const bool met = heap.fired;
            if (threw) {
                ASSERT_EQ(before, content(*store)) << "allocation " << nth;
                act(*store);
            }
            ASSERT_EQ(done, content(*store, false)) << "allocation " << nth;
            ASSERT_EQ(std::vector<std::string>(), faults(*store)) << "allocation " << nth;
            if (!met) {
                break;
            }
        }
    }
}

/// Calls that change a store with the tracks 1, 2 and 3, and calls that read it.
const std::pair<const char*, Act> kCalls[] = {
    {"add",
     [](Store& store) {
         std::vector<NewTrack> tracks = {make_track(9, 1000), make_track(1)};
         tracks[0].document_bands = make_bands(9);
         tracks[0].added = tracks[1].added = 1;
         tracks[1].source = make_source(2);
         tracks[1].tags = {{"album", "A"}};
         store.add(tracks);
     }},
    {"add_source", [](Store& store) { store.add_source(1, make_source(20)); }},
    {"remove", [](Store& store) { store.remove(2); }},
    {"remove_source", [](Store& store) { store.remove_source(make_source(2).uri); }},
    {"set_setting", [](Store& store) { store.set_setting("a", "value"); }},
    {"reading",
     [](Store& store) {
         content(store);
         store.find_source(make_source(1).uri);
         store.find_hash(make_hash(2));
         store.find_track(3);
         store.trail(3);
     }},
    {"verify",
     [](Store& store) {
         store.verify([](const Fault&) {}, [](uint64_t, uint64_t) { return true; });
     }},
};

void fill(Store& store)
{
    std::vector<NewTrack> tracks = {make_track(1), make_track(2), make_track(3)};
    for (NewTrack& track : tracks) {
        track.added = 1;
    }
    store.add(tracks);
}

TEST_F(Memory, ShortnessChangesNothingInAFile)
{
    fill(*open());
    const std::string bytes = read_file(path());
    for (const auto& [name, act] : kCalls) {
        SCOPED_TRACE(name);
        fail_everywhere(
            [&] {
                for (const char* end : {"", "-wal", "-shm"}) {
                    std::filesystem::remove(path() + end);
                }
                write_file(path(), bytes);
                return open(Access::write);
            },
            act);
    }
}

TEST_F(Memory, ShortnessChangesNothingInMemory)
{
    for (const auto& [name, act] : kCalls) {
        SCOPED_TRACE(name);
        fail_everywhere(
            [] {
                auto store = make_memory_store();
                fill(*store);
                return store;
            },
            act);
    }
}

TEST_F(Memory, ShortnessWhileOpeningLeavesNothing)
{
    for (const bool exists : {false, true}) {
        for (uint64_t nth = 1;; ++nth) {
            if (!exists) {
                std::filesystem::remove(path());
            }
            heap = {.armed = true,
                    .lasting = false,
                    .nth = nth,
                    .calls = 0,
                    .fired = false,
                    .live = heap.live};
            const int64_t before = heap.live;
            const int64_t sqlite_before = sqlite3_memory_used();
            std::unique_ptr<Store> store;
            try {
                store = open();
            } catch (const std::bad_alloc&) {
                EXPECT_TRUE(heap.fired);
            }
            heap.armed = false;
            const bool fired = heap.fired;
            if (store != nullptr) {
                EXPECT_TRUE(faults(*store).empty());
                store.reset();
            }
            EXPECT_EQ(before, heap.live) << "allocation " << nth;
            EXPECT_EQ(sqlite_before, sqlite3_memory_used()) << "allocation " << nth;
            EXPECT_TRUE(faults(*open()).empty());
            if (!fired || HasFailure()) {
                break;
            }
        }
    }
}

TEST_F(Memory, FailedCallsLeakNothing)
{
    fill(*open());
    const int64_t before = heap.live;
    const int64_t sqlite_before = sqlite3_memory_used();
    for (uint64_t nth = 1; nth < 200; nth += 7) {
        for (const auto& [name, act] : kCalls) {
            const auto store = open();
            run_short_of_memory(act, *store, nth, true);
        }
    }
    EXPECT_EQ(before, heap.live);
    EXPECT_EQ(sqlite_before, sqlite3_memory_used());
}

} // namespace
} // namespace kzcat::test
