// `kzfp evaluate`: what it says when it cannot measure something, and when it is interrupted.

#include "evaluate_fixture.hpp"

#include <chrono>
#include <csignal>
#include <filesystem>
#include <thread>

#include <spawn.h>
#include <sys/wait.h>

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

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

TEST_F(Evaluate, RefusesSeedsThatAreNoWholeNumbers)
{
    for (const std::string seed : {"-1", "1.5", "18446744073709551616", "one", "1 "}) {
        const ProcessResult result = evaluate({"--seed=" + seed});
        EXPECT_EQ(2, result.status) << seed;
        EXPECT_TRUE(contains(result.err, "'" + seed + "' is not a whole number from 0 to 2^64 - 1"))
            << result.err;
    }
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

/// Waits until one of two clips was made: that of a track that is gone never is.
void wait_for_either(const std::string& one, const std::string& other)
{
    while (!fs::exists(one) && !fs::exists(other)) {
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
}

TEST_F(Evaluate, GoesOnWhenATrackVanishes)
{
    const ScratchDirectory scratch;
    for (uint64_t seed = 1; seed <= 3; ++seed) {
        scratch.write("music/" + std::to_string(seed) + ".wav", wav(piece(seed)));
    }
    fs::create_directory(scratch.path("temporary"));
    const std::string keep = scratch.path("clips");
    Interrupted run({scratch.path("music"), "--clips", "100000", "--kinds", "clean", "--length",
                     "10", "--keep", keep, "-f", "json", "-j", "1"},
                    scratch.path("out"), scratch.path("temporary"));
    wait_for_either(keep + "/clean/k0002.wav", keep + "/clean/k0003.wav");
    fs::remove(lines_of(contents(keep + "/truth.jsonl"))[0].at("track").get<std::string>());
    wait_for_either(keep + "/clean/k0100.wav", keep + "/clean/k0101.wav");
    EXPECT_EQ(130, run.end());
    const json all = lines_of(contents(scratch.path("out"))).back();
    EXPECT_GT(all.at("failed"), 0);
    EXPECT_GT(all.at("right"), 0);
    EXPECT_EQ(0, all.at("wrong"));
}

} // namespace
