// FFmpeg's calls wait inside. A thread makes them, and leaves what it decodes in a queue of limited
// length, so that a read can end its own wait at any time.

#include "audio/live_ffmpeg.hpp"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <deque>
#include <exception>
#include <mutex>
#include <new>
#include <thread>
#include <utility>

#include "audio/ffmpeg_decoder.hpp"
#include "audio/ffmpeg_samples.hpp"
#include "audio/file_source.hpp"

namespace audio {

namespace {

constexpr size_t kMostWaiting = size_t{1} << 24; ///< bytes that were decoded and not yet read

bool is_same(const StreamFormat& a, const StreamFormat& b)
{
    return a.rate == b.rate && a.channels == b.channels && a.encoding == b.encoding;
}

struct Piece {
    StreamFormat format;
    std::vector<std::byte> samples;
};

class LiveFfmpeg : public LiveSource {
public:
    LiveFfmpeg(Descriptor pipe, const std::string& url, const Patience& patience);
    ~LiveFfmpeg() override;
    LiveFfmpeg(const LiveFfmpeg&) = delete;
    LiveFfmpeg& operator=(const LiveFfmpeg&) = delete;

    StreamFormat format() const override { return format_; }
    HeardFrames read(std::span<std::byte> bytes, int milliseconds) override;
    std::string trouble() const override { return trouble_; }
    uint64_t hiccups() const override { return hiccups_.load(); }

private:
    std::unique_ptr<FfmpegDecoder> open(Descriptor pipe, const std::string& url);
    static int ends_wait(void* self) noexcept;
    void check_given_up() const;
    bool stops() const;
    void decode() noexcept;
    bool hand_over(const AVFrame& frame);
    void finish(std::string trouble);
    HeardFrames take(std::span<std::byte> bytes);

    std::atomic<bool> stop_ = false;
    std::function<bool()> stop_of_user_;
    Patience patience_;
    Wait silence_;         ///< since the last piece; of the thread that decodes
    std::string given_up_; ///< why a wait was ended; empty when none was
    std::unique_ptr<FfmpegDecoder> decoder_;
    StreamFormat format_; ///< of what was read last
    std::string trouble_;
    std::atomic<uint64_t> hiccups_ = 0;

    std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Piece> pieces_; ///< decoded, the oldest first
    size_t waiting_ = 0;       ///< bytes in them
    size_t at_ = 0;            ///< bytes of the oldest that were read
    bool ended_ = false;
    std::string end_trouble_;

