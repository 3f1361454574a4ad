// The commands for catalogues as a user sees them: music goes in, clips of it are named, and what
// cannot be done is said.

#include "kzfp.hpp"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <map>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sys/resource.h>

#include "kzcat.h"
#include "support/signals.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

constexpr uint32_t kRate = 16000;

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

std::vector<json> lines_of(const std::string& text)
{
    std::vector<json> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.push_back(json::parse(line));
    }
    return lines;
}

std::string wav(const std::vector<int16_t>& samples)
{
    std::string bytes(samples.size() * 2, '\0');
    std::memcpy(bytes.data(), samples.data(), bytes.size());
    return wav_header(kRate, 1, static_cast<uint32_t>(bytes.size())) + bytes;
}

/// A piece of music of its own for each seed.
std::vector<int16_t> piece(uint64_t seed, double seconds = 30)
{
    return tune(kRate, 1, seconds, 0.5, seed);
}

/// Part of a piece, in seconds.
std::vector<int16_t> part(const std::vector<int16_t>& samples, double from, double seconds)
{
    const auto begin = samples.begin() + static_cast<std::ptrdiff_t>(from * kRate);
    return {begin, begin + static_cast<std::ptrdiff_t>(seconds * kRate)};
}

/// The bytes of the trail file of these samples.
std::string trail_file(const std::vector<int16_t>& samples)
{
    const kzcat_format format = {KZ_STREAM_FORMAT_PCM16, kRate, 1, 0};
    kzcat_builder* builder = nullptr;
    kzcat_trail* trail = nullptr;
    uint64_t size = 0;
    EXPECT_EQ(KZCAT_OK, kzcat_builder_create(&format, nullptr, &builder));
    EXPECT_EQ(KZCAT_OK, kzcat_builder_feed(builder, samples.data(), samples.size() * 2));
    EXPECT_EQ(KZCAT_OK, kzcat_builder_finish(builder, &trail));
    EXPECT_EQ(KZCAT_OK, kzcat_trail_write(trail, nullptr, 0, &size));
    std::string bytes(size, '\0');
    EXPECT_EQ(KZCAT_OK, kzcat_trail_write(trail, bytes.data(), size, &size));
    kzcat_trail_free(&trail);
    kzcat_builder_free(&builder);
    return bytes;
}

/// A FLAC file as it was, with no tags but this title.
std::string with_title(const std::string& flac, const std::string& title)
{
    constexpr size_t kFirstBlock = 4 + 4 + 34; // marker, header and what is known of the sound
    const auto lowest_first = [](size_t number) {
        std::string bytes;
        for (int i = 0; i < 4; ++i, number >>= 8U) {
            bytes += static_cast<char>(number & 0xffU);
        }
        return bytes;
    };
    const auto byte = [&flac](size_t at) { return static_cast<uint8_t>(flac.at(at)); };
    size_t frames = 4;
    for (bool last = false; !last;) {
        last = byte(frames) >= 0x80;
        frames += 4 + (size_t{byte(frames + 1)} << 16U) + (size_t{byte(frames + 2)} << 8U) +
                  byte(frames + 3);
    }
    const std::string tag = "TITLE=" + title;
    const std::string tags = lowest_first(0) + lowest_first(1) + lowest_first(tag.size()) + tag;
    std::string header = lowest_first(tags.size());
    std::swap(header[0], header[2]);
    std::string begin = flac.substr(0, kFirstBlock);
    begin[4] = 0; // not the last block any more
    return begin + '\x84' + header.substr(0, 3) + tags + flac.substr(frames);
}

/// Works in a folder meanwhile.
class WorkingIn {
public:
    explicit WorkingIn(const std::string& folder) { fs::current_path(folder); }
    ~WorkingIn() { fs::current_path(before_); }
    WorkingIn(const WorkingIn&) = delete;
    WorkingIn& operator=(const WorkingIn&) = delete;

private:
    fs::path before_ = fs::current_path();
};

