// What all commands share to write: a file instead of standard output, colour, progress.

#include "kzfp.hpp"

#include <cstdlib>
#include <filesystem>

#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "kzfp/output/progress.hpp"
#include "kzfp/output/style.hpp"
#include "kzfp/output/write.hpp"

namespace {

using namespace kz::test;
using ::kzfp::OutputError;
using ::kzfp::OutputFile;
using ::kzfp::Pace;
using ::kzfp::Progress;
using ::kzfp::ProgressMode;
using ::kzfp::write_output;

size_t files_in(const std::string& folder)
{
    return static_cast<size_t>(std::distance(std::filesystem::directory_iterator(folder), {}));
}

std::string error_of(const std::string& path, const std::vector<std::string>& inputs = {})
{
    try {
        OutputFile file(path, inputs);
        write_output("new");
        file.finish();
        return "";
    } catch (const OutputError& error) {
        return error.what();
    }
}

TEST(KzfpOutput, NeverReplacesWhatIsNoResult)
{
    const ScratchDirectory scratch;
    for (const std::string& bytes : {contents(clip("music.ogg")), contents(clip("music.mp3"))}) {
        const std::string song = scratch.write("song", bytes);
        EXPECT_NE(std::string::npos, error_of(song).find("would be lost")) << error_of(song);
        EXPECT_EQ(bytes, contents(song));
    }
    const std::string catalogue = scratch.path("music.kzc");
    ASSERT_EQ(0, kz::test::kzfp({"add", "-q", catalogue, clip("music.ogg")}).status);
    const std::string whole = contents(catalogue);
    EXPECT_EQ(
        1, kz::test::kzfp({"match", "-q", "-o", catalogue, catalogue, clip("music.ogg")}).status);
    EXPECT_EQ(whole, contents(catalogue));
}

TEST(KzfpOutput, ListsOfFilesAreNotReplaced)
{
    const ScratchDirectory scratch;
    const std::string list = scratch.write("list", clip("music.ogg") + "\n");
    const std::string catalogue = scratch.path("music.kzc");
    EXPECT_EQ(1, kz::test::kzfp({"add", "-q", catalogue, "--files-from", list, "-o", list}).status);
    EXPECT_NE(0, kz::test::kzfp({"--files-from", list, "-o", list}).status);
    EXPECT_EQ(clip("music.ogg") + "\n", contents(list));
}

TEST(KzfpOutputFile, AppearsWhenTheCommandEnds)
{
    const ScratchDirectory directory;
    OutputFile file(directory.path("out"));
    write_output("one\n");
    write_output("two\n");
    EXPECT_FALSE(std::filesystem::exists(directory.path("out")));
    file.finish();
    EXPECT_EQ("one\ntwo\n", contents(directory.path("out")));
    EXPECT_EQ(1u, files_in(directory.path()));
}

TEST(KzfpOutputFile, KeepsWhatWasThereWhenTheCommandFails)
{
    const ScratchDirectory directory;
    const std::string path = directory.write("out", "old");
    {
        const OutputFile file(path);
        write_output("new");
    }
    EXPECT_EQ("old", contents(path));
    EXPECT_EQ(1u, files_in(directory.path()));
}

TEST(KzfpOutputFile, GrowsFromTheFirstResultOnWhenLive)
{
    const ScratchDirectory directory;
    const std::string path = directory.write("out", "old");
    const OutputFile file(path, {}, OutputFile::Mode::live);
    EXPECT_EQ("old", contents(path));
    write_output("new");
    EXPECT_EQ("new", contents(path));
}

TEST(KzfpOutputFile, KeepsPermissionsAndLinks)
{
    const ScratchDirectory directory;
    const std::string path = directory.write("out", "old");
    ASSERT_EQ(0, ::chmod(path.c_str(), 0640));
    ASSERT_EQ(0, ::symlink("out", directory.path("link").c_str()));
    OutputFile file(directory.path("link"));
    write_output("new");
    file.finish();
    EXPECT_EQ("new", contents(path));
    EXPECT_TRUE(std::filesystem::is_symlink(directory.path("link")));
    EXPECT_EQ(static_cast<std::filesystem::perms>(0640),
              std::filesystem::status(path).permissions());
}

TEST(KzfpOutputFile, SaysWhyItCannotBeWritten)
{
    EXPECT_EQ("/nowhere/out cannot be written (No such file or directory)",
              error_of("/nowhere/out"));
    EXPECT_EQ("/dev/full cannot be written (No space left on device)", error_of("/dev/full"));
}

TEST(KzfpOutputFile, IsNoFileThatIsRead)
{
    const ScratchDirectory directory;
    const std::string path = directory.write("song.wav", "sound");
    EXPECT_EQ(path + " is also read; --output needs another file",
              error_of(path, {directory.path() + "/./song.wav"}));
    EXPECT_EQ("sound", contents(path));
}

TEST(KzfpStyle, LeavesTextAsItIsWithoutColour)
{
    EXPECT_EQ("text", ::kzfp::Style(false).bold("text"));
    EXPECT_EQ("\033[31mtext\033[m", ::kzfp::Style(true).red("text"));
}

TEST(KzfpStyle, KnowsUtf8FromTheEnvironment)
{
    ::setenv("LC_ALL", "de_DE.utf8", 1);
    EXPECT_TRUE(::kzfp::locale_is_utf8());
    ::setenv("LC_ALL", "C", 1);
    ::setenv("LANG", "C.UTF-8", 1);
    EXPECT_FALSE(::kzfp::locale_is_utf8());
    ::unsetenv("LC_ALL");
    ::unsetenv("LC_CTYPE");
    EXPECT_TRUE(::kzfp::locale_is_utf8());
}

TEST(KzfpProgress, RateIsThatOfTheLastHalfMinute)
{
    Pace pace;
    EXPECT_FALSE(pace.rate());
    pace.note(1, 1000, 0); // these were known already
    for (int second = 2; second <= 100; ++second) {
        pace.note(second, 1000 + 2 * static_cast<size_t>(second), 500.0 * second);
    }
    ASSERT_TRUE(pace.rate());
    EXPECT_DOUBLE_EQ(2, pace.rate()->files);
    EXPECT_DOUBLE_EQ(500, pace.rate()->sound);
    EXPECT_DOUBLE_EQ(5, *pace.remaining(10));
}

TEST(KzfpProgress, JsonIsOneObjectForEachCall)
{
    ::testing::internal::CaptureStderr();
    Progress progress(4, ProgressMode::json);
    progress.show(0, "a\xff.wav");
    const std::string text = ::testing::internal::GetCapturedStderr();
    ASSERT_TRUE(text.ends_with("}\n")) << text;
    const auto object = nlohmann::json::parse(text);
    EXPECT_EQ(1, object["schema"]);
    EXPECT_EQ(0, object["done"]);
    EXPECT_EQ(4, object["total"]);
    EXPECT_EQ("61ff2e776176", object["file_bytes"]);
    EXPECT_TRUE(object["elapsed"].is_number());
    EXPECT_TRUE(object["remaining"].is_null());
}

} // namespace
