// `kzfp disc` as a user sees it, on the content of real images and on the images themselves.

#include "kzfp.hpp"

#include <filesystem>

#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

const std::string kImages = KZ_DISC_IMAGES "/";

json json_of(const std::string& path)
{
    const std::string out = output_of({"disc", "--format", "json", path});
    EXPECT_EQ(out.size() - 1, out.find('\n')) << "one line";
    return json::parse(out);
}

void expect_failure(const std::string& path, const std::string& what)
{
    const ProcessResult result = kzfp({"disc", path});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_EQ(path + ": " + what + "\n", result.err);
}

// ---- Mounted discs

TEST(KzfpDisc, TellsABlurayDisc)
{
    EXPECT_EQ("kind: Blu-ray\n"
              "found: BDMV/index.bdmv\n"
              "found: BDMV/MovieObject.bdmv\n"
              "found: AACS/\n"
              "found: AACS/Content000.cer\n"
              "playlists: 00000.mpls 00007.mpls\n",
              output_of({"disc", kImages + "bluray"}));
    const json expected = {{"schema", 1},
                           {"path", kImages + "bluray"},
                           {"bluray", true},
                           {"dvd", false},
                           {"control_files",
                            {{"BDMV/index.bdmv", true},
                             {"BDMV/MovieObject.bdmv", true},
                             {"AACS/", true},
                             {"AACS/Content000.cer", true}}},
                           {"playlists", {"00000.mpls", "00007.mpls"}},
                           {"title_sets", json::array()}};
    EXPECT_EQ(expected, json_of(kImages + "bluray"));
}

TEST(KzfpDisc, TellsADvd)
{
    EXPECT_EQ("kind: DVD\n"
              "found: VIDEO_TS/VIDEO_TS.IFO\n"
              "title sets: 1 2\n",
              output_of({"disc", kImages + "dvd"}));
    const json expected = {{"schema", 1},
                           {"path", kImages + "dvd"},
                           {"bluray", false},
                           {"dvd", true},
                           {"control_files", {{"VIDEO_TS/VIDEO_TS.IFO", true}}},
                           {"playlists", json::array()},
                           {"title_sets", {1, 2}}};
    EXPECT_EQ(expected, json_of(kImages + "dvd"));
}

TEST(KzfpDisc, TakesARootWithASlashAtItsEnd)
{
    for (const char* kind : {"bluray", "dvd"}) {
        EXPECT_EQ(output_of({"disc", kImages + kind}), output_of({"disc", kImages + kind + "/"}));
        EXPECT_EQ(output_of({"disc", kImages + kind}), output_of({"disc", kImages + kind + "//"}));
    }
}

TEST(KzfpDisc, TellsWhatIsMissingAndThatADiscIsBoth)
{
    const ScratchDirectory directory;
    directory.write("BDMV/index.bdmv", "");
    directory.write("VIDEO_TS/VIDEO_TS.IFO", "");
    directory.write("VIDEO_TS/VTS_99_0.IFO", "");
    EXPECT_EQ("kind: Blu-ray\n"
              "kind: DVD\n"
              "found: BDMV/index.bdmv\n"
              "missing: BDMV/MovieObject.bdmv\n"
              "missing: AACS/\n"
              "found: VIDEO_TS/VIDEO_TS.IFO\n"
              "playlists: none\n"
              "title sets: 99\n",
              output_of({"disc", directory.path()}));
}

TEST(KzfpDisc, ListsAsPlaylistsOnlyFilesThatAreNamedSo)
{
    const ScratchDirectory directory;
    directory.write("BDMV/index.bdmv", "");
    for (const char* name : {"00001.mpls", "00000.mpls", "1.mpls", "00002.mpl", "0000a.mpls",
                             "00003.mpls.bak", "00004.mpls/below"}) {
        directory.write(std::string("BDMV/PLAYLIST/") + name, "");
    }
    fs::create_symlink("00001.mpls", directory.path("BDMV/PLAYLIST/00005.mpls"));
    EXPECT_EQ(json({"00000.mpls", "00001.mpls"}), json_of(directory.path())["playlists"]);
}

TEST(KzfpDisc, TakesLongPaths)
{
    const ScratchDirectory directory;
    std::string path = directory.path();
    for (int level = 0; level < 10; ++level) {
        path += "/" + std::string(255, 'd');
    }
    directory.write(path.substr(directory.path().size() + 1) + "/VIDEO_TS/VIDEO_TS.IFO", "");
    EXPECT_EQ(true, json_of(path)["dvd"]);
}

