// `kzfp duplicates`: which files it groups, and what it says of them.

#include "kzfp.hpp"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <map>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sndfile.hh>

#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

using Samples = std::vector<int16_t>;

Samples scaled(Samples samples, double factor)
{
    std::ranges::transform(samples, samples.begin(), [factor](int16_t sample) {
        return static_cast<int16_t>(std::lrint(sample * factor));
    });
    return samples;
}

Samples operator+(Samples samples, const Samples& more)
{
    samples.insert(samples.end(), more.begin(), more.end());
    return samples;
}

Samples silence(double seconds) { return Samples(static_cast<size_t>(seconds * kPieceRate)); }

/// Writes a file of a format of libsndfile.
std::string encode(const ScratchDirectory& scratch, const std::string& name, int format,
                   const Samples& samples)
{
    const std::string path = scratch.write(name, "");
    SndfileHandle file(path, SFM_WRITE, format, 1, static_cast<int>(kPieceRate));
    EXPECT_EQ(static_cast<sf_count_t>(samples.size()),
              file.write(samples.data(), static_cast<sf_count_t>(samples.size())));
    return path;
}

constexpr int kFlac = SF_FORMAT_FLAC | SF_FORMAT_PCM_16;
constexpr int kVorbis = SF_FORMAT_OGG | SF_FORMAT_VORBIS;

std::string name_in(const json& file)
{
    return fs::path(file["file"].get<std::string>()).filename();
}

/// The relation of each file of a group, by the file's name.
std::map<std::string, std::string> relations_in(const json& group)
{
    std::map<std::string, std::string> relations;
    for (const json& file : group["files"]) {
        relations[name_in(file)] = file["relation"];
    }
    return relations;
}

/// Folders of music, made once; tests only read them.
class Duplicates : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        const Samples one = piece(1);
        const std::string bytes = wav(one);
        scratch_->write("music/original.wav", bytes);
        scratch_->write("music/sub/copy.wav", bytes);
        scratch_->write("music/excerpt.wav", wav(part(one, 8, 12)));
        scratch_->write("music/quieter.wav", wav(scaled(one, 0.5)));
        scratch_->write("music/late.wav", wav(silence(3) + one));
        encode(*scratch_, "music/same.flac", kFlac, one);
        encode(*scratch_, "music/lossy.ogg", kVorbis, one);
        scratch_->write("music/other.wav", wav(piece(2)));
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static std::string music() { return scratch_->path("music"); }

    /// The groups that are found.
    static std::vector<json> groups_in(const std::string& path)
    {
        return lines_of(output_of({"duplicates", "--format", "json", path}));
    }

    static ScratchDirectory* scratch_;
};

ScratchDirectory* Duplicates::scratch_ = nullptr;

TEST_F(Duplicates, AreFoundWithWhatTheyAreToTheBestOne)
{
    const std::vector<json> groups = groups_in(music());
    ASSERT_EQ(1u, groups.size());
    EXPECT_EQ(1, groups[0]["schema"]);
    EXPECT_EQ(1, groups[0]["group"]);
    EXPECT_EQ((std::map<std::string, std::string>{{"original.wav", "best"},
                                                  {"copy.wav", "identical bytes"},
                                                  {"same.flac", "identical sound"},
                                                  {"quieter.wav", "same recording"},
                                                  {"late.wav", "same recording"},
                                                  {"lossy.ogg", "same recording"},
                                                  {"excerpt.wav", "excerpt"}}),
              relations_in(groups[0]));
}

TEST_F(Duplicates, SayWhereAnExcerptBegins)
{
    const json files = groups_in(music()).at(0)["files"];
    EXPECT_EQ("excerpt.wav", name_in(files.back()));
    EXPECT_NEAR(8, files.back()["offset"].get<double>(), 0.2);
    EXPECT_NEAR(12, files.back()["seconds"].get<double>(), 0.2);
    EXPECT_TRUE(contains(output_of({"duplicates", music()}), "excerpt.wav, from 0:08.")) << music();
}

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

TEST_F(Duplicates, AreNotTunesThatShareAPassage)
{
    const ScratchDirectory scratch;
    const Samples shared = part(piece(3), 5, 12);
    scratch.write("a.wav", wav(piece(4) + shared));
    scratch.write("b.wav", wav(shared + piece(5)));
    EXPECT_EQ("no duplicates among 2 recordings\n", output_of({"duplicates", scratch.path()}));
}

TEST_F(Duplicates, DoNotJoinTunesThatAMixHolds)
{
    const ScratchDirectory scratch;
    scratch.write("a.wav", wav(piece(4)));
    scratch.write("b.wav", wav(piece(5)));
    scratch.write("mix.wav", wav(piece(4) + piece(5) + piece(6)));
    const std::vector<json> groups = groups_in(scratch.path());
    ASSERT_EQ(1u, groups.size());
    EXPECT_EQ((std::map<std::string, std::string>{
                  {"mix.wav", "best"}, {"a.wav", "excerpt"}, {"b.wav", "excerpt"}}),
              relations_in(groups[0]));
}

TEST_F(Duplicates, OfSilenceAreCopiesOnly)
{
    const ScratchDirectory scratch;
    scratch.write("a.wav", wav(silence(9)));
    encode(scratch, "b.flac", kFlac, silence(9));
    scratch.write("c.wav", wav(silence(20)));
    EXPECT_EQ("no duplicates among 2 recordings\n", output_of({"duplicates", scratch.path()}));
    scratch.write("copy.wav", wav(silence(9)));
    const std::vector<json> groups = groups_in(scratch.path());
    ASSERT_EQ(1u, groups.size());
    EXPECT_EQ(
        (std::map<std::string, std::string>{{"a.wav", "best"}, {"copy.wav", "identical bytes"}}),
        relations_in(groups[0]));
}

TEST_F(Duplicates, WithEqualTrailsMayStillSoundDifferent)
{
    const ScratchDirectory scratch;
    const Samples half = scaled(piece(8), 0.5);
    scratch.write("a.wav", wav(half));
    scratch.write("b.wav", wav(scaled(half, 2)));
    const json files = groups_in(scratch.path()).at(0)["files"];
    EXPECT_EQ(files[0]["track"], files[1]["track"]);
    EXPECT_EQ(0, files[1]["error_rate"]);
    EXPECT_EQ("same recording", files[1]["relation"]);
}

TEST_F(Duplicates, MayBeOtherNamesOfOneFile)
{
    const ScratchDirectory scratch;
    const std::string file = scratch.write("a.wav", wav(piece(8)));
    fs::create_symlink(file, scratch.path("b.wav"));
    fs::create_hard_link(file, scratch.path("c.wav"));
    EXPECT_EQ((std::map<std::string, std::string>{
                  {"a.wav", "best"}, {"b.wav", "same file"}, {"c.wav", "same file"}}),
              relations_in(groups_in(scratch.path()).at(0)));
    const std::string script = output_of({"duplicates", "--script", scratch.path()});
    EXPECT_FALSE(contains(script, "b.wav")) << script;
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
