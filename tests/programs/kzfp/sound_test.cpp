// How sound is read: headerless samples of any channels, times as people write them, pipes that
// do not come, damaged files.

#include "kzfp.hpp"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

using namespace kz::test;

const std::string kMusic = clip("music-44100-stereo-s16.wav");

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

void expect_wrong_usage(const std::vector<std::string>& arguments, const std::string& part)
{
    const ProcessResult result = kzfp(arguments);
    EXPECT_EQ(2, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, part)) << result.err;
}

void expect_failure(const ProcessResult& result, const std::string& part)
{
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, part)) << result.err;
}

/// The samples of a 16-bit mono file, each `count` times.
std::string in_channels(const std::string& samples, int count)
{
    std::string result;
    for (size_t i = 0; i + 1 < samples.size(); i += 2) {
        for (int c = 0; c < count; ++c) {
            result += samples.substr(i, 2);
        }
    }
    return result;
}

/// A FIFO that this process holds open for writing, with something in it, or nobody.
class Fifo {
public:
    explicit Fifo(const std::string& path, const std::string& content) : path_(path)
    {
        EXPECT_EQ(0, ::mkfifo(path.c_str(), 0600));
        if (!content.empty()) {
            file_ = ::open(path.c_str(), O_RDWR | O_CLOEXEC);
            EXPECT_EQ(static_cast<ssize_t>(content.size()),
                      ::write(file_, content.data(), content.size()));
        }
    }
    ~Fifo()
    {
        ::close(file_);
        ::unlink(path_.c_str());
    }
    Fifo(const Fifo&) = delete;
    Fifo& operator=(const Fifo&) = delete;

private:
    std::string path_;
    int file_ = -1;
};

TEST(KzfpRaw, FourEqualChannelsAreOne)
{
    const ScratchDirectory directory;
    const std::string mono = contents(clip("music-44100-mono.s16"));
    const std::string four = directory.write("four.s16", in_channels(mono, 4));
    EXPECT_EQ(output_of({"--raw", "44100,1,s16", clip("music-44100-mono.s16")}),
              output_of({"--raw", "44100,4,s16", four}));
}

TEST(KzfpRaw, FloatsAreThoseOfTheFile)
{
    const ScratchDirectory directory;
    const std::string all = contents(clip("music-float.wav"));
    const size_t data = all.find("data");
    ASSERT_NE(std::string::npos, data);
    const std::string raw = directory.write("raw.f32", all.substr(data + 8));
    EXPECT_EQ(values_of({clip("music-float.wav")}), values_of({"--raw", "44100,2,f32", raw}));
}

TEST(KzfpRaw, RefusesMoreChannelsThanAStreamTakes)
{
    expect_wrong_usage({"--raw", "44100,65536,s16", kMusic}, "1 to 65535");
    expect_wrong_usage({"--raw", "44100,2,s24", kMusic}, "u8, s16, alaw, ulaw, f32");
}

TEST(KzfpTimes, MinutesAndHoursAreTaken)
{
    const std::string expected = output_of({"--start", "3.5", kMusic});
    EXPECT_EQ(expected, output_of({"--start", "0:03.5", kMusic}));
    EXPECT_EQ(expected, output_of({"--start", "0:00:03.5", kMusic}));
    expect_failure(kzfp({"--start", "1:02:03", kMusic}), "before the start at 3723.0 s");
    expect_failure(kzfp({"--start", "90:00", kMusic}), "before the start at 5400.0 s");
}

TEST(KzfpTimes, WhatIsNoTimeIsRefused)
{
    for (const char* text : {":30", "1:", "1:5", "1:60", "1.5:30", "-1:30", "1:-5", "1:2:3:4",
                             "1:0x", "1:30:1", "1:05:", "99999999999:00"}) {
        expect_wrong_usage({"--start", text, kMusic}, "number of seconds, M:SS or H:MM:SS");
        expect_wrong_usage({"--length", text, kMusic}, "number of seconds, M:SS or H:MM:SS");
    }
}

TEST(KzfpTimeout, FifoWithoutAWriterIsGivenUp)
{
    const ScratchDirectory directory;
    const std::string path = directory.path("fifo");
    const Fifo fifo(path, "");
    expect_failure(kzfp({"--timeout", "0.2", path}), "nothing came for 0.2 s (--timeout)");
    expect_failure(kzfp({"--timeout", "0.2", "--raw", "44100,1,s16", path}), "given up");
}

TEST(KzfpTimeout, PipeThatStopsIsGivenUp)
{
    const ScratchDirectory directory;
    const std::string path = directory.path("fifo");
    const Fifo fifo(path, contents(kMusic).substr(0, 4096));
    expect_failure(kzfp({"--timeout", "0.2", path}), "given up");
}

TEST(KzfpTimeout, FilesThatFollowAreStillRead)
{
    const ScratchDirectory directory;
    const std::string path = directory.path("fifo");
    const Fifo fifo(path, "");
    const ProcessResult result = kzfp({"-f", "human", "--timeout", "0.2", path, kMusic});
    expect_failure(result, "given up");
    EXPECT_EQ(output_of({"-f", "human", kMusic}), result.out);
}

TEST(KzfpTimeout, IsAboveZero)
{
    expect_wrong_usage({"--timeout", "0", kMusic}, "above 0");
    expect_wrong_usage({"--timeout", "never", kMusic}, "above 0");
}

} // namespace
