// Mapped files, and files that replace others in one step.

#include <csignal>
#include <string_view>
#include <system_error>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include "catalogue/index/mapped_file.hpp"
#include "catalogue/index/scratch_folder.hpp"

namespace kzcat {
namespace {

using test::ScratchFolder;

std::span<const std::byte> bytes_of(std::string_view text)
{
    return std::as_bytes(std::span(text));
}

std::string text_of(const std::string& path)
{
    const test::Bytes bytes = test::read_file(path);
    std::string text;
    for (const std::byte byte : bytes) {
        text.push_back(static_cast<char>(byte));
    }
    return text;
}

TEST(MappedFile, HasTheBytesOfTheFile)
{
    const ScratchFolder folder;
    test::write_file(folder.file("a"), bytes_of("some bytes"));
    MappedFile mapped(folder.file("a"));
    std::filesystem::remove(folder.file("a"));
    const MappedFile moved(std::move(mapped));
    ASSERT_EQ(10U, moved.bytes().size());
    EXPECT_EQ(std::byte{'b'}, moved.bytes()[5]);
}

TEST(MappedFile, MayBeEmpty)
{
    const ScratchFolder folder;
    test::write_file(folder.file("a"), {});
    EXPECT_TRUE(MappedFile(folder.file("a")).bytes().empty());
}

TEST(MappedFile, IsRefusedWhenItIsNoFile)
{
    const ScratchFolder folder;
    EXPECT_THROW(MappedFile{folder.path().string()}, std::system_error);
    EXPECT_THROW(MappedFile{folder.file("missing")}, std::system_error);
    ASSERT_EQ(0, mkfifo(folder.file("pipe").c_str(), 0600));
    EXPECT_THROW(MappedFile{folder.file("pipe")}, std::system_error);
}

TEST(FileReplacement, IsThereAfterItIsCommitted)
{
    const ScratchFolder folder;
    test::write_file(folder.file("a"), bytes_of("earlier"));
    FileReplacement file(folder.file("a"));
    ASSERT_TRUE(file.is_ours());
    file.write(bytes_of("???er"));
    file.write(bytes_of(" one"));
    file.write_start(bytes_of("lat"));
    EXPECT_EQ("earlier", text_of(folder.file("a")));
    file.commit();
    EXPECT_EQ("later one", text_of(folder.file("a")));
    EXPECT_EQ(1U, folder.files());
}

TEST(FileReplacement, LeavesNothingWhenItIsGivenUp)
{
    const ScratchFolder folder;
    test::write_file(folder.file("a"), bytes_of("earlier"));
    {
        FileReplacement file(folder.file("a"));
        file.write(bytes_of("half of"));
    }
    EXPECT_EQ("earlier", text_of(folder.file("a")));
    EXPECT_EQ(1U, folder.files());
}

TEST(FileReplacement, IsWrittenByOneAtATime)
{
    const ScratchFolder folder;
    FileReplacement one(folder.file("a"));
    one.write(bytes_of("one"));
    {
        const FileReplacement other(folder.file("a"));
        EXPECT_FALSE(other.is_ours());
    }
    one.commit();
    EXPECT_EQ("one", text_of(folder.file("a")));
    EXPECT_TRUE(FileReplacement(folder.file("a")).is_ours());
}

TEST(FileReplacement, UsesWhatAKilledProcessLeft)
{
    const ScratchFolder folder;
    const pid_t child = fork();
    if (child == 0) {
        FileReplacement file(folder.file("a"));
        file.write(bytes_of("a long text that is not finished"));
        raise(SIGKILL);
    }
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_EQ(1U, folder.files());
    FileReplacement file(folder.file("a"));
    ASSERT_TRUE(file.is_ours());
    file.write(bytes_of("whole"));
    file.commit();
    EXPECT_EQ("whole", text_of(folder.file("a")));
    EXPECT_EQ(1U, folder.files());
}

TEST(FileReplacement, FollowsNoLink)
{
    const ScratchFolder folder;
    test::write_file(folder.file("other"), bytes_of("keep"));
    std::filesystem::create_symlink(folder.file("other"), folder.file("a.new"));
    EXPECT_THROW(FileReplacement{folder.file("a")}, std::system_error);
    EXPECT_EQ("keep", text_of(folder.file("other")));
}

TEST(FileReplacement, ReportsAFolderThatIsMissing)
{
    const ScratchFolder folder;
    EXPECT_THROW(FileReplacement{folder.file("missing/a")}, std::system_error);
}

TEST(FileReplacement, LeavesTheEarlierFileOnAFullDisk)
{
    const ScratchFolder folder;
    test::write_file(folder.file("a"), bytes_of("earlier"));
    {
        const test::FileLimit limit(10);
        FileReplacement file(folder.file("a"));
        file.write(bytes_of("12345678"));
        EXPECT_THROW(file.write(bytes_of("12345678")), std::system_error);
    }
    EXPECT_EQ("earlier", text_of(folder.file("a")));
    EXPECT_EQ(1U, folder.files());
}

} // namespace
} // namespace kzcat
