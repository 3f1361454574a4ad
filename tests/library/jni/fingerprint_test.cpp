// One job, with everything below it scripted.

#include "kzsdk/jni/fingerprint.hpp"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "platform_probe.hpp"
#include "scripted_core.hpp"

namespace {

using namespace kz::test;
using android::Fingerprint;
using android::KZWaveFileEncoding;
using Calls = std::vector<std::string>;

constexpr char kTag[] = "Fingerprint - Native";

/// 600 bytes with a mark behind them.
class TextBuffer {
public:
    TextBuffer() { bytes_.fill('\0'); }
    char** address() { return &start_; }
    std::string text() const { return {bytes_.data(), strnlen(bytes_.data(), 600)}; }
    bool is_intact() const { return bytes_[600] == '\0' && bytes_[601] == '\0'; }

private:
    std::array<char, 602> bytes_;
    char* start_ = bytes_.data();
};

class Job : public ::testing::Test {
protected:
    void SetUp() override
    {
        script() = {};
        configure();
    }
    // The core flag belongs to the process.
    void TearDown() override
    {
        script() = {};
        job_.do_kill_vesk();
    }

    void configure(int32_t format_code = 1, int32_t bits = 16)
    {
        job_.setGenerateConfig(44100, 2, format_code, bits, audio_.data(), 8);
    }

    /// Runs the job, which fails with this one log line or, with null, without one.
    void expect_failure(const char* message)
    {
        const CapturedLog captured;
        TextBuffer buffer;
        EXPECT_EQ(-5, job_.generate(buffer.address()));
        EXPECT_EQ("", buffer.text());
        EXPECT_EQ(message != nullptr ? (LogLines{{6, kTag, message}}) : LogLines{},
                  captured.lines());
        EXPECT_EQ(0, script().texts_out);
    }

