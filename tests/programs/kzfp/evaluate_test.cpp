// `kzfp evaluate`: what it measures on small pieces of music, and what it says when it cannot.

#include "kzfp.hpp"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <set>
#include <thread>

#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include "kzfp/evaluate/clip.hpp"
#include "kzfp/evaluate/effects.hpp"
#include "kzfp/evaluate/kinds.hpp"
#include "kzfp/evaluate/score.hpp"
#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;
namespace ev = ::kzfp::evaluate;

/// A folder of pieces, each a track of its own.
class Evaluate : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory;
        for (uint64_t seed = 1; seed <= 6; ++seed) {
            scratch_->write("music/" + std::to_string(seed) + ".wav", wav(piece(seed)));
        }
    }
    static void TearDownTestSuite() { delete scratch_; }

    static std::string path(const std::string& name) { return scratch_->path(name); }
    static std::string music() { return path("music"); }

    /// Runs the command on the music with more words.
    static ProcessResult evaluate(std::vector<std::string> words, const ProcessSetup& setup = {})
    {
        words.insert(words.begin(), {"evaluate", music(), "--length", "10"});
        return kz::test::kzfp(words, setup);
    }

    /// The lines by kind.
    static std::map<std::string, json> rows(const ProcessResult& result)
    {
        std::map<std::string, json> all;
        for (const json& line : lines_of(result.out)) {
            all[line.at("kind").get<std::string>()] = line;
        }
        return all;
    }

    static ScratchDirectory* scratch_;
};

ScratchDirectory* Evaluate::scratch_ = nullptr;

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
    EXPECT_EQ(4, all.at("by_scan"));
    EXPECT_TRUE(all.contains("of_these_by_parts"));
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

TEST_F(Evaluate, GoesOnWithoutFilesThatAreNoSound)
{
    const ScratchDirectory scratch;
    for (uint64_t seed = 1; seed <= 3; ++seed) {
        scratch.write(std::to_string(seed) + ".wav", wav(piece(seed)));
    }
    scratch.write("empty.wav", "");
    scratch.write("text.wav", "this is no sound");
    const ProcessResult result =
        kz::test::kzfp({"evaluate", scratch.path(), scratch.path("nosuch.wav"), "--clips", "1",
                        "--kinds", "clean", "--length", "10", "-f", "json"});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "empty.wav: is empty, a sound file is needed\n"));
    EXPECT_TRUE(contains(result.err, "text.wav: "));
    EXPECT_TRUE(contains(result.err, "nosuch.wav: ")) << result.err;
    EXPECT_EQ(1, rows(result).at("clean").at("right"));
}

TEST_F(Evaluate, SaysThatThereIsNoMusic)
{
    const ScratchDirectory scratch;
    const ProcessResult result = kz::test::kzfp({"evaluate", scratch.path()});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, "there is no music to evaluate with; name sound files or"));
}

TEST_F(Evaluate, LeavesSilentTracksOut)
{
    const ScratchDirectory scratch;
    const std::string file =
        scratch.write("silent.wav", wav(std::vector<int16_t>(20 * kPieceRate)));
    const ProcessResult result = kz::test::kzfp(
        {"evaluate", file, "--clips", "2", "--kinds", "clean", "--length", "10", "-f", "json"});
    EXPECT_EQ(2, rows(result).at("clean").at("silent"));
    EXPECT_EQ(0, rows(result).at("clean").at("clips"));
}

TEST_F(Evaluate, SaysWhenNoTrackIsLongEnough)
{
    const ProcessResult result =
        kz::test::kzfp({"evaluate", music(), "--clips", "1", "--kinds", "clean", "--length", "60"});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "clean: no track is long enough; --length makes shorter"))
        << result.err;
}

TEST_F(Evaluate, TakesOnlyWhatItCanUse)
{
    const auto complaint = [](const std::string& option, const std::string& value) {
        const ProcessResult result = evaluate({option, value});
        EXPECT_EQ(2, result.status) << option;
        return result.err;
    };
    EXPECT_TRUE(contains(complaint("--kinds", "clean,loud"), "'loud' is not a kind; kinds are"));
    EXPECT_TRUE(contains(complaint("--length", "1"), "from 2 to 600"));
    EXPECT_TRUE(contains(complaint("--plan", "guess"), "'guess' is not a plan"));
    EXPECT_TRUE(contains(complaint("--clips", "0"), "--clips"));
    EXPECT_TRUE(contains(complaint("--format", "xml"), "'xml' is not a format"));
}

