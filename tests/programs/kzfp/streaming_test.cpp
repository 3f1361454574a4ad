// Audio is fed piece by piece and no further than needed, and nothing of that shows in the result.

#include "kzfp.hpp"

#include <cstring>
#include <memory>
#include <vector>

#include <sndfile.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "kzsdk/abs/startup.h"
#include "kzsdk/fpx/fpx.h"
#include "support/signals.hpp"

namespace {

using namespace kz::test;

struct Audio {
    uint32_t format = KZ_FPX_FORMAT_PCM16;
    uint32_t rate = 0;
    uint32_t channels = 0;
    std::string bytes;
    uint32_t algorithm = KZ_FPX_ALGORITHM_FIXED;
};

/// The document that the library gives for a whole buffer in one call; empty when it is incomplete.
std::string document_of_one_call(const Audio& audio)
{
    kzconf_configuration configuration;
    kzconf_initialize_configuration(&configuration);
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&configuration));
    kz_fpx_handle* handle = nullptr;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_create(audio.algorithm, audio.format, audio.rate,
                                               audio.channels, &handle));
    uint8_t complete = 0;
    EXPECT_EQ(KZ_OK,
              kz_fpx_fingerprint_add_audio(handle, audio.bytes.data(),
                                           static_cast<uint32_t>(audio.bytes.size()), &complete));
    std::string document;
    if (complete != 0) {
        char* text = nullptr;
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize(handle, &text));
        document = text;
        kz_fpx_fingerprint_serialize_free(&text);
        if (!document.ends_with('\n')) {
            document += '\n';
        }
    }
    kz_fpx_fingerprint_free(&handle);
    kzinit_shutdown_vesk();
    return document;
}

/// A whole file as its own words: 16-bit samples or companded bytes.
Audio read_all(const std::string& path)
{
    SF_INFO info = {};
    SNDFILE* file = sf_open(path.c_str(), SFM_READ, &info);
    EXPECT_NE(nullptr, file) << path;
    Audio audio;
    audio.rate = static_cast<uint32_t>(info.samplerate);
    audio.channels = static_cast<uint32_t>(info.channels);
    const int coding = info.format & SF_FORMAT_SUBMASK;
    const auto samples = static_cast<size_t>(info.frames) * audio.channels;
    if (coding == SF_FORMAT_PCM_16) {
        std::vector<int16_t> words(samples);
        sf_read_short(file, words.data(), static_cast<sf_count_t>(samples));
        audio.bytes.resize(samples * 2);
        std::memcpy(audio.bytes.data(), words.data(), audio.bytes.size());
    } else {
        audio.format = coding == SF_FORMAT_ALAW ? KZ_FPX_FORMAT_ALAW : KZ_FPX_FORMAT_ULAW;
        audio.bytes.resize(samples);
        sf_read_raw(file, audio.bytes.data(), static_cast<sf_count_t>(samples));
    }
    sf_close(file);
    return audio;
}

std::string bytes_of(const std::vector<int16_t>& words)
{
    std::string bytes(words.size() * 2, '\0');
    std::memcpy(bytes.data(), words.data(), bytes.size());
    return bytes;
}

/// Standard input that gives `beginning`, then `repeated` until `total` bytes are given.
ProcessSetup endless(const std::string& beginning, const std::string& repeated, uint64_t total)
{
    ProcessSetup setup;
    setup.input = [=, given = uint64_t{0}]() mutable -> std::string_view {
        const std::string_view next = given == 0 ? beginning : repeated;
        if (given >= total) {
            return {};
        }
        given += next.size();
        return next;
    };
    return setup;
}

constexpr uint64_t kTwoHoursAt44100 = uint64_t{7200} * 44100 * 4;
// What a default fingerprint takes, and a tenth of a second for the blocks in which a pipe is read.
constexpr uint64_t kNeededAt44100 = (KZ_FPX_MILLISECONDS_NEEDED + 100) * 441 / 10 * 4;
constexpr uint64_t kPipe = 65536; ///< what fits into a pipe without being read

TEST(KzfpStreaming, EveryRateAndEncodingGivesTheDocumentOfOneCall)
{
    for (const char* rate :
         {"8000", "11025", "16000", "22050", "24000", "32000", "44100", "48000"}) {
        for (const char* kind : {"-mono-s16", "-stereo-s16", "-mono-alaw", "-stereo-ulaw"}) {
            const std::string file = clip(std::string("music-") + rate + kind + ".wav");
            EXPECT_EQ(document_of_one_call(read_all(file)), output_of({file})) << file;
        }
    }
}

