// Formats that libsndfile decodes to floats are rounded here: its own conversion to 16 bits neither
// scales floats nor clips.

#include "audio/sound_file.hpp"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <limits>
#include <utility>

#include <unistd.h>

#include "audio/missing_samples.hpp"
#include "audio/samples.hpp"

namespace audio {

namespace {

constexpr size_t kBlock = 4096; ///< frames read at a time

} // namespace

SoundFile::SoundFile(int file, const AcceptsRate& accepts_rate, bool floats)
{
    // The object gets a descriptor of its own, which libsndfile closes, also when it cannot open
    // it.
    const int own = ::dup(file);
    if (own < 0 || ::lseek(own, 0, SEEK_SET) != 0) {
        throw system_error("cannot be read", errno);
    }
    file_.reset(sf_open_fd(own, SFM_READ, &info_, SF_TRUE));
    if (!file_) {
        throw NotRecognised(not_recognised_text());
    }
    // A header that could only be read in part is taken for another one; the next call clears that
    // error.
    if (sf_error(file_.get()) == SF_ERR_SYSTEM) {
        throw FileError("cannot be read (" + SoundFile::trouble() + ")");
    }
    check();
    cut_off_ = why_cut_off(file_.get(), info_);
    states_length_ = (info_.format & SF_FORMAT_TYPEMASK) == SF_FORMAT_MPEG && has_length_tag(file);
    if (is_companded() && info_.channels <= 2 && accepts_rate(file_rate())) {
        const bool alaw = (info_.format & SF_FORMAT_SUBMASK) == SF_FORMAT_ALAW;
        encoding_ = alaw ? Encoding::alaw : Encoding::ulaw;
    } else if (floats && is_decoded_to_float() && accepts_rate(file_rate())) {
        encoding_ = Encoding::f32;
    }
}

bool SoundFile::is_opus() const { return (info_.format & SF_FORMAT_SUBMASK) == SF_FORMAT_OPUS; }

void SoundFile::select(const Section& section)
{
    if (section.length) {
        frames_left_ = static_cast<uint64_t>(std::llround(*section.length * file_rate()));
    }
    const sf_count_t start = std::llround(section.start * file_rate());
    go_to(start);
    position_ = static_cast<uint64_t>(start);
}

void SoundFile::check() const
{
    if (info_.channels < 1) {
        throw FileError("has no channels, one or more are needed");
    }
    if (info_.samplerate < 0 || !is_usual_rate(file_rate())) {
        throw FileError("has a rate of " + std::to_string(info_.samplerate) + " Hz, " +
                        std::to_string(kLowestRate) + " to " + std::to_string(kHighestRate) +
                        " Hz can be used");
    }
}

std::optional<double> SoundFile::duration() const
{
    if (info_.frames < 0 || info_.frames == std::numeric_limits<sf_count_t>::max()) {
        return {};
    }
    return static_cast<double>(info_.frames) / info_.samplerate;
}

std::vector<Tag> SoundFile::tags() const
{
    constexpr std::pair<int, const char*> kStrings[] = {
        {SF_STR_TITLE, "title"}, {SF_STR_ARTIST, "artist"}, {SF_STR_ALBUM, "album"},
        {SF_STR_DATE, "date"},   {SF_STR_GENRE, "genre"},   {SF_STR_TRACKNUMBER, "tracknumber"}};
    std::vector<Tag> tags;
    for (const auto& [number, name] : kStrings) {
        const char* const text = sf_get_string(file_.get(), number);
        if (text != nullptr && *text != 0) {
            tags.push_back({.name = name, .value = to_utf8(text)});
        }
    }
    return tags;
}

StreamFormat SoundFile::format() const
{
    const bool mixed = encoding_ == Encoding::s16 && info_.channels > 2;
    return {file_rate(), mixed ? 1 : file_channels(), encoding_};
}

/// True for containers in which companded samples are one byte each, in one piece.
bool SoundFile::is_companded() const
{
    const int coding = info_.format & SF_FORMAT_SUBMASK;
    switch (info_.format & SF_FORMAT_TYPEMASK) {
    case SF_FORMAT_WAV:
    case SF_FORMAT_WAVEX:
    case SF_FORMAT_W64:
    case SF_FORMAT_RF64:
    case SF_FORMAT_AU:
    case SF_FORMAT_AIFF:
    case SF_FORMAT_CAF:
        return coding == SF_FORMAT_ALAW || coding == SF_FORMAT_ULAW;
    default:
        return false;
    }
}

/// libsndfile's own conversion of these to 16 bits neither scales floats nor clips (or looks for
/// the peak of the whole file first).
bool SoundFile::is_decoded_to_float() const
{
    switch (info_.format & SF_FORMAT_SUBMASK) {
    case SF_FORMAT_FLOAT:
    case SF_FORMAT_DOUBLE:
    case SF_FORMAT_VORBIS:
    case SF_FORMAT_OPUS:
    case SF_FORMAT_MPEG_LAYER_I:
    case SF_FORMAT_MPEG_LAYER_II:
    case SF_FORMAT_MPEG_LAYER_III:
        return true;
    default:
        return false;
    }
}

void SoundFile::go_to(sf_count_t start)
{
    if (start == 0 || (info_.seekable && sf_seek(file_.get(), start, SEEK_SET) == start)) {
        return;
    }
    // Either the file ends before, or it can only be read forwards.
    if (!info_.seekable) {
        sf_count_t left = start;
        while (left > 0) {
            const sf_count_t got = read_samples(std::min<sf_count_t>(left, kBlock));
            if (got <= 0) {
                break;
            }
            left -= got;
        }
        if (left == 0) {
            return;
        }
    }
    throw start_beyond_end(duration().value_or(0), static_cast<double>(start) / info_.samplerate);
}

size_t SoundFile::read(std::span<std::byte> bytes)
{
    const size_t frame_bytes = format().frame_bytes();
    const size_t frames = std::min<uint64_t>(bytes.size() / frame_bytes, frames_left_);
    const auto wanted = bytes.first(frames * frame_bytes);
    size_t done = 0;
    if (encoding_ == Encoding::s16) {
        done = read_pcm16(wanted);
    } else if (encoding_ == Encoding::f32) {
        done = read_floats(wanted);
    } else {
        const auto size = static_cast<sf_count_t>(wanted.size());
        const sf_count_t got = sf_read_raw(file_.get(), wanted.data(), size);
        done = static_cast<size_t>(std::max<sf_count_t>(got, 0)) / frame_bytes;
    }
    ended_ = done < frames;
    position_ += done;
    frames_left_ -= done;
    return done;
}

std::string SoundFile::trouble() const
{
    if (sf_error(file_.get()) == SF_ERR_NO_ERROR) {
        if (!ended_) {
            return {};
        }
        return is_too_short() ? should_last(*duration()) : cut_off_;
    }
    std::string text = sf_strerror(file_.get());
    if (text.starts_with("Error : ")) {
        text.erase(0, 8);
    }
    if (text.ends_with('.')) {
        text.pop_back();
    }
    return text;
}

/// The length that an MP3 file states is right to a few frames.
bool SoundFile::is_too_short() const
{
    return states_length_ && duration() &&
           static_cast<double>(position_) / info_.samplerate + kMissing < *duration();
}

size_t SoundFile::read_pcm16(std::span<std::byte> bytes)
{
    const size_t frame_bytes = format().frame_bytes();
    if (info_.channels <= 2 && !is_decoded_to_float()) {
        auto* const samples = reinterpret_cast<int16_t*>(bytes.data());
        const auto all = static_cast<sf_count_t>(bytes.size() / frame_bytes);
        return static_cast<size_t>(
            std::max<sf_count_t>(sf_readf_short(file_.get(), samples, all), 0));
    }
    size_t done = 0;
    const size_t frames = bytes.size() / frame_bytes;
    while (done < frames) {
        const auto wanted = static_cast<sf_count_t>(std::min(kBlock, frames - done));
        const auto got = static_cast<size_t>(std::max<sf_count_t>(read_samples(wanted), 0));
        if (info_.channels > 2) {
            mix_down(std::span(samples_).first(got * file_channels()), file_channels());
        }
        std::memcpy(bytes.data() + done * frame_bytes, samples_.data(), got * frame_bytes);
        done += got;
        if (got == 0) {
            break;
        }
    }
    return done;
}

size_t SoundFile::read_floats(std::span<std::byte> bytes)
{
    auto* const samples = reinterpret_cast<float*>(bytes.data());
    const auto frames = static_cast<sf_count_t>(bytes.size() / format().frame_bytes());
    return static_cast<size_t>(
        std::max<sf_count_t>(sf_readf_float(file_.get(), samples, frames), 0));
}

/// Reads frames of all channels into `samples_`.
sf_count_t SoundFile::read_samples(sf_count_t frames)
{
    const auto count = static_cast<size_t>(frames) * file_channels();
    samples_.resize(count);
    if (!is_decoded_to_float()) {
        return sf_readf_short(file_.get(), samples_.data(), frames);
    }
    floats_.resize(count);
    const sf_count_t got = sf_readf_float(file_.get(), floats_.data(), frames);
    const size_t filled = static_cast<size_t>(std::max<sf_count_t>(got, 0)) * file_channels();
    std::transform(floats_.begin(), floats_.begin() + static_cast<std::ptrdiff_t>(filled),
                   samples_.begin(), to_16_bits);
    return got;
}

} // namespace audio
