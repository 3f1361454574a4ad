// The command that says what runs on a stream.

#include "monitor_fixture.hpp"

#include <algorithm>
#include <iterator>
#include <sstream>

#include <sys/stat.h>

#include "small_server.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

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

/// What is heard of a station that sends this; its catalogue has the music of the clips.
std::vector<json> heard_from_station(const std::string& bytes)
{
    const ScratchDirectory scratch;
    const std::string clips = scratch.path("clips.kzc");
    output_of({"add", clips, clip("music.flac")});
    const SmallServer server([&bytes](int socket, const std::string& request) {
        send_file(socket, request, bytes, bytes.size());
    });
    const ProcessResult result = kzfp({"monitor", "-f", "json", clips, server.url("live.mp3")});
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_EQ("", result.err);
    return lines_of(result.out);
}

bool reads_urls() { return contains(output_of({"--version"}), "FFmpeg"); }

TEST_F(MonitorCommand, StreamsOfTheNetworkAreHeard)
{
    if (!reads_urls()) {
        GTEST_SKIP() << "this build is without FFmpeg";
    }
    const std::vector<json> lines = heard_from_station(contents(clip("music.mp3")));
    ASSERT_LE(2U, lines.size());
    const json& ended = lines[lines.size() - 2];
    expect_entry(ended, "track", 0, 20);
    EXPECT_EQ(clip("music.flac"), ended["source"]);
    EXPECT_EQ("end of stream", lines.back()["stopped"]);
    EXPECT_EQ(0, lines.back()["format_changes"]);
}

TEST_F(MonitorCommand, AChangeOfTheFormatIsSurvived)
{
    if (!reads_urls()) {
        GTEST_SKIP() << "this build is without FFmpeg";
    }
    const std::vector<json> lines =
        heard_from_station(contents(clip("music.mp3")) + contents(clip("music-22050-mono.mp3")));
    std::vector<json> changes; // the decoder may report rate and channels one after the other
    std::ranges::copy_if(lines, std::back_inserter(changes),
                         [](const json& line) { return line["event"] == "format"; });
    ASSERT_FALSE(changes.empty());
    EXPECT_NEAR(20, changes.back()["at"].get<double>(), 0.2);
    EXPECT_EQ(22050, changes.back()["rate"]);
    EXPECT_EQ(1, changes.back()["channels"]);
    EXPECT_EQ(changes.size(), lines.back()["format_changes"].get<size_t>());
    EXPECT_NEAR(40, lines.back()["seconds"].get<double>(), 0.3);
    const json& ended = lines[lines.size() - 2];
    EXPECT_EQ("ends", ended["event"]);
    EXPECT_NEAR(40, ended["known"].get<double>(), 2) << "it is recognised after the change too";
}

TEST_F(MonitorCommand, TheTimelineIsDrawnOnAPage)
{
    const std::string page = scratch_->path("page.html");
    EXPECT_EQ(0, monitor_mix({"--report", page}).status);
    const std::string html = contents(page);
    EXPECT_TRUE(contains(html, "<svg")) << html.substr(0, 500);
    EXPECT_TRUE(contains(html, "piece1"));
}

TEST_F(MonitorCommand, ResultsGoToAFileWhenWanted)
{
    const std::string path = scratch_->path("out.json");
    const ProcessResult result = monitor_mix({"-f", "json", "-o", path});
    EXPECT_EQ("", result.out);
    EXPECT_EQ(monitor_mix({"-f", "json"}).out, contents(path));
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

} // namespace