TEST_F(Evaluate, ReportsCataloguesThatCannotBeOpened)
{
    const ProcessResult result = evaluate({"--catalogue", path("nosuch.kzc")});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "nosuch.kzc")) << result.err;
    EXPECT_FALSE(fs::exists(path("nosuch.kzc")));
}

TEST_F(Evaluate, SaysWhereItCouldWorkInstead)
{
    ProcessSetup setup;
    setup.environment = {"TMPDIR=" + path("nosuch")};
    const ProcessResult result = evaluate({"--clips", "1", "--kinds", "clean"}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "set TMPDIR to a place that can be written")) << result.err;
    const ProcessResult full = evaluate({"--clips", "1", "--kinds", "clean", "-o", "/dev/full"});
    EXPECT_EQ(1, full.status);
    EXPECT_TRUE(contains(full.err, "/dev/full cannot be written")) << full.err;
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

TEST_F(Evaluate, KeepsItsInputsFromItsPage)
{
    const std::string file = path("music/1.wav");
    const std::string before = contents(file);
    const ProcessResult result =
        kz::test::kzfp({"evaluate", file, "--clips", "1", "--kinds", "clean", "--report", file});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "--report needs another file")) << result.err;
    EXPECT_EQ(before, contents(file));
    const ProcessResult nowhere = evaluate({"--kinds", "clean", "--report", path("no/page.html")});
    EXPECT_EQ(1, nowhere.status);
    EXPECT_TRUE(contains(nowhere.err, "page.html cannot be written")) << nowhere.err;
    EXPECT_EQ("", nowhere.out);
}

