// A catalogue whose tracks are spread over servers, as its users meet it: the answers are those of
// a file, those of the servers that are left say so, and workers add each track once.

#include "kzfp.hpp"

#include <algorithm>
#include <chrono>
#include <csignal>
#include <fstream>
#include <map>
#include <thread>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sys/stat.h>

#include "catalogue/index/fleet.hpp"
#include "recordings.hpp"
#include "running.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::test;
using kzcat::test::attach_shards;
using kzcat::test::Fleet;
using nlohmann::json;
using Samples = std::vector<int16_t>;

constexpr uint64_t kTracks = 12;
constexpr uint64_t kStrangers = 4;

std::string database_of(const std::string& url)
{
    const size_t end = url.find('?');
    const size_t begin = url.rfind('/', end) + 1;
    return url.substr(begin, end - begin);
}

Samples with_noise(Samples samples, uint64_t seed)
{
    const Samples hiss = noise(samples.size(), 0.05, seed);
    for (size_t i = 0; i < samples.size(); ++i) {
        samples[i] = static_cast<int16_t>((3 * samples[i] + hiss[i]) / 4);
    }
    return samples;
}

/// As through a wall: the mean of some samples.
Samples muffled(const Samples& samples)
{
    constexpr size_t kMean = 6;
    Samples low(samples.size());
    for (size_t i = kMean; i < samples.size(); ++i) {
        int sum = 0;
        for (size_t k = 0; k < kMean; ++k) {
            sum += samples[i - k];
        }
        low[i] = static_cast<int16_t>(sum / static_cast<int>(kMean));
    }
    return low;
}

/// Which strangers come nearest is decided by hits of chance alone: by parts, other tracks of a
/// file than of a server may be the ones that are compared.
std::vector<json> without_strangers(const std::string& answers)
{
    std::vector<json> lines = lines_of(answers);
    for (json& line : lines) {
        if (line["verdict"] == "no match") {
            line.erase("runner_up");
        }
    }
    return lines;
}

/// A coordinator with two shards, and a catalogue on it that has the tracks of a file.
class KzfpShards : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        if (!postgres_obstacle().empty()) {
            return;
        }
        scratch_ = std::make_unique<ScratchDirectory>();
        fleet_ = std::make_unique<Fleet>();
        std::vector<std::string> add = {"add", "--documents", file()};
        for (uint64_t seed = 1; seed <= kTracks + kStrangers; ++seed) {
            const Samples whole = piece(seed, 20);
            if (seed <= kTracks) {
                add.push_back(scratch_->write(std::to_string(seed) + ".wav", wav(whole)));
            }
            write_clips(whole, seed);
        }
        output_of(add);
        kzfp({"export", file(), scratch_->path("file.jsonl")});
        output_of({"import", spread(), scratch_->path("file.jsonl")});
    }
    static void TearDownTestSuite()
    {
        fleet_.reset();
        scratch_.reset();
    }
    void SetUp() override
    {
        if (!postgres_obstacle().empty()) {
            GTEST_SKIP() << postgres_obstacle();
        }
    }
    void TearDown() override
    {
        if (fleet_ != nullptr && !fleet_->two.is_running()) {
            fleet_->two.start();
        }
    }

    static std::string file() { return scratch_->path("file.kzc"); }
    static std::string spread() { return fleet_->coordinator.url(); }

    /// Parts of a piece, from anywhere: clean, and if it is a track noisy or muffled.
    static void write_clips(const Samples& whole, uint64_t seed)
    {
        const double from = 0.37 + 0.7 * static_cast<double>(seed);
        const std::string number = std::to_string(seed);
        write_clip("clean" + number, part(whole, from / 2, 7));
        if (seed <= kTracks && seed % 2 == 0) {
            write_clip("noisy" + number, with_noise(part(whole, from, 9), seed));
        } else if (seed <= kTracks) {
            write_clip("muffled" + number, muffled(part(whole, from, 8)));
        }
    }
    static void write_clip(const std::string& name, const Samples& samples)
    {
        clips_.push_back(scratch_->write(name + ".wav", wav(samples)));
    }

    /// What is found of all clips.
    static std::string answers(const std::string& catalogue, const std::string& plan)
    {
        std::vector<std::string> words = {"match", "-f", "json", "--plan", plan, catalogue};
        words.insert(words.end(), clips_.begin(), clips_.end());
        return output_of(words);
    }

    /// Posts what was added, which few tracks are not worth.
    static void post(const PostgresServer& server, const std::string& database)
    {
        server.sql("INSERT INTO kzcat.posting_request SELECT shard, 1 FROM "
                   "(SELECT number AS shard FROM kzcat.shard UNION ALL SELECT 0 "
                   "WHERE NOT EXISTS (SELECT FROM kzcat.shard)) AS places",
                   database);
    }

    /// A track that lies on this shard, and a clip of it.
    static int track_on(int shard)
    {
        return std::stoi(fleet_->coordinator.sql("SELECT min(id) FROM kzcat.track WHERE shard = " +
                                                 std::to_string(shard)));
    }
    static std::string clip_on(int shard)
    {
        return scratch_->path("clean" + std::to_string(track_on(shard)) + ".wav");
    }

    static int posted_tracks(const PostgresServer& server, const std::string& database = "postgres")
    {
        return std::stoi(
            server.sql("SELECT count(*) FROM kzcat.posted WHERE segment IS NOT NULL", database));
    }

    static inline std::unique_ptr<ScratchDirectory> scratch_;
    static inline std::unique_ptr<Fleet> fleet_;
    static inline std::vector<std::string> clips_;
};

