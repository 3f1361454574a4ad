// The command that says what runs on a stream.

#include "kzfp.hpp"

#include <filesystem>
#include <sstream>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "recordings.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

const std::vector<std::string> kRaw = {"--raw", "16000,1,s16"};

using Samples = std::vector<int16_t>;

Samples joined(const std::vector<Samples>& parts)
{
    Samples sound;
    for (const Samples& one : parts) {
        sound.insert(sound.end(), one.begin(), one.end());
    }
    return sound;
}

std::string bytes_of(const Samples& samples)
{
    return {reinterpret_cast<const char*>(samples.data()), samples.size() * 2};
}

/// A minute and a half: piece 1, a stranger, silence, and piece 2.
Samples mix()
{
    return joined({piece(1), piece(50, 20), Samples(6 * kPieceRate), part(piece(2), 4, 26)});
}

class MonitorCommand : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        std::vector<std::string> arguments = {"add", catalogue()};
        for (uint64_t seed = 1; seed <= 2; ++seed) {
            arguments.push_back(
                scratch_->write("piece" + std::to_string(seed) + ".wav", wav(piece(seed))));
        }
        ASSERT_EQ(0, kzfp(arguments).status);
        scratch_->write("mix.raw", bytes_of(mix()));
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static std::string catalogue() { return scratch_->path("music.kzc"); }

    static ProcessResult monitor(std::vector<std::string> arguments, const std::string& stream,
                                 const ProcessSetup& setup = {})
    {
        arguments.insert(arguments.begin(), "monitor");
        arguments.insert(arguments.end(), {catalogue(), stream});
        return kzfp(arguments, setup);
    }

    static ProcessResult monitor_mix(std::vector<std::string> arguments,
                                     const ProcessSetup& setup = {})
    {
        arguments.insert(arguments.end(), kRaw.begin(), kRaw.end());
        return monitor(std::move(arguments), scratch_->path("mix.raw"), setup);
    }

    static ScratchDirectory* scratch_;
};

ScratchDirectory* MonitorCommand::scratch_ = nullptr;

void expect_entry(const json& entry, const std::string& heard, double begin, double end)
{
    EXPECT_EQ(heard, entry["heard"]) << entry;
    EXPECT_NEAR(begin, entry["begin"].get<double>(), 2) << entry;
    EXPECT_NEAR(end, entry["end"].get<double>(), 2) << entry;
}

TEST_F(MonitorCommand, SaysWhatRanFromWhenToWhen)
{
    const ProcessResult result = monitor_mix({"-f", "json"});
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_EQ("", result.err);
    std::vector<json> ended;
    const std::vector<json> lines = lines_of(result.out);
    for (const json& line : lines) {
        EXPECT_EQ(1, line["schema"]);
        if (line["event"] == "ends") {
            ended.push_back(line);
        }
    }
    ASSERT_EQ(4U, ended.size()) << result.out;
    expect_entry(ended[0], "track", 0, 30);
    expect_entry(ended[1], "gap", 30, 50);
    expect_entry(ended[2], "silence", 50, 56);
    expect_entry(ended[3], "track", 56, 82);
    EXPECT_EQ(scratch_->path("piece2.wav"), ended[3]["source"]);
    EXPECT_NEAR(4, ended[3]["place_begin"].get<double>(), 2);
    const json& summary = lines.back();
    EXPECT_EQ("summary", summary["event"]);
    EXPECT_EQ("end of stream", summary["stopped"]);
    EXPECT_NEAR(82, summary["seconds"].get<double>(), 0.01);
    EXPECT_EQ(2U, summary["tracks"].size());
}

TEST_F(MonitorCommand, PipesHaveTheSameTimeline)
{
    const std::string sound = bytes_of(mix());
    std::vector<std::string> arguments = {"-f", "json"};
    arguments.insert(arguments.end(), kRaw.begin(), kRaw.end());
    const ProcessResult piped = monitor(arguments, "-", fed_with(sound));
    EXPECT_EQ(0, piped.status) << piped.err;
    EXPECT_EQ(monitor_mix({"-f", "json"}).out, piped.out);
}

TEST_F(MonitorCommand, CsvHasALineForEachEntry)
{
    std::istringstream lines(monitor_mix({"-f", "csv"}).out);
    std::string line;
    ASSERT_TRUE(std::getline(lines, line));
    EXPECT_EQ("heard,begin,end,track,source,title,artist,place_begin,place_end,score,speed,tempo,"
              "pitch,repeat",
              line);
    size_t entries = 0;
    while (std::getline(lines, line)) {
        EXPECT_EQ(13, std::count(line.begin(), line.end(), ',')) << line;
        ++entries;
    }
    EXPECT_EQ(4U, entries);
}

