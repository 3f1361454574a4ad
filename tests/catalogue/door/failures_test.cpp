// Every allocation of the C++ code and of SQLite, failing in turn, alone or with all later ones:
// the call reports it, loses nothing and leaks nothing.

#include <cstdlib>
#include <new>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <sqlite3.h>

#include "catalogue/door/music.hpp"
#include "support/allocation.hpp"
#include "support/scratch_directory.hpp"

// The run-time library's own would allocate unseen.
[[gnu::noinline]] void* operator new(size_t size)
{
    if (void* const block = std::malloc(size == 0 ? 1 : size)) {
        return block;
    }
    throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* block) noexcept { std::free(block); }
[[gnu::noinline]] void operator delete(void* block, size_t /*size*/) noexcept { std::free(block); }

namespace {

using namespace kz::test;

// ---- SQLite's allocator, over the one that can fail; each block knows its size.

constexpr size_t kHeader = 16;

void* take(int size)
{
    auto* const block = static_cast<char*>(std::malloc(static_cast<size_t>(size) + kHeader));
    if (block == nullptr) {
        return nullptr;
    }
    *reinterpret_cast<int*>(block) = size;
    return block + kHeader;
}
void give_back(void* block)
{
    if (block != nullptr) {
        std::free(static_cast<char*>(block) - kHeader);
    }
}
int size_of(void* block)
{
    return block == nullptr ? 0 : *reinterpret_cast<int*>(static_cast<char*>(block) - kHeader);
}
void* take_again(void* block, int size)
{
    auto* const moved = static_cast<char*>(
        std::realloc(static_cast<char*>(block) - kHeader, static_cast<size_t>(size) + kHeader));
    if (moved == nullptr) {
        return nullptr;
    }
    *reinterpret_cast<int*>(moved) = size;
    return moved + kHeader;
}
int rounded_up(int size) { return (size + 7) & ~7; }
int begin(void* /*data*/) { return SQLITE_OK; }
void end(void* /*data*/) {}

/// Before SQLite is used for the first time.
[[maybe_unused]] const bool watched = [] {
    static const sqlite3_mem_methods methods = {take,       give_back, take_again, size_of,
                                                rounded_up, begin,     end,        nullptr};
    return sqlite3_config(SQLITE_CONFIG_MALLOC, &methods) == SQLITE_OK &&
           sqlite3_initialize() == SQLITE_OK;
}();

class DoorFailures : public ::testing::Test {
protected:
    /// `attempt` gives the status of a call, which fails when an allocation did, unless it could do
    /// without the memory.
    template <class Attempt>
    void expect_reported(Attempt attempt)
    {
        ASSERT_EQ(KZCAT_OK, attempt()) << kzcat_get_error_text();
        uint64_t failures = 0;
        for_every_failed_allocation([&](auto fired) {
            const kzcat_status status = attempt();
            failures += fired() ? 1U : 0U;
            if (!fired()) {
                EXPECT_EQ(KZCAT_OK, status) << kzcat_get_error_text();
            } else {
                EXPECT_TRUE(status == KZCAT_ERROR_MEMORY || status == KZCAT_OK)
                    << status << ": " << kzcat_get_error_text();
            }
        });
        EXPECT_GT(failures, 0u);
        EXPECT_EQ(KZCAT_OK, attempt()) << "it does not work any more";
    }