TEST_F(KzfpShards, AnswerAsAFileWhereverTracksLie)
{
    const std::string one = fleet_->coordinator.new_database();
    const std::string back = scratch_->path("back.kzc");
    output_of({"merge", one, spread()});
    output_of({"merge", back, one});
    const std::string scanned = answers(file(), "scan");
    std::map<std::string, int> verdicts;
    for (const json& answer : lines_of(scanned)) {
        ++verdicts[answer["verdict"]];
    }
    EXPECT_EQ(2 * kTracks, static_cast<uint64_t>(verdicts["match"])) << scanned;
    EXPECT_EQ(kStrangers, static_cast<uint64_t>(verdicts["no match"])) << scanned;
    for (const std::string& catalogue : {one, spread(), back}) {
        EXPECT_EQ(scanned, answers(catalogue, "scan")) << catalogue;
    }
    post(fleet_->coordinator, database_of(one));
    post(fleet_->coordinator, "postgres");
    EXPECT_EQ(12, posted_tracks(fleet_->coordinator, database_of(one)));
    EXPECT_EQ(12, posted_tracks(fleet_->one) + posted_tracks(fleet_->two));
    const auto by_parts = without_strangers(answers(file(), "parts"));
    for (const std::string& catalogue : {one, spread(), back}) {
        EXPECT_EQ(by_parts, without_strangers(answers(catalogue, "parts"))) << catalogue;
    }
}

TEST_F(KzfpShards, OfWhichOneIsDownFailTheLookUp)
{
    fleet_->two.kill9();
    const ProcessResult result = kzfp({"match", spread(), clip_on(1)});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, "shard 2 of 2 gave no answer")) << result.err;
    EXPECT_TRUE(contains(result.err, "--partial")) << result.err;
    EXPECT_EQ(1, std::ranges::count(result.err, '\n')) << result.err;
}

TEST_F(KzfpShards, ThatAreLeftAnswerAndSaySo)
{
    fleet_->two.kill9();
    const ProcessResult result = kzfp({"match", "--partial", spread(), clip_on(1), clip_on(2)});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(spread() + ": only 1 of 2 servers answered, and tracks of the others were not looked "
                         "through; start these and look up again\n",
              result.err);
    EXPECT_TRUE(contains(result.out, clip_on(1) + ": " + std::to_string(track_on(1)) + " ("))
        << result.out;
    EXPECT_TRUE(contains(result.out, clip_on(2) + ": no match\n")) << result.out;
}

TEST_F(KzfpShards, ThatAreLeftAreCountedInJson)
{
    fleet_->two.kill9();
    const ProcessResult result =
        kzfp({"match", "--partial", "-f", "json", spread(), clip_on(1), clip_on(2)});
    EXPECT_EQ(1, result.status);
    const auto lines = lines_of(result.out);
    ASSERT_EQ(2u, lines.size()) << result.err;
    EXPECT_EQ("match", lines[0]["verdict"]);
    EXPECT_EQ("no match", lines[1]["verdict"]) << "its track lies on the other shard";
    for (const json& line : lines) {
        EXPECT_EQ(json::parse(R"({"answered": 1, "of": 2})"), line["shards"]) << line;
    }
}