/// A catalogue of a real piece and some others, made once; tests only read it.
class Recognition : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        std::vector<std::string> arguments = {"add", catalogue(), music(), clip("speech.wav")};
        for (uint64_t seed = 1; seed <= 3; ++seed) {
            arguments.push_back(
                scratch_->write("piece" + std::to_string(seed) + ".wav", wav(piece(seed))));
        }
        const ProcessResult result = kzfp(arguments);
        ASSERT_EQ(0, result.status) << result.err;
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static std::string catalogue() { return scratch_->path("music.kzc"); }
    static std::string music() { return clip("music-44100-stereo-s16.wav"); }

    static json match(std::vector<std::string> arguments)
    {
        arguments.insert(arguments.begin(), {"match", "--format", "json", catalogue()});
        const std::vector<json> lines = lines_of(output_of(arguments));
        EXPECT_EQ(1u, lines.size());
        return lines.empty() ? json() : lines.front();
    }

    static ScratchDirectory* scratch_;
};

ScratchDirectory* Recognition::scratch_ = nullptr;

// ---- Matching

TEST_F(Recognition, NamesTheTrackAndThePlaceOfAClip)
{
    const json answer = match({"--start", "7", "--length", "10", music()});
    EXPECT_EQ(music(), answer["file"]);
    EXPECT_EQ("match", answer["verdict"]);
    ASSERT_EQ(1u, answer["matches"].size());
    const json& best = answer["matches"][0];
    EXPECT_EQ(music(), best["source"]);
    EXPECT_EQ("music-44100-stereo-s16", best["title"]);
    EXPECT_NEAR(7, best["offset"].get<double>(), 0.03);
    EXPECT_GT(best["score"].get<double>(), best["threshold"].get<double>());
    EXPECT_EQ(1, best["speed"]);
    EXPECT_EQ(1, best["tempo"]);
    EXPECT_EQ(1, best["pitch"]);
    EXPECT_EQ("trail", best["by"]);
}

TEST_F(Recognition, JsonHasTheMembersThatAreDocumented)
{
    const json answer = match({"--start", "5", "--length", "8", music()});
    std::vector<std::string> names;
    for (const auto& member : answer.items()) {
        names.push_back(member.key());
    }
    EXPECT_EQ((std::vector<std::string>{"file", "matches", "runner_up", "verdict"}), names);
    names.clear();
    for (const auto& member : answer["matches"][0].items()) {
        names.push_back(member.key());
    }
    EXPECT_EQ((std::vector<std::string>{"by", "offset", "pitch", "score", "source", "speed",
                                        "tempo", "threshold", "title", "track"}),
              names);
}

TEST_F(Recognition, OtherEncodingsOfAClipAreNamedToo)
{
    for (const char* name : {"music.mp3", "music.ogg", "music-8000-mono-ulaw.wav", "music-8bit.wav",
                             "music-96000.wav", "music-6-channels.wav", "music-37800.wav"}) {
        const json answer = match({"--start", "4", "--length", "12", clip(name)});
        ASSERT_EQ("match", answer["verdict"]) << name;
        EXPECT_EQ(music(), answer["matches"][0]["source"]) << name;
        EXPECT_NEAR(4, answer["matches"][0]["offset"].get<double>(), 0.1) << name;
    }
}

TEST_F(Recognition, StrangersAreNoMatch)
{
    const std::string stranger = scratch_->write("stranger.wav", wav(piece(77, 14)));
    const json answer = match({stranger});
    EXPECT_EQ("no match", answer["verdict"]);
    EXPECT_EQ(0u, answer["matches"].size());
    EXPECT_FALSE(answer.contains("candidates"));
}

TEST_F(Recognition, SilenceIsTooQuiet)
{
    EXPECT_EQ("too quiet", match({clip("silence.wav")})["verdict"]);
}