    ScratchDirectory scratch_;
    std::string path_ = scratch_.path("c.kzc");
};

TEST_F(DoorFailures, AreReportedByBuilders)
{
    const auto samples = piece(1, 3);
    expect_reported([&] {
        const auto builder = make<Builder>(kzcat_builder_create, &kFormat,
                                           static_cast<const kzcat_builder_settings*>(nullptr));
        if (builder.status != KZCAT_OK) {
            EXPECT_EQ(nullptr, builder.handle);
            return builder.status;
        }
        const kzcat_status fed =
            kzcat_builder_feed(builder.handle.get(), samples.data(), samples.size() * 2);
        if (fed != KZCAT_OK) {
            EXPECT_EQ(KZCAT_ERROR_MEMORY, kzcat_builder_feed(builder.handle.get(), "ab", 2))
                << "sound may be lost, so it must not go on";
            return fed;
        }
        const kzcat_status so_far =
            make<Trail>(kzcat_builder_get_trail, builder.handle.get()).status;
        if (so_far != KZCAT_OK) {
            EXPECT_EQ(KZCAT_ERROR_MEMORY,
                      make<Trail>(kzcat_builder_finish, builder.handle.get()).status);
            return so_far;
        }
        return make<Trail>(kzcat_builder_finish, builder.handle.get()).status;
    });
}

TEST_F(DoorFailures, AreReportedByQueries)
{
    const auto samples = piece(1, 4);
    expect_reported([&]() -> kzcat_status {
        const auto query = make<Query>(kzcat_query_create, &kFormat);
        if (query.status != KZCAT_OK) {
            return query.status;
        }
        const kzcat_status fed =
            kzcat_query_feed(query.handle.get(), samples.data(), samples.size() * 2);
        return fed == KZCAT_OK ? kzcat_query_finish(query.handle.get()) : fed;
    });
}

TEST_F(DoorFailures, AreReportedByTrailFiles)
{
    const Trail trail = trail_of(piece(1, 3));
    std::vector<char> bytes(10000);
    uint64_t size = 0;
    expect_reported(
        [&] { return kzcat_trail_write(trail.get(), bytes.data(), bytes.size(), &size); });
    expect_reported([&] {
        return make<Trail>(kzcat_trail_read, static_cast<const void*>(bytes.data()), size).status;
    });
}

TEST_F(DoorFailures, AreReportedByOpening)
{
    ASSERT_NE(nullptr, open_file(path_));
    expect_reported([&] {
        return make<Catalogue>(kzcat_open, path_.c_str(), uint32_t{KZCAT_ACCESS_WRITE},
                               static_cast<const kzcat_settings*>(nullptr))
            .status;
    });
}

// The catalogue is opened anew each time: what its connection remembers is no leak.
TEST_F(DoorFailures, LoseNothingWhenAdding)
{
    const Trail first = trail_of(piece(1, 3), true);
    const Trail second = trail_of(piece(2, 3));
    int64_t tracks = 0;
    expect_reported([&]() -> kzcat_status {
        const Catalogue catalogue = open_file(path_);
        if (catalogue == nullptr) {
            return KZCAT_ERROR_MEMORY;
        }
        const kzcat_tag tag = {"title", "A title that is longer than a short string"};
        const kzcat_new_track both[] = {{first.get(), {"one", -1, -1, nullptr}, &tag, 1},
                                        {second.get(), {"two", -1, -1, nullptr}, nullptr, 0}};
        const kzcat_status status = kzcat_add(catalogue.get(), both, 2, nullptr);
        tracks += status == KZCAT_OK ? 1 : 0;
        return status;
    });
    EXPECT_GT(tracks, 0);
    const Catalogue catalogue = open_file(path_);
    uint64_t faults = 1;
    EXPECT_EQ(KZCAT_OK, kzcat_verify(catalogue.get(), nullptr, nullptr, nullptr, &faults));
    EXPECT_EQ(0u, faults);
    kzcat_facts facts;
    kzcat_get_facts(catalogue.get(), 0, &facts);
    EXPECT_EQ(2u, facts.tracks) << "both or none";
}

TEST_F(DoorFailures, AreReportedByReading)
{
    add(open_file(path_).get(), trail_of(piece(1, 3), true).get(), "one");
    expect_reported([&]() -> kzcat_status {
        const Catalogue catalogue = open_file(path_, KZCAT_ACCESS_READ);
        if (catalogue == nullptr) {
            return KZCAT_ERROR_MEMORY;
        }
        const auto track = make<Track>(kzcat_find_source, catalogue.get(), "one");
        if (track.status != KZCAT_OK) {
            return track.status;
        }
        return make<Trail>(kzcat_get_trail, catalogue.get(), int64_t{1}).status;
    });
}

TEST_F(DoorFailures, AreReportedByRecognising)
{
    const auto samples = piece(1, 5);
    const Catalogue catalogue = open_memory();
    add(catalogue.get(), trail_of(samples).get(), "one");
    // Short, since it is looked up once for each of the allocations that this takes.
    const Query query = query_of({samples.begin() + kRate, samples.begin() + 5 * kRate});
    kzcat_match_options options;
    kzcat_initialize_match_options(&options);
    options.speeds = 0;
    const auto attempt = [&] {
        return make<Result>(kzcat_recognise, catalogue.get(),
                            static_cast<const kzcat_query*>(query.get()),
                            static_cast<const kzcat_match_options*>(&options))
            .status;
    };
    // The index is there from then on: it stays in memory, which would look like a leak.
    ASSERT_EQ(KZCAT_OK, attempt());
    // After the first ones, the same few come again for every phase and place.
    for (uint64_t nth = 1; !HasFailure(); nth += nth < 64 ? 1 : 61) {
        const int64_t before = live_blocks();
        kzcat_status status = KZCAT_OK;
        bool fired = false;
        {
            const AllocationFault fault(nth);
            status = attempt();
            fired = fault.fired();
        }
        EXPECT_EQ(fired ? kzcat_status{KZCAT_ERROR_MEMORY} : kzcat_status{KZCAT_OK}, status) << nth;
        EXPECT_EQ(before, live_blocks()) << "left over after failed allocation " << nth;
        if (!fired) {
            EXPECT_GT(nth, 100u);
            break;
        }
    }
}

TEST_F(DoorFailures, AreReportedByMonitors)
{
    const auto samples = piece(1, 5);
    const Catalogue catalogue = open_memory();
    add(catalogue.get(), trail_of(samples).get(), "one");
    kzcat_monitor_options options;
    kzcat_initialize_monitor_options(&options);
    options.speeds = 0;
    const auto attempt = [&]() -> kzcat_status {
        const auto monitor = make<Monitor>(kzcat_monitor_create, &kFormat,
                                           static_cast<const kzcat_monitor_options*>(&options));
        if (monitor.status != KZCAT_OK) {
            EXPECT_EQ(nullptr, monitor.handle);
            return monitor.status;
        }
        kzcat_status status = kzcat_monitor_feed(monitor.handle.get(), catalogue.get(),
                                                 samples.data(), samples.size() * 2);
        status = status == KZCAT_OK ? kzcat_monitor_finish(monitor.handle.get(), catalogue.get())
                                    : status;
        if (status != KZCAT_OK) {
            EXPECT_EQ(KZCAT_ERROR_MEMORY,
                      kzcat_monitor_feed(monitor.handle.get(), catalogue.get(), "ab", 2))
                << "sound may be lost, so it must not go on";
        }
        return status;
    };
    ASSERT_EQ(KZCAT_OK, attempt()); // the index stays in memory from then on
    for (uint64_t nth = 1; !HasFailure(); nth += nth < 64 ? 1 : 61) {
        const int64_t before = live_blocks();
        kzcat_status status = KZCAT_OK;
        bool fired = false;
        {
            const AllocationFault fault(nth);
            status = attempt();
            fired = fault.fired();
        }
        EXPECT_EQ(fired ? kzcat_status{KZCAT_ERROR_MEMORY} : kzcat_status{KZCAT_OK}, status) << nth;
        EXPECT_EQ(before, live_blocks()) << "left over after failed allocation " << nth;
        if (!fired) {
            EXPECT_GT(nth, 100u);
            break;
        }
    }
}

TEST_F(DoorFailures, AreReportedByOpeningTheIndex)
{
    add(open_file(path_).get(), trail_of(piece(1, 3)).get(), "one");
    expect_reported([&]() -> kzcat_status {
        const Catalogue catalogue = open_file(path_, KZCAT_ACCESS_READ);
        kzcat_facts facts;
        return catalogue == nullptr ? kzcat_status{KZCAT_ERROR_MEMORY}
                                    : kzcat_get_facts(catalogue.get(), 1, &facts);
    });
}

TEST_F(DoorFailures, AreReportedByMerging)
{
    const Catalogue from = open_memory();
    add(from.get(), trail_of(piece(1, 3), true).get(), "one");
    expect_reported([&]() -> kzcat_status {
        const Catalogue into = open_memory();
        return into == nullptr ? kzcat_status{KZCAT_ERROR_MEMORY}
                               : kzcat_merge(into.get(), from.get(), nullptr, nullptr, nullptr);
    });
}

TEST_F(DoorFailures, AreReportedByImporting)
{
    const Trail trail = trail_of(piece(1, 3), true);
    const kzcat_tag tag = {"title", "A title that is longer than a short string"};
    const kzcat_source sources[] = {{"one", -1, -1, nullptr}, {"two", -1, -1, nullptr}};
    const kzcat_stored_track track = {trail.get(), sources, 2, &tag, 1, 7, {}};
    expect_reported([&]() -> kzcat_status {
        const Catalogue into = open_memory();
        return into == nullptr ? kzcat_status{KZCAT_ERROR_MEMORY}
                               : kzcat_import(into.get(), &track, 1, nullptr);
    });
}

TEST_F(DoorFailures, AreReportedByDocumentBands)
{
    const Trail trail = trail_of(piece(1, 3), true);
    std::vector<uint16_t> bands(1000);
    uint64_t count = 0;
    ASSERT_EQ(KZCAT_OK,
              kzcat_trail_get_document_bands(trail.get(), bands.data(), bands.size(), &count));
    expect_reported([&] {
        return make<Trail>(kzcat_trail_create_with_document_bands,
                           static_cast<const kzcat_trail*>(trail.get()),
                           static_cast<const uint16_t*>(bands.data()), count)
            .status;
    });
}

} // namespace
