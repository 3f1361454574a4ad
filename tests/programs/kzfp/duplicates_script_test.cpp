// The commands that would remove duplicates, run by a real shell.

#include <filesystem>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzfp/duplicates/script.hpp"
#include "support/process.hpp"
#include "support/scratch_directory.hpp"

namespace {

using namespace kzfp;
using kz::test::ScratchDirectory;

Quality lossless_file()
{
    Quality quality;
    quality.state = Quality::State::there;
    quality.lossless = true;
    quality.rate = 44100;
    quality.channels = 2;
    quality.bandwidth = 20'500;
    return quality;
}

FoundFile file_of(const std::string& path, const Quality& quality, Kinship kinship)
{
    FoundFile file;
    file.file.path = path;
    file.quality = quality;
    file.kinship = kinship;
    return file;
}

/// Names that a shell would take for something else.
std::vector<std::string> nasty_names()
{
    return {"two\nlines; touch touched",
            "it's",
            "-rf",
            "$(touch touched)",
            "`touch touched`",
            "\"quoted\" \\ name",
            "\xff\xfe no UTF-8",
            "* ? [a-z]",
            "# no comment",
            " "};
}

void run_script(const ScratchDirectory& scratch, const std::string& script,
                const std::vector<std::string>& environment = {})
{
    const std::string path = scratch.write("script.sh", script);
    kz::test::ProcessSetup setup;
    setup.environment = environment;
    const auto result = kz::test::run({"/bin/sh", path}, setup);
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_EQ("", result.out + result.err);
}

TEST(DuplicatesScript, RemovesIdenticalFilesOfAnyName)
{
    const ScratchDirectory scratch;
    for (const std::string& name : nasty_names()) {
        scratch.write("music/" + name, "same");
    }
    scratch.write("music/kept", "same");
    Finding finding;
    finding.files = {file_of("kept", lossless_file(), Kinship::best)};
    for (const std::string& name : nasty_names()) {
        finding.files.push_back(file_of(name, lossless_file(), Kinship::identical_bytes));
        finding.files.back().copy_of = 0;
    }
    run_script(scratch, script_header(scratch.path("music")) + to_script(finding, 1));
    std::vector<std::string> left;
    for (const auto& entry : std::filesystem::directory_iterator(scratch.path("music"))) {
        left.push_back(entry.path().filename().string());
    }
    EXPECT_EQ(std::vector<std::string>{"kept"}, left);
}

TEST(DuplicatesScript, KeepsWhatHasChangedMeanwhile)
{
    const ScratchDirectory scratch;
    Finding finding;
    finding.files = {
        file_of(scratch.write("kept", "same"), lossless_file(), Kinship::best),
        file_of(scratch.write("copy", "other"), lossless_file(), Kinship::identical_bytes),
        file_of(scratch.path("link"), lossless_file(), Kinship::identical_bytes)};
    finding.files[1].copy_of = finding.files[2].copy_of = 0;
    std::filesystem::create_hard_link(scratch.path("kept"), scratch.path("link"));
    const std::string script = script_header(scratch.path()) + to_script(finding, 1);
    run_script(scratch, script);
    EXPECT_TRUE(std::filesystem::exists(scratch.path("copy")));
    EXPECT_TRUE(std::filesystem::exists(scratch.path("link")));
    std::filesystem::remove(scratch.path("kept"));
    scratch.write("copy", "same");
    run_script(scratch, script);
    EXPECT_TRUE(std::filesystem::exists(scratch.path("copy")));
}

TEST(DuplicatesScript, RemovesMoreOnlyOnRequest)
{
    const ScratchDirectory scratch;
    Quality lossy = lossless_file();
    lossy.lossless = false;
    Finding finding;
    finding.files = {file_of(scratch.write("kept", "1"), lossless_file(), Kinship::best),
                     file_of(scratch.write("lossy", "2"), lossy, Kinship::same_recording),
                     file_of(scratch.write("lossy copy", "2"), lossy, Kinship::same_recording),
                     file_of(scratch.write("other", "3"), lossless_file(), Kinship::same_recording),
                     file_of(scratch.write("excerpt", "4"), lossy, Kinship::excerpt)};
    finding.files[2].copy_of = 1;
    const std::string script = script_header(scratch.path()) + to_script(finding, 1);
    const auto left = [&](const std::vector<std::string>& environment) {
        run_script(scratch, script, environment);
        std::string names;
        for (const FoundFile& file : finding.files) {
            names += std::filesystem::exists(file.file.path) ? '1' : '0';
        }
        return names;
    };
    EXPECT_EQ("11011", left({}));
    EXPECT_EQ("10011", left({"INFERIOR=yes"}));
    EXPECT_EQ("10000", left({"REVIEW=yes"}));
}

TEST(DuplicatesScript, RemovesCopiesOfWhatItRemoves)
{
    const ScratchDirectory scratch;
    Quality lossy = lossless_file();
    lossy.lossless = false;
    Finding finding;
    finding.files = {file_of(scratch.write("kept", "1"), lossless_file(), Kinship::best),
                     file_of(scratch.write("lossy", "2"), lossy, Kinship::same_recording),
                     file_of(scratch.write("copy", "2"), lossy, Kinship::same_recording)};
    finding.files[2].copy_of = 1;
    run_script(scratch, script_header(scratch.path()) + to_script(finding, 1), {"INFERIOR=yes"});
    EXPECT_TRUE(std::filesystem::exists(scratch.path("kept")));
    EXPECT_FALSE(std::filesystem::exists(scratch.path("lossy")));
    EXPECT_FALSE(std::filesystem::exists(scratch.path("copy")));
}

TEST(DuplicatesScript, LeavesGroupsWithoutTheirBestFile)
{
    Finding finding;
    Quality gone;
    finding.files = {file_of("a", gone, Kinship::best),
                     file_of("b", gone, Kinship::identical_bytes)};
    EXPECT_EQ("", to_script(finding, 1));
}

} // namespace
