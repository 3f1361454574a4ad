// `kzfp compare`: its verdicts, its exit statuses, its three forms of output, and bad inputs.

#include "kzfp.hpp"

#include <algorithm>
#include <filesystem>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

std::vector<int16_t> joined(std::vector<int16_t> samples, const std::vector<int16_t>& more)
{
    samples.insert(samples.end(), more.begin(), more.end());
    return samples;
}

/// Every sound file is made once; tests only read them.
class Compare : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        song_ = scratch_->write("song.wav", wav(piece(1)));
        other_ = scratch_->write("other.wav", wav(piece(2)));
        inner_ = scratch_->write("inner.wav", wav(part(piece(1), 9, 12)));
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static ProcessResult compared(std::vector<std::string> arguments)
    {
        arguments.insert(arguments.begin(), {"compare", "--format", "json"});
        return kzfp(arguments);
    }

    /// The object of one pair; `status` is what the program ends with.
    static json pair(const std::string& first, const std::string& second, int status)
    {
        const ProcessResult result = compared({first, second});
        EXPECT_EQ(status, result.status) << result.out << result.err;
        const std::vector<json> lines = lines_of(result.out);
        EXPECT_EQ(1u, lines.size()) << result.err;
        return lines.empty() ? json() : lines.front();
    }

    static std::string write(const std::string& name, const std::string& bytes)
    {
        return scratch_->write(name, bytes);
    }

    static ScratchDirectory* scratch_;
    static std::string song_;
    static std::string other_;
    static std::string inner_;
};

ScratchDirectory* Compare::scratch_ = nullptr;
std::string Compare::song_;
std::string Compare::other_;
std::string Compare::inner_;

// ---- Verdicts

TEST_F(Compare, AnotherEncodingIsTheSameRecording)
{
    const json answer = pair(clip("music-44100-stereo-s16.wav"), clip("music.mp3"), 0);
    EXPECT_EQ("same recording", answer["verdict"]);
    EXPECT_NEAR(0, answer["offset"].get<double>(), 0.1);
    EXPECT_GT(answer["agreeing_share"].get<double>(), 0.9);
    EXPECT_LT(answer["bit_error_rate"].get<double>(), 0.1);
    EXPECT_LT(answer["document_distance"].get<double>(), 50);
}

TEST_F(Compare, SilenceBeforeItLeavesARecordingTheSame)
{
    std::vector<int16_t> later(4 * kPieceRate);
    later = joined(later, piece(1));
    const json answer = pair(song_, write("later.wav", wav(later)), 0);
    EXPECT_EQ("same recording", answer["verdict"]);
    EXPECT_NEAR(-4, answer["offset"].get<double>(), 0.1);
}

TEST_F(Compare, ARecordingThatGoesOnOtherwiseStartsTheSame)
{
    const std::string changed =
        write("changed.wav", wav(joined(part(piece(1), 0, 15), part(piece(2), 0, 15))));
    EXPECT_EQ("same start", pair(song_, changed, 1)["verdict"]);
    const std::string beginning = write("beginning.wav", wav(part(piece(1), 0, 12)));
    EXPECT_EQ("same start", pair(song_, beginning, 1)["verdict"]);
}

TEST_F(Compare, AnExcerptIsRelatedWithItsPlace)
{
    const json forth = pair(song_, inner_, 1);
    EXPECT_EQ("related", forth["verdict"]);
    EXPECT_EQ(song_, forth["first"]);
    EXPECT_EQ(inner_, forth["second"]);
    EXPECT_NEAR(9, forth["offset"].get<double>(), 0.05);
    const json back = pair(inner_, song_, 1);
    EXPECT_EQ("related", back["verdict"]);
    EXPECT_NEAR(-9, back["offset"].get<double>(), 0.05);
}

TEST_F(Compare, AnotherSpeedIsRelatedWithItsFactor)
{
    std::string faster = wav(piece(1));
    const uint32_t rate = kPieceRate * 104 / 100;
    for (size_t i = 0; i < 4; ++i) { // the header's rate, at its place since the format was made
        faster[24 + i] = static_cast<char>(rate >> (8 * i));
    }
    const std::string file = write("faster.wav", faster);
    const json forth = pair(song_, file, 1);
    EXPECT_EQ("related", forth["verdict"]);
    EXPECT_NEAR(1.04, forth["speed"].get<double>(), 0.003);
    EXPECT_NEAR(1 / 1.04, pair(file, song_, 1)["speed"].get<double>(), 0.003);
}

TEST_F(Compare, OtherMusicIsDifferent)
{
    const json answer = pair(song_, other_, 1);
    EXPECT_EQ("different", answer["verdict"]);
    EXPECT_TRUE(answer["offset"].is_null());
    EXPECT_TRUE(answer["bit_error_rate"].is_null());
    EXPECT_GT(answer["document_distance"].get<double>(), 100);
}

TEST_F(Compare, SilenceSaysNothing)
{
    const std::string silent = write("silent.wav", wav(std::vector<int16_t>(10 * kPieceRate)));
    EXPECT_EQ("too quiet", pair(song_, silent, 2)["verdict"]);
}

TEST_F(Compare, VerdictsComeWithTheirMeasuredError)
{
    for (const json& answer : {pair(song_, song_, 0), pair(song_, other_, 1)}) {
        EXPECT_GT(answer["measured_error"]["pairs"].get<int>(), 100);
        EXPECT_LT(answer["measured_error"]["wrong"].get<int>(),
                  answer["measured_error"]["pairs"].get<int>() / 20);
    }
    EXPECT_TRUE(contains(kzfp({"compare", song_, song_}).out, " such verdicts w"));
}

// ---- Other forms than sound

TEST_F(Compare, TrailsAreComparedLikeSound)
{
    const std::string trail = write("song.kzt", trail_file(piece(1)));
    EXPECT_EQ("same recording", pair(song_, trail, 0)["verdict"]);
    EXPECT_EQ("related", pair(trail, inner_, 1)["verdict"]);
    const json answer = pair(trail, write("other.kzt", trail_file(piece(2))), 1);
    EXPECT_EQ("different", answer["verdict"]);
    EXPECT_TRUE(answer["document_distance"].is_null());
}

TEST_F(Compare, DocumentsAndValuesSayWhatBeginsAlike)
{
    const std::string document = write("song.xml", output_of({song_}));
    const std::string values = write("song.txt", output_of({"-f", "values", song_}));
    const std::string others = write("other.txt", output_of({"-f", "values", other_}));
    for (const std::string& first : {document, values, song_}) {
        const json answer = pair(first, values, 0);
        EXPECT_EQ("same start", answer["verdict"]) << first;
        EXPECT_EQ("document", answer["by"]) << first;
        EXPECT_EQ(0, answer["document_distance"]) << first;
        EXPECT_EQ("different", pair(first, others, 1)["verdict"]) << first;
    }
}

TEST_F(Compare, ATrailAndADocumentHaveNothingInCommon)
{
    const std::string document = write("song.xml", output_of({song_}));
    const std::string trail = write("song.kzt", trail_file(piece(1)));
    const ProcessResult result = kzfp({"compare", trail, document});
    EXPECT_EQ(2, result.status);
    EXPECT_TRUE(contains(result.err, document + ": has nothing that can be compared"))
        << result.err;
    EXPECT_TRUE(contains(result.err, "compare the sound files")) << result.err;
}

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
