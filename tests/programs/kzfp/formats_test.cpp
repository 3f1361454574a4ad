// Files of every kind: those that libsndfile reads, those that FFmpeg reads, and damaged ones. The
// same music gives the same result whatever it is packed in.

#include "kzfp.hpp"

#include <algorithm>
#include <cmath>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sys/stat.h>
#include <unistd.h>

#include "audio/file_source.hpp"
#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

const std::string kMusic = clip("music-44100-stereo-s16.wav");
constexpr const char* kLossy[] = {"music.m4a", "music.mp4", "music.webm",
                                  "music.wma", "music.ac3", "music.aac",
                                  "music.mp3", "music.ogg", "music-tagged.mp3"};

/// The tests of what only FFmpeg reads.
class KzfpFormats : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (audio::ffmpeg_version().empty()) {
            GTEST_SKIP() << "this build is without FFmpeg";
        }
    }
};

/// A catalogue of the music as WAV.
class Catalogue {
public:
    Catalogue() { EXPECT_EQ("", kzfp({"add", "-q", path(), kMusic}).err); }
    std::string path() const { return scratch_.path("music.kzc"); }

    std::vector<json> match(const std::vector<std::string>& files) const
    {
        std::vector<std::string> arguments = {"match", "-q", "--format", "json", path()};
        arguments.insert(arguments.end(), files.begin(), files.end());
        return lines_of(kzfp(arguments).out);
    }

private:
    ScratchDirectory scratch_;
};

TEST_F(KzfpFormats, LosslessOnesGiveTheValuesOfTheWave)
{
    const std::vector<int> expected = values_of({kMusic});
    for (const char* name :
         {"music-alac.m4a", "music-picture.m4a", "music-two-sounds.mkv", "music.flac"}) {
        EXPECT_EQ(expected, values_of({clip(name)})) << name;
    }
}

/// What an encoder put before the music is not part of it: the place shows.
TEST_F(KzfpFormats, LossyOnesAreRecognisedAtTheStart)
{
    const Catalogue catalogue;
    std::vector<std::string> files;
    for (const char* name : kLossy) {
        files.push_back(clip(name));
    }
    const std::vector<json> lines = catalogue.match(files);
    ASSERT_EQ(files.size(), lines.size());
    for (const json& line : lines) {
        ASSERT_EQ("match", line["verdict"]) << line;
        EXPECT_GT(0.05, std::abs(line["matches"][0]["offset"].get<double>())) << line;
        EXPECT_FALSE(line.contains("warning")) << line;
    }
}

/// To the sample, though decoding begins somewhere before.
TEST_F(KzfpFormats, StartsAreFoundToTheSample)
{
    const std::vector<std::string> from = {"--start", "1:04.3217"};
    const auto from_start = [&from](const char* name) {
        return values_of({from[0], from[1], clip(name)});
    };
    const std::vector<int> expected = from_start("very-late.wav");
    EXPECT_EQ(expected, from_start("very-late.m4a"));
    EXPECT_EQ(expected, from_start("very-late.mkv"));
}

TEST_F(KzfpFormats, OpusIsReadToItsEnd)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("music.kzc");
    const ProcessResult result = kzfp({"add", "-q", catalogue, clip("music.opus")});
    EXPECT_EQ("", result.err);
    const json track = json::parse(output_of({"list", "--format", "json", catalogue}));
    EXPECT_NEAR(20, track["seconds"].get<double>(), 0.2) << track;
}

TEST_F(KzfpFormats, TagsAreThoseOfTheFile)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("music.kzc");
    EXPECT_EQ(0, kzfp({"add", "-q", catalogue, clip("music.m4a"), clip("music.wma")}).status);
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(2u, tracks.size());
    for (const json& track : tracks) {
        const json& tags = track["tags"];
        EXPECT_EQ(json::array({"Trip"}), tags.value("title", json())) << track;
        EXPECT_EQ(json::array({"JDruid"}), tags.value("artist", json())) << track;
        EXPECT_EQ(json::array({"Boats"}), tags.value("album", json())) << track;
        EXPECT_EQ(json::array({"2006"}), tags.value("date", json())) << track;
        EXPECT_EQ(json::array({"3"}), tags.value("tracknumber", json())) << track;
    }
}

