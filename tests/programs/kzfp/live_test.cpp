// Sound that is listened to while it comes: what arrives is given, no wait lasts longer than was
// asked for, and what goes wrong has a sentence.

#include "audio/live.hpp"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "audio/decoder_messages.hpp"
#include "audio/file_source.hpp"
#include "kzfp.hpp"
#include "small_server.hpp"

namespace {

using namespace kz::test;
using audio::Heard;
using audio::LiveSource;

constexpr int kWait = 50; ///< milliseconds
constexpr size_t kMusicFrames = 882000;

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

bool without_ffmpeg() { return audio::ffmpeg_version().empty(); }

std::unique_ptr<LiveSource> open(const std::string& name,
                                 std::optional<audio::StreamFormat> raw = {},
                                 const audio::Patience& patience = {})
{
    return audio::open_live({.name = name, .raw = raw, .patience = patience});
}

/// What opening it throws; empty when it does not.
std::string refusal(const std::string& name, std::optional<audio::StreamFormat> raw = {},
                    const audio::Patience& patience = {})
{
    try {
        open(name, raw, patience);
        return {};
    } catch (const audio::FileError& error) {
        return error.what();
    }
}

struct Listened {
    std::string bytes;
    std::vector<audio::StreamFormat> formats; ///< in their order
    std::vector<size_t> frames;               ///< of each format
    std::string trouble;

    size_t all() const
    {
        size_t sum = 0;
        for (const size_t count : frames) {
            sum += count;
        }
        return sum;
    }
};

/// Listens to the end.
Listened listen(LiveSource& source)
{
    Listened heard = {.bytes = {}, .formats = {source.format()}, .frames = {0}, .trouble = {}};
    std::vector<std::byte> buffer(4096 * source.format().frame_bytes());
    for (;;) {
        const audio::HeardFrames got = source.read(buffer, kWait);
        if (got.what == Heard::end) {
            heard.trouble = source.trouble();
            return heard;
        }
        if (got.what == Heard::new_format) {
            heard.formats.push_back(source.format());
            heard.frames.push_back(0);
            buffer.resize(4096 * source.format().frame_bytes());
        }
        heard.frames.back() += got.frames;
        heard.bytes.append(reinterpret_cast<const char*>(buffer.data()),
                           got.frames * source.format().frame_bytes());
    }
}

/// A FIFO into which a thread writes.
class FedFifo {
public:
    FedFifo() : path_(scratch_.path("fifo")) { EXPECT_EQ(0, ::mkfifo(path_.c_str(), 0600)); }
    ~FedFifo()
    {
        if (writer_.joinable()) {
            writer_.join();
        }
    }
    FedFifo(const FedFifo&) = delete;
    FedFifo& operator=(const FedFifo&) = delete;

    const std::string& path() const { return path_; }

    /// In pieces of `piece` bytes. The reader's end has to be open, or to be opened soon.
    void feed(std::string bytes, size_t piece)
    {
        writer_ = std::thread([this, bytes = std::move(bytes), piece] {
            const int file = ::open(path_.c_str(), O_WRONLY | O_CLOEXEC);
            for (size_t at = 0; at < bytes.size(); at += piece) {
                const size_t count = std::min(piece, bytes.size() - at);
                if (::write(file, bytes.data() + at, count) != static_cast<ssize_t>(count)) {
                    break;
                }
            }
            ::close(file);
        });
    }

private:
    ScratchDirectory scratch_;
    std::string path_;
    std::thread writer_;
};

const audio::StreamFormat kStereo = {
    .rate = 44100, .channels = 2, .encoding = audio::Encoding::s16};

std::string counting_bytes(size_t count)
{
    std::string bytes(count, '\0');
    for (size_t i = 0; i < count; ++i) {
        bytes[i] = static_cast<char>(i * 7 % 251);
    }
    return bytes;
}

// ---- Headerless pipes

TEST(LiveRaw, GivesTheBytesWhateverTheirPieces)
{
    const std::string bytes = counting_bytes(40000);
    for (const size_t piece : {1u, 3u, 4u, 1021u, 40000u}) {
        FedFifo fifo;
        const auto source = open(fifo.path(), kStereo);
        fifo.feed(bytes.substr(0, piece == 1 ? 4000 : bytes.size()), piece);
        const Listened heard = listen(*source);
        EXPECT_EQ(bytes.substr(0, piece == 1 ? 4000 : bytes.size()), heard.bytes) << piece;
        EXPECT_EQ("", heard.trouble);
    }
}

TEST(LiveRaw, ReturnsWhileNobodyWrites)
{
    const FedFifo fifo;
    const auto source = open(fifo.path(), kStereo);
    std::vector<std::byte> buffer(4000);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(Heard::nothing, source->read(buffer, 1).what);
    }
}