    static constexpr std::array<uint8_t, 8> audio_ = {'s', 'a', 'm', 'p', 'l', 'e', 's', '!'};
    Fingerprint job_;
};

TEST(JobEncoding, IsTranslatedFromTheWaveFormatCode)
{
    const auto translate = Fingerprint::translateWaveFormatCode;
    const std::array<KZWaveFileEncoding, 12> by_number = {
        translate(0, 16), translate(1, 8),  translate(1, 16), translate(7, 8),
        translate(6, 8),  translate(2, 4),  translate(17, 4), translate(20, 4),
        translate(49, 0), translate(64, 4), translate(80, 0), translate(3, 32),
    };
    for (size_t i = 0; i < by_number.size(); ++i) {
        EXPECT_EQ(static_cast<int32_t>(i), static_cast<int32_t>(by_number[i]));
    }
}

KZWaveFileEncoding pcm(uint32_t bits)
{
    return Fingerprint::translateWaveFormatCode(1, static_cast<uint16_t>(bits));
}

TEST(JobEncoding, IsEightBitBelowNineBitsAndSixteenBitFromThere)
{
    for (const uint32_t bits : {0U, 1U, 8U}) {
        EXPECT_EQ(KZWaveFileEncoding::Pcm8, pcm(bits)) << bits;
    }
    for (const uint32_t bits : {9U, 16U, 24U, 32U, 65535U}) {
        EXPECT_EQ(KZWaveFileEncoding::Pcm16, pcm(bits)) << bits;
    }
}

TEST(JobEncoding, IsUnknownForEveryCodeThatIsNotListed)
{
    const std::vector<int> listed = {1, 2, 3, 6, 7, 17, 20, 49, 64, 80};
    for (int code = 0; code <= 65535; ++code) {
        const bool is_listed = std::find(listed.begin(), listed.end(), code) != listed.end();
        EXPECT_EQ(is_listed, Fingerprint::translateWaveFormatCode(
                                 static_cast<uint16_t>(code), 16) != KZWaveFileEncoding::Unknown)
            << code;
    }
}

TEST(JobEncoding, HasAName)
{
    const std::array<std::string, 12> names = {
        "UNKNOWN",  "8-bit PCM",       "16-bit PCM", "uLAW",
        "ALAW",     "Microsoft ADPCM", "IMA ADPCM",  "ITU G.723 ADPCM (Yamaha)",
        "GSM 6.10", "ITU G.721 ADPCM", "MPEG",       "IEEE float",
    };
    for (size_t i = 0; i < names.size(); ++i) {
        EXPECT_EQ(names[i], Fingerprint::getEncodingString(static_cast<KZWaveFileEncoding>(i)));
    }
    for (const int32_t other : {-1, 12, std::numeric_limits<int32_t>::max()}) {
        EXPECT_STREQ("UNKNOWN",
                     Fingerprint::getEncodingString(static_cast<KZWaveFileEncoding>(other)));
    }
}

TEST_F(Job, PassesItsConfigurationToTheExtraction)
{
    TextBuffer buffer;
    EXPECT_EQ(0, job_.generate(buffer.address()));
    EXPECT_EQ("<text/>", buffer.text());
    EXPECT_EQ(1U, script().algorithm);
    EXPECT_EQ(44100U, script().rate);
    EXPECT_EQ(2U, script().channels);
    EXPECT_EQ("samples!", script().audio);
    EXPECT_EQ((Calls{"configure", "start", "create", "add audio", "serialize", "free"}),
              script().calls);
    EXPECT_EQ(0, script().texts_out);
}

TEST_F(Job, MapsEncodingsToInputFormats)
{
    struct Case {
        int32_t code, bits;
        uint32_t format;
    };
    for (const Case& one : {Case{1, 8, 1}, {1, 16, 2}, {1, 24, 2}, {6, 8, 3}, {7, 8, 4}}) {
        configure(one.code, one.bits);
        TextBuffer buffer;
        EXPECT_EQ(0, job_.generate(buffer.address()));
        EXPECT_EQ(one.format, script().format) << one.code;
    }
}

TEST_F(Job, ReadsOnlyTheLowSixteenBitsOfFormatAndBits)
{
    configure(0x7fff0001, static_cast<int32_t>(0xabcd0008));
    TextBuffer buffer;
    EXPECT_EQ(0, job_.generate(buffer.address()));
    EXPECT_EQ(1U, script().format);
}

TEST_F(Job, RefusesOtherEncodingsWithoutAWord)
{
    for (const int32_t code : {0, 2, 3, 17, 20, 49, 64, 80, 85, 0xfffe}) {
        script().calls.clear();
        configure(code, 16);
        expect_failure(nullptr);
        EXPECT_EQ(0, std::count(script().calls.begin(), script().calls.end(), "create")) << code;
        unsigned char* serialized = nullptr;
        EXPECT_EQ(KZ_FPX_ERROR_NO_INPUT_FORMAT, job_.fpx_generate_fingerprint(&serialized));
        EXPECT_EQ(nullptr, serialized);
    }
}

TEST_F(Job, NamesAnEmptyBufferInTheLog)
{
    job_.setGenerateConfig(44100, 2, 1, 16, audio_.data(), 0);
    expect_failure("audio_buffer is null or audio_buffer_len is 0.");
    job_.setGenerateConfig(44100, 2, 1, 16, nullptr, 8);
    expect_failure("audio_buffer is null or audio_buffer_len is 0.");
    EXPECT_EQ((Calls{"configure", "start"}), script().calls);
    unsigned char* serialized = nullptr;
    EXPECT_EQ(KZ_OK, job_.fpx_generate_fingerprint(&serialized)) << "success without a text";
}

// The encoding is checked before the buffer.
TEST_F(Job, RefusesAnEncodingBeforeItLooksAtTheBuffer)
{
    job_.setGenerateConfig(44100, 2, 3, 16, nullptr, 0);
    expect_failure(nullptr);
}

TEST_F(Job, ThatWasNeverConfiguredFails)
{
    TextBuffer buffer;
    EXPECT_EQ(-5, Fingerprint().generate(buffer.address()));
    EXPECT_EQ((Calls{"configure", "start"}), script().calls);
}

TEST_F(Job, LogsAFailedCreateAndFreesNothing)
{
    script().create = KZ_QV_ERROR_INVALID_ARGUMENT;
    expect_failure("kz_fpx_fingerprint_create() failed. error=900F0004");
    EXPECT_EQ("create", script().calls.back());
}

TEST_F(Job, LogsAudioThatIsRefusedAndFreesTheHandle)
{
    script().add_audio = KZ_QV_ERROR_INVALID_ARGUMENT;
    expect_failure("kz_fpx_fingerprint_add_audio() failed error=900F0004");
    EXPECT_EQ("free", script().calls.back());
    unsigned char* serialized = nullptr;
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, job_.fpx_generate_fingerprint(&serialized));
}

TEST_F(Job, DoesNotLogOrSerializeTooLittleAudio)
{
    script().complete = 0;
    expect_failure(nullptr);
    EXPECT_EQ((Calls{"configure", "start", "create", "add audio", "free"}), script().calls);
    unsigned char* serialized = nullptr;
    EXPECT_EQ(KZ_FPX_ERROR_NOT_ENOUGH_AUDIO, job_.fpx_generate_fingerprint(&serialized));
}

TEST_F(Job, LogsAFailedSerialisationAndFreesTheHandle)
{
    script().serialize = KZ_FPX_ERROR_RENDER;
    expect_failure("kz_fpx_fingerprint_serialize() failed error=9008000B");
    EXPECT_EQ("free", script().calls.back());
}

TEST_F(Job, LogsZeroForTheStatusOfAFailedFree)
{
    script().free = KZ_QV_ERROR_INVALID_ARGUMENT;
    expect_failure("kz_fpx_fingerprint_free() failed error =0");
    unsigned char* serialized = nullptr;
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, job_.fpx_generate_fingerprint(&serialized));
    std::free(serialized);
    --script().texts_out;
}