TEST_F(KzfpFormats, ComeThroughPipesToo)
{
    for (const char* name : {"music-alac.m4a", "music-two-sounds.mkv"}) {
        ProcessSetup setup = fed_with(contents(clip(name)));
        EXPECT_EQ(output_of({clip(name)}), kzfp({"-"}, setup).out) << name;
    }
}

TEST_F(KzfpFormats, AnIndexThatIsMissingIsNamed)
{
    const ProcessResult result = kzfp({clip("no-index.m4a")});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "is an MP4 file without its index")) << result.err;
}

TEST_F(KzfpFormats, FilmsWithoutSoundAreRefused)
{
    const ProcessResult result = kzfp({clip("no-sound.mp4")});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "holds no sound")) << result.err;
}

/// A playlist may name any file or address; none of them is opened.
TEST_F(KzfpFormats, PlaylistsOpenNothing)
{
    const ScratchDirectory scratch;
    const std::string list =
        scratch.write("list.m3u8", "#EXTM3U\n#EXT-X-TARGETDURATION:20\n#EXTINF:20,\nfile://" +
                                       kMusic + "\n#EXT-X-ENDLIST\n");
    const std::string concat =
        scratch.write("list.ffconcat", "ffconcat version 1.0\nfile '" + kMusic + "'\n");
    for (const std::string& path : {list, concat}) {
        const ProcessResult result = kzfp({path});
        EXPECT_EQ(1, result.status) << path;
        EXPECT_EQ("", result.out);
    }
}

// ---- Damaged files

struct Damaged {
    const char* name;
    std::vector<const char*> words; ///< of the warning; none where the damage cannot be seen
};

const std::vector<Damaged> kDamaged = {
    {"broken.wav",
     {"is damaged after 5.", "bytes of it are missing", "what comes before was used"}},
    {"broken.aiff",
     {"is damaged after 5.", "bytes of it are missing", "what comes before was used"}},
    {"broken.flac", {"is damaged after ", "lost sync", "what comes before was used"}},
    {"broken.ogg", {"is damaged after ", "its last page is missing", "what comes before was used"}},
    {"broken.mp3", {"is damaged after 9.", "it should last 20.", "what comes before was used"}},
    {"cut.mp3", {}}};

const std::vector<Damaged> kDamagedForFfmpeg = {
    {"broken.m4a", {"is damaged after ", "it should last 20.", "what comes before was used"}},
    {"broken.mkv", {"is damaged after ", "it should last 20.", "what comes before was used"}},
    {"broken.wma", {"is damaged (1 piece of it cannot be decoded); the rest was used"}}};

