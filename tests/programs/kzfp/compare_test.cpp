// `kzfp compare`: its verdicts, and what they are of.

#include "compare_fixture.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

std::vector<int16_t> joined(std::vector<int16_t> samples, const std::vector<int16_t>& more)
{
    samples.insert(samples.end(), more.begin(), more.end());
    return samples;
}

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

} // namespace