TEST(LiveRaw, GivesUpAfterTheTimeoutAndWhenTold)
{
    const FedFifo fifo;
    const auto late = open(fifo.path(), kStereo, {.timeout = 0.05, .stop = {}});
    EXPECT_TRUE(contains(listen(*late).trouble, "nothing came for 0.05 s"));
    const auto stopped = open(fifo.path(), kStereo, {.timeout = {}, .stop = [] { return true; }});
    EXPECT_TRUE(contains(listen(*stopped).trouble, "interrupted"));
}

TEST(LiveRaw, ReportsHalfAFrameAtTheEnd)
{
    FedFifo fifo;
    const auto source = open(fifo.path(), kStereo);
    fifo.feed(counting_bytes(402), 402);
    const Listened heard = listen(*source);
    EXPECT_EQ(100u, heard.all());
    EXPECT_NE("", heard.trouble);
}

// ---- Pipes of sound files

class LivePipe : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (without_ffmpeg()) {
            GTEST_SKIP() << "this build is without FFmpeg";
        }
    }
};

TEST_F(LivePipe, DecodesSoundFilesAsTheyCome)
{
    for (const char* name : {"music-44100-stereo-s16.wav", "music.mp3", "music.ogg", "music.flac",
                             "music.aac", "music-two-sounds.mkv"}) {
        FedFifo fifo;
        fifo.feed(contents(clip(name)), 1000);
        const auto source = open(fifo.path());
        const Listened heard = listen(*source);
        EXPECT_NEAR(static_cast<double>(kMusicFrames), static_cast<double>(heard.all()), 4000)
            << name;
        EXPECT_EQ("", heard.trouble) << name;
        EXPECT_EQ(2u, heard.formats[0].channels);
    }
}

TEST_F(LivePipe, SamplesOfAWaveAreThoseOfTheFile)
{
    const std::string wave = contents(clip("music-44100-stereo-s16.wav"));
    FedFifo fifo;
    fifo.feed(wave, 65536);
    const auto source = open(fifo.path());
    EXPECT_EQ(wave.substr(44), listen(*source).bytes);
}

/// Bytes of one channel and of two, as a station changes its form.
TEST_F(LivePipe, AChangeOfTheFormatIsReported)
{
    FedFifo fifo;
    fifo.feed(contents(clip("music.mp3")) + contents(clip("music-22050-mono.mp3")), 4096);
    const auto source = open(fifo.path());
    const Listened heard = listen(*source);
    ASSERT_LE(2u, heard.formats.size());
    EXPECT_EQ(44100u, heard.formats.front().rate);
    EXPECT_EQ(22050u, heard.formats.back().rate);
    EXPECT_EQ(1u, heard.formats.back().channels);
    EXPECT_NEAR(static_cast<double>(kMusicFrames), static_cast<double>(heard.frames.front()), 4000);
    EXPECT_NEAR(441000.0, static_cast<double>(heard.frames.back()), 4000);
}

TEST_F(LivePipe, DamageIsSurvived)
{
    std::string bytes = contents(clip("music.mp3"));
    bytes.replace(100000, 20000, std::string(20000, '\x55'));
    FedFifo fifo;
    fifo.feed(bytes, 4096);
    const auto source = open(fifo.path());
    const Listened heard = listen(*source);
    EXPECT_LT(kMusicFrames * 9 / 10, heard.all());
    EXPECT_EQ("", heard.trouble);
}

TEST_F(LivePipe, WhatIsNoSoundGetsTheCure)
{
    FedFifo fifo;
    fifo.feed(std::string(300000, 'x'), 4096);
    EXPECT_TRUE(contains(refusal(fifo.path()), "headerless audio needs --raw"));
}

TEST_F(LivePipe, OneThatDoesNotComeIsGivenUp)
{
    const FedFifo fifo;
    EXPECT_TRUE(contains(refusal(fifo.path(), {}, {.timeout = 0.05, .stop = {}}),
                         "nothing came for 0.05 s"));
    EXPECT_TRUE(contains(refusal(fifo.path(), {}, {.timeout = {}, .stop = [] { return true; }}),
                         "interrupted"));
}

// ---- Streams of the network

using LiveUrl = LivePipe;