TEST_F(Recognition, CandidatesAreTheBestTracksWhateverTheirScore)
{
    const std::string stranger = scratch_->write("other.wav", wav(piece(78, 14)));
    const json answer = match({"--candidates", "3", stranger});
    EXPECT_EQ("no match", answer["verdict"]);
    ASSERT_EQ(3u, answer["candidates"].size());
    // Those found at another speed have to reach more, so what counts is how much is missing.
    const auto margin = [&answer](size_t i) {
        const json& candidate = answer["candidates"][i];
        return candidate["score"].get<double>() - candidate["threshold"].get<double>();
    };
    EXPECT_GE(margin(0), margin(1));
    EXPECT_GE(margin(1), margin(2));
    EXPECT_EQ(answer["runner_up"], answer["candidates"][1]["score"]);
}

TEST_F(Recognition, TrailFilesAreLookedUp)
{
    const std::string trail = scratch_->write("part.kzt", trail_file(part(piece(3), 6, 15)));
    const json answer = match({trail});
    ASSERT_EQ("match", answer["verdict"]) << answer;
    EXPECT_EQ(scratch_->path("piece3.wav"), answer["matches"][0]["source"]);
    EXPECT_NEAR(6, answer["matches"][0]["offset"].get<double>(), 0.1);
}