TEST(KzfpDisc, RefusesADirectoryThatIsNoDisc)
{
    const ScratchDirectory directory;
    expect_failure(directory.path(), "neither a Blu-ray disc nor a DVD: it has no BDMV/index.bdmv "
                                     "and no VIDEO_TS/VIDEO_TS.IFO");
}

// ---- Devices and images

TEST(KzfpDisc, TellsTheLabelsOfAnImage)
{
    EXPECT_EQ("ISO 9660 label: HOLIDAY_2026\nUDF label: HOLIDAY_2026\n",
              output_of({"disc", kImages + "dvd.iso"}));
    const json expected = {{"schema", 1},
                           {"path", kImages + "bluray.iso"},
                           {"iso9660_label", "SUMMER_FILM"},
                           {"udf_label", "SUMMER_FILM"}};
    EXPECT_EQ(expected, json_of(kImages + "bluray.iso"));
}

TEST(KzfpDisc, TellsOnlyLabelsOfVolumesThatAreThere)
{
    EXPECT_EQ("ISO 9660 label: PLAIN\n", output_of({"disc", kImages + "plain.iso"}));
    EXPECT_EQ(json(), json_of(kImages + "plain.iso")["udf_label"]);
}

TEST(KzfpDisc, PrintsLabelsInFull)
{
    EXPECT_EQ("ISO 9660 label: ABCDEFGHIJKLMNOPQRSTUVWXYZ012345\n"
              "UDF label: ABCDEFGHIJKLMNOPQRSTUVWXYZ0123\n",
              output_of({"disc", kImages + "longest.iso"}));
    EXPECT_EQ("ISO 9660 label: TWO WORDS\nUDF label: TWO WORDS\n",
              output_of({"disc", kImages + "words.iso"}));
}

TEST(KzfpDisc, ShowsNoControlCharacters)
{
    std::string image = contents(kImages + "plain.iso");
    image.replace(16 * 2048 + 40, 6, "A\x1b\n\x7fZ ");
    const ScratchDirectory directory;
    const std::string path = directory.write("image", image);
    EXPECT_EQ("ISO 9660 label: A???Z\n", output_of({"disc", path}));
    EXPECT_EQ("A\x1b\n\x7fZ", json_of(path)["iso9660_label"]);
}

TEST(KzfpDisc, RefusesWhatIsNoDisc)
{
    const ScratchDirectory directory;
    const std::string what =
        "no disc: it has neither an ISO 9660 volume nor a UDF volume where discs have them";
    expect_failure(directory.write("empty", ""), what);
    expect_failure(directory.write("noise", std::string(100'000, 'x')), what);
    expect_failure(kImages + "far.udf", what);
    expect_failure(directory.path("missing"), "cannot be opened (No such file or directory)");
}

// ---- The command line

TEST(KzfpDisc, FailuresHaveALineOfJsonToo)
{
    const ScratchDirectory directory;
    const std::string path = directory.path("missing");
    const ProcessResult result = kzfp({"disc", "--format", "json", path});
    EXPECT_EQ(1, result.status);
    const json expected = {
        {"schema", 1}, {"path", path}, {"error", "cannot be opened (No such file or directory)"}};
    EXPECT_EQ(expected, json::parse(result.out));
}

TEST(KzfpDisc, WritesToAFileWhenAsked)
{
    const ScratchDirectory directory;
    const std::string file = directory.path("found.txt");
    EXPECT_EQ("", output_of({"disc", "--output", file, kImages + "dvd"}));
    EXPECT_EQ(output_of({"disc", "--format", "text", kImages + "dvd"}), contents(file));
}

TEST(KzfpDisc, NeedsOnePathAndAKnownFormat)
{
    for (const std::vector<std::string>& arguments :
         std::vector<std::vector<std::string>>{{"disc"},
                                               {"disc", "a", "b"},
                                               {"disc", "--format", "values", "a"},
                                               {"disc", "--raw", "a"}}) {
        const ProcessResult result = kzfp(arguments);
        EXPECT_EQ(2, result.status);
        EXPECT_EQ("", result.out);
        EXPECT_NE("", result.err);
    }
}

} // namespace
