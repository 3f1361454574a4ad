// `kzfp monitor` on streams that pause, stop or cannot be heard, and when its results cannot be
// written.

#include "monitor_fixture.hpp"

#include <filesystem>

#include <sys/stat.h>

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

TEST_F(MonitorCommand, PagesThatCannotBeWrittenAreRefusedFirst)
{
    const std::string out = scratch_->path("timeline.json");
    for (const std::string& page : {std::string("/nonexistent/page.html"), out, catalogue()}) {
        const ProcessResult result = monitor_mix({"-f", "json", "-o", out, "--report", page});
        EXPECT_EQ(1, result.status) << page;
        EXPECT_TRUE(contains(result.err, page)) << result.err;
        EXPECT_FALSE(fs::exists(out)) << "nothing was heard yet";
    }
    EXPECT_EQ(0, kzfp({"verify", catalogue()}).status);
}

TEST_F(MonitorCommand, AnOldPageStaysWhenTheStreamCannotBeHeard)
{
    const std::string page = scratch_->write("old.html", "old");
    EXPECT_EQ(1, monitor({"--report", page}, "/nonexistent/stream.wav").status);
    EXPECT_EQ("old", contents(page));
}

TEST_F(MonitorCommand, AStreamThatPausesIsReported)
{
    // A second of sound, and the rest 3 seconds later.
    const std::string sound = "'" + scratch_->path("mix.raw") + "'";
    const std::string script = "{ head -c 32000 " + sound + "; sleep 3; tail -c +32001 " + sound +
                               "; } | '" KZFP_PROGRAM "' monitor -f json --raw 16000,1,s16 '" +
                               catalogue() + "' -";
    const std::vector<json> lines = lines_of(run({"/bin/bash", "-c", script}).out);
    ASSERT_FALSE(lines.empty());
    EXPECT_EQ("interruption", lines[0]["event"]);
    EXPECT_NEAR(1, lines[0]["at"].get<double>(), 0.3);
    EXPECT_GT(lines[0]["seconds"].get<double>(), 1);
    EXPECT_GE(lines.back()["interruptions"].get<int>(), 1);
    EXPECT_EQ(2U, lines.back()["tracks"].size()) << "what comes later is still recognised";
}

TEST_F(MonitorCommand, AStreamThatStopsIsGivenUpWhenWanted)
{
    const std::string fifo = scratch_->path("stops");
    ASSERT_EQ(0, ::mkfifo(fifo.c_str(), 0600));
    const std::string script =
        "exec 3<>'" + fifo + "'; head -c 640000 '" + scratch_->path("mix.raw") +
        "' >&3 & '" KZFP_PROGRAM "' monitor -f json --raw 16000,1,s16 --timeout 1 '" + catalogue() +
        "' '" + fifo + "'; echo status $? >&2";
    const ProcessResult result = run({"/bin/bash", "-c", script});
    EXPECT_TRUE(contains(result.err, "status 1")) << result.err;
    EXPECT_EQ(1U, lines_of(result.out).back()["tracks"].size()) << "what was heard is there";
}

TEST_F(MonitorCommand, StreamsThatCannotBeHeardAreFailures)
{
    for (const std::string& stream :
         {std::string("/nonexistent/stream.wav"), scratch_->write("empty.wav", ""),
          scratch_->write("text.wav", "this is no sound, it is only a text\n")}) {
        const ProcessResult result = monitor({"-f", "json"}, stream);
        EXPECT_EQ(1, result.status) << stream;
        EXPECT_TRUE(contains(result.err, stream)) << result.err;
    }
}

TEST_F(MonitorCommand, CataloguesThatCannotBeReadAreFailures)
{
    for (const std::string& path :
         {std::string("/nonexistent.kzc"), scratch_->write("no.kzc", std::string(5000, 'x'))}) {
        const ProcessResult result = kzfp({"monitor", path, scratch_->path("piece1.wav")});
        EXPECT_EQ(1, result.status);
        EXPECT_TRUE(contains(result.err, path)) << result.err;
    }
}

TEST_F(MonitorCommand, StreamsWithoutMusicHaveNoTracks)
{
    for (const std::string& sound :
         {std::string(), std::string(20, '\0'), std::string(200000, '\0')}) {
        std::vector<std::string> arguments = {"-f", "json"};
        arguments.insert(arguments.end(), kRaw.begin(), kRaw.end());
        const ProcessResult result = monitor(arguments, "-", fed_with(sound));
        EXPECT_EQ(0, result.status) << result.err;
        EXPECT_EQ(0U, lines_of(result.out).back()["tracks"].size());
    }
}

TEST_F(MonitorCommand, AReaderThatLeavesEndsTheRun)
{
    ProcessSetup setup;
    setup.close_output_after = 10;
    const ProcessResult result = monitor_mix({"-f", "csv"}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.err);
}

TEST_F(MonitorCommand, AFullDiskIsReported)
{
    ProcessSetup setup;
    setup.output_file = "/dev/full";
    const ProcessResult result = monitor_mix({"-f", "csv"}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "No space left")) << result.err;
}

TEST_F(MonitorCommand, WrongUsageIsRefused)
{
    for (const std::vector<std::string>& wrong : {std::vector<std::string>{"--for", "soon"},
                                                  {"--clock", "sun"},
                                                  {"--silence", "3"},
                                                  {"--silence", "nan"},
                                                  {"--format", "xml"},
                                                  {"--every", "-1"}}) {
        const ProcessResult result = monitor_mix(wrong);
        EXPECT_EQ(2, result.status) << wrong[0];
        EXPECT_TRUE(contains(result.err, wrong[1])) << result.err;
    }
    EXPECT_EQ(2, kzfp({"monitor", catalogue()}).status);
}

} // namespace