TEST_F(Recognition, FilesThatCannotBeReadAreErrors)
{
    const ProcessResult result = kzfp(
        {"match", "--format", "json", catalogue(), clip("empty.wav"), "/nonexistent", music()});
    EXPECT_EQ(1, result.status);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(3u, lines.size());
    EXPECT_EQ("error", lines[0]["verdict"]);
    EXPECT_NE("", lines[0]["error"]);
    EXPECT_EQ("/nonexistent", lines[1]["file"]);
    EXPECT_TRUE(contains(lines[1]["error"], "No such file")) << lines[1];
    EXPECT_EQ("match", lines[2]["verdict"]);
    EXPECT_EQ(2, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
}

TEST_F(Recognition, AnswersComeInTheOrderOfTheFiles)
{
    std::vector<std::string> arguments = {"match", "--format", "json", "--jobs", "4", catalogue()};
    std::vector<std::string> files;
    for (int i = 0; i < 12; ++i) {
        files.push_back(i % 2 == 0 ? music() : clip("silence.wav"));
    }
    arguments.insert(arguments.end(), files.begin(), files.end());
    const std::vector<json> lines = lines_of(output_of(arguments));
    ASSERT_EQ(files.size(), lines.size());
    for (size_t i = 0; i < files.size(); ++i) {
        EXPECT_EQ(files[i], lines[i]["file"]);
        EXPECT_EQ(i % 2 == 0 ? "match" : "too quiet", lines[i]["verdict"]);
    }
}

TEST_F(Recognition, TextIsALineForPeople)
{
    const std::string text = output_of({"match", catalogue(), "--start", "7", music()});
    EXPECT_TRUE(contains(text, music() + ": music-44100-stereo-s16 (" + music() + ") at 0:07.0, "))
        << text;
    EXPECT_EQ(clip("silence.wav") + ": too quiet or too short to say anything\n",
              output_of({"match", catalogue(), clip("silence.wav")}));
}

TEST_F(Recognition, ClipsComeThroughAPipe)
{
    const std::string sound = wav(part(piece(2), 11, 12));
    const ProcessResult result =
        kzfp({"match", "--format", "json", catalogue(), "-"}, fed_with(sound));
    ASSERT_EQ(0, result.status) << result.err;
    const json answer = json::parse(result.out);
    EXPECT_EQ("-", answer["file"]);
    EXPECT_EQ("match", answer["verdict"]);
    EXPECT_EQ(scratch_->path("piece2.wav"), answer["matches"][0]["source"]);
    EXPECT_NEAR(11, answer["matches"][0]["offset"].get<double>(), 0.03);
}

TEST_F(Recognition, MissingCataloguesAreNamed)
{
    for (const char* command : {"match", "list", "verify", "remove"}) {
        std::vector<std::string> arguments = {command, "/nonexistent/music.kzc"};
        if (std::string(command) == "match" || std::string(command) == "remove") {
            arguments.push_back(music());
        }
        const ProcessResult result = kzfp(arguments);
        EXPECT_EQ(1, result.status) << command;
        EXPECT_EQ("", result.out) << command;
        EXPECT_TRUE(contains(result.err, "/nonexistent/music.kzc")) << result.err;
        EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
        EXPECT_EQ(result.err.find("/nonexistent"), result.err.rfind("/nonexistent")) << result.err;
    }
}

// ---- Comparing

TEST_F(Recognition, CompareRefusesWhatCannotBeReadTwice)
{
    const ProcessResult result = kzfp({"compare", music(), "-"}, fed_with(contents(music())));
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_EQ("-: is read twice, so it must be a file; write the sound to one first\n", result.err);
}

TEST_F(Recognition, CompareFindsWhereOneFileBeginsInTheOther)
{
    const std::string inner = scratch_->write("inner.wav", wav(part(piece(1), 9, 12)));
    const std::string outer = scratch_->path("piece1.wav");
    const auto compared = [](const std::string& a, const std::string& b) {
        return json::parse(output_of({"compare", "--format", "json", a, b}));
    };
    const json forth = compared(outer, inner);
    EXPECT_EQ("match", forth["verdict"]);
    EXPECT_EQ(inner, forth["file"]);
    EXPECT_EQ(outer, forth["matches"][0]["source"]);
    EXPECT_NEAR(9, forth["matches"][0]["offset"].get<double>(), 0.03);
    const json back = compared(inner, outer);
    EXPECT_EQ(outer, back["file"]);
    EXPECT_NEAR(-9, back["matches"][0]["offset"].get<double>(), 0.03);
    EXPECT_TRUE(
        contains(output_of({"compare", outer, inner}), inner + " begins at 0:09.0 of " + outer));
}

TEST_F(Recognition, CompareKnowsTheSameRecordingFromAnother)
{
    EXPECT_TRUE(contains(output_of({"compare", music(), clip("music.mp3")}), "the same recording"));
    EXPECT_TRUE(contains(output_of({"compare", music(), clip("speech.wav")}), ": different"));
}

// ---- Adding

TEST(KzfpAdd, MakesTheCatalogueAndListsWhatItAdded)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("new.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("b.wav", wav(piece(2, 5)));
    EXPECT_EQ("added " + first + "\nadded " + second + "\n2 added\n",
              output_of({"add", catalogue, first, second}));
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(1, tracks[0]["track"]);
    EXPECT_EQ(first, tracks[0]["sources"][0]);
    EXPECT_EQ(json::array({"a"}), tracks[0]["tags"]["title"]);
    EXPECT_NEAR(5, tracks[0]["seconds"].get<double>(), 0.01);
    EXPECT_EQ(2, tracks[1]["track"]);
}

TEST(KzfpAdd, PassesOverWhatHasNotChanged)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, file});
    EXPECT_EQ("1 unchanged\n", output_of({"add", catalogue, file}));
    // Touched, but of the same bytes.
    fs::last_write_time(file, fs::last_write_time(file) + std::chrono::seconds(5));
    EXPECT_EQ("moved " + file + "\n1 moved\n", output_of({"add", catalogue, file}));
    EXPECT_EQ("1 unchanged\n", output_of({"add", catalogue, file}));
}

TEST(KzfpAdd, FilesThatMovedKeepTheirTracks)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string before = scratch.write("a.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, before});
    const std::string after = scratch.path("z.wav");
    fs::rename(before, after);
    EXPECT_EQ("moved " + after + "\n1 moved\n", output_of({"add", catalogue, after}));
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_EQ(1, tracks[0]["track"]);
    EXPECT_EQ(json::array({after}), tracks[0]["sources"]);
}

