// Recognising as a user sees it: clips of the music of a catalogue are named, and what cannot be
// done is said.

#include "kzfp.hpp"

#include <algorithm>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

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
    EXPECT_EQ((std::vector<std::string>{"file", "matches", "runner_up", "schema", "verdict"}),
              names);
    names.clear();
    for (const auto& member : answer["matches"][0].items()) {
        names.push_back(member.key());
    }
    EXPECT_EQ((std::vector<std::string>{"artist", "by", "clip_begin", "clip_end", "offset", "pitch",
                                        "score", "source", "speed", "sure", "tempo", "threshold",
                                        "title", "track"}),
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

} // namespace