TEST_F(LiveUrl, IsDecodedAsItComes)
{
    const std::string music = contents(clip("music.mp3"));
    const SmallServer server([&music](int socket, const std::string& request) {
        send_file(socket, request, music, music.size());
    });
    const auto source = open(server.url("music.mp3"));
    const Listened heard = listen(*source);
    EXPECT_NEAR(static_cast<double>(kMusicFrames), static_cast<double>(heard.all()), 4000);
    EXPECT_EQ("", heard.trouble);
}

TEST_F(LiveUrl, IsResumedWhereTheConnectionBroke)
{
    const std::string music = contents(clip("music.mp3"));
    std::atomic<int> connections = 0;
    const SmallServer server([&](int socket, const std::string& request) {
        send_file(socket, request, music, ++connections == 1 ? 150000 : music.size());
    });
    const auto source = open(server.url("music.mp3"));
    const Listened heard = listen(*source);
    EXPECT_NEAR(static_cast<double>(kMusicFrames), static_cast<double>(heard.all()), 4000);
    EXPECT_LT(1, connections.load());
}

TEST_F(LiveUrl, MissingFilesAreRefused)
{
    const SmallServer server([](int socket, const std::string&) {
        send_all(socket, "HTTP/1.1 404 Not Found\r\nContent-Length: 0\r\n\r\n");
    });
    EXPECT_TRUE(contains(refusal(server.url("nothing.mp3")), "404"));
}

/// A server that takes connections and says nothing, until the test is over.
class SilentServer {
public:
    explicit SilentServer(std::string beginning)
        : beginning_(std::move(beginning)),
          server_([this](int socket, const std::string&) { hold(socket); })
    {
    }
    ~SilentServer() { over_.store(true); }
    SilentServer(const SilentServer&) = delete;
    SilentServer& operator=(const SilentServer&) = delete;

    std::string url() const { return server_.url("music.mp3"); }

private:
    void hold(int socket) const
    {
        send_all(socket, beginning_);
        while (!over_.load()) {
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
    }

    std::string beginning_;
    std::atomic<bool> over_ = false;
    SmallServer server_;
};

TEST_F(LiveUrl, OneThatDoesNotAnswerIsGivenUp)
{
    const SilentServer server("");
    EXPECT_TRUE(contains(refusal(server.url(), {}, {.timeout = 0.2, .stop = {}}),
                         "nothing came for 0.2 s"));
    EXPECT_TRUE(contains(refusal(server.url(), {}, {.timeout = {}, .stop = [] { return true; }}),
                         "interrupted"));
}

TEST_F(LiveUrl, OneThatFallsSilentIsGivenUp)
{
    const SilentServer server("HTTP/1.1 200 OK\r\nContent-Type: audio/mpeg\r\n\r\n" +
                              contents(clip("music.mp3")).substr(0, 200000));
    const auto source = open(server.url(), {}, {.timeout = 0.5, .stop = {}});
    const Listened heard = listen(*source);
    EXPECT_LT(kMusicFrames / 4, heard.all());
    EXPECT_TRUE(contains(heard.trouble, "nothing came for 0.5 s")) << heard.trouble;
}

TEST_F(LiveUrl, HasAFormatOfItsOwn)
{
    EXPECT_TRUE(contains(refusal("http://127.0.0.1/x", kStereo), "--raw is for pipes and files"));
}

// ---- Others

TEST(LiveFile, IsThereAtOnce)
{
    const auto source = open(clip("music-44100-stereo-s16.wav"));
    EXPECT_EQ(kMusicFrames, listen(*source).all());
    EXPECT_TRUE(contains(refusal(clip("nothing.wav")), "No such file or directory"));
}

/// No machine has an input of that name. The drivers' own lines are left out.
TEST(LiveMicrophone, UnknownOnesAreRefusedWithTheInputs)
{
    audio::silence_decoders();
    ::testing::internal::CaptureStderr();
    const std::string why = refusal("mic:no such input");
    EXPECT_EQ("", ::testing::internal::GetCapturedStderr());
    EXPECT_TRUE(contains(why, "inputs") || contains(why, "without PortAudio")) << why;
}

TEST(LiveNames, OnlyUrlsAndMicrophonesAreLive)
{
    for (const char* name : {"mic:", "mic:USB", "http://a/b", "rtsp://a"}) {
        EXPECT_TRUE(audio::is_live_only(name)) << name;
    }
    for (const char* name : {"-", "a.wav", "a/b://c", "://", "microphone.wav", "/mic:/a"}) {
        EXPECT_FALSE(audio::is_live_only(name)) << name;
    }
}

} // namespace