TEST(KzfpAdd, RelativePathsAreKeptFromElsewhere)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    scratch.write("here/a.wav", wav(piece(1, 5)));
    scratch.write("there/b.wav", wav(piece(1, 5)));
    {
        const WorkingIn here(scratch.path("here"));
        output_of({"add", catalogue, "a.wav"});
    }
    const WorkingIn there(scratch.path("there"));
    EXPECT_EQ("moved b.wav\n1 moved\n", output_of({"add", catalogue, "b.wav"}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_EQ((json{"a.wav", "b.wav"}), tracks[0]["sources"]);
}

TEST(KzfpAdd, FilesThatTookOthersNamesAreAllThere)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("b.wav", wav(piece(2, 6)));
    output_of({"add", catalogue, first, second});
    fs::rename(first, scratch.path("x"));
    fs::rename(second, first);
    fs::rename(scratch.path("x"), second);
    EXPECT_EQ("moved " + first + "\nadded " + second + "\n1 added, 1 moved\n",
              output_of({"add", catalogue, first, second}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", catalogue}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(json::array({first}), tracks[0]["sources"]);
    EXPECT_EQ(json::array({second}), tracks[1]["sources"]);
    EXPECT_NEAR(6, tracks[0]["seconds"].get<double>(), 0.01);
    EXPECT_NEAR(5, tracks[1]["seconds"].get<double>(), 0.01);
}

TEST(KzfpAdd, AMovedFileKeepsItsTrackFromItsSuccessor)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string name = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string after = scratch.path("b.wav");
    output_of({"add", catalogue, name});
    fs::rename(name, after);
    scratch.write("a.wav", wav(piece(2, 6)));
    EXPECT_EQ("added " + name + "\nmoved " + after + "\n1 added, 1 moved\n",
              output_of({"add", catalogue, name, after}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", catalogue}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(json::array({after}), tracks[0]["sources"]);
    EXPECT_EQ(json::array({name}), tracks[1]["sources"]);
}

TEST(KzfpAdd, ALimitOnTheSizeOfFilesIsAnError)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 5)));
    rlimit usual = {};
    ASSERT_EQ(0, getrlimit(RLIMIT_FSIZE, &usual));
    const rlimit low = {.rlim_cur = 40'000, .rlim_max = usual.rlim_max};
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &low));
    const ProcessResult result = kzfp({"add", catalogue, file});
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &usual));
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "make room")) << result.err;
    EXPECT_EQ("added " + file + "\n1 added\n", output_of({"add", catalogue, file}));
}

TEST(KzfpAdd, CopiesAreSourcesOfOneTrack)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("b.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, first});
    output_of({"add", catalogue, second});
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_EQ(json::array({first, second}), tracks[0]["sources"]);
}

TEST(KzfpAdd, FilesThatChangedAreReadAgain)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, file});
    scratch.write("a.wav", wav(piece(2, 6)));
    EXPECT_EQ("added " + file + "\n1 added\n", output_of({"add", catalogue, file}));
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_NEAR(6, tracks[0]["seconds"].get<double>(), 0.01);
}

TEST(KzfpAdd, BadFilesDoNotStopTheOthers)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string good = scratch.write("good.wav", wav(piece(1, 5)));
    const std::string text = scratch.write("bad.wav", "words");
    const std::string brief = scratch.write("short.wav", wav(piece(1, 0.2)));
    const ProcessResult result = kzfp({"add", catalogue, text, "/nonexistent", brief, good, "-"});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("added " + good + "\n1 added, 4 failed\n", result.out);
    EXPECT_TRUE(contains(result.err, text + ": is not a sound file")) << result.err;
    EXPECT_TRUE(contains(result.err, "/nonexistent: cannot be opened")) << result.err;
    EXPECT_TRUE(contains(result.err, brief + ": is too short: 0.20 s of sound")) << result.err;
    EXPECT_EQ(4, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
}

