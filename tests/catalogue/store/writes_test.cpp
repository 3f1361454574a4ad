// Every write that can go wrong goes wrong once: with an error, on a full disk, or as the last
// thing that the process does.

#include <csignal>
#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/catalogue/store/content.hpp"
#include "tests/catalogue/store/faulty_files.hpp"
#include "tests/catalogue/store/files.hpp"

namespace kzcat::test {
namespace {

namespace fs = std::filesystem;
using Kind = StoreError::Kind;

constexpr uint64_t kBatch = 3;

std::unique_ptr<Store> open_faulty(const std::string& path)
{
    return open_sqlite_store(path, Access::create, {.vfs = faulty_files()});
}

/// Opens, adds three batches, closes, and the same again; `acknowledge` is called after each batch.
void add_in_two_sittings(const std::string& path, const std::function<void()>& acknowledge)
{
    for (uint64_t number = 1; number < 6 * kBatch;) {
        const auto store = open_faulty(path);
        for (int batch = 0; batch < 3; ++batch, number += kBatch) {
            add_tracks(*store, number, kBatch);
            acknowledge();
        }
    }
}

/// What is there must be the first tracks, whole, in whole batches.
uint64_t count_whole_tracks(Store& store, const std::string& when)
{
    EXPECT_EQ(std::vector<std::string>(), faults(store)) << when;
    uint64_t number = 0;
    store.visit_trails(0, [&](int64_t, const Trail& trail) {
        EXPECT_TRUE(make_trail(++number) == trail) << when;
        return true;
    });
    EXPECT_EQ(0U, number % kBatch) << when;
    EXPECT_EQ(number, static_cast<uint64_t>(store.last_change())) << when;
    return number;
}

/// Runs in a process that dies at its n-th write; the batches that it acknowledged, and whether it
/// died.
std::pair<uint64_t, bool> add_until_death(const std::string& path, FileFault fault, uint64_t nth)
{
    int pipe_ends[2];
    if (pipe(pipe_ends) != 0) {
        throw std::runtime_error("pipe");
    }
    const pid_t child = fork();
    if (child == 0) {
        set_file_fault(fault, nth, false, nth);
        add_in_two_sittings(path, [&] {
            if (write(pipe_ends[1], "x", 1) != 1) {
                _exit(2);
            }
        });
        _exit(0);
    }
    close(pipe_ends[1]);
    uint64_t batches = 0;
    char byte = 0;
    while (read(pipe_ends[0], &byte, 1) == 1) {
        ++batches;
    }
    close(pipe_ends[0]);
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFSIGNALED(status) || WEXITSTATUS(status) == 0);
    return {batches, WIFSIGNALED(status)};
}

void die_at_every_write(FileFault fault)
{
    uint64_t deaths = 0;
    for (uint64_t nth = 1;; ++nth, ++deaths) {
        const kz::test::ScratchDirectory folder;
        const std::string path = folder.path("a.kzc");
        const auto [batches, died] = add_until_death(path, fault, nth);
        if (!died) {
            EXPECT_EQ(6U, batches);
            break;
        }
        if (fault == FileFault::power_cut) {
            fs::remove(path + "-shm");
        }
        const std::string when = "death at write " + std::to_string(nth);
        const auto store = open_faulty(path);
        const uint64_t tracks = count_whole_tracks(*store, when);
        EXPECT_LE(batches * kBatch, tracks) << when << ": what was acknowledged is lost";
        EXPECT_GE((batches + 1) * kBatch, tracks) << when;
        add_tracks(*store, tracks + 1, kBatch);
        EXPECT_EQ(tracks + kBatch, count_whole_tracks(*store, when + ", and going on"));
        if (::testing::Test::HasFailure()) {
            break;
        }
    }
    EXPECT_LT(100U, deaths);
}

TEST(Writes, AKillAtAnyOfThemLosesNothing) { die_at_every_write(FileFault::kill); }

TEST(Writes, APowerCutAtAnyOfThemLosesNothing) { die_at_every_write(FileFault::power_cut); }

/// Adds batches while the n-th write goes wrong; returns whether it did.
bool fail_at(FileFault fault, uint64_t nth, bool lasting)
{
    const kz::test::ScratchDirectory folder;
    const std::string path = folder.path("a.kzc");
    const std::string when = "fault at write " + std::to_string(nth);
    uint64_t batches = 0;
    set_file_fault(fault, nth, lasting);
    try {
        add_in_two_sittings(path, [&] { ++batches; });
    } catch (const StoreError& error) {
        EXPECT_EQ(fault == FileFault::full ? Kind::full : Kind::failed, error.kind())
            << error.what() << ", " << when;
        EXPECT_NE(std::string::npos, std::string(error.what()).find(path));
    }
    const bool fired = file_fault_fired();
    EXPECT_TRUE(fired || batches == 6) << when;
    set_file_fault(FileFault::none, 0);
    const auto store = open_faulty(path);
    const uint64_t tracks = count_whole_tracks(*store, when);
    EXPECT_LE(batches * kBatch, tracks) << when;
    add_tracks(*store, tracks + 1, kBatch);
    EXPECT_EQ(tracks + kBatch, count_whole_tracks(*store, when + ", and going on"));
    return fired;
}

TEST(Writes, AnErrorAtAnyOfThemLosesNothing)
{
    uint64_t nth = 1;
    while (fail_at(FileFault::error, nth, false) && fail_at(FileFault::error, nth, true) &&
           !::testing::Test::HasFailure()) {
        ++nth;
    }
    EXPECT_LT(100U, nth);
}

TEST(Writes, AFullDiskAtAnyOfThemLosesNothing)
{
    uint64_t nth = 1;
    while (fail_at(FileFault::full, nth, false) && fail_at(FileFault::full, nth, true) &&
           !::testing::Test::HasFailure()) {
        ++nth;
    }
    EXPECT_LT(100U, nth);
}

/// The same store goes on once the trouble is over.
TEST(Writes, WhatFailsHasChangedNothing)
{
    for (const FileFault fault : {FileFault::error, FileFault::full}) {
        for (uint64_t nth = 1;; ++nth) {
            const kz::test::ScratchDirectory folder;
            const auto store = open_faulty(folder.path("a.kzc"));
            add_tracks(*store, 1, 5);
            const std::string before = content(*store);
            set_file_fault(fault, nth, true);
            bool failed = false;
            try {
                add_tracks(*store, 6, 5);
            } catch (const StoreError&) {
                failed = true;
            }
            const bool fired = file_fault_fired();
            set_file_fault(FileFault::none, 0);
            if (!fired) {
                break;
            }
            EXPECT_TRUE(failed) << nth;
            EXPECT_TRUE(before == content(*store)) << nth;
            EXPECT_EQ(6, add_tracks(*store, 6, 5).at(0).track) << nth;
            EXPECT_TRUE(faults(*store).empty()) << nth;
        }
    }
}

} // namespace
} // namespace kzcat::test
