// The program as a user sees it: what it prints, what it refuses and how it reports that.

#include "kzfp.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "kzsdk/abs/version.h"
#include "support/signals.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

const std::string kMusic = clip("music-44100-stereo-s16.wav");

size_t lines_in(const std::string& text)
{
    return static_cast<size_t>(std::count(text.begin(), text.end(), '\n'));
}

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

/// The numbers between the tags of the block element.
std::vector<int> document_numbers(const std::string& document)
{
    const size_t element = document.find("<FP_BLOCK ");
    const size_t start = document.find('>', element) + 1;
    return numbers_in(document.substr(start, document.find('<', start) - start));
}

/// The file is refused with status 1, no output, and this one line.
void expect_refused(const std::vector<std::string>& arguments, const std::string& line,
                    const ProcessSetup& setup = {})
{
    const ProcessResult result = kzfp(arguments, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_EQ(line + "\n", result.err);
}

void expect_wrong_usage(const std::vector<std::string>& arguments, const std::string& part)
{
    const ProcessResult result = kzfp(arguments);
    EXPECT_EQ(2, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, part)) << result.err;
}

TEST(KzfpOutput, IsTheQueryDocumentUnlessSaidOtherwise)
{
    const std::string document = output_of({kMusic});
    EXPECT_TRUE(document.starts_with("<?xml")) << document;
    EXPECT_TRUE(contains(document, "<KZFPX_FP_QUERY VERSION=\"1.0\">")) << document;
    EXPECT_TRUE(document.ends_with("</KZFPX_FP_QUERY>\n")) << document;
    EXPECT_EQ(30u, document_numbers(document).size());
    EXPECT_EQ(document, output_of({"--format", "document", kMusic}));
}

TEST(KzfpOutput, ValuesAreThoseOfTheDocumentAsSignedNumbers)
{
    std::vector<int> expected = document_numbers(output_of({kMusic}));
    for (int& value : expected) {
        value = value > 32767 ? value - 65536 : value;
    }
    const std::string line = output_of({"--format", "values", kMusic});
    EXPECT_EQ(1u, lines_in(line));
    EXPECT_EQ(expected, numbers_in(line));
}

TEST(KzfpOutput, JsonTellsTheFileItsFormatAndTheSilenceSkipped)
{
    const std::string file = clip("late-44100-mono.wav");
    const json object = json::parse(output_of({"--format", "json", file}));
    EXPECT_EQ(file, object["file"]);
    EXPECT_EQ("fixed", object["algorithm"]);
    EXPECT_NEAR(27.3, object["duration"].get<double>(), 0.001);
    EXPECT_EQ(44100, object["sample_rate"]);
    EXPECT_EQ(1, object["channels"]);
    EXPECT_EQ(values_of({file}), object["values"].get<std::vector<int>>());
    // The search goes back by half its window; the music itself may begin softly.
    const double seconds = object["signal_offset_seconds"];
    EXPECT_GT(seconds, 7.2);
    EXPECT_LT(seconds, 7.6);
    EXPECT_NEAR(seconds * 11025, object["signal_offset_samples"].get<double>(), 0.1);
    EXPECT_EQ(11025, object["signal_offset_rate"]);
}

TEST(KzfpOutput, JsonIsOneLinePerFile)
{
    const std::string out = output_of({"--format", "json", kMusic, clip("speech.wav")});
    ASSERT_EQ(2u, lines_in(out));
    const size_t middle = out.find('\n');
    EXPECT_EQ(kMusic, json::parse(out.substr(0, middle))["file"]);
    EXPECT_EQ(clip("speech.wav"), json::parse(out.substr(middle))["file"]);
}

TEST(KzfpOutput, JsonStaysJsonWhateverTheNameOfTheFile)
{
    const ScratchDirectory directory;
    const std::string file = directory.write("quote\" \xff.wav", contents(kMusic));
    const ProcessResult result = kzfp({"--format", "json", file});
    EXPECT_EQ(0, result.status);
    EXPECT_TRUE(json::accept(result.out)) << result.out;
}

TEST(KzfpOutput, SeveralFilesFollowEachOtherInTheOrderGiven)
{
    EXPECT_EQ(output_of({"-f", "values", clip("tone.wav")}) + output_of({"-f", "values", kMusic}),
              output_of({"-f", "values", clip("tone.wav"), kMusic}));
}

TEST(KzfpOutput, IsTheSameEveryTime)
{
    EXPECT_EQ(output_of({clip("music.mp3")}), output_of({clip("music.mp3")}));
}