/// The command adds what there is, and says once that it is not all.
void expect_result_and_warning(const Damaged& file)
{
    const ScratchDirectory scratch;
    const std::string path = clip(file.name);
    const ProcessResult result = kzfp({"add", "-q", scratch.path("a.kzc"), path});
    const ProcessResult strict = kzfp({"add", "-q", "--strict", scratch.path("b.kzc"), path});
    EXPECT_EQ(0, result.status) << result.err;
    for (const char* words : file.words) {
        EXPECT_TRUE(contains(result.err, words)) << result.err;
    }
    const auto lines = file.words.empty() ? 0 : 1;
    EXPECT_EQ(lines, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
    EXPECT_EQ(lines, strict.status) << strict.err;
}

TEST(KzfpDamaged, FilesGiveTheirResultAndAWarning)
{
    for (const Damaged& file : kDamaged) {
        SCOPED_TRACE(file.name);
        expect_result_and_warning(file);
    }
}

TEST_F(KzfpFormats, DamagedOnesGiveTheirResultAndAWarning)
{
    for (const Damaged& file : kDamagedForFfmpeg) {
        SCOPED_TRACE(file.name);
        expect_result_and_warning(file);
    }
}

/// A clip that is looked up strictly gets no complaint.
void expect_whole(const Catalogue& catalogue, const std::string& name,
                  const std::vector<std::string>& section)
{
    std::vector<std::string> arguments = {"match", "-q", "--strict", catalogue.path(), clip(name)};
    arguments.insert(arguments.end(), section.begin(), section.end());
    const ProcessResult result = kzfp(arguments);
    EXPECT_EQ("", result.err) << name;
    EXPECT_EQ(0, result.status) << name;
}

TEST(KzfpDamaged, SectionsBeforeTheDamageAreWhole)
{
    const Catalogue catalogue;
    for (const char* name : {"broken.wav", "broken.ogg", "broken.mp3"}) {
        expect_whole(catalogue, name, {"--start", "1", "--length", "3"});
    }
}

/// The stated length of the first is an estimate from its quiet beginning.
TEST(KzfpDamaged, WholeFilesAreNotTakenForDamaged)
{
    const Catalogue catalogue;
    for (const char* name : {"music-varying.mp3", "music-tagged.mp3", "music.mp3", "music.ogg",
                             "music.aiff", "music-ulaw.au", "music-24bit.wav"}) {
        expect_whole(catalogue, name, {});
        expect_whole(catalogue, name, {"--start", "5"});
    }
}

/// libmpg123 would print lines of its own, which name no file.
TEST(KzfpDamaged, DecodersPrintNothingThemselves)
{
    const ScratchDirectory scratch;
    std::string bytes = contents(clip("music-tagged.mp3"));
    bytes.replace(60000, 3000, std::string(3000, '\x55'));
    bytes.resize(200000);
    const std::string path = scratch.write("bad.mp3", bytes);
    for (const std::string& file : {path, clip("broken.mp3")}) {
        const ProcessResult result = kzfp({"add", "-q", scratch.path("a.kzc"), file});
        EXPECT_TRUE(result.err.starts_with(file + ": ")) << result.err;
        EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
    }
}

TEST(KzfpDamaged, WhatIsNoSoundGetsTheCure)
{
    const ScratchDirectory scratch;
    const std::string unreadable = scratch.write("unreadable.m4a", "x");
    ::chmod(unreadable.c_str(), 0);
    const std::pair<std::string, std::string> kCases[] = {
        {clip("empty.wav"), "is empty, a sound file is needed"},
        {clip("words.txt"), "headerless audio needs --raw"},
        {scratch.write("noise.m4a", std::string(100000, '\xa5')), "headerless audio needs --raw"},
        {scratch.path(), "is a directory, a sound file is needed"},
        {"/dev/null", "is empty, a sound file is needed"},
        {scratch.path("nothing.m4a"), "No such file or directory"},
        {"http://127.0.0.1/music.mp3", "only monitor listens to streams"},
        {unreadable, ::geteuid() == 0 ? "" : "Permission denied"}};
    for (const auto& [path, why] : kCases) {
        const ProcessResult result = kzfp({path});
        EXPECT_EQ(1, result.status) << path;
        EXPECT_TRUE(result.err.starts_with(path + ": ")) << result.err;
        EXPECT_TRUE(contains(result.err, why)) << result.err;
    }
}

/// A machine that lacks FFmpeg's libraries, or PortAudio's.
ProcessSetup without(const std::string& libraries)
{
    ProcessSetup setup;
    setup.environment = {"LD_PRELOAD=" KZFP_MISSING_LIBRARIES, "MISSING_LIBRARIES=" + libraries};
    return setup;
}

TEST_F(KzfpFormats, MissingLibrariesAreNamedWithTheirCure)
{
    const ProcessResult result = kzfp({clip("music.m4a")}, without("libavcodec"));
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "FFmpeg's libraries cannot be opened")) << result.err;
    EXPECT_TRUE(contains(result.err, "install them (Debian: libavformat")) << result.err;
}

TEST_F(KzfpFormats, WaveFilesNeedNoFurtherLibraries)
{
    const ProcessResult result = kzfp({kMusic}, without("lib"));
    EXPECT_EQ("", result.err);
    EXPECT_EQ(output_of({kMusic}), result.out);
    const std::string version = kzfp({"--version"}, without("libav")).out;
    EXPECT_FALSE(contains(version, "FFmpeg")) << version;
}

TEST(KzfpVersion, NamesWhatItReadsWith)
{
    const std::string version = output_of({"--version"});
    EXPECT_TRUE(contains(version, "\nreads sound with libsndfile")) << version;
    EXPECT_TRUE(contains(version, audio::readers())) << version;
}

} // namespace