TEST(KzfpAdd, ARefusedTrackDoesNotStopTheOthers)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("c.wav", wav(piece(2, 5)));
    const std::string refused =
        scratch.write("b.flac", with_title(contents(clip("music.flac")),
                                           std::string((size_t{1} << 20) + 1, 'x')));
    const ProcessResult result = kzfp({"add", catalogue, first, refused, second});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("added " + first + "\nadded " + second + "\n2 added, 1 failed\n", result.out);
    EXPECT_TRUE(contains(result.err, refused + ": the value of a tag")) << result.err;
    EXPECT_TRUE(contains(result.err, "is too long")) << result.err;
    EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
    EXPECT_EQ("2 unchanged\n", output_of({"add", catalogue, first, second}));
}

TEST(KzfpAdd, FoldersAreWalkedInTheOrderOfNames)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    scratch.write("m/b/2.wav", wav(piece(2, 4)));
    scratch.write("m/b/1.WAV", wav(piece(1, 4)));
    scratch.write("m/a.wav", wav(piece(3, 4)));
    scratch.write("m/cover.jpg", "picture");
    fs::create_directory_symlink(scratch.path("m"), scratch.path("m/loop"));
    const std::string folder = scratch.path("m");
    EXPECT_EQ("added " + folder + "/a.wav\nadded " + folder + "/b/1.WAV\nadded " + folder +
                  "/b/2.wav\n3 added; 1 file that is no sound passed over\n",
              output_of({"add", "-j", "3", catalogue, folder}));
}

TEST(KzfpAdd, IdsDoNotDependOnTheNumberOfThreads)
{
    const ScratchDirectory scratch;
    for (uint64_t seed = 1; seed <= 6; ++seed) {
        // Of very different lengths, so that they are not ready in their order.
        scratch.write("m/" + std::to_string(seed) + ".wav",
                      wav(piece(seed, seed % 2 == 1 ? 30 : 2)));
    }
    const auto tracks = [&scratch](const std::string& jobs) {
        const std::string catalogue = scratch.path(jobs + ".kzc");
        output_of({"add", "-j", jobs, catalogue, scratch.path("m")});
        std::map<std::string, int> ids;
        for (const json& track : lines_of(output_of({"list", "--format", "json", catalogue}))) {
            ids[track["sources"][0]] = track["track"];
        }
        return ids;
    };
    EXPECT_EQ(tracks("1"), tracks("6"));
}

TEST(KzfpAdd, TheCataloguesOwnFilesAreNotRead)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 4)));
    output_of({"add", catalogue, file});
    const std::string link = scratch.path("link.kzc");
    fs::create_symlink(catalogue, link);
    fs::create_hard_link(catalogue, scratch.path("hard.wav"));
    // Closing one of them would give up the locks that the program holds on it.
    for (const std::string& name : {catalogue, catalogue + "-wal", catalogue + "-shm",
                                    catalogue + "-journal", link, scratch.path("hard.wav")}) {
        for (const std::string& opened : {catalogue, link}) {
            for (const char* command : {"add", "match"}) {
                const ProcessResult result = kzfp({command, opened, name});
                EXPECT_EQ(1, result.status);
                EXPECT_EQ(name + ": belongs to the catalogue itself\n", result.err) << command;
            }
        }
    }
    EXPECT_EQ(catalogue + ": 1 track, whole\n", output_of({"verify", catalogue}));
}

TEST(KzfpAdd, TrailFilesAreAddedAsTheyAre)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string sound = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string trail = scratch.write("a.kzt", trail_file(piece(1, 5)));
    EXPECT_EQ("added " + sound + "\nknown " + trail + "\n1 added, 1 known\n",
              output_of({"add", catalogue, sound, trail}));
    const std::string bytes = contents(trail);
    const std::string cut = scratch.write("cut.kzt", bytes.substr(0, bytes.size() - 3));
    const ProcessResult result = kzfp({"add", catalogue, cut});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(result.err.starts_with(cut + ": ")) << result.err;
}