// Lossless containers of the same 16-bit samples, the floating-point ones included.
TEST(KzfpInput, LosslessFormatsGiveTheSameDocument)
{
    const std::string expected = output_of({kMusic});
    for (const char* name :
         {"music.flac", "music.aiff", "music-24bit.wav", "music-float.wav", "music-double.wav"}) {
        EXPECT_EQ(expected, output_of({clip(name)})) << name;
    }
}

TEST(KzfpInput, LossyFormatsAreRead)
{
    for (const char* name : {"music.ogg", "music.mp3"}) {
        EXPECT_EQ(30u, values_of({clip(name)}).size()) << name;
    }
}

TEST(KzfpInput, CompandedFilesGoToTheLibraryAsTheyAre)
{
    EXPECT_EQ(output_of({"--raw", "8000,2,alaw", clip("music-8000-stereo.alaw")}),
              output_of({clip("music-8000-stereo-alaw.wav")}));
    EXPECT_EQ(output_of({"--raw", "8000,1,ulaw", clip("music-8000-mono.ulaw")}),
              output_of({clip("music-8000-mono-ulaw.wav")}));
    EXPECT_EQ(output_of({clip("music-8000-mono-ulaw.wav")}), output_of({clip("music-ulaw.au")}));
}

// The library's own 8-bit input folds the lower half of the waveform up.
TEST(KzfpInput, EightBitFilesAreWidenedUnlessAskedOtherwise)
{
    const std::vector<int> reference = values_of({clip("music-22050-mono-s16.wav")});
    const auto distance = [&reference](const std::vector<int>& values) {
        int largest = 0;
        for (size_t i = 0; i < reference.size(); ++i) {
            largest = std::max(largest, std::abs(values.at(i) - reference[i]));
        }
        return largest;
    };
    const int widened = distance(values_of({clip("music-8bit.wav")}));
    const int as_it_is = distance(values_of({"--raw", "22050,1,u8", clip("music-22050-mono.u8")}));
    EXPECT_LT(widened, 500);
    EXPECT_GT(as_it_is, 4 * widened);
}

TEST(KzfpInput, ManyChannelsAreMixedDownToOne)
{
    // Two pairs of the same two channels: the average of all is the average of the two.
    const std::vector<int> mono = values_of({clip("music-44100-mono-s16.wav")});
    const std::vector<int> four = values_of({clip("music-4-channels.wav")});
    const std::vector<int> six = values_of({clip("music-6-channels.wav")});
    for (size_t i = 0; i < mono.size(); ++i) {
        EXPECT_NEAR(mono[i], four.at(i), 8) << "value " << i;
        EXPECT_NEAR(mono[i], six.at(i), 40) << "value " << i; // at three quarters of the level
    }
}

// At full scale, where a sum that is not divided enough wraps.
TEST(KzfpInput, ManyChannelsAreDividedByTheNextPowerOfTwo)
{
    const std::vector<int16_t> music = tune(44100, 1, 15, 1.0);
    const ScratchDirectory directory;
    const auto wav = [&directory](const std::vector<int16_t>& words, uint32_t channels) {
        const std::string bytes(reinterpret_cast<const char*>(words.data()), words.size() * 2);
        const auto size = static_cast<uint32_t>(bytes.size());
        return directory.write("many.wav", wav_header(44100, channels, size) + bytes);
    };
    for (const uint32_t channels : {3u, 4u, 5u, 8u}) {
        std::vector<int16_t> many;
        std::vector<int16_t> one;
        const auto divisor = static_cast<int>(std::bit_ceil(channels));
        for (const int16_t word : music) {
            many.insert(many.end(), channels, word);
            const double mixed = static_cast<double>(word) * channels / divisor;
            one.push_back(static_cast<int16_t>(std::floor(mixed + 0.5)));
        }
        const std::string expected = output_of({wav(one, 1)});
        EXPECT_EQ(expected, output_of({wav(many, channels)})) << channels << " channels";
    }
}

TEST(KzfpInput, FloatsBeyondFullScaleAreClipped)
{
    const std::string clipped = output_of({clip("music-float-loud.wav")});
    EXPECT_NE(output_of({kMusic}), clipped);
    const ScratchDirectory directory;
    const std::string samples = contents(clip("music-44100-stereo-s16.wav"));
    std::string loud = samples.substr(0, 44);
    for (size_t i = 44; i + 1 < samples.size(); i += 2) {
        const auto word = static_cast<int16_t>(static_cast<uint8_t>(samples[i]) |
                                               (static_cast<uint8_t>(samples[i + 1]) << 8));
        const auto value = static_cast<uint16_t>(std::clamp(word * 4, -32768, 32767));
        loud += static_cast<char>(value & 0xff);
        loud += static_cast<char>(value >> 8);
    }
    EXPECT_EQ(output_of({directory.write("loud.wav", loud)}), clipped);
}