TEST(KzfpStreaming, LeadingSilenceGivesTheDocumentOfOneCall)
{
    for (const char* rate : {"8000", "22050", "44100", "48000"}) {
        for (const char* channels : {"-mono", "-stereo"}) {
            const std::string file = clip(std::string("late-") + rate + channels + ".wav");
            EXPECT_EQ(document_of_one_call(read_all(file)), output_of({file})) << file;
        }
    }
}

TEST(KzfpStreaming, TheFloatAlgorithmGivesTheDocumentOfOneCall)
{
    for (const char* name : {"music-8000-mono-s16", "late-48000-stereo", "music-44100-stereo-ulaw",
                             "music-96000", "music-37800"}) {
        const std::string file = clip(std::string(name) + ".wav");
        Audio audio = read_all(file);
        audio.algorithm = KZ_FPX_ALGORITHM_FLOAT;
        EXPECT_EQ(document_of_one_call(audio), output_of({"--algorithm", "float", file})) << file;
    }
}

// Where the sound begins within a piece, and how softly, must not matter.
TEST(KzfpStreaming, SilenceOfAnyLengthGivesTheDocumentOfOneCall)
{
    Random random(20);
    for (const uint32_t rate : {8000u, 11025u, 16000u, 22050u, 24000u, 32000u, 44100u, 48000u}) {
        for (int run = 0; run < 2; ++run) {
            const uint32_t channels = 1 + random.below(2);
            std::vector<int16_t> words(size_t{random.below(12 * rate)} * channels, 0);
            const double level = random.below(2) == 0 ? 0.5 : 0.02;
            const auto music = tune(rate, channels, 17, level, random.next());
            words.insert(words.end(), music.begin(), music.end());
            const Audio audio = {.rate = rate, .channels = channels, .bytes = bytes_of(words)};
            const std::string format =
                std::to_string(rate) + "," + std::to_string(channels) + ",s16";
            const ProcessResult result = kzfp({"--raw", format, "-"}, fed_with(audio.bytes));
            EXPECT_EQ(0, result.status) << result.err;
            EXPECT_EQ(document_of_one_call(audio), result.out) << format << ", run " << run;
        }
    }
}

/// The fewest frames of mono 16-bit sound that one call makes a fingerprint of.
size_t fewest_frames(const Audio& audio)
{
    const auto complete = [&](size_t frames) {
        Audio beginning = audio;
        beginning.bytes.resize(2 * frames);
        return !document_of_one_call(beginning).empty();
    };
    size_t enough = size_t{16} * audio.rate;
    size_t too_few = size_t{14} * audio.rate;
    EXPECT_TRUE(complete(enough));
    EXPECT_FALSE(complete(too_few));
    while (enough - too_few > 1) {
        const size_t middle = (enough + too_few) / 2;
        (complete(middle) ? enough : too_few) = middle;
    }
    return enough;
}

// The shortest stream that is enough for one call is enough for the program, and one frame less is
// too little for both.
TEST(KzfpStreaming, NeedsNotOneFrameMoreThanOneCall)
{
    for (const uint32_t rate : {8000u, 11025u, 22050u, 44100u, 48000u}) {
        const std::string all = bytes_of(tune(rate, 1, 16));
        const size_t enough = fewest_frames({.rate = rate, .channels = 1, .bytes = all});
        const std::string format = std::to_string(rate) + ",1,s16";
        EXPECT_EQ(0, kzfp({"--raw", format, "-"}, fed_with(all.substr(0, 2 * enough))).status);
        const ProcessResult refused =
            kzfp({"--raw", format, "-"}, fed_with(all.substr(0, 2 * enough - 2)));
        EXPECT_EQ(1, refused.status);
        EXPECT_EQ("standard input: 14.21 s of sound, 14.22 s needed\n", refused.err) << rate;
    }
}

// The slowest rate that the program takes, at which the resampler looks furthest ahead.
TEST(KzfpStreaming, WhatIsTooShortNeverLooksLongEnough)
{
    const std::string all = bytes_of(tune(1000, 1, 16));
    const size_t enough = fewest_frames(
        {.rate = 1000, .channels = 1, .bytes = all, .algorithm = KZ_FPX_ALGORITHM_FLOAT});
    const ProcessResult refused = kzfp({"--algorithm", "float", "--raw", "1000,1,s16", "-"},
                                       fed_with(all.substr(0, 2 * enough - 2)));
    EXPECT_EQ("standard input: 14.21 s of sound, 14.22 s needed\n", refused.err);
}

TEST(KzfpStreaming, OfTwoRawHoursOnlyTheFirstSecondsAreRead)
{
    const std::string minute = bytes_of(tune(44100, 2, 20));
    const ProcessResult result =
        kzfp({"--raw", "44100,2,s16", "-"}, endless(minute, minute, kTwoHoursAt44100));
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_LT(result.bytes_fed, kNeededAt44100 + kPipe);
}

