// No room: on a small disk that is really full, and below a limit on the size of files.

#include <csignal>
#include <cstdio>
#include <string>

#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/catalogue/store/content.hpp"
#include "tests/catalogue/store/files.hpp"

namespace kzcat::test {
namespace {

using Kind = StoreError::Kind;

/// Adds tracks until there is no room; gives their number, or -1 when it ends in any other way.
int64_t fill(Store& store)
{
    uint64_t number = store.track_count();
    try {
        for (;; ++number) {
            add(store, make_track(number + 1, 2000));
        }
    } catch (const StoreError& error) {
        std::fprintf(stderr, "%s\n", error.what());
        return error.kind() == Kind::full ? static_cast<int64_t>(number) : -1;
    }
}

bool is_whole(const std::string& path, int64_t tracks)
{
    const auto store = open_sqlite_store(path, Access::read);
    const auto found = faults(*store);
    for (const std::string& text : found) {
        std::fprintf(stderr, "%s\n", text.c_str());
    }
    return found.empty() && static_cast<int64_t>(store->track_count()) == tracks;
}

/// Runs `act` in a process of its own; its exit status.
int run_apart(const std::function<int()>& act)
{
    const pid_t child = fork();
    if (child == 0) {
        int status = 1;
        try {
            status = act();
        } catch (const std::exception& error) {
            std::fprintf(stderr, "%s\n", error.what());
        }
        _exit(status);
    }
    int status = -1;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

constexpr int kSkipped = 77;

/// A disk of 2 MB that nobody else sees.
bool mount_small_disk(const std::string& folder)
{
    return unshare(CLONE_NEWNS) == 0 &&
           mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
           mount("tmpfs", folder.c_str(), "tmpfs", 0, "size=2m") == 0;
}

TEST(Room, AFullDiskIsSaidAndLosesNothing)
{
    const kz::test::ScratchDirectory folder;
    const int status = run_apart([&] {
        if (!mount_small_disk(folder.path())) {
            return kSkipped;
        }
        const std::string path = folder.path("a.kzc");
        int64_t tracks = -1;
        std::string before;
        {
            const auto store = open_sqlite_store(path, Access::create);
            tracks = fill(*store);
            before = content(*store);
            if (tracks < 5 || before != content(*store) || fill(*store) != tracks) {
                return 2;
            }
        }
        if (!is_whole(path, tracks)) {
            return 3;
        }
        if (mount(nullptr, folder.path().c_str(), nullptr, MS_REMOUNT, "size=4m") != 0) {
            return 4;
        }
        const auto store = open_sqlite_store(path, Access::write);
        return before == content(*store) && fill(*store) > tracks ? 0 : 5;
    });
    if (status == kSkipped) {
        GTEST_SKIP() << "needs the right to mount a small disk";
    }
    EXPECT_EQ(0, status);
}

TEST(Room, ALimitOnFilesIsSaidAndLosesNothing)
{
    const kz::test::ScratchDirectory folder;
    const std::string path = folder.path("a.kzc");
    EXPECT_EQ(0, run_apart([&] {
                  std::signal(SIGXFSZ, SIG_IGN);
                  const rlimit limit = {.rlim_cur = 1'000'000, .rlim_max = 1'000'000};
                  setrlimit(RLIMIT_FSIZE, &limit);
                  const auto store = open_sqlite_store(path, Access::create);
                  const int64_t tracks = fill(*store);
                  return tracks > 5 && is_whole(path, tracks) ? 0 : 1;
              }));
    const auto store = open_sqlite_store(path, Access::write);
    EXPECT_TRUE(faults(*store).empty());
    EXPECT_TRUE(add(*store, make_track(10'000)).is_new) << "once there is room";
}

TEST(Room, NoRoomForAnythingLeavesNothingOdd)
{
    const kz::test::ScratchDirectory folder;
    const std::string path = folder.path("a.kzc");
    for (const rlim_t bytes : {0U, 1U, 5000U, 20'000U, 100'000U}) {
        EXPECT_EQ(0, run_apart([&] {
                      std::signal(SIGXFSZ, SIG_IGN);
                      const rlimit limit = {.rlim_cur = bytes, .rlim_max = bytes};
                      setrlimit(RLIMIT_FSIZE, &limit);
                      try {
                          open_sqlite_store(path, Access::create);
                      } catch (const StoreError& error) {
                          std::fprintf(stderr, "%s\n", error.what());
                          return error.kind() == Kind::full ? 0 : 1;
                      }
                      return 2;
                  }))
            << bytes;
        EXPECT_EQ(0U, open_sqlite_store(path, Access::read)->track_count());
    }
    EXPECT_EQ(1, add(*open_sqlite_store(path, Access::create), make_track(1)).track);
}

} // namespace
} // namespace kzcat::test