TEST(KzfpInput, OtherRatesAreConvertedAndThatIsSaid)
{
    const std::vector<int> reference = values_of({kMusic});
    for (const char* rate : {"96000", "37800"}) {
        const std::string file = clip(std::string("music-") + rate + ".wav");
        const ProcessResult result = kzfp({"--format", "values", file});
        EXPECT_EQ(0, result.status);
        EXPECT_EQ(file + ": converted from " + rate + " Hz to 44100 Hz\n", result.err);
        const std::vector<int> values = numbers_in(result.out);
        for (size_t i = 0; i < reference.size(); ++i) {
            EXPECT_NEAR(reference[i], values.at(i), 40) << rate << " Hz, value " << i;
        }
    }
}

TEST(KzfpInput, TheFloatingPointAlgorithmTakesAnyRateAsItIs)
{
    const std::vector<int> reference = values_of({kMusic});
    for (const std::string& file : {kMusic, clip("music-96000.wav"), clip("music-37800.wav")}) {
        const json object =
            json::parse(output_of({"--algorithm", "float", "--format", "json", file}));
        EXPECT_EQ("float", object["algorithm"]);
        const auto values = object["values"].get<std::vector<int>>();
        for (size_t i = 0; i < reference.size(); ++i) {
            // Polyphase outputs lie up to one input sample beside their time: as far apart as 48000
            // Hz.
            EXPECT_NEAR(reference[i], values.at(i), 90) << file << ", value " << i;
        }
    }
    expect_wrong_usage({"--algorithm", "float", "--raw", "999,1,s16", kMusic}, "1000 to 768000");
}

TEST(KzfpInput, HeaderlessSamplesGiveTheDocumentOfTheirFile)
{
    EXPECT_EQ(output_of({clip("music-44100-mono-s16.wav")}),
              output_of({"--raw", "44100,1,s16", clip("music-44100-mono.s16")}));
}

TEST(KzfpInput, StandardInputIsReadAsAFileIs)
{
    for (const char* name : {"music-44100-stereo-s16.wav", "music-8000-mono-alaw.wav", "music.flac",
                             "music.ogg", "music.mp3", "music.aiff", "very-late.wav"}) {
        const std::string expected = output_of({clip(name)});
        const ProcessResult piped = kzfp({"-"}, fed_with(contents(clip(name))));
        EXPECT_EQ(expected, piped.out) << name << " through a pipe: " << piped.err;
        EXPECT_EQ(0, piped.status);
        ProcessSetup redirected;
        redirected.input_file = clip(name);
        EXPECT_EQ(expected, kzfp({"-"}, redirected).out) << name << " redirected";
    }
    const ProcessResult raw =
        kzfp({"--raw", "44100,1,s16", "-"}, fed_with(contents(clip("music-44100-mono.s16"))));
    EXPECT_EQ(output_of({clip("music-44100-mono-s16.wav")}), raw.out);
}

// The sample counts of the sections are whole, so cutting the file beforehand gives the same words.
TEST(KzfpInput, StartAndLengthCutTheFile)
{
    const ScratchDirectory directory;
    const std::string all = contents(kMusic);
    const size_t second = 44100 * 4;
    const std::string cut =
        directory.write("cut.wav", wav_header(44100, 2, static_cast<uint32_t>(15 * second)) +
                                       all.substr(44 + 2 * second, 15 * second));
    EXPECT_EQ(output_of({cut}), output_of({"--start", "2", "--length", "15", kMusic}));

    const std::string raw = contents(clip("music-44100-mono.s16"));
    const std::string raw_cut = directory.write("cut.s16", raw.substr(2 * 88200, 15 * 88200));
    const std::vector<std::string> section = {"--raw", "44100,1,s16", "--start",
                                              "2",     "--length",    "15"};
    std::vector<std::string> file = section;
    file.push_back(clip("music-44100-mono.s16"));
    EXPECT_EQ(output_of({"--raw", "44100,1,s16", raw_cut}), output_of(file));
    std::vector<std::string> piped = section;
    piped.emplace_back("-");
    EXPECT_EQ(output_of(file), kzfp(piped, fed_with(raw)).out);
}

