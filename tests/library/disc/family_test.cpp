// What both families have in common: switch, last error and files.

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <string>
#include <thread>

#include <fcntl.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include "kzsdk/abs/memory.h"
#include "kzsdk/disc/disc_family.hpp"
#include "library/disc/families.hpp"
#include "support/allocation.hpp"
#include "support/scratch_directory.hpp"

using namespace kz::test;

namespace {

constexpr const char* kNoFilter = "system calls cannot be filtered here: no seccomp";

/// From here on the calling thread's `lseek` fails in the given way; this cannot be undone for the
/// thread.
bool make_seeking_fail(int error)
{
    const auto answer = SECCOMP_RET_ERRNO | static_cast<uint32_t>(error);
    sock_filter filter[] = {
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_lseek, 0, 1),
        BPF_STMT(BPF_RET | BPF_K, answer),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
    };
    const sock_fprog program = {static_cast<unsigned short>(std::size(filter)), filter};
    return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
           ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

// ---- Off

class DiscFamilyOff : public DiscOff {};
INSTANTIATE_TEST_SUITE_P(Each, DiscFamilyOff, ::testing::Values(kBluray, kDvd), family_name);

TEST_P(DiscFamilyOff, TheSwitchReportsWhatItFound)
{
    EXPECT_EQ(KZ_DISC_NOT_ON, family().query_availability());
    EXPECT_EQ(0u, family().initialize());
    EXPECT_EQ(KZ_DISC_ALREADY_ON, family().query_availability());
    EXPECT_EQ(KZ_DISC_ALREADY_ON, family().initialize());
    EXPECT_EQ(KZ_DISC_ALREADY_ON, family().get_error());
    EXPECT_EQ(0u, family().shutdown());
    EXPECT_EQ(0u, family().get_error());
    EXPECT_EQ(KZ_DISC_NOT_ON, family().shutdown());
    EXPECT_EQ(KZ_DISC_NOT_ON, family().get_error());
}

TEST_P(DiscFamilyOff, AskingForTheSwitchKeepsNoError)
{
    EXPECT_EQ(KZ_DISC_NOT_ON, family().query_availability());
    EXPECT_EQ(0u, family().get_error());
}

TEST_P(DiscFamilyOff, SwitchingOnForgetsTheLastError)
{
    EXPECT_EQ(-1, family().open("/"));
    EXPECT_EQ(0u, family().initialize());
    EXPECT_EQ(0u, family().get_error());
}

TEST_P(DiscFamilyOff, SwitchingOffLeavesTheLastError)
{
    ASSERT_EQ(0u, family().initialize());
    EXPECT_EQ(-1, family().seek(0, 0, 3));
    EXPECT_EQ(0u, family().shutdown());
    EXPECT_EQ(KZ_DISC_ERROR_NOT_FOUND, family().get_error());
}

TEST_P(DiscFamilyOff, NothingTouchesAFile)
{
    const ScratchDirectory directory;
    const int file = ::open(directory.write("file", "content").c_str(), O_RDONLY);
    const AtEnd close_file([file] { ::close(file); });
    char buffer[8] = "before";
    uint32_t length = 77;
    const auto expect_refused = [&] { EXPECT_EQ(KZ_DISC_NOT_ON, family().get_error()); };

    EXPECT_EQ(-1, family().open(directory.path("file").c_str()));
    expect_refused();
    EXPECT_EQ(-1, family().seek(file, 3, SEEK_SET));
    expect_refused();
    EXPECT_EQ(-1, family().seek(file, 3, 99)) << "the switch is asked first";
    expect_refused();
    EXPECT_EQ(-1, family().read(file, buffer, 4));
    expect_refused();
    EXPECT_EQ(-1, family().read_at(file, 1, buffer, 4));
    expect_refused();
    EXPECT_EQ(KZ_DISC_NOT_ON, family().close(file));
    expect_refused();
    EXPECT_EQ(KZ_DISC_NOT_ON, family().read_vol_label("/", 8, &length, buffer));
    expect_refused();
    EXPECT_EQ(0u, length);
    EXPECT_STREQ("before", buffer);
    EXPECT_EQ(0, ::lseek(file, 0, SEEK_CUR)) << "still open, and where it was";
}

TEST(DvdFamilyOff, NothingExists)
{
    kzdvdfs_shutdown();
    EXPECT_EQ(0, kzdvdfs_exists("/"));
    EXPECT_EQ(KZ_DISC_NOT_ON, kzdvdfs_get_error());
}

// ---- On

class DiscFamily : public DiscOn {};
INSTANTIATE_TEST_SUITE_P(Each, DiscFamily, ::testing::Values(kBluray, kDvd), family_name);

TEST_P(DiscFamily, SharesNothingWithTheOther)
{
    const DiscFamilyCalls& other = family().open == kBluray.open ? kDvd : kBluray;
    EXPECT_EQ(KZ_DISC_NOT_ON, other.query_availability());
    EXPECT_EQ(-1, family().seek(0, 0, 3));
    EXPECT_EQ(0u, other.get_error());
    EXPECT_EQ(KZ_DISC_ERROR_NOT_FOUND, family().get_error());
}

TEST_P(DiscFamily, NeedsNoMemoryManager)
{
    EXPECT_EQ(KZ_MEM_NOT_ON, kzmem_query_availability());
    const uint64_t before = allocation_count();
    const int32_t file = family().open("/");
    EXPECT_GE(file, 0);
    EXPECT_EQ(KZ_OK, family().close(file));
    EXPECT_EQ(before, allocation_count());
}

TEST_P(DiscFamily, ReadsAFileFromAnyPlace)
{
    const ScratchDirectory directory;
    const int32_t file = family().open(directory.write("file", "0123456789").c_str());
    ASSERT_GE(file, 0);
    char buffer[16] = {};
    EXPECT_EQ(4, family().read(file, buffer, 4));
    EXPECT_STREQ("0123", buffer);
    EXPECT_EQ(5, family().seek(file, 1, 1));
    EXPECT_EQ(8, family().seek(file, -2, 2));
    EXPECT_EQ(2, family().read(file, buffer, 4)) << "the file ends";
    EXPECT_EQ(0, family().read(file, buffer, 4)) << "behind its end";
    EXPECT_EQ(2, family().seek(file, 2, 0));
    EXPECT_EQ(3, family().read_at(file, 6, buffer, 3));
    EXPECT_EQ(0, std::memcmp("678", buffer, 3));
    EXPECT_EQ(9, family().seek(file, 0, 1)) << "reading at a place moves on from there";
    EXPECT_EQ(0, family().read_at(file, 20, buffer, 3));
    EXPECT_EQ(0u, family().close(file));
    EXPECT_EQ(0u, family().get_error());
}

// A dual-layer disc has 50 GB.
TEST_P(DiscFamily, ReachesPlacesBeyond32Bits)
{
    const ScratchDirectory directory;
    const std::string path = directory.write("file", "");
    constexpr int64_t kFar = 50'000'000'000;
    if (::truncate(path.c_str(), kFar + 4) != 0) {
        GTEST_SKIP() << "the file system here takes no file of 50 GB with a hole: "
                     << std::strerror(errno);
    }
    const int32_t file = family().open(path.c_str());
    ASSERT_GE(file, 0);
    char buffer[8] = {};
    EXPECT_EQ(kFar, family().seek(file, kFar, 0));
    EXPECT_EQ(4, family().read(file, buffer, 8));
    EXPECT_EQ(3, family().read_at(file, kFar + 1, buffer, 8));
    EXPECT_EQ(0u, family().close(file));
}

TEST_P(DiscFamily, SuccessLeavesTheLastErrorOfAnEarlierFailure)
{
    EXPECT_EQ(-1, family().open("/missing/file"));
    const int32_t file = family().open("/");
    EXPECT_GE(file, 0);
    EXPECT_EQ(0u, family().close(file));
    expect_error(KZ_DISC_ERROR_NOT_FOUND);
}

// A descriptor may be passed on deliberately.
TEST_P(DiscFamily, OpensFilesThatStartedProgramsInherit)
{
    const int32_t file = family().open("/");
    EXPECT_EQ(0, ::fcntl(file, F_GETFD) & FD_CLOEXEC);
    EXPECT_EQ(0u, family().close(file));
}

TEST_P(DiscFamily, OpensForReadingOnly)
{
    const ScratchDirectory directory;
    const int32_t file = family().open(directory.write("file", "x").c_str());
    EXPECT_EQ(O_RDONLY, ::fcntl(file, F_GETFL) & O_ACCMODE);
    EXPECT_EQ(-1, ::write(file, "y", 1));
    EXPECT_EQ(0u, family().close(file));
}

// ---- Errors, each brought about for real

TEST_P(DiscFamily, AnUnknownWhenceIsReportedAsNotFound)
{
    for (const int32_t whence : {3, -1, 4, 1000}) {
        EXPECT_EQ(-1, family().seek(0, 0, whence));
        expect_error(KZ_DISC_ERROR_NOT_FOUND);
    }
}

TEST_P(DiscFamily, AMissingFileIsNotFound)
{
    const ScratchDirectory directory;
    EXPECT_EQ(-1, family().open(directory.path("missing").c_str()));
    expect_error(KZ_DISC_ERROR_NOT_FOUND);
    EXPECT_EQ(-1, family().open(""));
    expect_error(KZ_DISC_ERROR_NOT_FOUND);
}

TEST_P(DiscFamily, ALinkThatLeadsNowhereIsNotFound)
{
    const ScratchDirectory directory;
    std::filesystem::create_symlink("missing", directory.path("link"));
    EXPECT_EQ(-1, family().open(directory.path("link").c_str()));
    expect_error(KZ_DISC_ERROR_NOT_FOUND);
}

TEST_P(DiscFamily, AClosedDescriptorIsBad)
{
    char buffer[4];
    for (const int32_t descriptor : {-1, 100'000'000}) {
        EXPECT_EQ(-1, family().seek(descriptor, 0, 0));
        expect_error(KZ_DISC_ERROR_BAD_DESCRIPTOR);
        EXPECT_EQ(-1, family().read(descriptor, buffer, 4));
        expect_error(KZ_DISC_ERROR_BAD_DESCRIPTOR);
        EXPECT_EQ(-1, family().read_at(descriptor, 0, buffer, 4));
        expect_error(KZ_DISC_ERROR_BAD_DESCRIPTOR);
        EXPECT_EQ(KZ_DISC_ERROR_BAD_DESCRIPTOR, family().close(descriptor));
        expect_error(KZ_DISC_ERROR_BAD_DESCRIPTOR);
    }
}

TEST_P(DiscFamily, AnUnreadableFileIsDenied)
{
    const ScratchDirectory directory;
    const std::string path = directory.write("file", "x");
    ASSERT_EQ(0, ::chmod(directory.path().c_str(), 0755));
    ASSERT_EQ(0, ::chmod(path.c_str(), 0));
    as_nobody([&] { EXPECT_EQ(-1, family().open(path.c_str())); });
    expect_error(KZ_DISC_ERROR_ACCESS_DENIED);
}

TEST_P(DiscFamily, APlaceBeforeTheBeginningIsInvalid)
{
    const ScratchDirectory directory;
    const int32_t file = family().open(directory.write("file", "0123").c_str());
    EXPECT_EQ(-1, family().seek(file, -1, 0));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(-1, family().seek(file, -5, 2));
    expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(0u, family().close(file));
}

// -1 is what a failed seek returns: it must not be taken for the position -1.
TEST_P(DiscFamily, ReadingAtMinusOneReadsNothing)
{
    const ScratchDirectory directory;
    const int32_t file = family().open(directory.write("file", "0123").c_str());
    char buffer[4] = {'a', 'b', 'c', 'd'};
    for (const int64_t offset : {int64_t{-1}, int64_t{-2}, INT64_MIN}) {
        EXPECT_EQ(-1, family().read_at(file, offset, buffer, 4));
        expect_error(KZ_DISC_ERROR_INVALID_ARGUMENT);
    }
    EXPECT_EQ(0, std::memcmp("abcd", buffer, 4));
    EXPECT_EQ(0u, family().close(file));
}

TEST_P(DiscFamily, TooManyFilesAreTold)
{
    int32_t file = 0;
    without_descriptors([&] { file = family().open("/"); });
    EXPECT_EQ(-1, file);
    expect_error(KZ_DISC_ERROR_TOO_MANY_FILES);
}

// No call here writes, so the system never says "no space" by itself: a filter says it.
TEST_P(DiscFamily, AFullDiskIsTold)
{
    const int32_t file = family().open("/");
    bool filtered = false;
    int64_t sought = 0;
    int32_t read = 0;
    char buffer[4];
    kz_status after_seek = 0;
    std::thread([&] {
        filtered = make_seeking_fail(ENOSPC);
        sought = family().seek(file, 0, 0);
        after_seek = family().get_error();
        read = family().read_at(file, 0, buffer, 4);
    }).join();
    EXPECT_EQ(0u, family().close(file));
    if (!filtered) {
        GTEST_SKIP() << kNoFilter;
    }
    EXPECT_EQ(-1, sought);
    EXPECT_EQ(KZ_DISC_ERROR_NO_SPACE, after_seek);
    EXPECT_EQ(-1, read);
    expect_error(KZ_DISC_ERROR_NO_SPACE);
}

// What an earlier call has left in `errno` must not be taken for the reason.
TEST_P(DiscFamily, AnArrivalElsewhereIsNotBlamedOnAnEarlierError)
{
    const int32_t file = family().open("/");
    bool filtered = false;
    int32_t read = 0;
    char buffer[4];
    std::thread([&] {
        filtered = make_seeking_fail(0); // "arrived at 0"
        errno = ENOENT;
        read = family().read_at(file, 5, buffer, 4);
    }).join();
    EXPECT_EQ(0u, family().close(file));
    if (!filtered) {
        GTEST_SKIP() << kNoFilter;
    }
    EXPECT_EQ(-1, read);
    expect_error(KZ_DISC_ERROR_SYSTEM);
}

TEST_P(DiscFamily, EveryOtherFailureIsOneOfTheSystem)
{
    const ScratchDirectory directory;
    const std::string file = directory.write("file", "x");
    std::filesystem::create_symlink("loop", directory.path("loop"));
    EXPECT_EQ(-1, family().open((file + "/below").c_str())) << "no directory";
    expect_error(KZ_DISC_ERROR_SYSTEM);
    EXPECT_EQ(-1, family().open(directory.path("loop").c_str()));
    expect_error(KZ_DISC_ERROR_SYSTEM);
    EXPECT_EQ(-1, family().open(std::string(5000, 'x').c_str())) << "too long";
    expect_error(KZ_DISC_ERROR_SYSTEM);
    EXPECT_EQ(-1, family().open(nullptr));
    expect_error(KZ_DISC_ERROR_SYSTEM);

    const int32_t opened = family().open(directory.path().c_str());
    char buffer[4];
    EXPECT_EQ(-1, family().read(opened, buffer, 4)) << "a directory";
    expect_error(KZ_DISC_ERROR_SYSTEM);
    EXPECT_EQ(0u, family().close(opened));

    int ends[2];
    ASSERT_EQ(0, ::pipe(ends));
    EXPECT_EQ(-1, family().seek(ends[0], 0, 0)) << "a pipe has no places";
    expect_error(KZ_DISC_ERROR_SYSTEM);
    EXPECT_EQ(-1, family().read_at(ends[0], 0, buffer, 4));
    expect_error(KZ_DISC_ERROR_SYSTEM);
    ::close(ends[0]);
    ::close(ends[1]);
}

TEST(DiscErrors, EveryErrnoHasItsCode)
{
    for (int error = 0; error < 200; ++error) {
        kz_status expected = KZ_DISC_ERROR_SYSTEM;
        switch (error) {
        case 2:
            expected = KZ_DISC_ERROR_NOT_FOUND;
            break;
        case 9:
            expected = KZ_DISC_ERROR_BAD_DESCRIPTOR;
            break;
        case 13:
            expected = KZ_DISC_ERROR_ACCESS_DENIED;
            break;
        case 22:
            expected = KZ_DISC_ERROR_INVALID_ARGUMENT;
            break;
        case 24:
            expected = KZ_DISC_ERROR_TOO_MANY_FILES;
            break;
        case 28:
            expected = KZ_DISC_ERROR_NO_SPACE;
            break;
        default:
            break;
        }
        EXPECT_EQ(expected, kz::disc::status_of(error)) << error;
    }
}

// One word for the process: it holds the last failure of any thread.
TEST_P(DiscFamily, TheLastErrorMayBeAnotherThreads)
{
    EXPECT_EQ(-1, family().seek(0, 0, 3));
    std::thread([&] { EXPECT_EQ(KZ_DISC_ERROR_BAD_DESCRIPTOR, family().close(-1)); }).join();
    expect_error(KZ_DISC_ERROR_BAD_DESCRIPTOR);
}

// The thread sanitizer sees a race here if there is one.
TEST_P(DiscFamily, CanFailInSeveralThreadsAtOnce)
{
    const auto fail_often = [&] {
        for (int i = 0; i < 500; ++i) {
            EXPECT_EQ(-1, family().seek(0, 0, 3));
            const kz_status status = family().get_error();
            EXPECT_TRUE(status == 0 || status == KZ_DISC_ERROR_NOT_FOUND) << status;
            static_cast<void>(family().query_availability());
        }
    };
    std::thread other(fail_often);
    fail_often();
    other.join();
}

// ---- DVD only

class DvdExists : public DiscOn {};
INSTANTIATE_TEST_SUITE_P(Each, DvdExists, ::testing::Values(kDvd), family_name);

TEST_P(DvdExists, TellsFilesOfEveryKind)
{
    const ScratchDirectory directory;
    const std::string file = directory.write("file", "x");
    std::filesystem::create_symlink("file", directory.path("link"));
    EXPECT_EQ(1, kzdvdfs_exists(file.c_str()));
    EXPECT_EQ(1, kzdvdfs_exists(directory.path().c_str()));
    EXPECT_EQ(1, kzdvdfs_exists(directory.path("link").c_str()));
    ASSERT_EQ(0, ::chmod(file.c_str(), 0));
    EXPECT_EQ(1, kzdvdfs_exists(file.c_str())) << "there, though not to be read";
    expect_error(0);
}

// The system checks the real user here, so that is the one to give up; for one thread only.
TEST_P(DvdExists, IsNotSeenInAClosedDirectory)
{
    const ScratchDirectory directory;
    const std::string file = directory.write("file", "x");
    ASSERT_EQ(0, ::chmod(directory.path().c_str(), 0));
    int32_t exists = 1;
    std::thread([&] {
        constexpr uid_t kNobody = 65534;
        if (::getuid() == 0) {
            ASSERT_EQ(0, ::syscall(SYS_setresuid, kNobody, kNobody, kNobody));
        }
        exists = kzdvdfs_exists(file.c_str());
    }).join();
    EXPECT_EQ(0, exists);
    expect_error(KZ_DISC_ERROR_ACCESS_DENIED);
    ASSERT_EQ(0, ::chmod(directory.path().c_str(), 0700));
}

TEST_P(DvdExists, SaysWhyNot)
{
    const ScratchDirectory directory;
    std::filesystem::create_symlink("missing", directory.path("link"));
    for (const char* name : {"missing", "link", "missing/below"}) {
        EXPECT_EQ(0, kzdvdfs_exists(directory.path(name).c_str())) << name;
        expect_error(KZ_DISC_ERROR_NOT_FOUND);
    }
    EXPECT_EQ(0, kzdvdfs_exists((directory.write("file", "") + "/below").c_str()));
    expect_error(KZ_DISC_ERROR_SYSTEM);
    EXPECT_EQ(0, kzdvdfs_exists(nullptr));
    expect_error(KZ_DISC_ERROR_SYSTEM);
}

} // namespace
