// The first piece of sound is decoded at once: only then the rate and the channels are certain.

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstring>
#include <string_view>
#include <utility>

#include <unistd.h>

#include "audio/ffmpeg_decoder.hpp"
#include "audio/ffmpeg_samples.hpp"
#include "audio/file_source.hpp"

extern "C" {
#include <libavutil/dict.h>
}

namespace audio {

namespace {

constexpr double kPreroll = 2;       ///< seconds before a place from which decoding is right again
constexpr double kWorthSeeking = 10; ///< seconds; below, everything is decoded

bool is_same(const StreamFormat& a, const StreamFormat& b)
{
    return a.rate == b.rate && a.channels == b.channels && a.encoding == b.encoding;
}

/// Of "00:03:20.5", as Matroska files have it for each stream: whole seconds.
std::optional<double> to_duration(std::string_view text)
{
    uint32_t seconds = 0;
    for (int colons_left = 2;; --colons_left) {
        uint32_t number = 0;
        const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), number);
        if (error != std::errc{} || number > 9999) {
            return {};
        }
        seconds = seconds * 60 + number;
        if (colons_left == 0) {
            return seconds;
        }
        text.remove_prefix(static_cast<size_t>(stop - text.data()));
        if (!text.starts_with(':')) {
            return {};
        }
        text.remove_prefix(1);
    }
}

/// A file that FFmpeg reads.
class FfmpegFile : public FileSource {
public:
    FfmpegFile(int file, const AcceptsRate& accepts_rate, bool floats);

    void select(const Section& section) override;
    uint32_t file_rate() const override { return format_.rate; }
    uint32_t file_channels() const override { return channels_; }
    std::optional<double> duration() const override;
    std::vector<Tag> tags() const override;
    StreamFormat format() const override { return format_; }
    size_t read(std::span<std::byte> bytes) override;
    std::string trouble() const override;
    bool went_on() const override { return early_end().empty(); }

private:
    void start(const AcceptsRate& accepts_rate);
    bool fetch();
    bool pass_over(uint64_t frames);
    bool pass_over_from_a_place(uint64_t frames);
    std::string early_end() const;

    int file_;
    bool floats_;
    std::unique_ptr<FfmpegDecoder> decoder_;
    StreamFormat format_;
    uint32_t channels_ = 0;
    int64_t origin_ = AV_NOPTS_VALUE; ///< time stamp of the first frame
    int64_t stamp_ = AV_NOPTS_VALUE;  ///< of the frame at hand
    std::vector<std::byte> samples_;  ///< decoded
    size_t at_ = 0;                   ///< bytes of them that were read
    uint64_t frames_left_ = UINT64_MAX;
    uint64_t passed_ = 0; ///< frames decoded or passed over, from the start of the file
    bool ended_ = false;
    std::string trouble_;
};

FfmpegFile::FfmpegFile(int file, const AcceptsRate& accepts_rate, bool floats)
    : file_(file), floats_(floats),
      decoder_(std::make_unique<FfmpegDecoder>(std::make_unique<FfmpegFileInput>(file)))
{
    start(accepts_rate);
}

void FfmpegFile::start(const AcceptsRate& accepts_rate)
{
    const AVFrame* const frame = decoder_->next();
    if (frame == nullptr) {
        throw FileError(decoder_->damaged() > 0 ? "is damaged: none of its sound can be decoded"
                                                : "holds no sound that can be decoded");
    }
    if (frame->sample_rate < 0 || !is_usual_rate(static_cast<uint32_t>(frame->sample_rate))) {
        throw FileError("has a rate of " + std::to_string(frame->sample_rate) + " Hz, " +
                        std::to_string(kLowestRate) + " to " + std::to_string(kHighestRate) +
                        " Hz can be used");
    }
    channels_ = static_cast<uint32_t>(frame->ch_layout.nb_channels);
    floats_ = floats_ && accepts_rate(static_cast<uint32_t>(frame->sample_rate));
    format_ = format_of(*frame, floats_);
    origin_ = frame->pts;
    if (!append_samples(*frame, floats_, samples_)) {
        throw FileError("holds samples of a kind that is not known; convert it to WAV or FLAC");
    }
    passed_ = samples_.size() / format_.frame_bytes();
}

/// Decodes the next piece into `samples_`, all of which were read. False at the end.
bool FfmpegFile::fetch()
{
    samples_.clear();
    at_ = 0;
    const AVFrame* const frame = ended_ ? nullptr : decoder_->next();
    if (frame == nullptr) {
        ended_ = true;
        return false;
    }
    if (!is_same(format_of(*frame, floats_), format_)) {
        ended_ = true;
        trouble_ = "its sound goes on with another rate or number of channels";
        return false;
    }
    stamp_ = frame->pts;
    append_samples(*frame, floats_, samples_);
    passed_ += samples_.size() / format_.frame_bytes();
    return true;
}

void FfmpegFile::select(const Section& section)
{
    if (section.length) {
        frames_left_ = static_cast<uint64_t>(std::llround(*section.length * format_.rate));
    }
    const auto start = static_cast<uint64_t>(std::llround(section.start * format_.rate));
    const bool is_far = section.start > kWorthSeeking && origin_ != AV_NOPTS_VALUE;
    if (is_far && decoder_->finds_places()) {
        if (pass_over_from_a_place(start)) {
            return;
        }
        *this = FfmpegFile(
            file_, [this](uint32_t) { return floats_; }, floats_);
        frames_left_ = section.length
                           ? static_cast<uint64_t>(std::llround(*section.length * format_.rate))
                           : UINT64_MAX;
    }
    if (!pass_over(start)) {
        throw start_beyond_end(static_cast<double>(passed_) / format_.rate, section.start);
    }
}