TEST(KzfpInput, StartWorksInFilesThatAreDecoded)
{
    const std::string expected = output_of({"--start", "3", kMusic});
    EXPECT_EQ(expected, output_of({"--start", "3", clip("music.flac")}));
    EXPECT_EQ(30u, values_of({"--start", "3", clip("music.ogg")}).size());
    EXPECT_EQ(30u, values_of({"--start", "3", clip("music.mp3")}).size());
    EXPECT_EQ(output_of({"--start", "3", "--raw", "8000,1,ulaw", clip("music-8000-mono.ulaw")}),
              output_of({"--start", "3", clip("music-8000-mono-ulaw.wav")}));
}

TEST(KzfpInput, LengthIsNotExceeded)
{
    expect_refused({"--length", "9.55", kMusic}, kMusic + ": 9.55 s of sound, 14.22 s needed");
}

TEST(KzfpMessages, TooShort)
{
    expect_refused({clip("short.wav")}, clip("short.wav") + ": 9.10 s of sound, 14.22 s needed");
}

TEST(KzfpMessages, TooShortAfterSilence)
{
    const ProcessResult result = kzfp({clip("late-and-short.wav")});
    EXPECT_EQ(1, result.status);
    const std::string line = result.err;
    EXPECT_TRUE(line.starts_with(clip("late-and-short.wav") + ": 9.")) << line;
    EXPECT_TRUE(contains(line, " s of sound after 10.0 s of silence, 14.22 s needed\n") ||
                contains(line, " s of sound after 9.9 s of silence, 14.22 s needed\n"))
        << line;
}

TEST(KzfpMessages, Silence)
{
    expect_refused({clip("silence.wav")},
                   clip("silence.wav") + ": nothing but silence in 20.0 s, 14.22 s needed");
}

TEST(KzfpMessages, NoSamples)
{
    expect_refused({clip("no-samples.wav")}, clip("no-samples.wav") + ": no sound, 14.22 s needed");
}

TEST(KzfpMessages, EmptyFile)
{
    expect_refused({clip("empty.wav")}, clip("empty.wav") + ": is empty, a sound file is needed");
    expect_refused({"-"}, "standard input: is empty, a sound file is needed");
    expect_refused({"--raw", "8000,1,u8", "-"}, "standard input: no sound, 14.22 s needed");
}

TEST(KzfpMessages, NotASoundFile)
{
    const std::string what = ": is not a sound file that can be read (WAV, FLAC, OGG, MP3, ...); "
                             "headerless audio needs --raw";
    expect_refused({clip("words.txt")}, clip("words.txt") + what);
    expect_refused({"-"}, "standard input" + what, fed_with("These are words.\n"));
}

TEST(KzfpMessages, DamagedFile)
{
    const ProcessResult result = kzfp({clip("broken.flac")});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(1u, lines_in(result.err));
    EXPECT_TRUE(contains(result.err, "then the file is damaged (")) << result.err;
    EXPECT_TRUE(contains(result.err, "14.22 s needed")) << result.err;
}

TEST(KzfpMessages, FileThatCannotBeOpened)
{
    expect_refused({"/nowhere/song.wav"},
                   "/nowhere/song.wav: cannot be opened (No such file or directory)");
    expect_refused({"/"}, "/: is a directory, a sound file is needed");
}

TEST(KzfpMessages, StartBeyondTheEnd)
{
    expect_refused({"--start", "60", kMusic},
                   kMusic + ": ends at 20.0 s, before the start at 60.0 s");
    expect_refused({"--raw", "44100,1,s16", "--start", "60", clip("music-44100-mono.s16")},
                   clip("music-44100-mono.s16") + ": ends at 20.0 s, before the start at 60.0 s");
}

TEST(KzfpMessages, OddBytesAtTheEndOfHeaderlessAudio)
{
    const ScratchDirectory directory;
    const std::string odd = directory.write("odd.s16", std::string(4003, 'x'));
    expect_refused({"--raw", "44100,2,s16", odd},
                   odd + ": ends with 3 odd bytes, whole frames of 4 bytes are needed");
    expect_refused({"--raw", "44100,1,s16", odd},
                   odd + ": ends with 1 odd byte, whole frames of 2 bytes are needed");
    expect_refused({"--raw", "44100,1,s16", "-"},
                   "standard input: ends with 1 odd byte, whole frames of 2 bytes are needed",
                   fed_with(std::string(4003, 'x')));
}

