// The file of --report: whole or not at all.

#include "kzfp/pages/report_file.hpp"

#include <filesystem>
#include <fstream>
#include <sstream>

#include <gtest/gtest.h>

#include "support/scratch_directory.hpp"

namespace kzfp {
namespace {

namespace fs = std::filesystem;

std::string text_of(const std::string& path)
{
    std::ostringstream text;
    text << std::ifstream(path).rdbuf();
    return text.str();
}

void write_text(const std::string& path, const std::string& text) { std::ofstream(path) << text; }

/// What is wrong with a place for a report; empty when nothing is.
std::string trouble_with(const std::string& path, const std::vector<std::string>& others)
{
    try {
        const ReportFile file(path, others);
        return {};
    } catch (const OutputError& error) {
        return error.what();
    }
}

size_t files_in(const std::string& folder)
{
    return static_cast<size_t>(std::distance(fs::directory_iterator(folder), {}));
}

class ReportFiles : public testing::Test {
protected:
    std::string at(const std::string& name) const { return scratch_.path() + "/" + name; }

    kz::test::ScratchDirectory scratch_;
};

TEST_F(ReportFiles, NoPathMeansNoReport)
{
    const ReportFile file("", {});
    EXPECT_FALSE(file.is_wanted());
}

TEST_F(ReportFiles, TheyAppearWhenThePageIsWhole)
{
    ReportFile file(at("page.html"), {});
    EXPECT_TRUE(file.is_wanted());
    EXPECT_FALSE(fs::exists(at("page.html")));
    file.finish("<html/>");
    EXPECT_EQ("<html/>", text_of(at("page.html")));
    EXPECT_EQ(1U, files_in(scratch_.path()));
}

TEST_F(ReportFiles, WithoutAnEndTheOldOneStays)
{
    write_text(at("page.html"), "old");
    {
        const ReportFile file(at("page.html"), {});
    }
    EXPECT_EQ("old", text_of(at("page.html")));
    EXPECT_EQ(1U, files_in(scratch_.path()));
}

TEST_F(ReportFiles, TheyReplaceNothingThatIsUsed)
{
    write_text(at("clip.wav"), "sound");
    fs::create_symlink(at("clip.wav"), at("link.html"));
    const std::vector<std::string> others = {at("clip.wav"), at("results.json"), "-", ""};
    EXPECT_NE("", trouble_with(at("clip.wav"), others));
    EXPECT_NE("", trouble_with(at("link.html"), others));
    EXPECT_NE("", trouble_with(at("results.json"), others));
    EXPECT_EQ("", trouble_with(at("page.html"), others));
    EXPECT_EQ("sound", text_of(at("clip.wav")));
}

TEST_F(ReportFiles, LinksAreFollowed)
{
    write_text(at("page.html"), "old");
    fs::create_symlink(at("page.html"), at("link.html"));
    ReportFile(at("link.html"), {}).finish("new");
    EXPECT_TRUE(fs::is_symlink(at("link.html")));
    EXPECT_EQ("new", text_of(at("page.html")));
}

TEST_F(ReportFiles, StandardOutputIsNoPlaceForThem)
{
    EXPECT_NE(std::string::npos, trouble_with("-", {}).find("--report needs a name"));
}

TEST_F(ReportFiles, APlaceThatIsNotThereIsReportedFirst)
{
    const std::string trouble = trouble_with(at("nowhere/page.html"), {});
    EXPECT_NE(std::string::npos, trouble.find("No such file or directory"));
}

TEST_F(ReportFiles, AFullDiskIsReported)
{
    ReportFile file("/dev/full", {});
    try {
        file.finish("page");
        FAIL() << "a full disk took the page";
    } catch (const OutputError& error) {
        EXPECT_NE(std::string::npos, std::string(error.what()).find("No space left"));
    }
}

} // namespace
} // namespace kzfp