/// Passes over that many frames of what was decoded. False when there are not as many.
bool FfmpegFile::pass_over(uint64_t frames)
{
    const size_t frame_bytes = format_.frame_bytes();
    while (frames > 0) {
        if (at_ == samples_.size() && !fetch()) {
            return false;
        }
        const uint64_t passed = std::min<uint64_t>(frames, (samples_.size() - at_) / frame_bytes);
        at_ += passed * frame_bytes;
        frames -= passed;
    }
    return true;
}

/// The same, from a place shortly before the end of these frames; false when it is not found.
bool FfmpegFile::pass_over_from_a_place(uint64_t frames)
{
    const double seconds = static_cast<double>(frames) / format_.rate;
    if (!decoder_->go_before(origin_, seconds - kPreroll) || !fetch() || stamp_ == AV_NOPTS_VALUE) {
        return false;
    }
    const int64_t place = decoder_->samples_between(origin_, stamp_, format_.rate);
    if (place < 0 || static_cast<uint64_t>(place) > frames) {
        return false;
    }
    passed_ = static_cast<uint64_t>(place) + samples_.size() / format_.frame_bytes();
    return pass_over(frames - static_cast<uint64_t>(place));
}

size_t FfmpegFile::read(std::span<std::byte> bytes)
{
    const size_t frame_bytes = format_.frame_bytes();
    const size_t frames = std::min<uint64_t>(bytes.size() / frame_bytes, frames_left_);
    const auto wanted = bytes.first(frames * frame_bytes);
    size_t done = 0;
    while (done < wanted.size() && (at_ < samples_.size() || fetch())) {
        const size_t count = std::min(wanted.size() - done, samples_.size() - at_);
        std::memcpy(wanted.data() + done, samples_.data() + at_, count);
        done += count;
        at_ += count;
    }
    frames_left_ -= done / frame_bytes;
    return done / frame_bytes;
}

std::optional<double> FfmpegFile::duration() const
{
    const AVFormatContext& container = decoder_->container();
    const AVStream& stream = decoder_->stream();
    if (container.duration_estimation_method == AVFMT_DURATION_FROM_BITRATE) {
        return {}; // a guess
    }
    if (stream.duration != AV_NOPTS_VALUE && stream.duration > 0) {
        return static_cast<double>(stream.duration) * av_q2d(stream.time_base);
    }
    if (container.nb_streams == 1 && container.duration > 0) {
        return static_cast<double>(container.duration) / AV_TIME_BASE;
    }
    const AVDictionaryEntry* const tag =
        ffmpeg().av_dict_get(stream.metadata, "DURATION", nullptr, 0);
    return tag == nullptr ? std::nullopt : to_duration(tag->value);
}

/// The names of tags differ between formats; FFmpeg has one set of them for most.
std::vector<Tag> FfmpegFile::tags() const
{
    constexpr std::pair<const char*, const char*> kNames[] = {
        {"title", "title"}, {"artist", "artist"}, {"album", "album"},      {"date", "date"},
        {"year", "date"},   {"genre", "genre"},   {"track", "tracknumber"}};
    std::vector<Tag> tags;
    for (const auto& [key, name] : kNames) {
        const AVDictionaryEntry* entry = nullptr;
        for (const AVDictionary* entries :
             {decoder_->stream().metadata, decoder_->container().metadata}) {
            entry = entry != nullptr ? entry : ffmpeg().av_dict_get(entries, key, nullptr, 0);
        }
        const bool is_new = std::ranges::find(tags, name, &Tag::name) == tags.end();
        if (entry != nullptr && *entry->value != 0 && is_new) {
            tags.push_back({.name = name, .value = to_utf8(entry->value)});
        }
    }
    return tags;
}

/// Why there is no more, when there should be.
std::string FfmpegFile::early_end() const
{
    if (!trouble_.empty() || !decoder_->trouble().empty()) {
        return trouble_.empty() ? decoder_->trouble() : trouble_;
    }
    const double seconds = static_cast<double>(passed_) / format_.rate;
    if (!ended_ || !duration() || *duration() <= seconds + kMissing) {
        return {};
    }
    return should_last(*duration());
}

std::string FfmpegFile::trouble() const
{
    std::string end = early_end();
    if (!end.empty() || decoder_->damaged() == 0) {
        return end;
    }
    const std::string count = std::to_string(decoder_->damaged());
    return count + (count == "1" ? " piece of it" : " pieces of it") + " cannot be decoded";
}

bool is_mp4(int file)
{
    std::array<char, 8> start = {};
    return ::pread(file, start.data(), start.size(), 0) == ssize_t{start.size()} &&
           std::string_view(start.data(), start.size()).ends_with("ftyp");
}

} // namespace

std::unique_ptr<FileSource> open_with_ffmpeg(int file, const AcceptsRate& accepts_rate, bool floats)
{
    try {
        return std::make_unique<FfmpegFile>(file, accepts_rate, floats);
    } catch (const LibraryError& error) {
        throw NotRecognised(not_recognised_text() + "; " + error.what());
    } catch (const NotRecognised&) {
        throw NotRecognised(is_mp4(file) ? "is an MP4 file without its index, probably because it "
                                           "was cut off; copy or record it again"
                                         : not_recognised_text());
    }
}

std::string ffmpeg_version()
{
    try {
        const std::string version = ffmpeg().av_version_info();
        return "FFmpeg " + version.substr(0, version.find('-'));
    } catch (const LibraryError&) {
        return {};
    }
}

} // namespace audio