TEST_F(MonitorCommand, PeopleReadTimesAndNames)
{
    const ProcessResult result = monitor_mix({});
    EXPECT_TRUE(contains(result.out, "0:00.0")) << result.out;
    EXPECT_TRUE(contains(result.out, "piece1 (" + scratch_->path("piece1.wav") + ")"));
    EXPECT_TRUE(contains(result.out, "not recognised")) << result.out;
    EXPECT_TRUE(contains(result.out, "heard (end of stream): 2 tracks")) << result.out;
}

TEST_F(MonitorCommand, TheTimeOfDayIsShownWhenWanted)
{
    const json line = lines_of(monitor_mix({"-f", "json", "--clock", "wall"}).out).at(0);
    const auto clock = line["begin_clock"].get<std::string>();
    EXPECT_EQ(22U, clock.size()) << clock;
    EXPECT_EQ('Z', clock.back());
}

TEST_F(MonitorCommand, StopsWhenTheTimeIsUp)
{
    const json summary = lines_of(monitor_mix({"-f", "json", "--for", "0:12"}).out).back();
    EXPECT_EQ("time is up", summary["stopped"]);
    EXPECT_NEAR(12, summary["seconds"].get<double>(), 0.001);
}

TEST_F(MonitorCommand, SaysThatATrackGoesOnWhenWanted)
{
    EXPECT_TRUE(contains(monitor_mix({"-f", "json", "--every", "10"}).out, "\"goes on\""));
    EXPECT_FALSE(contains(monitor_mix({"-f", "json"}).out, "\"goes on\""));
}

TEST_F(MonitorCommand, SoundFilesAreStreamsToo)
{
    const ProcessResult result = monitor({"-f", "json"}, scratch_->path("piece2.wav"));
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_TRUE(contains(result.out, "piece2.wav")) << result.out;
}

TEST_F(MonitorCommand, TheTimelineIsDrawnOnAPage)
{
    const std::string page = scratch_->path("page.html");
    EXPECT_EQ(0, monitor_mix({"--report", page}).status);
    const std::string html = contents(page);
    EXPECT_TRUE(contains(html, "<svg")) << html.substr(0, 500);
    EXPECT_TRUE(contains(html, "piece1"));
}

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

TEST_F(MonitorCommand, ResultsGoToAFileWhenWanted)
{
    const std::string path = scratch_->path("out.json");
    const ProcessResult result = monitor_mix({"-f", "json", "-o", path});
    EXPECT_EQ("", result.out);
    EXPECT_EQ(monitor_mix({"-f", "json"}).out, contents(path));
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

TEST_F(MonitorCommand, AnEndByTheUserIsAnOrdinaryEnd)
{
    for (const std::string signal : {"INT", "TERM"}) {
        const std::string fifo = scratch_->path("fifo" + signal);
        ASSERT_EQ(0, ::mkfifo(fifo.c_str(), 0600));
        // The FIFO stays open, so the stream does not end by itself.
        const std::string script =
            "set -m; exec 3<>'" + fifo +
            "'; '" KZFP_PROGRAM "' monitor -f json --raw 16000,1,s16 '" + catalogue() + "' '" +
            fifo + "' > '" + fifo + ".out' & pid=$!; cat '" + scratch_->path("mix.raw") + "' > '" +
            fifo + "'; while ! grep -q piece2 '" + fifo + ".out'; do sleep 0.1; done; kill -" +
            signal + " $pid; wait $pid; echo status $?";
        const ProcessResult result = run({"/bin/bash", "-c", script});
        EXPECT_TRUE(contains(result.out, "status 0")) << result.out << result.err;
        const json summary = lines_of(contents(fifo + ".out")).back();
        EXPECT_EQ("interrupted", summary["stopped"]);
        EXPECT_EQ(2U, summary["tracks"].size()) << "what was going on is in it";
    }
}

TEST_F(MonitorCommand, WrongUsageIsRefused)
{
    for (const std::vector<std::string>& wrong : {std::vector<std::string>{"--for", "soon"},
                                                  {"--clock", "sun"},
                                                  {"--silence", "3"},
                                                  {"--format", "xml"},
                                                  {"--every", "-1"}}) {
        EXPECT_EQ(2, monitor_mix(wrong).status) << wrong[0];
    }
    EXPECT_EQ(2, kzfp({"monitor", catalogue()}).status);
}

} // namespace