TEST(KzfpAdd, JsonTellsWhatBecameOfEachFile)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string good = scratch.write("good.wav", wav(piece(1, 5)));
    const ProcessResult result = kzfp({"add", "-f", "json", catalogue, good, "/nonexistent"});
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ((json{{"file", good}, {"outcome", "added"}, {"track", 1}}), lines[0]);
    EXPECT_EQ("error", lines[1]["outcome"]);
    EXPECT_TRUE(contains(lines[1]["error"], "cannot be opened")) << lines[1];
}

// ---- Documents

TEST(KzfpDocuments, AreAnsweredByTracksAddedForThem)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string music = clip("music-44100-stereo-s16.wav");
    const std::string document =
        scratch.write("query.xml", output_of({"fingerprint", "--start", "3", music}));
    const auto verdict = [&] {
        return json::parse(output_of({"match", "-f", "json", catalogue, document}));
    };
    output_of({"add", catalogue, music});
    EXPECT_EQ("no match", verdict()["verdict"]);
    output_of({"add", "--documents", catalogue, music});
    const json answer = verdict();
    ASSERT_EQ("match", answer["verdict"]) << answer;
    EXPECT_EQ("document", answer["matches"][0]["by"]);
    EXPECT_EQ(music, answer["matches"][0]["source"]);
    EXPECT_NEAR(3, answer["matches"][0]["offset"].get<double>(), 0.6);
    EXPECT_TRUE(answer["matches"][0].contains("weak"));
}

TEST(KzfpDocuments, DamagedOnesAreRefused)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    output_of({"add", catalogue, scratch.write("a.wav", wav(piece(1, 4)))});
    const std::string document = scratch.write("query.xml", "<KZFPX_FP_QUERY>");
    const ProcessResult result = kzfp({"match", catalogue, document});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(result.err.starts_with(document + ": ")) << result.err;
}

// ---- Removing, merging, verifying, listing

TEST(KzfpRemove, TakesIdsAndPaths)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    std::vector<std::string> files;
    std::vector<std::string> arguments = {"add", catalogue};
    for (uint64_t seed = 1; seed <= 3; ++seed) {
        files.push_back(scratch.write(std::to_string(seed) + ".wav", wav(piece(seed, 4))));
        arguments.push_back(files.back());
    }
    output_of(arguments);
    EXPECT_EQ("removed 2\nremoved " + files[0] + "\n",
              output_of({"remove", catalogue, "2", files[0]}));
    const ProcessResult again = kzfp({"remove", catalogue, "2", files[2]});
    EXPECT_EQ(1, again.status);
    EXPECT_EQ("removed " + files[2] + "\n", again.out);
    EXPECT_TRUE(again.err.starts_with("2: no track with the id 2")) << again.err;
    EXPECT_EQ("", output_of({"list", "-f", "json", catalogue}));
    // An id is never given out again.
    output_of({"add", catalogue, files[0]});
    EXPECT_EQ(4, lines_of(output_of({"list", "-f", "json", catalogue}))[0]["track"]);
}