    std::thread thread_;
};

LiveFfmpeg::LiveFfmpeg(Descriptor pipe, const std::string& url, const Patience& patience)
    : stop_of_user_(patience.stop), patience_{.timeout = patience.timeout,
                                              .stop = [this] { return stops(); }},
      silence_(patience_), decoder_(open(std::move(pipe), url))
{
    const AVFrame* const first = decoder_->next();
    check_given_up();
    if (first == nullptr || !hand_over(*first)) {
        throw FileError(decoder_->trouble().empty() ? "holds no sound that can be decoded"
                                                    : decoder_->trouble());
    }
    format_ = pieces_.front().format;
    thread_ = std::thread(&LiveFfmpeg::decode, this);
}

LiveFfmpeg::~LiveFfmpeg()
{
    stop_.store(true);
    changed_.notify_all();
    if (thread_.joinable()) {
        thread_.join();
    }
}

std::unique_ptr<FfmpegDecoder> LiveFfmpeg::open(Descriptor pipe, const std::string& url)
{
    try {
        if (url.empty()) {
            return std::make_unique<FfmpegDecoder>(
                std::make_unique<FfmpegPipeInput>(std::move(pipe), patience_));
        }
        return std::make_unique<FfmpegDecoder>(
            url, AVIOInterruptCB{.callback = ends_wait, .opaque = this});
    } catch (const NotRecognised& error) {
        check_given_up();
        throw FileError(url.empty() ? "is not sound that can be read as it comes; headerless audio "
                                      "needs --raw"
                                    : std::string("cannot be opened (") + error.what() + ")");
    }
}

/// Notes why: FFmpeg may still give what it has before it ends.
int LiveFfmpeg::ends_wait(void* self) noexcept
{
    auto& live = *static_cast<LiveFfmpeg*>(self);
    try {
        live.silence_.check();
        return 0;
    } catch (const std::exception& error) {
        live.given_up_ = error.what();
        return 1;
    }
}

void LiveFfmpeg::check_given_up() const
{
    if (!given_up_.empty()) {
        throw FileError(given_up_);
    }
}

bool LiveFfmpeg::stops() const { return stop_.load() || (stop_of_user_ && stop_of_user_()); }

/// The thread.
void LiveFfmpeg::decode() noexcept
{
    try {
        for (;;) {
            silence_.restart();
            const AVFrame* const frame = decoder_->next();
            hiccups_.store(decoder_->damaged());
            if (frame == nullptr) {
                break;
            }
            if (!hand_over(*frame)) {
                return;
            }
        }
        finish(given_up_.empty() ? decoder_->trouble() : given_up_);
    } catch (const std::exception& error) {
        finish(error.what());
    }
}

/// Puts a piece into the queue once there is room. False when nobody reads it any more.
bool LiveFfmpeg::hand_over(const AVFrame& frame)
{
    Piece piece = {.format = format_of(frame, true), .samples = {}};
    if (!is_usual_rate(piece.format.rate) || !append_samples(frame, true, piece.samples)) {
        throw FileError("has sound of a kind that cannot be used");
    }
    std::unique_lock lock(mutex_);
    while (waiting_ > kMostWaiting && !stop_.load()) {
        changed_.wait_for(lock, std::chrono::milliseconds(100));
    }
    waiting_ += piece.samples.size();
    pieces_.push_back(std::move(piece));
    changed_.notify_all();
    return !stop_.load();
}

void LiveFfmpeg::finish(std::string trouble)
{
    const std::scoped_lock lock(mutex_);
    ended_ = true;
    end_trouble_ = std::move(trouble);
    changed_.notify_all();
}

HeardFrames LiveFfmpeg::read(std::span<std::byte> bytes, int milliseconds)
{
    std::unique_lock lock(mutex_);
    changed_.wait_for(lock, std::chrono::milliseconds(milliseconds),
                      [this] { return ended_ || !pieces_.empty(); });
    if (!pieces_.empty()) {
        return take(bytes);
    }
    if (!ended_) {
        return {};
    }
    trouble_ = end_trouble_;
    return {Heard::end, 0};
}

/// Takes as much of the pieces at hand as has room and is of one format.
HeardFrames LiveFfmpeg::take(std::span<std::byte> bytes)
{
    if (!is_same(pieces_.front().format, format_)) {
        format_ = pieces_.front().format;
        return {Heard::new_format, 0};
    }
    const size_t frame_bytes = format_.frame_bytes();
    const auto wanted = bytes.first(bytes.size() / frame_bytes * frame_bytes);
    size_t done = 0;
    while (done < wanted.size() && !pieces_.empty() && is_same(pieces_.front().format, format_)) {
        const std::vector<std::byte>& samples = pieces_.front().samples;
        const size_t count = std::min(wanted.size() - done, samples.size() - at_);
        std::copy_n(samples.data() + at_, count, wanted.data() + done);
        done += count;
        at_ += count;
        if (at_ == samples.size()) {
            waiting_ -= at_;
            at_ = 0;
            pieces_.pop_front();
        }
    }
    changed_.notify_all();
    return {Heard::samples, done / frame_bytes};
}

} // namespace

std::unique_ptr<LiveSource> open_pipe(Descriptor pipe, const Patience& patience)
{
    return std::make_unique<LiveFfmpeg>(std::move(pipe), "", patience);
}

std::unique_ptr<LiveSource> open_url(const std::string& url, const Patience& patience)
{
    return std::make_unique<LiveFfmpeg>(Descriptor(), url, patience);
}

} // namespace audio
