#include "kzfp/duplicates/quality.hpp"

#include <algorithm>
#include <array>
#include <cmath>
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

/// Whole numbers, floats, or either as the extensible form has them.
bool is_lossless_wave(std::string_view bytes)
{
    const size_t chunk = bytes.find("fmt ");
    const uint32_t form = chunk == std::string_view::npos ? 0 : little_endian_16(bytes, chunk + 8);
    return form == 1 || form == 3 || form == 0xFFFE;
}

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
        return bytes.find("lpcm") != std::string_view::npos ||
               bytes.find("alac") != std::string_view::npos;
    }
    if (bytes.size() >= 8 && bytes.substr(4, 4) == "ftyp") {
        return bytes.find("alac") != std::string_view::npos;
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
        quality.lossless = sound.raw || is_lossless(beginning_of(path, kBeginning));
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
