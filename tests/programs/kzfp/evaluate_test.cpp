// `kzfp evaluate`: what it measures on small pieces of music.

#include "evaluate_fixture.hpp"

#include <algorithm>
#include <filesystem>
#include <set>

#include "kzfp/evaluate/kinds.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;
namespace ev = ::kzfp::evaluate;

std::string without_times(const std::string& text)
{
    std::string result;
    for (json line : lines_of(text)) {
        line.erase("look_up_ms");
        result += line.dump() + '\n';
    }
    return result;
}

TEST_F(Evaluate, RecognisesCleanClipsAndNoStrangers)
{
    const ProcessResult result = evaluate({"--clips", "8", "--kinds", "clean", "-f", "json"});
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_EQ("", result.err);
    const json clean = rows(result).at("clean");
    EXPECT_EQ(8, clean.at("clips"));
    EXPECT_EQ(8, clean.at("right"));
    EXPECT_EQ(8, clean.at("first"));
    EXPECT_EQ(0, clean.at("wrong"));
    EXPECT_EQ(4, clean.at("strangers"));
    EXPECT_EQ(0, clean.at("false_matches"));
    EXPECT_LT(clean.at("place_95"), 0.05);
    EXPECT_NEAR(0.6756, clean.at("recall_low").get<double>(), 1e-4);
    const json all = rows(result).at("all");
    EXPECT_EQ(4, all.at("tracks"));
    EXPECT_EQ(2, all.at("stranger_tracks"));
    EXPECT_FALSE(all.at("partial"));
}

TEST_F(Evaluate, GivesTheSameTableForTheSameSeed)
{
    const std::vector<std::string> words = {
        "--clips", "2", "--kinds", "clean,white_0,mic,speed+2", "-f", "json"};
    const auto run = [&](const std::string& jobs, const std::string& seed) {
        std::vector<std::string> all = words;
        all.insert(all.end(), {"-j", jobs, "--seed", seed});
        return without_times(evaluate(all).out);
    };
    const std::string once = run("1", "7");
    EXPECT_EQ(once, run("2", "7"));
    EXPECT_NE(once, run("1", "8"));
}

TEST_F(Evaluate, NamesWhatAMissingProgramWouldMake)
{
    ProcessSetup setup;
    setup.environment = {"PATH="};
    const ProcessResult table =
        evaluate({"--clips", "1", "--kinds", "clean,gsm,tempo+3,speech_over"}, setup);
    EXPECT_EQ(1, table.status);
    EXPECT_TRUE(contains(table.out, "Not made, since ffmpeg is missing (apt-get install ffmpeg): "
                                    "gsm.\n"))
        << table.out;
    EXPECT_TRUE(contains(table.out, "sox is missing (apt-get install sox): tempo+3.\n"));
    EXPECT_TRUE(contains(table.out, "espeak-ng is missing (apt-get install espeak-ng)"));
    const ProcessResult lines =
        evaluate({"--clips", "1", "--kinds", "gsm,clean", "-f", "json"}, setup);
    EXPECT_TRUE(contains(rows(lines).at("gsm").at("not_made"), "apt-get install ffmpeg"));
    EXPECT_EQ(1, rows(lines).at("clean").at("clips"));
}

TEST_F(Evaluate, MakesMostKindsWithoutOtherPrograms)
{
    const ev::Toolbox toolbox;
    std::set<std::string> own;
    for (const ev::Kind& kind : ev::all_kinds()) {
        own.insert(kind.name);
    }
    for (const char* name : {"clean", "telephone", "mic", "reverb", "white_0", "pink_0", "lowpass",
                             "bass", "clipped", "quiet", "speed+5"}) {
        ASSERT_TRUE(own.contains(name)) << name;
        EXPECT_EQ("", ev::find_kind(name)->missing(toolbox)) << name;
    }
    const ProcessResult result = evaluate(
        {"--clips", "1", "--kinds",
         "telephone,mic,reverb,white_5,pink_5,lowpass,bass,clipped,quiet,speed-2", "-f", "csv"});
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_EQ(12, std::ranges::count(result.out, '\n'));
    EXPECT_TRUE(contains(result.out, "\nall,,10,")) << result.out;
}

TEST_F(Evaluate, SetsIdenticalRecordingsApart)
{
    const ScratchDirectory scratch;
    for (uint64_t seed = 11; seed <= 13; ++seed) {
        scratch.write(std::to_string(seed) + ".wav", wav(piece(seed)));
    }
    scratch.write("copy.wav", wav(piece(11)));
    const ProcessResult result = kz::test::kzfp(
        {"evaluate", scratch.path(), "--clips", "2", "--kinds", "clean", "--length", "10"});
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_TRUE(contains(result.out, "The same recording twice; the second one was left out:\n  " +
                                         scratch.path("11.wav") + " = " + scratch.path("copy.wav")))
        << result.out;
}