TEST(KzfpMessages, NoPlaceForACopyOfAPipe)
{
    ProcessSetup setup = fed_with(contents(kMusic));
    setup.environment = {"TMPDIR=/nowhere"};
    expect_refused({"-"},
                   "standard input: cannot be copied to a temporary file in /nowhere "
                   "(No such file or directory)",
                   setup);
}

TEST(KzfpMessages, AreOneLineWhateverTheNameOfTheFile)
{
    expect_refused({"two\nlines\x1b.wav"},
                   "two?lines?.wav: cannot be opened (No such file or directory)");
}

TEST(KzfpStatus, OneBadFileDoesNotStopTheOthers)
{
    const ProcessResult result = kzfp({"-f", "human", clip("words.txt"), kMusic, "/nowhere.wav",
                                       clip("tone.wav"), clip("short.wav")});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(output_of({"-f", "human", kMusic, clip("tone.wav")}), result.out);
    EXPECT_EQ(3u, lines_in(result.err)) << result.err;
}

TEST(KzfpStatus, FullDiskIsReported)
{
    ProcessSetup setup;
    setup.output_file = "/dev/full";
    const ProcessResult result = kzfp({kMusic}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("kzfp: standard output cannot be written (No space left on device)\n", result.err);
    EXPECT_EQ(1, kzfp({"--help"}, setup).status);
}

TEST(KzfpStatus, ReaderThatLeavesEndsTheProgramQuietly)
{
    ProcessSetup setup;
    setup.close_output_after = 1;
    std::vector<std::string> arguments(20, kMusic);
    arguments.insert(arguments.begin(), "--format=json");
    const ProcessResult result = kzfp(arguments, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.err);
}

TEST(KzfpStatus, HelpAndVersionAreNoFailures)
{
    const std::string help = output_of({"--help"});
    for (const char* word : {"--format", "--raw", "--start", "--length", "--algorithm", "--version",
                             "mixed down", "8-bit", "JSON Lines"}) {
        EXPECT_TRUE(contains(help, word)) << word;
    }
    const std::string version = output_of({"--version"});
    EXPECT_TRUE(version.starts_with("kzfp " KZFP_VERSION " (libkzsdk " KZSDK_VERSION ", libkzcat "))
        << version;
    EXPECT_TRUE(contains(version, "\nreads sound with libsndfile")) << version;
}

TEST(KzfpStatus, WrongUsageIsTwo)
{
    expect_wrong_usage({}, "FILE is required");
    expect_wrong_usage({"--colour", kMusic}, "--colour");
    expect_wrong_usage({"--format", "mp3", kMusic}, "xml, json, csv, values, human");
    expect_wrong_usage({"--algorithm", "best", kMusic}, "'best' is not an algorithm");
    expect_wrong_usage({"--raw", "44100", kMusic}, "RATE,CHANNELS,ENCODING");
    expect_wrong_usage({"--raw", "", kMusic}, "RATE,CHANNELS,ENCODING");
    expect_wrong_usage({"--raw", "12345,1,s16", kMusic}, "one of 8000, 11025");
    expect_wrong_usage({"--raw", "44100,0,s16", kMusic}, "1 to 65535");
    expect_wrong_usage({"--raw", "44100,2,s24", kMusic}, "u8, s16, alaw, ulaw");
    for (const char* seconds : {"-1", "nan", "inf", "1e10", "soon", ""}) {
        expect_wrong_usage({"--start", seconds, kMusic}, "number of seconds");
        expect_wrong_usage({"--length", seconds, kMusic}, "number of seconds");
    }
}

TEST(KzfpProgress, IsForTerminalsOnly)
{
    EXPECT_EQ("", kzfp({"--format", "json", kMusic, kMusic}).err);
}

// `script` runs the program on a terminal of its own.
TEST(KzfpProgress, IsShownOnATerminalAndClearedBeforeEachResult)
{
    const std::string two = std::string(KZFP_PROGRAM) + " --format values " + kMusic + " " + kMusic;
    const std::string out = run({"/usr/bin/script", "-qec", two, "/dev/null"}).out;
    EXPECT_TRUE(contains(out, "2 of 2: ")) << out;
    const std::string line = output_of({"--format", "values", kMusic});
    EXPECT_TRUE(contains(out, "\r\033[K" + line.substr(0, line.size() - 1))) << out;

    const std::string one = std::string(KZFP_PROGRAM) + " --format values " + kMusic;
    EXPECT_FALSE(contains(run({"/usr/bin/script", "-qec", one, "/dev/null"}).out, "1 of 1"));
}

} // namespace