// Of a sound file in a pipe no more is taken than twice what is needed.
TEST(KzfpStreaming, TwoHoursOfAWavPipeAreReadForTheirFirstSeconds)
{
    const std::string piece = bytes_of(tune(44100, 2, 20));
    const std::string header = wav_header(44100, 2, static_cast<uint32_t>(kTwoHoursAt44100));
    const ProcessResult result = kzfp({"-"}, endless(header + piece, piece, kTwoHoursAt44100));
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_LT(result.bytes_fed, 2 * kNeededAt44100 + kPipe);
    const ScratchDirectory directory;
    const auto size = static_cast<uint32_t>(piece.size());
    EXPECT_EQ(output_of({directory.write("piece.wav", wav_header(44100, 2, size) + piece)}),
              result.out);
}

// Writers to which the length is unknown leave one of these in the header.
TEST(KzfpStreaming, WavPipesOfUnknownLengthAreRead)
{
    const std::string samples = bytes_of(tune(22050, 1, 16));
    const ScratchDirectory directory;
    const auto size = static_cast<uint32_t>(samples.size());
    const std::string expected =
        output_of({directory.write("known.wav", wav_header(22050, 1, size) + samples)});
    for (const uint32_t claimed : {0xffffffffu - 36, 0x7ffff000u, 0x7fffffffu}) {
        EXPECT_EQ(expected, kzfp({"-"}, fed_with(wav_header(22050, 1, claimed) + samples)).out)
            << claimed;
    }
}

// Far beyond what is waited for when the beginning of a pipe is not a sound file.
TEST(KzfpStreaming, StartFarIntoAPipeIsReached)
{
    const std::string piece = bytes_of(tune(44100, 2, 20));
    const std::string header = wav_header(44100, 2, static_cast<uint32_t>(kTwoHoursAt44100));
    const ProcessResult result =
        kzfp({"--start", "400", "-"}, endless(header + piece, piece, kTwoHoursAt44100));
    EXPECT_EQ(0, result.status) << result.err;
    const ScratchDirectory directory;
    const auto size = static_cast<uint32_t>(piece.size());
    EXPECT_EQ(output_of({directory.write("piece.wav", wav_header(44100, 2, size) + piece)}),
              result.out);
}

TEST(KzfpStreaming, WhatIsNotASoundFileIsNotReadForEver)
{
    const std::string words(1 << 20, 'w');
    const ProcessResult result = kzfp({"-"}, endless(words, words, uint64_t{1} << 30));
    EXPECT_EQ(1, result.status);
    EXPECT_LE(result.bytes_fed, (uint64_t{1} << 26) + kPipe);
}

// The measured peak is never below that of this test itself, which therefore stays small.
TEST(KzfpStreaming, MemoryDoesNotGrowWithTheLengthOfTheInput)
{
    const std::string second(16000, '\0');
    const ScratchDirectory directory;
    const uint64_t two_hours = 7200 * second.size();
    const auto write = [&](const std::string& name, uint64_t size) {
        const std::string file =
            directory.write(name, wav_header(8000, 1, static_cast<uint32_t>(size)));
        EXPECT_EQ(0, ::truncate(file.c_str(), static_cast<off_t>(44 + size)));
        return file;
    };
    // The address sanitizer keeps what was freed: little enough of it to see what is not freed.
    const auto measured = [](ProcessSetup setup) {
        setup.environment.emplace_back("ASAN_OPTIONS=quarantine_size_mb=1");
        return setup;
    };
    const ProcessResult brief = kzfp({write("brief.wav", 20 * second.size())}, measured({}));
    const ProcessResult file = kzfp({write("long.wav", two_hours)}, measured({}));
    const ProcessResult raw =
        kzfp({"--raw", "8000,1,s16", "-"}, measured(endless(second, second, two_hours)));
    EXPECT_EQ("standard input: nothing but silence in 7200.0 s, 14.22 s needed\n", raw.err);
    EXPECT_LT(file.peak_kibibytes, brief.peak_kibibytes + 8192);
    EXPECT_LT(raw.peak_kibibytes, brief.peak_kibibytes + 8192);
    // A quarter of that through a pipe, which is gone through again with each doubling.
    const std::string header = wav_header(8000, 1, static_cast<uint32_t>(two_hours / 4));
    const ProcessResult piped =
        kzfp({"-"}, measured(endless(header + second, second, two_hours / 4)));
    EXPECT_LT(piped.peak_kibibytes, brief.peak_kibibytes + 8192);
}

} // namespace