TEST_F(Evaluate, NamesStrangersThatSoundLikeATrack)
{
    const ScratchDirectory scratch;
    const std::string known = scratch.write("known.wav", wav(piece(21)));
    const std::string stranger = scratch.write("part.wav", wav(part(piece(21), 5, 20)));
    const std::string catalogue = scratch.path("music.kzc");
    ASSERT_EQ(0, kz::test::kzfp({"add", catalogue, known}).status);
    const ProcessResult result =
        kz::test::kzfp({"evaluate", known, stranger, "--catalogue", catalogue, "--clips", "2",
                        "--kinds", "clean", "--length", "10", "-f", "json"});
    const json all = rows(result).at("all");
    EXPECT_EQ(2, all.at("right"));
    EXPECT_EQ(1, all.at("same_sound"));
    EXPECT_EQ(0, all.at("false_matches"));
    ASSERT_EQ(1u, all.at("same_sound_pairs").size());
    EXPECT_EQ(stranger, all.at("same_sound_pairs")[0].at("file"));
    EXPECT_EQ(known, all.at("same_sound_pairs")[0].at("other"));
}

TEST_F(Evaluate, LooksUpInACatalogueThatIsThere)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("music.kzc");
    ASSERT_EQ(0,
              kz::test::kzfp({"add", catalogue, path("music/1.wav"), path("music/2.wav")}).status);
    const ProcessResult result = evaluate({"--catalogue", catalogue, "--clips", "4", "--kinds",
                                           "clean", "-f", "json", "--plan", "both"});
    EXPECT_EQ(0, result.status) << result.err;
    const json all = rows(result).at("all");
    EXPECT_EQ(2, all.at("tracks"));
    EXPECT_EQ(4, all.at("stranger_tracks"));
    EXPECT_EQ(4, all.at("right"));
    // Too small for an index, which is not put beside a catalogue that was there for this.
    EXPECT_FALSE(all.contains("by_scan"));
    EXPECT_FALSE(fs::exists(catalogue + ".idx"));
}

TEST_F(Evaluate, ComparesTheIndexWithAScan)
{
    const std::vector<std::string> words = {"--clips", "4", "--kinds", "clean,mic"};
    std::vector<std::string> both = words;
    both.insert(both.end(), {"--plan", "both"});
    const std::string text = evaluate(both).out;
    EXPECT_TRUE(contains(text, "\nOf 8 clips that a scan recognised, the index alone recognised "))
        << text;
    EXPECT_FALSE(contains(evaluate(words).out, "the index"));
    both.insert(both.end(), {"-f", "json"});
    const json all = rows(evaluate(both)).at("all");
    EXPECT_EQ(8, all.at("by_scan"));
    EXPECT_GE(all.at("of_these_by_parts"), 4);
}

TEST_F(Evaluate, SaysThatACatalogueHasNoneOfTheFiles)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("music.kzc");
    const std::string other = scratch.write("other.wav", wav(piece(31)));
    ASSERT_EQ(0, kz::test::kzfp({"add", catalogue, other}).status);
    const ProcessResult result =
        evaluate({"--catalogue", catalogue, "--clips", "2", "--kinds", "clean", "-f", "json"});
    EXPECT_TRUE(contains(result.err, "only false matches can be measured")) << result.err;
    EXPECT_EQ(0, rows(result).at("all").at("clips"));
    EXPECT_EQ(1, rows(result).at("all").at("strangers"));
}

TEST_F(Evaluate, KeepsClipsThatMatchFinds)
{
    const ScratchDirectory scratch;
    const std::string folder = scratch.path("clips");
    const std::string catalogue = scratch.path("music.kzc");
    const ProcessResult result = evaluate({"--keep", folder, "--clips", "1", "--kinds", "clean"});
    EXPECT_EQ(0, result.status) << result.err;
    ASSERT_EQ(0, kz::test::kzfp({"add", catalogue, music()}).status);
    const std::vector<json> truth = lines_of(contents(folder + "/truth.jsonl"));
    ASSERT_EQ(2u, truth.size());
    for (const json& line : truth) {
        const std::string clip = folder + "/" + line.at("file").get<std::string>();
        const json answer =
            lines_of(output_of({"match", "--format", "json", catalogue, clip})).front();
        ASSERT_EQ("match", answer.at("verdict")) << answer;
        EXPECT_EQ(line.at("track"), answer.at("matches")[0].at("source"));
        EXPECT_NEAR(line.at("seconds"), answer.at("matches")[0].at("offset"), 0.05);
    }
    const ProcessResult again = evaluate({"--keep", folder, "--clips", "1", "--kinds", "clean"});
    EXPECT_EQ(1, again.status);
    EXPECT_TRUE(contains(again.err, "is not empty; name a new folder")) << again.err;
}

TEST_F(Evaluate, DrawsAPage)
{
    const ScratchDirectory scratch;
    const std::string page = scratch.path("page.html");
    ProcessSetup setup;
    setup.environment = {"PATH="};
    const ProcessResult result = evaluate(
        {"--clips", "1", "--kinds", "clean,white_20,white_0,gsm", "--report", page}, setup);
    EXPECT_FALSE(result.out.empty());
    const std::string html = contents(page);
    for (const char* part : {"<svg", "How well clips are recognised", "white noise",
                             "the clip as it is", "apt-get install ffmpeg", "</html>"}) {
        EXPECT_TRUE(contains(html, part)) << part;
    }
    EXPECT_FALSE(contains(html, "tempo"));
}

} // namespace
