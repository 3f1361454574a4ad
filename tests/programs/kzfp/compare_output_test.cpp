// `kzfp compare`: its forms of output and exit statuses, and bad inputs.

#include "compare_fixture.hpp"

#include <algorithm>
#include <csignal>
#include <filesystem>

#include "running.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

// ---- Several files and forms of output

TEST_F(Compare, EachOtherFileHasItsLine)
{
    const std::string missing = scratch_->path("missing.wav");
    const ProcessResult result = compared({song_, song_, missing, other_});
    EXPECT_EQ(2, result.status);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(3u, lines.size());
    EXPECT_EQ("same recording", lines[0]["verdict"]);
    EXPECT_EQ("error", lines[1]["verdict"]);
    EXPECT_TRUE(contains(lines[1]["error"], "No such file")) << lines[1];
    EXPECT_EQ("different", lines[2]["verdict"]);
    EXPECT_TRUE(result.err.starts_with(missing + ": ")) << result.err;
}

TEST_F(Compare, AFirstFileThatFailsFailsAllPairs)
{
    const std::string missing = scratch_->path("missing.wav");
    const ProcessResult result = compared({missing, song_, other_});
    EXPECT_EQ(2, result.status);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ("error", lines[1]["verdict"]);
    EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
}

TEST_F(Compare, TextNamesTheVerdictAndTheEvidence)
{
    const ProcessResult result = kzfp({"compare", song_, inner_, other_});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(result.out.starts_with(inner_ + " and " + song_ +
                                       ": related, begins at 0:09.0 of the first"))
        << result.out;
    EXPECT_TRUE(contains(result.out, "\n" + other_ + " and " + song_ + ": different, "))
        << result.out;
}

TEST_F(Compare, CsvHasAFieldForEachColumn)
{
    const ProcessResult result =
        kzfp({"compare", "-f", "csv", song_, inner_, scratch_->path("missing.wav")});
    EXPECT_EQ(2, result.status);
    const std::string header = "first,second,verdict,offset,score,threshold,speed,tempo,pitch,"
                               "agreeing_seconds,bit_error_rate,document_distance,error\n";
    ASSERT_TRUE(result.out.starts_with(header)) << result.out;
    EXPECT_EQ(36, std::count(result.out.begin(), result.out.end(), ',')) << result.out;
    EXPECT_TRUE(contains(result.out, song_ + ',' + inner_ + ",related,9.")) << result.out;
}

TEST_F(Compare, OutputGoesToAFile)
{
    const std::string file = scratch_->path("pairs.json");
    EXPECT_EQ("", output_of({"compare", "-f", "json", "-o", file, song_, song_}));
    EXPECT_EQ("same recording", json::parse(contents(file))["verdict"]);
}

TEST_F(Compare, ReportShowsEveryPair)
{
    const std::string file = scratch_->path("page.html");
    const std::string missing = scratch_->path("missing.wav");
    const ProcessResult result =
        kzfp({"compare", "--report", file, song_, inner_, other_, missing});
    EXPECT_EQ(2, result.status);
    const std::string page = contents(file);
    for (const std::string& text :
         {inner_, other_, missing, std::string("related"), std::string("different"),
          std::string("No such file"), std::string("3 other files")}) {
        EXPECT_TRUE(contains(page, text)) << text;
    }
    size_t pictures = 0;
    for (size_t at = page.find("data:image/png"); at != std::string::npos;
         at = page.find("data:image/png", at + 1)) {
        ++pictures;
    }
    EXPECT_GE(pictures, 3u) << "a spectrogram for each file that was read";
}

TEST_F(Compare, ReportNeverReplacesAnInput)
{
    const std::string copy = write("copy.wav", contents(song_));
    EXPECT_EQ(2, kzfp({"compare", "--report", copy, song_, copy}).status);
    EXPECT_EQ(contents(song_), contents(copy));
}

// The file at hand is finished. Hours of silence take no room on the disk.
TEST_F(Compare, CtrlCEndsItAfterTheFirstFile)
{
    constexpr uint32_t kBytes = 300'000'000;
    const std::string hours = write("hours.wav", wav_header(kPieceRate, 1, kBytes));
    std::filesystem::resize_file(hours, std::filesystem::file_size(hours) + kBytes);
    const std::string out = scratch_->path("out");
    const std::string err = scratch_->path("err");
    Running running({"compare", "-f", "json", hours, song_}, out, err);
    ASSERT_TRUE(running.wait_until_open(hours));
    running.send(SIGINT);
    EXPECT_EQ(130, running.wait());
    EXPECT_EQ("", contents(out));
    EXPECT_EQ("interrupted before " + song_ + "\n", contents(err));
}

// ---- Bad inputs

TEST_F(Compare, RefusesWhatCannotBeReadTwice)
{
    const ProcessResult result = kzfp({"compare", song_, "-"}, fed_with(contents(song_)));
    EXPECT_EQ(2, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_EQ("-: is read several times, so it must be a file; write the sound to one first\n",
              result.err);
}

TEST_F(Compare, EveryBadFileHasItsLine)
{
    const std::string whole = contents(song_);
    const std::string values = output_of({"-f", "values", song_});
    const std::vector<std::string> files = {write("empty.wav", ""),
                                            write("cut.wav", whole.substr(0, 30)),
                                            write("text.wav", "no sound at all"),
                                            scratch_->path(""),
                                            write("cut.kzt", trail_file(piece(1)).substr(0, 40)),
                                            write("cut.xml", "<KZFPX_FP_QUERY>"),
                                            write("two.txt", values + values)};
    std::vector<std::string> arguments = {song_};
    arguments.insert(arguments.end(), files.begin(), files.end());
    const ProcessResult result = compared(arguments);
    EXPECT_EQ(2, result.status);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(files.size(), lines.size()) << result.out;
    for (size_t i = 0; i < files.size(); ++i) {
        EXPECT_EQ(files[i], lines[i]["second"]);
        EXPECT_EQ("error", lines[i]["verdict"]) << lines[i];
        EXPECT_NE("", lines[i]["error"]) << lines[i];
    }
}

TEST_F(Compare, DamagedSoundIsUsedWithAWarning)
{
    const ProcessResult lenient = compared({song_, clip("broken.flac")});
    EXPECT_EQ("too quiet", json::parse(lenient.out)["verdict"]) << "of what is left, 0.9 s";
    EXPECT_TRUE(contains(lenient.err, "damaged")) << lenient.err;
    const ProcessResult strict = compared({"--strict", song_, clip("broken.flac")});
    EXPECT_EQ(2, strict.status);
    EXPECT_EQ("error", json::parse(strict.out)["verdict"]);
}

TEST_F(Compare, OutputThatFailsIsTrouble)
{
    ProcessSetup setup;
    setup.output_file = "/dev/full";
    const ProcessResult full = kzfp({"compare", song_, song_}, setup);
    EXPECT_EQ(2, full.status);
    EXPECT_TRUE(contains(full.err, "No space left")) << full.err;
    ProcessSetup closed;
    closed.close_output_after = 1;
    std::vector<std::string> arguments = {"compare", "-f", "json", inner_};
    arguments.insert(arguments.end(), 200, inner_);
    const ProcessResult left = kzfp(arguments, closed);
    EXPECT_EQ(2, left.status);
    EXPECT_EQ("", left.err);
}

TEST_F(Compare, OneFileIsWrongUsage) { EXPECT_EQ(2, kzfp({"compare", song_}).status); }

} // namespace
