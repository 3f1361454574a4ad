// `kzfp --every`: one fingerprint for each window of a file or a pipe.

#include "kzfp.hpp"

#include <sstream>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "support/signals.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

const std::string kMusic = clip("music-44100-stereo-s16.wav");
const std::string kLate = clip("late-44100-mono.wav");
const std::string kShort = clip("short.wav");
const std::string kTooShort = "9.10 s of sound, 14.22 s needed";

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

std::vector<std::string> lines_of(const std::string& text)
{
    std::vector<std::string> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.push_back(line);
    }
    return lines;
}

void expect_refused(const std::vector<std::string>& arguments, const std::string& part)
{
    const ProcessResult result = kzfp(arguments);
    EXPECT_EQ(2, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, part)) << result.err;
}

TEST(KzfpEvery, WindowsAreThoseOfTheirSections)
{
    const auto lines = lines_of(output_of({"--every", "2.5", "--format", "values", kMusic}));
    ASSERT_EQ(3u, lines.size()); // the last one that fits in 20 seconds begins at 5
    const std::vector<std::string> times = {"0", "2.5", "5"};
    for (size_t i = 0; i < times.size(); ++i) {
        EXPECT_EQ(times[i] + " " + output_of({"--start", times[i], "--format", "values", kMusic}),
                  lines[i] + "\n");
    }
}

TEST(KzfpEvery, TimesAreThoseOfTheWholeFile)
{
    const auto lines = lines_of(output_of(
        {"--every", "1", "--start", "0:04", "--format", "json", "--algorithm", "float", kMusic}));
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ(4.0, json::parse(lines[0])["time"]);
    EXPECT_EQ(5.0, json::parse(lines[1])["time"]);
    EXPECT_EQ(30u, json::parse(lines[1])["values"].size());
}

TEST(KzfpEvery, HeaderlessSoundBeginsAtTheStart)
{
    const std::string file = clip("music-22050-mono.u8");
    const std::vector<std::string> raw = {"--raw", "22050,1,u8", "--format", "values"};
    const auto run_from = [&raw](const std::string& start, const std::string& input,
                                 std::vector<std::string> more) {
        more.insert(more.end(), raw.begin(), raw.end());
        more.insert(more.end(), {"--start", start, input});
        const ProcessResult result = kzfp(
            more, input == "-" ? fed_with(contents(clip("music-22050-mono.u8"))) : ProcessSetup());
        EXPECT_EQ(0, result.status) << result.err;
        return result.out;
    };
    const std::string windows = run_from("2.5", file, {"--every", "1.5"});
    EXPECT_EQ("2.5 " + run_from("2.5", file, {}) + "4 " + run_from("4", file, {}) + "5.5 " +
                  run_from("5.5", file, {}),
              windows);
    EXPECT_EQ(windows, run_from("2.5", "-", {"--every", "1.5"}));
}

TEST(KzfpEvery, SilentWindowsHaveTheirLineToo)
{
    const auto lines = lines_of(output_of({"--every", "3", "--format", "json", kLate}));
    ASSERT_LE(4u, lines.size());
    EXPECT_EQ("silence", json::parse(lines[0])["error"]);
    EXPECT_EQ("silence", json::parse(lines[1])["error"]);
    EXPECT_EQ(6.0, json::parse(lines[2])["time"]); // the sound begins in the middle of this one
    EXPECT_EQ(30u, json::parse(lines[2])["values"].size());
    const auto people = lines_of(output_of({"--every", "3", "--format", "human", kLate}));
    EXPECT_EQ("     0.00 s  silence", people.at(0));
    const auto table = lines_of(output_of({"--every", "3", "--format", "csv", kLate}));
    EXPECT_TRUE(table.at(1).ends_with(",silence")) << table.at(1);
    EXPECT_EQ("0", lines_of(output_of({"--every", "3", "--format", "values", kLate})).at(0));
}

TEST(KzfpEvery, FilesThatAreTooShortFail)
{
    const ProcessResult result = kzfp({"--every", "1", "--format", "json", kShort});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(kTooShort, json::parse(result.out)["error"]);
    EXPECT_EQ(kShort + ": " + kTooShort + "\n", result.err);
}

TEST(KzfpEvery, GivesEachLineAsSoonAsItIsComplete)
{
    const ScratchDirectory directory;
    const std::string path = directory.path("fifo");
    ASSERT_EQ(0, ::mkfifo(path.c_str(), 0600));
    const int file = ::open(path.c_str(), O_RDWR | O_CLOEXEC);
    const std::string sound = contents(clip("music-22050-mono.u8"));
    ASSERT_LT(0, ::fcntl(file, F_SETPIPE_SZ, 1 << 20));
    ASSERT_EQ(static_cast<ssize_t>(sound.size()), ::write(file, sound.data(), sound.size()));
    // The writer is still there, so the stream does not end.
    const ProcessResult result = kzfp(
        {"--every", "2", "--format", "values", "--raw", "22050,1,u8", "--timeout", "0.5", path});
    ::close(file);
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "nothing came for 0.5 s")) << result.err;
    EXPECT_EQ(4u, lines_of(result.out).size()) << result.out;
    EXPECT_TRUE(result.out.ends_with("\n\n")) << "the line of the failure";
}

// Far beyond what is waited for when the beginning of a pipe is not a sound file.
TEST(KzfpEvery, ReadsASoundFileInAPipeToItsEnd)
{
    const std::vector<int16_t> samples = tune(48000, 2, 10);
    const std::string piece(reinterpret_cast<const char*>(samples.data()), samples.size() * 2);
    const std::string header = wav_header(48000, 2, static_cast<uint32_t>(52 * piece.size()));
    ProcessSetup setup;
    setup.input = [&, given = 0]() mutable -> std::string_view {
        ++given;
        return given == 1 ? header : given <= 53 ? std::string_view(piece) : std::string_view();
    };
    const ProcessResult result = kzfp({"--every", "1:40", "--format", "json", "-"}, setup);
    EXPECT_EQ(0, result.status) << result.err;
    const auto lines = lines_of(result.out);
    ASSERT_EQ(6u, lines.size());
    EXPECT_EQ(500.0, json::parse(lines[5])["time"]);
    EXPECT_EQ(520.0, json::parse(lines[5])["duration"]);
    EXPECT_EQ(json::parse(lines[0])["values"], json::parse(lines[5])["values"]);
}

TEST(KzfpEvery, NeedsAFormThatHasLines)
{
    expect_refused({"--every", "2", kMusic}, "choose --format json, csv, values or human");
    expect_refused({"--every", "0", "--format", "json", kMusic}, "'0' is not a time");
}

} // namespace
