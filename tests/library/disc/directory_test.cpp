// Listing directories, on real ones.

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <string>

#include <sys/stat.h>

#include "kzsdk/abs/memory.h"
#include "kzsdk/disc/bluray.hpp"
#include "library/disc/families.hpp"
#include "support/allocation.hpp"
#include "support/scratch_directory.hpp"

using namespace kz::test;
namespace fs = std::filesystem;

namespace {

struct Close {
    void operator()(kzbdfs_dir* dir) const { kzbdfs_close_dir(dir); }
    void operator()(kzbdfs_dirent* entry) const { kzbdfs_free_dirent(entry); }
};
using Directory = std::unique_ptr<kzbdfs_dir, Close>;
using Entry = std::unique_ptr<kzbdfs_dirent, Close>;

Directory open_directory(const std::string& path)
{
    kzbdfs_dir* dir = nullptr;
    EXPECT_EQ(KZ_OK, kzbdfs_open_dir(path.c_str(), &dir));
    return Directory(dir);
}

Entry next(const Directory& dir) { return Entry(kzbdfs_readdir(dir.get())); }

Entry entry_named(const Directory& dir, const std::string& name)
{
    for (Entry entry = next(dir); entry; entry = next(dir)) {
        if (kzbdfs_dirent_get_name(entry.get()) == name) {
            return entry;
        }
    }
    ADD_FAILURE() << "no entry " << name;
    return nullptr;
}

/// The name of every entry and the kind that the library reports.
std::map<std::string, std::string> kinds_in(const std::string& path)
{
    std::map<std::string, std::string> kinds;
    const Directory dir = open_directory(path);
    for (Entry entry = next(dir); entry; entry = next(dir)) {
        std::string kind;
        kind += kzbdfs_dirent_is_file(entry.get()) == 1 ? "file " : "";
        kind += bnbdfs_dirent_is_dir(entry.get()) == 1 ? "dir " : "";
        kind += kzbdfs_dirent_is_current_dir(entry.get()) == 1 ? "current " : "";
        kind += kzbdfs_dirent_is_parent_dir(entry.get()) == 1 ? "parent " : "";
        EXPECT_TRUE(kinds.emplace(kzbdfs_dirent_get_name(entry.get()), kind).second);
    }
    return kinds;
}

/// Listing does not depend on the switch: every test runs with the family off.
class DiscDirectory : public ::testing::Test {
protected:
    void SetUp() override
    {
        kzbdfs_shutdown();
        kzbdfs_get_error();
        before_ = live_blocks();
    }
    void TearDown() override
    {
        kzbdfs_get_error();
        EXPECT_EQ(before_, live_blocks()) << "blocks were leaked";
    }

    const ScratchDirectory scratch_;

private:
    int64_t before_ = 0;
};

TEST_F(DiscDirectory, ListsEveryEntryForWhatItIs)
{
    const std::string longest(255, 'n');
    scratch_.write("file", "content");
    scratch_.write("empty", "");
    scratch_.write(longest, "x");
    scratch_.write(".hidden", "x");
    scratch_.write("...", "x");
    scratch_.write("sub/below", "x");
    fs::create_symlink("file", scratch_.path("link-to-file"));
    fs::create_symlink("sub", scratch_.path("link-to-dir"));
    fs::create_symlink("missing", scratch_.path("link-to-nothing"));
    ASSERT_EQ(0, ::mkfifo(scratch_.path("pipe").c_str(), 0600));
    const std::map<std::string, std::string> expected = {
        {".", "dir current "}, {"..", "dir parent "}, {"file", "file "},       {"empty", "file "},
        {longest, "file "},    {".hidden", "file "},  {"...", "file "},        {"sub", "dir "},
        {"link-to-file", ""},  {"link-to-dir", ""},   {"link-to-nothing", ""}, {"pipe", ""},
    };
    EXPECT_EQ(expected, kinds_in(scratch_.path()));
    EXPECT_EQ(0u, kzbdfs_get_error());
}

TEST_F(DiscDirectory, WorksWhileTheFamilyAndTheMemoryManagerAreOff)
{
    EXPECT_EQ(KZ_DISC_NOT_ON, kzbdfs_query_availability());
    EXPECT_EQ(KZ_MEM_NOT_ON, kzmem_query_availability());
    EXPECT_EQ(2u, kinds_in(scratch_.path()).size());
}

TEST_F(DiscDirectory, EndsWithNullAndStaysThere)
{
    const Directory dir = open_directory(scratch_.path());
    EXPECT_TRUE(next(dir));
    EXPECT_TRUE(next(dir));
    EXPECT_FALSE(next(dir));
    EXPECT_FALSE(next(dir));
    EXPECT_EQ(KZ_OK, kzbdfs_get_error()) << "the end is no error";
}

TEST_F(DiscDirectory, TheDelimiterIsASlash) { EXPECT_EQ(47, kzbdfs_dir_get_delim()); }

TEST_F(DiscDirectory, TheFullPathHasTwoSlashesBeforeTheName)
{
    scratch_.write("file", "x");
    const Directory dir = open_directory(scratch_.path());
    EXPECT_EQ(scratch_.path() + "/", dir->path);
    EXPECT_EQ(scratch_.path() + "//file", entry_named(dir, "file")->path);
    const Directory with_slash = open_directory(scratch_.path() + "/");
    EXPECT_EQ(scratch_.path() + "//", with_slash->path);
    EXPECT_EQ(scratch_.path() + "///file", entry_named(with_slash, "file")->path);
}

// ---- Opening

TEST_F(DiscDirectory, NullArgumentsAreRefused)
{
    kzbdfs_dir* dir = nullptr;
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, kzbdfs_open_dir(nullptr, &dir));
    EXPECT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, kzbdfs_open_dir("/", nullptr));
    EXPECT_EQ(nullptr, dir);
    EXPECT_EQ(0u, kzbdfs_get_error());
}

