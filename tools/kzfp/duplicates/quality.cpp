#include "kzfp/duplicates/quality.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <fstream>
#include <string_view>
#include <tuple>
#include <vector>

#include <sys/stat.h>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/duplicates/bandwidth.hpp"
#include "kzfp/duplicates/decoded.hpp"

namespace kzfp {

namespace {

constexpr size_t kBeginning = 65536;
constexpr uint64_t kLongestFile = uint64_t{1} << 62U;
constexpr double kLookedAt = 20; ///< seconds
constexpr double kBandwidthStep = 2000;
constexpr double kAudible = 20000; ///< hertz

uint32_t little_endian_16(std::string_view bytes, size_t at)
{
    return at + 1 < bytes.size()
               ? static_cast<uint8_t>(bytes[at]) |
                     static_cast<uint32_t>(static_cast<uint8_t>(bytes[at + 1])) << 8U
               : 0;
}

bool is_whole_numbers_or_floats(uint32_t form) { return form == 1 || form == 3; }

/// Whole numbers, floats, or either as the extensible form has them.
bool is_lossless_wave(std::string_view bytes)
{
    const size_t chunk = bytes.find("fmt ");
    if (chunk == std::string_view::npos) {
        return false;
    }
    const size_t at = chunk + (bytes.starts_with("riff") ? 24 : 8); // Wave64 has longer names
    uint32_t form = little_endian_16(bytes, at);
    if (bytes.starts_with("RIFX")) {
        form = (form & 0xFFU) << 8U | form >> 8U;
    }
    return is_whole_numbers_or_floats(form == 0xFFFE ? little_endian_16(bytes, at + 24) : form);
}

/// What follows the tag, whose length has seven bits in each byte.
std::string_view behind_id3(std::string_view bytes)
{
    size_t length = 0;
    for (size_t at = 6; at < 10 && at < bytes.size(); ++at) {
        length = length << 7U | (static_cast<uint8_t>(bytes[at]) & 0x7FU);
    }
    return bytes.substr(std::min(bytes.size(), 10 + length));
}

/// Of any of the sounds in it.
bool is_lossless_mp4(std::string_view bytes)
{
    for (size_t at = bytes.find("stsd"); at != std::string_view::npos;
         at = bytes.find("stsd", at + 4)) {
        if (bytes.size() >= at + 20 && bytes.substr(at + 16, 4) == "alac") {
            return true;
        }
    }
    return false;
}

uint64_t big_endian(std::string_view bytes)
{
    uint64_t number = 0;
    for (const char byte : bytes) {
        number = number << 8U | static_cast<uint8_t>(byte);
    }
    return number;
}

/// Where an MP4 file says what is in it: at its start, or behind everything else.
std::string description_in_mp4(const std::string& path)
{
    std::ifstream file(path, std::ios::binary);
    uint64_t at = 0;
    std::string box(16, '\0');
    while (file.seekg(static_cast<std::streamoff>(at)) && file.read(box.data(), 16)) {
        const std::string_view bytes = box;
        const uint64_t short_size = big_endian(bytes.substr(0, 4));
        const uint64_t size = short_size == 1 ? big_endian(bytes.substr(8, 8)) : short_size;
        if (bytes.substr(4, 4) == "moov") {
            std::string text(kBeginning, '\0');
            file.read(text.data(), static_cast<std::streamsize>(text.size()));
            text.resize(static_cast<size_t>(file.gcount()));
            return text;
        }
        if (size < 8 || size > kLongestFile - at) {
            break;
        }
        at += size;
    }
    return {};
}

bool is_mp4(std::string_view bytes) { return bytes.size() >= 8 && bytes.substr(4, 4) == "ftyp"; }

bool is_lossless_aifc(std::string_view bytes)
{
    constexpr std::array<std::string_view, 6> kForms = {"NONE", "sowt", "twos",
                                                        "fl32", "FL32", "fl64"};
    const size_t chunk = bytes.find("COMM");
    return chunk != std::string_view::npos && bytes.size() >= chunk + 30 &&
           std::ranges::find(kForms, bytes.substr(chunk + 26, 4)) != kForms.end();
}

std::vector<float> to_mono(const std::vector<float>& samples, size_t channels)
{
    std::vector<float> sums(samples.size() / channels);
    for (size_t i = 0; i < sums.size() * channels; ++i) {
        sums[i / channels] += samples[i] / static_cast<float>(channels);
    }
    return sums;
}

/// 0 for the 8-bit encodings, whose noise hides it.
double bandwidth_of_source(audio::Source& source, uint32_t rate)
{
    const audio::StreamFormat format = source.format();
    const auto samples = read_floats(source, static_cast<size_t>(kLookedAt * format.rate));
    return std::min(bandwidth_of(to_mono(samples, format.channels), format.rate), rate / 2.0);
}

void look_at_sound(const std::string& path, const SoundOptions& sound, Quality& quality)
{
    with_sound_of(path, sound, {}, [&quality](const audio::OpenedInput& opened) {
        quality.rate = opened.facts.rate;
        quality.channels = opened.facts.channels;
        quality.seconds = opened.facts.duration.value_or(0);
    });
    const double start = std::max(0.0, (quality.seconds - kLookedAt) / 2);
    const audio::Section middle = {.start = start, .length = kLookedAt};
    with_sound_of(path, sound, middle, [&quality](const audio::OpenedInput& opened) {
        quality.bandwidth = bandwidth_of_source(*opened.source, quality.rate);
    });
}

} // namespace

bool is_lossless(const std::string& beginning)
{
    const std::string_view bytes = beginning;
    const auto begins = [bytes](std::string_view with) { return bytes.starts_with(with); };
    if (begins("RIFF") || begins("RIFX") || begins("RF64") || begins("riff")) {
        return is_lossless_wave(bytes);
    }
    if (begins("FORM") && bytes.size() >= 12) {
        const std::string_view form = bytes.substr(8, 4);
        return form == "AIFF" || form == "8SVX" || (form == "AIFC" && is_lossless_aifc(bytes));
    }
    if (begins("OggS")) {
        return bytes.substr(0, 64).find("\x7f"
                                        "FLAC") != std::string_view::npos;
    }
    if (begins("caff")) {
        const size_t chunk = bytes.find("desc");
        const std::string_view form =
            bytes.substr(std::min(bytes.size(), chunk + (chunk < bytes.size() ? 20 : 0)), 4);
        return form == "lpcm" || form == "alac";
    }
    if (is_mp4(bytes)) {
        return is_lossless_mp4(bytes);
    }
    if (begins(".snd")) {
        return bytes.size() >= 16 && bytes[15] >= 2 && bytes[15] <= 7;
    }
    if (begins("ID3")) {
        return behind_id3(bytes).starts_with("fLaC");
    }
    return begins("fLaC") || begins("wvPk") || begins("MAC ") || begins("TTA1");
}

Quality quality_of(const std::string& path, const SoundOptions& sound)
{
    Quality quality;
    struct stat facts = {};
    if (::stat(path.c_str(), &facts) != 0) {
        return quality;
    }
    quality.device = facts.st_dev;
    quality.inode = facts.st_ino;
    try {
        if (!S_ISREG(facts.st_mode)) {
            throw audio::FileError("is no regular file any more");
        }
        const std::string beginning = beginning_of(path, kBeginning);
        quality.lossless = sound.raw || is_lossless(beginning) ||
                           (is_mp4(beginning) && is_lossless_mp4(description_in_mp4(path)));
        if (sound.raw || content_of_file(path) == Content::sound) {
            look_at_sound(path, sound, quality);
        }
        quality.state = Quality::State::there;
    } catch (const audio::FileError& error) {
        quality.state = Quality::State::unreadable;
        quality.trouble = error.what();
    }
    if (quality.seconds > 0) {
        quality.bit_rate = 8 * static_cast<double>(facts.st_size) / quality.seconds;
    }
    return quality;
}

bool is_better(const Quality& one, const Quality& other)
{
    const auto rank = [](const Quality& quality) {
        const double bit_rate = quality.lossless ? 0 : std::round(quality.bit_rate / 1000);
        return std::tuple(quality.state == Quality::State::there, quality.rate != 0,
                          quality.lossless, quality.complete, quality.wide,
                          quality.wide ? 0 : std::floor(quality.bandwidth / kBandwidthStep),
                          quality.channels, bit_rate, -std::round(quality.silent));
    };
    return rank(one) > rank(other);
}

void compare_among(std::span<Quality* const> group)
{
    double longest = 0;
    std::array<double, 2> widest = {}; // of lossy files, of lossless ones
    for (const Quality* quality : group) {
        double& wide = widest.at(quality->lossless ? 1 : 0);
        longest = std::max(longest, quality->sounding);
        wide = std::max(wide, std::min(quality->bandwidth, kAudible));
    }
    for (Quality* quality : group) {
        quality->complete = quality->sounding >= longest - kSameLength;
        quality->wide = quality->bandwidth >= widest.at(quality->lossless ? 1 : 0) - kBandwidthStep;
    }
}

bool is_clearly_inferior(const Quality& copy, const Quality& best)
{
    return copy.state == Quality::State::there && best.state == Quality::State::there &&
           copy.rate != 0 && best.lossless && !copy.lossless &&
           copy.bandwidth <= best.bandwidth + kBandwidthStep / 2 &&
           copy.channels <= best.channels && copy.sounding <= best.sounding + kSameLength;
}

} // namespace kzfp