TEST(KzfpMerge, BringsTracksWithTheirTags)
{
    const ScratchDirectory scratch;
    const std::string first = scratch.write("1.wav", wav(piece(1, 4)));
    const std::string second = scratch.write("2.wav", wav(piece(2, 4)));
    const std::string into = scratch.path("into.kzc");
    const std::string other = scratch.path("other.kzc");
    output_of({"add", into, first});
    output_of({"add", "--documents", other, first, second});
    EXPECT_EQ(other + ": 1 added, 1 known\n", output_of({"merge", into, other}));
    EXPECT_EQ(other + ": 0 added, 2 known\n", output_of({"merge", into, other}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", into}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(json::array({"2"}), tracks[1]["tags"]["title"]);
    EXPECT_EQ(true, tracks[0]["documents"]);
    EXPECT_EQ(true, tracks[1]["documents"]);
}

TEST(KzfpMerge, TakesWhatIsWholeOfADamagedCatalogue)
{
    const ScratchDirectory scratch;
    const std::string other = scratch.path("other.kzc");
    const std::string into = scratch.path("into.kzc");
    for (uint64_t seed = 1; seed <= 3; ++seed) {
        output_of(
            {"add", other, scratch.write(std::to_string(seed) + ".wav", wav(piece(seed, 9)))});
    }
    const std::string trail = trail_file(piece(2, 9));
    std::string bytes = contents(other);
    const size_t codes = bytes.find(trail.substr(trail.size() - 100));
    ASSERT_NE(std::string::npos, codes);
    bytes[codes] = static_cast<char>(bytes[codes] ^ 1);
    scratch.write("other.kzc", bytes);
    const ProcessResult result = kzfp({"merge", into, other});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(other + ": 2 added, 0 known\n", result.out);
    EXPECT_EQ(other + ": 1 track is damaged and left out; verify names what to add again\n",
              result.err);
    EXPECT_EQ(2u, lines_of(output_of({"list", "-f", "json", into})).size());
}

TEST(KzfpVerify, NoticesDamage)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    output_of({"add", catalogue, scratch.write("a.wav", wav(piece(1, 20)))});
    EXPECT_EQ(catalogue + ": 1 track, whole\n", output_of({"verify", catalogue}));
    std::string bytes = contents(catalogue);
    // The codes are the longest run of bytes without zeros in a row: change one in the middle.
    const std::string codes = output_of({"list", "-f", "json", catalogue});
    ASSERT_GT(json::parse(codes)["codes"], 100);
    const size_t last = bytes.find_last_not_of('\0');
    bytes[last] = static_cast<char>(bytes[last] ^ 1);
    bytes[last - 100] = static_cast<char>(bytes[last - 100] ^ 1);
    const std::string damaged = scratch.write("damaged.kzc", bytes);
    const ProcessResult result = kzfp({"verify", damaged});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, damaged)) << result.err;
}

TEST(KzfpList, SaysHowClipsAreLookedUp)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 75)));
    output_of({"add", catalogue, file});
    EXPECT_EQ("     1    1:15.0  " + file + "\n1 track, 0.0 hours; looked up by scan\n",
              output_of({"list", catalogue}));
    const json summary = json::parse(output_of({"list", "--summary", "-f", "json", catalogue}));
    EXPECT_EQ(catalogue, summary["catalogue"]);
    EXPECT_EQ(1, summary["tracks"]);
    EXPECT_EQ("scan", summary["plan"]);
}

TEST(KzfpList, ShowsEveryTagOfOneName)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string bytes = trail_file(piece(1, 5));
    const kzcat_tag tags[] = {{"artist", "One"}, {"title", "Song"}, {"artist", "Two"}};
    kzcat_trail* trail = nullptr;
    kzcat_catalogue* opened = nullptr;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_read(bytes.data(), bytes.size(), &trail));
    ASSERT_EQ(KZCAT_OK, kzcat_open(catalogue.c_str(), KZCAT_ACCESS_CREATE, nullptr, &opened));
    const kzcat_new_track track = {
        .trail = trail, .source = {"a", -1, -1, nullptr}, .tags = tags, .tag_count = 3};
    EXPECT_EQ(KZCAT_OK, kzcat_add(opened, &track, 1, nullptr));
    kzcat_close(&opened);
    kzcat_trail_free(&trail);
    const json listed = json::parse(output_of({"list", "-f", "json", catalogue}));
    EXPECT_EQ((json{{"artist", {"One", "Two"}}, {"title", json::array({"Song"})}}), listed["tags"]);
}

} // namespace