/// Starts the command with its output in a file, and ends it by a signal once that says how.
class Interrupted {
public:
    Interrupted(const std::vector<std::string>& words, const std::string& out,
                const std::string& temporary)
    {
        std::vector<std::string> all = {KZFP_PROGRAM, "evaluate"};
        all.insert(all.end(), words.begin(), words.end());
        all.insert(all.end(), {"-o", out, "--progress", "none"});
        std::vector<char*> pointers;
        for (std::string& word : all) {
            pointers.push_back(word.data());
        }
        pointers.push_back(nullptr);
        std::string folder = "TMPDIR=" + temporary;
        std::string found = "PATH=";
        char* environment[] = {folder.data(), found.data(), nullptr};
        EXPECT_EQ(0, ::posix_spawn(&child_, KZFP_PROGRAM, nullptr, nullptr, pointers.data(),
                                   environment));
    }
    int end()
    {
        ::kill(child_, SIGINT);
        int status = 0;
        ::waitpid(child_, &status, 0);
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

private:
    pid_t child_ = -1;
};

TEST_F(Evaluate, PrintsTheTableSoFarAfterCtrlC)
{
    const ScratchDirectory scratch;
    fs::create_directory(scratch.path("temporary"));
    const std::string keep = scratch.path("clips");
    Interrupted run({music(), "--clips", "100000", "--kinds", "clean,quiet", "--length", "10",
                     "--keep", keep, "-f", "json"},
                    scratch.path("out"), scratch.path("temporary"));
    // The first clips are there before the signal comes.
    while (!fs::exists(keep + "/quiet/k0002.wav")) {
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    EXPECT_EQ(130, run.end());
    const std::vector<json> lines = lines_of(contents(scratch.path("out")));
    ASSERT_EQ(3u, lines.size());
    EXPECT_TRUE(lines.back().at("partial"));
    EXPECT_GT(lines.back().at("clips"), 0);
    EXPECT_LT(lines.back().at("clips"), 100000);
    EXPECT_TRUE(fs::is_empty(scratch.path("temporary")));
}

TEST(EvaluateScore, HasTheIntervalOfWilson)
{
    const ev::Interval all = ev::confidence(10, 10);
    EXPECT_NEAR(0.7225, all.low, 1e-4);
    EXPECT_EQ(1, all.high);
    const ev::Interval half = ev::confidence(50, 100);
    EXPECT_NEAR(0.4038, half.low, 1e-4);
    EXPECT_NEAR(0.5962, half.high, 1e-4);
    EXPECT_NEAR(0.2775, ev::confidence(0, 10).high, 1e-4);
    EXPECT_EQ(0, ev::confidence(0, 10).low);
    EXPECT_EQ(1, ev::confidence(0, 0).high);
}

TEST(EvaluateScore, CountsTracksOfTheSameSoundNeitherWay)
{
    ev::Tally tally;
    ev::Outcome outcome;
    outcome.state = ev::Outcome::State::looked_up;
    outcome.accepted = true;
    tally.add(outcome);
    outcome.same_sound = true;
    tally.add(outcome);
    outcome.known = true;
    tally.add(outcome);
    EXPECT_EQ(1u, tally.strangers);
    EXPECT_EQ(1u, tally.false_matches);
    EXPECT_EQ(0u, tally.clips);
    EXPECT_EQ(2u, tally.same_sound);
}

ev::Clip clip_of_piece()
{
    ev::Clip clip = {.rate = kPieceRate, .channels = 1, .samples = {}};
    for (const int16_t sample : piece(1, 8)) {
        clip.samples.push_back(static_cast<float>(sample) / 32768);
    }
    return clip;
}

TEST(EvaluateEffects, AddNoiseOfTheStatedLevel)
{
    const ev::Clip clip = clip_of_piece();
    for (const auto colour : {ev::NoiseColour::white, ev::NoiseColour::pink}) {
        ev::Random random(1, "noise");
        ev::Clip noise = ev::with_noise(clip, random, colour, 20);
        for (size_t i = 0; i < noise.samples.size(); ++i) {
            noise.samples[i] -= clip.samples[i];
        }
        EXPECT_NEAR(0.1, level_of(noise) / level_of(clip), 1e-4);
    }
}

TEST(EvaluateEffects, KeepTheBandOfATelephone)
{
    const auto level_at = [](double hertz) {
        ev::Clip tone = {.rate = kPieceRate, .channels = 1, .samples = {}};
        for (size_t i = 0; i < 4 * kPieceRate; ++i) {
            const double turns = hertz * static_cast<double>(i) / kPieceRate;
            tone.samples.push_back(static_cast<float>(0.5 * std::sin(6.283185307179586 * turns)));
        }
        const ev::Pcm pcm = ev::over_telephone(tone);
        EXPECT_EQ(8000u, pcm.rate);
        double sum = 0;
        for (const int16_t sample : pcm.samples) {
            sum += double{static_cast<double>(sample)} * sample;
        }
        return std::sqrt(sum / static_cast<double>(pcm.samples.size())) / 32768;
    };
    EXPECT_NEAR(0.9 * 0.5 / std::sqrt(2), level_at(1000), 0.01);
    EXPECT_LT(level_at(100), 0.002);
    EXPECT_LT(level_at(3700), 0.002);
}

TEST(EvaluateEffects, ChangeTheLengthWithTheSpeed)
{
    const ev::Clip clip = clip_of_piece();
    const auto frames = static_cast<double>(clip.frames());
    EXPECT_NEAR(frames / 1.05, static_cast<double>(sped_up(clip, 1.05).frames()), 2);
    EXPECT_NEAR(frames / 0.95, static_cast<double>(sped_up(clip, 0.95).frames()), 2);
    EXPECT_EQ(clip.rate, sped_up(clip, 1.05).rate);
}

/// The largest sample, whatever its sign.
int peak_of_pcm(const ev::Pcm& pcm)
{
    int peak = 0;
    for (const int16_t sample : pcm.samples) {
        peak = std::max(peak, std::abs(int{sample}));
    }
    return peak;
}

TEST(EvaluateEffects, KeepALevelThatCanBeWritten)
{
    const ev::Clip clip = clip_of_piece();
    EXPECT_EQ(32767, peak_of_pcm(to_pcm(clipped(clip, 12))));
    EXPECT_NEAR(0.98 * 32767, peak_of_pcm(to_pcm_within_scale(scaled(clip, 10))), 1);
}

} // namespace