TEST_F(Job, DropsAFailedFreeAfterAnEarlierFailure)
{
    script().free = KZ_QV_ERROR_INVALID_ARGUMENT;
    script().add_audio = KZ_QV_ERROR_EMPTY;
    expect_failure("kz_fpx_fingerprint_add_audio() failed error=900F0009");
    unsigned char* serialized = nullptr;
    EXPECT_EQ(KZ_QV_ERROR_EMPTY, job_.fpx_generate_fingerprint(&serialized));
}

TEST_F(Job, SucceedsThoughTheTextCannotBeFreed)
{
    script().serialize_free = KZ_FPX_ERROR_INVALID_ARGUMENT;
    const CapturedLog captured;
    TextBuffer buffer;
    EXPECT_EQ(0, job_.generate(buffer.address()));
    EXPECT_EQ("<text/>", buffer.text());
    EXPECT_EQ((LogLines{{6, kTag, "kz_fpx_fingerprint_serialize_free() failed"}}),
              captured.lines());
}

TEST_F(Job, WritesNothingBehindAText)
{
    for (const size_t length : {0U, 1U, 599U, 600U}) {
        script().text = std::string(length, 'x');
        const CapturedLog captured;
        TextBuffer buffer;
        EXPECT_EQ(0, job_.generate(buffer.address()));
        EXPECT_EQ(script().text, buffer.text());
        EXPECT_TRUE(buffer.is_intact());
        EXPECT_EQ(LogLines{}, captured.lines()) << length;
    }
}

TEST_F(Job, FillsTheBufferWith600BytesAndNoTerminator)
{
    script().text = std::string(600, 'x');
    std::array<char, 601> bytes;
    bytes.fill('#');
    char* start = bytes.data();
    EXPECT_EQ(0, job_.generate(&start));
    EXPECT_EQ(std::string(600, 'x') + "#", std::string(bytes.data(), 601));
}

TEST_F(Job, CutsALongerTextAndSaysSo)
{
    script().text = std::string(600, 'x') + "y";
    const CapturedLog captured;
    TextBuffer buffer;
    EXPECT_EQ(0, job_.generate(buffer.address()));
    EXPECT_EQ(std::string(600, 'x'), buffer.text());
    EXPECT_TRUE(buffer.is_intact());
    EXPECT_EQ((LogLines{{6, kTag, "strlen((const char*)serialized_fingerprint > buffer "}}),
              captured.lines());
}

TEST_F(Job, StartsTheCoreOnceForAllJobsOfTheProcess)
{
    TextBuffer buffer;
    EXPECT_EQ(0, job_.generate(buffer.address()));
    script().calls.clear();
    Fingerprint other;
    other.setGenerateConfig(8000, 1, 1, 16, audio_.data(), 8);
    EXPECT_EQ(0, other.generate(buffer.address()));
    EXPECT_EQ((Calls{"create", "add audio", "serialize", "free"}), script().calls);
}

TEST_F(Job, RestartsTheCoreOnceWhenTheStartFails)
{
    script().starts = {KZ_INIT_ERROR_NO_RECORD};
    const CapturedLog captured;
    TextBuffer buffer;
    EXPECT_EQ(0, job_.generate(buffer.address()));
    EXPECT_EQ((Calls{"configure", "start", "shut down", "configure", "start", "create", "add audio",
                     "serialize", "free"}),
              script().calls);
    EXPECT_EQ((LogLines{{6, kTag, "Error 90050990 occurred while initializing \n"}}),
              captured.lines());
}

TEST_F(Job, FailsWhenTheSecondStartFailsToo)
{
    script().starts = {KZ_INIT_ERROR_NO_RECORD, KZ_MEM_ALREADY_ON};
    const CapturedLog captured;
    TextBuffer buffer;
    EXPECT_EQ(-5, job_.generate(buffer.address()));
    EXPECT_EQ((Calls{"configure", "start", "shut down", "configure", "start"}), script().calls);
    EXPECT_EQ((LogLines{{6, kTag, "Error 90050990 occurred while initializing \n"},
                        {6, kTag, "Error 90040005 occurred while initializing \n"}}),
              captured.lines());
}

TEST_F(Job, LogsZeroForTheStatusOfAFailedConfiguration)
{
    script().configuration = KZ_ERROR_INVALID_ARGUMENT;
    const CapturedLog captured;
    TextBuffer buffer;
    EXPECT_EQ(-5, job_.generate(buffer.address()));
    const LogLine line = {6, kTag, "Error 0 occurred while initializing the config structure.\n"};
    EXPECT_EQ((LogLines{line, line}), captured.lines());
}

TEST_F(Job, ShutsDownOnlyACoreThatThisFrontHasStarted)
{
    job_.do_kill_vesk();
    EXPECT_EQ(Calls{}, script().calls);
    EXPECT_EQ(0, job_.do_init_vesk());
    job_.do_kill_vesk();
    job_.do_kill_vesk();
    EXPECT_EQ((Calls{"configure", "start", "shut down"}), script().calls);
}

} // namespace
