// `kzfp duplicates`: where it looks, what it says of files, and its forms of output.

#include "duplicates_fixture.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

TEST_F(Duplicates, SayWhatTheFilesAreLike)
{
    std::map<std::string, json> files;
    const std::vector<json> groups = groups_in(music());
    for (const json& file : groups.at(0)["files"]) {
        files[name_in(file)] = file;
    }
    EXPECT_EQ(true, files["same.flac"]["lossless"]);
    EXPECT_EQ(false, files["lossy.ogg"]["lossless"]);
    EXPECT_EQ(true, files["original.wav"]["best"]);
    EXPECT_EQ(false, files["same.flac"]["best"]);
    EXPECT_EQ(16000, files["original.wav"]["sample_rate"]);
    EXPECT_EQ("there", files["original.wav"]["state"]);
    EXPECT_NEAR(256000, files["original.wav"]["bit_rate"].get<double>(), 1000);
    EXPECT_NEAR(-3, files["late.wav"]["offset"].get<double>(), 0.2);
}

TEST_F(Duplicates, OfACatalogueAreFoundWithoutTheFiles)
{
    const ScratchDirectory scratch;
    fs::copy(music(), scratch.path("music"), fs::copy_options::recursive);
    const std::string catalogue = scratch.path("c.kzc");
    output_of({"add", catalogue, scratch.path("music")});
    EXPECT_EQ(7u, groups_in(catalogue).at(0)["files"].size());
    fs::remove(scratch.path("music/original.wav"));
    fs::remove(scratch.path("music/sub/copy.wav"));
    const json some = groups_in(catalogue).at(0)["files"];
    EXPECT_EQ("same.flac", name_in(some[0]));
    EXPECT_EQ(true, some[0]["best"]);
    fs::remove_all(scratch.path("music"));
    const json none = groups_in(catalogue).at(0)["files"];
    ASSERT_EQ(7u, none.size());
    EXPECT_EQ(false, none[0]["best"]);
    EXPECT_EQ("not there", none[0]["relation"]);
    EXPECT_EQ("gone", none[0]["state"]);
    EXPECT_TRUE(contains(output_of({"duplicates", catalogue}), "the file is not there"));
}

TEST_F(Duplicates, DoNotDependOnTheNumberOfThreads)
{
    const auto found = [](const std::string& jobs) {
        return output_of({"duplicates", "--format", "json", "--jobs", jobs, music()});
    };
    EXPECT_EQ(found("1"), found("7"));
}

TEST_F(Duplicates, OfTrailsAreFoundToo)
{
    const ScratchDirectory scratch;
    scratch.write("a.kzt", trail_file(piece(7)));
    scratch.write("a.wav", wav(scaled(piece(7), 0.4)));
    const json files = groups_in(scratch.path()).at(0)["files"];
    EXPECT_EQ("a.wav", name_in(files[0]));
    EXPECT_EQ("same recording", files[1]["relation"]);
    EXPECT_FALSE(files[1].contains("lossless"));
}

TEST_F(Duplicates, CanBeOfAListOfFiles)
{
    const std::string list = music() + "/original.wav\n" + music() + "/same.flac\n";
    const ProcessResult result =
        kzfp({"duplicates", "-f", "json", "--files-from", "-"}, fed_with(list));
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_EQ(2u, lines_of(result.out).at(0)["files"].size());
}

TEST_F(Duplicates, AsTablesHaveALineForEachFile)
{
    const std::string table = output_of({"duplicates", "--format", "csv", music()});
    EXPECT_EQ(8, std::ranges::count(table, '\n'));
    EXPECT_TRUE(table.starts_with("group,file,track,best,relation,")) << table;
    EXPECT_TRUE(contains(table, "\n1," + music() + "/original.wav,")) << table;
}

TEST_F(Duplicates, KeepNamesThatAreNotUtf8)
{
    const ScratchDirectory scratch;
    const std::string name = scratch.write("\xff\n.wav", wav(piece(1)));
    scratch.write("z.wav", wav(piece(1)));
    const json file = groups_in(scratch.path()).at(0)["files"][1]; // in the order of names
    std::string digits;
    for (const char c : name) {
        constexpr char kDigits[] = "0123456789abcdef";
        const auto byte = static_cast<uint8_t>(c);
        digits += {kDigits[byte / 16], kDigits[byte % 16]};
    }
    EXPECT_EQ(digits, file["file_bytes"]);
    EXPECT_TRUE(contains(output_of({"duplicates", "--script", scratch.path()}), "'" + name + "'"));
}

TEST_F(Duplicates, AreRemovedByTheScriptAsFarAsItSays)
{
    const ScratchDirectory scratch;
    fs::copy(music(), scratch.path("music"), fs::copy_options::recursive);
    const std::string script = scratch.path("remove.sh");
    EXPECT_EQ("", output_of({"duplicates", "--script", "-o", script, scratch.path("music")}));
    const auto left = [&scratch] {
        return std::distance(fs::recursive_directory_iterator(scratch.path("music")),
                             fs::recursive_directory_iterator());
    };
    ASSERT_EQ(9, left()); // a folder among them
    EXPECT_EQ(0, run({"/bin/sh", script}).status);
    EXPECT_FALSE(fs::exists(scratch.path("music/sub/copy.wav")));
    EXPECT_EQ(8, left());
    ProcessSetup setup;
    setup.environment = {"INFERIOR=yes"};
    EXPECT_EQ(0, run({"/bin/sh", script}, setup).status);
    EXPECT_FALSE(fs::exists(scratch.path("music/lossy.ogg")));
    EXPECT_EQ(7, left());
}

} // namespace
