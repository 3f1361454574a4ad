// Samples that an encoder put before and behind the music are cut off by FFmpeg itself, so that the
// same music begins at the same sample in every format.

#include "audio/ffmpeg_decoder.hpp"

#include <algorithm>
#include <array>
#include <cstring>
#include <new>
#include <string_view>

#include "audio/file_source.hpp"

namespace audio {

namespace {

constexpr const char* kProtocols = "http,https,httpproxy,tls,tcp,udp,rtp,srtp,rtmp,rtmps,rtmpt,"
                                   "rtmpts,mmsh,mmst,ftp,srt,hls,crypto";

/// Files may refer to others; none of these is opened.
int refuse_to_open(AVFormatContext*, AVIOContext**, const char*, int, AVDictionary**)
{
    return AVERROR(EPERM);
}

/// Formats that name other places, which FFmpeg would open: playlists and sessions.
constexpr std::array<std::string_view, 13> kReferring = {
    "hls", "applehttp", "dash", "concat",   "concatf", "imf",        "rtsp",
    "sdp", "sap",       "rtp",  "avisynth", "lavfi",   "vapoursynth"};

/// Whether one of a format's names, which commas part, is among these.
bool is_referring(const AVInputFormat& format)
{
    std::string_view names = format.name;
    while (!names.empty()) {
        const size_t comma = std::min(names.find(','), names.size());
        if (std::ranges::find(kReferring, names.substr(0, comma)) != kReferring.end()) {
            return true;
        }
        names.remove_prefix(std::min(comma + 1, names.size()));
    }
    return false;
}

/// The format of bytes by what they begin with; null when it is not found, for a reason that
/// opening them tells. Some formats open sockets while their heads are read: those are refused
/// before.
const AVInputFormat* format_of(AVIOContext& io)
{
    const AVInputFormat* format = nullptr;
    if (ffmpeg().av_probe_input_buffer2(&io, &format, nullptr, nullptr, 0, 0) < 0) {
        return nullptr;
    }
    if (format != nullptr && is_referring(*format)) {
        throw FileError("holds no sound but says where some is (it is of the format " +
                        std::string(format->name) +
                        "), and nothing that a file refers to is opened; give the sound itself");
    }
    return format;
}

template <class Handle>
Handle made(decltype(Handle().get()) object)
{
    if (object == nullptr) {
        throw std::bad_alloc();
    }
    return Handle(object);
}

bool is_known(const AVCodecParameters& sound)
{
    return sound.codec_id != AV_CODEC_ID_NONE && sound.sample_rate > 0 &&
           sound.ch_layout.nb_channels > 0;
}

/// The first sound of a container, or -1.
int first_sound(const AVFormatContext& container)
{
    for (unsigned i = 0; i < container.nb_streams; ++i) {
        if (container.streams[i]->codecpar->codec_type == AVMEDIA_TYPE_AUDIO) {
            return static_cast<int>(i);
        }
    }
    return -1;
}

void pass_over_all_but(AVFormatContext& container, size_t stream)
{
    for (unsigned i = 0; i < container.nb_streams; ++i) {
        container.streams[i]->discard = i == stream ? AVDISCARD_DEFAULT : AVDISCARD_ALL;
    }
}

struct Options {
    AVDictionary* entries = nullptr;
    Options() = default;
    Options(const Options&) = delete;
    Options& operator=(const Options&) = delete;
    ~Options() { ffmpeg().av_dict_free(&entries); }
    void set(const char* name, const char* value)
    {
        ffmpeg().av_dict_set(&entries, name, value, 0);
    }
};

} // namespace

FfmpegDecoder::FfmpegDecoder(std::unique_ptr<FfmpegInput> input) : input_(std::move(input))
{
    io_ = make_io(*input_);
    const AVInputFormat* const format = format_of(*io_);
    auto* const container = ffmpeg().avformat_alloc_context();
    if (container == nullptr) {
        throw std::bad_alloc();
    }
    container->pb = io_.get();
    container->io_open = refuse_to_open;
    Options options;
    options.set("protocol_whitelist", "none"); // which is no protocol's name; an empty list is any
    open(container, nullptr, format, &options.entries);
}

FfmpegDecoder::FfmpegDecoder(const std::string& url, const AVIOInterruptCB& interrupt)
{
    auto* const container = ffmpeg().avformat_alloc_context();
    if (container == nullptr) {
        throw std::bad_alloc();
    }
    container->interrupt_callback = interrupt;
    Options options;
    options.set("protocol_whitelist", url.starts_with("file://") ? "file" : kProtocols);
    options.set("reconnect", "1"); // of HTTP
    options.set("reconnect_streamed", "1");
    options.set("reconnect_on_network_error", "1");
    options.set("reconnect_delay_max", "10");
    options.set("rtsp_transport", "tcp");
    open(container, url.c_str(), nullptr, &options.entries);
}

/// Takes the container, which FFmpeg frees when it cannot open it.
void FfmpegDecoder::open(AVFormatContext* container, const char* url, const AVInputFormat* format,
                         AVDictionary** options)
{
    const int error = ffmpeg().avformat_open_input(&container, url, format, options);
    if (error == AVERROR(ENOMEM)) {
        throw std::bad_alloc();
    }
    if (error < 0) {
        if (input_ && !input_->trouble().empty()) {
            throw FileError(input_->trouble());
        }
        throw NotRecognised(ffmpeg_error_text(error));
    }
    container_.reset(container);
    packet_ = made<Packet>(ffmpeg().av_packet_alloc());
    frame_ = made<Frame>(ffmpeg().av_frame_alloc());
    choose_stream();
    open_codec();
}

/// Most containers describe their sound at once; the others are searched for it.
void FfmpegDecoder::choose_stream()
{
    int found = first_sound(*container_);
    if (found < 0 || !is_known(*container_->streams[found]->codecpar)) {
        const int error = ffmpeg().avformat_find_stream_info(container_.get(), nullptr);
        if (input_ && !input_->trouble().empty()) {
            throw FileError(input_->trouble());
        }
        found = error < 0 ? -1 : first_sound(*container_);
    }
    if (found < 0) {
        throw FileError("holds no sound (it is of the format " +
                        std::string(container_->iformat->name) + ")");
    }
    stream_ = static_cast<size_t>(found);
    pass_over_all_but(*container_, stream_);
}

void FfmpegDecoder::open_codec()
{
    const AVCodecParameters& sound = *stream().codecpar;
    const AVCodec* const codec = ffmpeg().avcodec_find_decoder(sound.codec_id);
    if (codec == nullptr) {
        throw FileError(std::string("holds sound that FFmpeg cannot decode (") +
                        ffmpeg().avcodec_get_name(sound.codec_id) + "); convert it to WAV or FLAC");
    }
    codec_ = made<CodecContext>(ffmpeg().avcodec_alloc_context3(codec));
    int error = ffmpeg().avcodec_parameters_to_context(codec_.get(), &sound);
    if (error >= 0) {
        codec_->pkt_timebase = stream().time_base;
        codec_->thread_count = 1; // files are worked on in parallel instead
        error = ffmpeg().avcodec_open2(codec_.get(), codec, nullptr);
    }
    if (error < 0) {
        throw FileError(std::string("holds sound that cannot be decoded (") + codec->name + ": " +
                        ffmpeg_error_text(error) + ")");
    }
}

const AVFrame* FfmpegDecoder::next()
{
    for (;;) {
        const int result = ffmpeg().avcodec_receive_frame(codec_.get(), frame_.get());
        if (result == 0) {
            damaged_ += frame_->decode_error_flags != 0 ? 1U : 0U;
            if (frame_->nb_samples > 0 && frame_->ch_layout.nb_channels > 0) {
                return frame_.get();
            }
            continue;
        }
        if (result != AVERROR(EAGAIN) && result != AVERROR_EOF) {
            ++damaged_;
        }
        if (ended_ || !feed()) {
            return nullptr;
        }
    }
}

/// Gives the codec one more piece, or says to it that there is none.
bool FfmpegDecoder::feed()
{
    for (;;) {
        const int error = ffmpeg().av_read_frame(container_.get(), packet_.get());
        if (error < 0) {
            end(error);
            return ffmpeg().avcodec_send_packet(codec_.get(), nullptr) >= 0;
        }
        const bool is_ours = static_cast<size_t>(packet_->stream_index) == stream_;
        const bool is_whole = (packet_->flags & AV_PKT_FLAG_CORRUPT) == 0;
        const int sent = is_ours ? ffmpeg().avcodec_send_packet(codec_.get(), packet_.get()) : 0;
        ffmpeg().av_packet_unref(packet_.get());
        if (is_ours) {
            damaged_ += sent < 0 || !is_whole ? 1U : 0U;
            return true;
        }
    }
}

void FfmpegDecoder::end(int error)
{
    ended_ = true;
    if (input_ && !input_->trouble().empty()) {
        trouble_ = input_->trouble();
    } else if (error != AVERROR_EOF) {
        trouble_ = ffmpeg_error_text(error);
    } else if (container_->pb != nullptr && container_->pb->error < 0 &&
               container_->pb->error != AVERROR_EOF) {
        trouble_ = ffmpeg_error_text(container_->pb->error);
    }
}

bool FfmpegDecoder::finds_places() const
{
    // Their time stamps count samples.
    return std::strstr(container_->iformat->name, "mp4") != nullptr &&
           stream().time_base.num == 1 && stream().time_base.den == codec_->sample_rate;
}

bool FfmpegDecoder::go_before(int64_t origin, double seconds)
{
    const auto before = static_cast<int64_t>(seconds / av_q2d(stream().time_base));
    const int64_t target = origin + before;
    const int error = ffmpeg().avformat_seek_file(container_.get(), static_cast<int>(stream_),
                                                  INT64_MIN, target, target, 0);
    ffmpeg().avcodec_flush_buffers(codec_.get());
    ended_ = false;
    return error >= 0;
}

int64_t FfmpegDecoder::samples_between(int64_t origin, int64_t stamp, uint32_t rate) const
{
    return ffmpeg().av_rescale_q(stamp - origin, stream().time_base, {1, static_cast<int>(rate)});
}

} // namespace audio