TEST_F(KzfpShards, ThatAreAllBackAnswerAsIfNothingHadBeen)
{
    fleet_->two.kill9();
    EXPECT_EQ(1, kzfp({"match", "--partial", spread(), clip_on(1)}).status);
    fleet_->two.start();
    for (const std::vector<std::string>& options :
         std::vector<std::vector<std::string>>{{"-f", "json"}, {"-f", "csv"}, {}}) {
        std::vector<std::string> words = {"match", "--partial", "--plan", "scan"};
        words.insert(words.end(), options.begin(), options.end());
        std::vector<std::string> words_of_file = words;
        words.insert(words.end(), {spread(), clip_on(1), clip_on(2)});
        words_of_file.insert(words_of_file.end(), {file(), clip_on(1), clip_on(2)});
        EXPECT_EQ(output_of(words_of_file), output_of(words)) << "with no word of it";
    }
}

TEST_F(KzfpShards, HaveTheirPasswordShownNowhereWhenDown)
{
    fleet_->two.kill9();
    std::string url = spread();
    url.insert(url.find('@'), ":secret");
    for (const std::string option : {"--partial", "--no-speeds"}) {
        const ProcessResult result = kzfp({"match", option, url, clip_on(1)});
        EXPECT_EQ(1, result.status);
        EXPECT_FALSE(contains(result.out + result.err, "secret")) << result.err;
        EXPECT_TRUE(contains(result.err, " of 2 ")) << result.err;
    }
}

TEST_F(KzfpShards, AreNotEvaluatedInPart)
{
    const ProcessResult result =
        kzfp({"evaluate", "--partial", "--catalogue", spread(), clip_on(1)});
    EXPECT_EQ(2, result.status);
    EXPECT_TRUE(contains(result.err, "--partial")) << result.err;
}

/// The pipe gives nothing until the test writes to it, so the first worker has that job for sure
/// when it is killed.
TEST_F(KzfpShards, ReceiveTheTrackOfEachJobOnce)
{
    const std::string url = fleet_->coordinator.new_database();
    const std::string name = database_of(url);
    const std::string first = database_of(fleet_->one.new_database());
    const std::string second = database_of(fleet_->two.new_database());
    attach_shards(url, {kzcat::test::shard_address(fleet_->one, first),
                        kzcat::test::shard_address(fleet_->two, second)});
    constexpr int kJobs = kTracks + 1;
    const auto count = [&](const std::string& what) {
        return std::stoi(fleet_->coordinator.sql("SELECT count(*) FROM kzcat." + what, name));
    };
    const auto await = [&](const std::string& state, int wanted) {
        while (count("job WHERE state = '" + state + "'") != wanted) {
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
    };
    const std::string pipe = scratch_->path("pipe.wav");
    ASSERT_EQ(0, ::mkfifo(pipe.c_str(), 0600));
    output_of({"jobs", "add", url, pipe});
    Running killed({"worker", "--jobs", url, "-j", "1"}, scratch_->path("1"), scratch_->path("2"));
    await("running", 1);
    std::vector<std::string> add = {"jobs", "add", url};
    for (uint64_t seed = 1; seed <= kTracks; ++seed) {
        add.push_back(scratch_->path(std::to_string(seed) + ".wav"));
    }
    output_of(add);
    Running other({"worker", "--jobs", url, "-j", "2"}, scratch_->path("3"), scratch_->path("4"));
    await("done", kTracks);
    killed.send(SIGKILL);
    EXPECT_EQ(137, killed.wait());
    await("running", 1); // the other one has it now
    std::ofstream(pipe, std::ios::binary) << wav(piece(50, 6));
    EXPECT_EQ(0, other.wait()) << contents(scratch_->path("4"));
    EXPECT_EQ(kJobs, count("job WHERE state = 'done'"));
    EXPECT_EQ(kJobs, count("track"));
    EXPECT_EQ(kJobs, count("source"));
    EXPECT_EQ(kJobs, count("track JOIN kzcat.job ON track.id = job.track"));
    EXPECT_EQ(0, count("pending"));
    // Each on the shard that the catalogue names, and nowhere else.
    EXPECT_EQ(kJobs, count("trail"));
    EXPECT_EQ(kJobs, count("trail JOIN kzcat.track ON track.id = trail.track AND track.shard = "
                           "trail.shard"));
    EXPECT_LT(0, count("trail WHERE shard = 1"));
    EXPECT_LT(0, count("trail WHERE shard = 2"));
    EXPECT_EQ(url + ": 13 tracks, all whole\n", output_of({"verify", url}));
}

} // namespace