TEST_F(DiscDirectory, ADirectoryThatCannotOpenIsShortMemory)
{
    const auto expect_refused = [](const std::string& path, kz_status reason) {
        auto* const untouched = reinterpret_cast<kzbdfs_dir*>(&kzbdfs_dir_get_delim);
        kzbdfs_dir* dir = untouched;
        EXPECT_EQ(KZ_DISC_ERROR_MEMORY, kzbdfs_open_dir(path.c_str(), &dir)) << path;
        EXPECT_EQ(untouched, dir);
        EXPECT_EQ(reason, kzbdfs_get_error()) << path.substr(0, 80);
    };
    expect_refused(scratch_.path("missing"), KZ_DISC_ERROR_NOT_FOUND);
    expect_refused(scratch_.write("file", "x"), KZ_DISC_ERROR_SYSTEM);
    expect_refused("", KZ_DISC_ERROR_NOT_FOUND);
    expect_refused(std::string(10'000, 'x'), KZ_DISC_ERROR_SYSTEM);
    fs::create_directory(scratch_.path("closed"));
    ASSERT_EQ(0, ::chmod(scratch_.path().c_str(), 0755));
    ASSERT_EQ(0, ::chmod(scratch_.path("closed").c_str(), 0));
    as_nobody([&] { expect_refused(scratch_.path("closed"), KZ_DISC_ERROR_ACCESS_DENIED); });
    ASSERT_EQ(0, ::chmod(scratch_.path("closed").c_str(), 0700)); // or it could not be removed
    without_descriptors([&] { expect_refused("/", KZ_DISC_ERROR_TOO_MANY_FILES); });
}

// The reason stays pending until it is fetched, so the next success returns it.
TEST_F(DiscDirectory, AFailedOpenShowsInTheNextSuccess)
{
    kzbdfs_dir* dir = nullptr;
    EXPECT_EQ(KZ_DISC_ERROR_MEMORY, kzbdfs_open_dir(scratch_.path("missing").c_str(), &dir));
    EXPECT_EQ(KZ_DISC_ERROR_NOT_FOUND, kzbdfs_open_dir("/", &dir));
    EXPECT_NE(nullptr, dir);
    kzbdfs_close_dir(dir);
    EXPECT_EQ(KZ_OK, kzbdfs_get_error());
}

// The descriptor is closed behind the stream's back, so every call on it fails.
TEST_F(DiscDirectory, FailedReadingAndClosingLeaveTheirReason)
{
    Directory dir = open_directory(scratch_.path());
    ASSERT_EQ(0, ::close(::dirfd(dir->stream)));
    EXPECT_FALSE(next(dir));
    EXPECT_EQ(KZ_DISC_ERROR_BAD_DESCRIPTOR, kzbdfs_get_error());
    dir.reset();
    EXPECT_EQ(KZ_DISC_ERROR_BAD_DESCRIPTOR, kzbdfs_get_error());
}

// A caller that goes by the returned status, and not by the handle, leaks the handle.
TEST_F(DiscDirectory, SuccessReturnsThePendingLastErrorAndTakesIt)
{
    EXPECT_EQ(KZ_DISC_NOT_ON, kzbdfs_shutdown());
    kzbdfs_dir* dir = nullptr;
    EXPECT_EQ(KZ_DISC_NOT_ON, kzbdfs_open_dir("/", &dir));
    EXPECT_NE(nullptr, dir);
    kzbdfs_close_dir(dir);
    EXPECT_EQ(0u, kzbdfs_get_error());
    EXPECT_TRUE(open_directory("/"));
}

// ---- Entries

TEST_F(DiscDirectory, NullIsNeitherReadNorNamedNorFreed)
{
    EXPECT_EQ(nullptr, kzbdfs_readdir(nullptr));
    EXPECT_EQ(nullptr, kzbdfs_dirent_get_name(nullptr));
    EXPECT_EQ(0, kzbdfs_dirent_is_current_dir(nullptr));
    EXPECT_EQ(0, kzbdfs_dirent_is_parent_dir(nullptr));
    EXPECT_EQ(0, kzbdfs_dirent_is_file(nullptr));
    EXPECT_EQ(0, bnbdfs_dirent_is_dir(nullptr));
    kzbdfs_free_dirent(nullptr);
    kzbdfs_close_dir(nullptr);
}

// The record belongs to the stream, and so does the name.
TEST_F(DiscDirectory, AnEntrysNameLiesInTheStream)
{
    const Directory dir = open_directory(scratch_.path());
    const uint64_t before = allocation_count();
    const Entry first = next(dir);
    EXPECT_EQ(before + 2, allocation_count()) << "the entry and its path; the name is not copied";
    ::rewinddir(dir->stream);
    const Entry again = next(dir);
    EXPECT_EQ(kzbdfs_dirent_get_name(first.get()), kzbdfs_dirent_get_name(again.get()))
        << "one place in the stream's buffer";
}

TEST_F(DiscDirectory, AnEntrysPathOutlivesTheHandle)
{
    scratch_.write("file", "x");
    Directory dir = open_directory(scratch_.path());
    const Entry file = entry_named(dir, "file");
    dir.reset();
    EXPECT_EQ(1, kzbdfs_dirent_is_file(file.get()));
    EXPECT_EQ(0, bnbdfs_dirent_is_dir(file.get()));
}

TEST_F(DiscDirectory, AnEntryThatIsGoneIsNothing)
{
    scratch_.write("file", "x");
    const Directory dir = open_directory(scratch_.path());
    const Entry file = entry_named(dir, "file");
    fs::remove(scratch_.path("file"));
    EXPECT_EQ(0, kzbdfs_dirent_is_file(file.get()));
    EXPECT_EQ(KZ_DISC_ERROR_NOT_FOUND, kzbdfs_get_error());
    EXPECT_EQ(0, bnbdfs_dirent_is_dir(file.get()));
    EXPECT_EQ(KZ_DISC_ERROR_NOT_FOUND, kzbdfs_get_error());
}

// The check and the opening are separate: what was a file may be a link by then.
TEST_F(DiscDirectory, ALinkSwappedInAfterTheLookIsOpened)
{
    scratch_.write("elsewhere", "secret");
    const std::string path = scratch_.write("file", "x");
    const Directory dir = open_directory(scratch_.path());
    const Entry file = entry_named(dir, "file");
    EXPECT_EQ(1, kzbdfs_dirent_is_file(file.get()));
    fs::remove(path);
    fs::create_symlink("elsewhere", path);
    EXPECT_EQ(0, kzbdfs_dirent_is_file(file.get())) << "a look does not follow links";
    ASSERT_EQ(KZ_OK, kzbdfs_initialize());
    const int32_t opened = kzbdfs_open(path.c_str());
    char content[8] = {};
    EXPECT_EQ(6, kzbdfs_read(opened, content, 8));
    EXPECT_STREQ("secret", content);
    EXPECT_EQ(KZ_OK, kzbdfs_close(opened));
    EXPECT_EQ(KZ_OK, kzbdfs_shutdown());
}

TEST_F(DiscDirectory, AnEntryThatMayNotBeLookedAtIsNothing)
{
    scratch_.write("file", "x");
    ASSERT_EQ(0, ::chmod(scratch_.path().c_str(), 0444)); // may be listed but not searched
    as_nobody([&] {
        const Directory dir = open_directory(scratch_.path());
        const Entry file = entry_named(dir, "file");
        EXPECT_EQ(0, kzbdfs_dirent_is_file(file.get()));
        EXPECT_EQ(KZ_DISC_ERROR_ACCESS_DENIED, kzbdfs_get_error());
    });
    ASSERT_EQ(0, ::chmod(scratch_.path().c_str(), 0700));
}

// ---- Lengths

/// Nested directories, whose path is as long as the system allows.
std::string make_deep(const ScratchDirectory& scratch, size_t length)
{
    std::string path = scratch.path();
    while (path.size() + 1 < length) {
        path += '/';
        path.append(std::min<size_t>(200, length - path.size()), 'd');
        fs::create_directory(path);
    }
    return path;
}

TEST_F(DiscDirectory, APathOfAnyLengthIsListed)
{
    const std::string name(255, 'n');
    for (const size_t length : {size_t{300}, size_t{1000}, size_t{3800}}) {
        const std::string path = make_deep(scratch_, length);
        std::ofstream(fs::path(path) / name) << "x";
        const Directory dir = open_directory(path);
        const Entry entry = entry_named(dir, name);
        EXPECT_EQ(std::string(path).append("//").append(name), entry->path);
        EXPECT_EQ(1, kzbdfs_dirent_is_file(entry.get()));
    }
}

// The name can still be read; the system accepts no path of 4096 bytes or more.
TEST_F(DiscDirectory, AnEntryWhosePathIsTooLongIsOnlyListed)
{
    const std::string path = make_deep(scratch_, 4090);
    const std::string name = "longer-than-6";
    const fs::path before = fs::current_path();
    fs::current_path(path);
    std::ofstream(name) << "x";
    {
        const Directory dir = open_directory(path);
        const Entry entry = entry_named(dir, name);
        EXPECT_EQ(path + "//" + name, entry->path);
        EXPECT_EQ(0, kzbdfs_dirent_is_file(entry.get()));
        EXPECT_EQ(KZ_DISC_ERROR_SYSTEM, kzbdfs_get_error());
    }
    {
        const Directory dir = open_directory(".");
        EXPECT_EQ(1, kzbdfs_dirent_is_file(entry_named(dir, name).get()));
    }
    fs::remove(name);
    fs::current_path(before);
}

TEST_F(DiscDirectory, AThousandEntriesAreListed)
{
    std::map<std::string, std::string> expected = {{".", "dir current "}, {"..", "dir parent "}};
    for (int i = 0; i < 1000; ++i) {
        const std::string name = std::to_string(i) + std::string(static_cast<size_t>(i % 250), 'x');
        scratch_.write(name, "");
        expected.emplace(name, "file ");
    }
    EXPECT_EQ(expected, kinds_in(scratch_.path()));
}

// ---- Short memory

TEST_F(DiscDirectory, ShortMemoryWhenOpeningLeavesNothing)
{
    for_every_failed_allocation([&](auto fired) {
        kzbdfs_dir* dir = nullptr;
        const kz_status status = kzbdfs_open_dir("/", &dir);
        EXPECT_EQ(fired() ? KZ_DISC_ERROR_MEMORY : 0u, status);
        EXPECT_EQ(fired(), dir == nullptr);
        kzbdfs_close_dir(dir);
        kzbdfs_get_error(); // set when it was the stream that had no memory
    });
}

TEST_F(DiscDirectory, ShortMemoryWhenReadingPassesOverAnEntry)
{
    scratch_.write("file", "x");
    for_every_failed_allocation([&](auto fired) {
        kzbdfs_dir* opened = nullptr;
        if (kzbdfs_open_dir(scratch_.path().c_str(), &opened) != KZ_OK) {
            return;
        }
        const Directory dir(opened);
        int entries = 0;
        for (int call = 0; call < 3; ++call) {
            entries += next(dir) != nullptr ? 1 : 0;
        }
        EXPECT_EQ(fired(), entries < 3);
        EXPECT_FALSE(next(dir));
    });
}

} // namespace
