/// @file
/// Samples of every encoding, at any address, as sums over the channels. Sums are taken in double
/// precision, the first channel first, and rounded once; those of integers are exact until then.

#include "catalogue/model/sound_reader.hpp"

#include <algorithm>
#include <bit>
#include <cstring>
#include <stdexcept>
#include <string>

#include "kzsdk/dsp/convert.h"
#include "kzsdk/stream/stream.h"

namespace kzcat {

namespace {

constexpr size_t kBlockBytes = 32768; // samples and sums of a block fit the first caches
constexpr double kFullScale = 32768;
constexpr double kLoudest = 16 * kFullScale;

template <class Word>
Word load(const std::byte* bytes)
{
    Word word;
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

// The three bytes of a sample as the upper ones of a word.
int32_t load_24_bits(const std::byte* bytes)
{
    uint32_t word = 0;
    constexpr bool kLittle = std::endian::native == std::endian::little;
    std::memcpy(reinterpret_cast<std::byte*>(&word) + (kLittle ? 1 : 0), bytes, 3);
    return std::bit_cast<int32_t>(word);
}

double from_float(double sample)
{
    const double scaled = sample * kFullScale;
    return scaled == scaled ? std::clamp(scaled, -kLoudest, kLoudest) : 0;
}

size_t bytes_per_sample(uint32_t encoding)
{
    switch (encoding) {
    case KZ_STREAM_FORMAT_PCM8:
    case KZ_STREAM_FORMAT_LINEAR8:
    case KZ_STREAM_FORMAT_ALAW:
    case KZ_STREAM_FORMAT_ULAW:
        return 1;
    case KZ_STREAM_FORMAT_PCM16:
        return 2;
    case KZ_STREAM_FORMAT_PCM24:
        return 3;
    case KZ_STREAM_FORMAT_PCM32:
    case KZ_STREAM_FORMAT_FLOAT32:
        return 4;
    case KZ_STREAM_FORMAT_FLOAT64:
        return 8;
    default:
        return 0;
    }
}

// Calls `value_of(bytes of a sample)` for each sample of each frame.
template <size_t Size, class ValueOf>
void sum_frames(const std::byte* bytes, std::span<float> sums, uint32_t channels, ValueOf value_of)
{
    for (float& sum : sums) {
        double total = 0;
        for (uint32_t c = 0; c < channels; ++c, bytes += Size) {
            total += value_of(bytes);
        }
        sum = static_cast<float>(total);
    }
}

void sum_16_bits(const std::byte* bytes, std::span<float> sums, uint32_t channels)
{
    const auto frames = static_cast<int32_t>(sums.size());
    if (channels == 1) {
        KZDSP_ShortToFloat(bytes, sums.data(), frames);
    } else if (channels == 2) {
        KZDSP_StereoShortToMonoFloat(bytes, sums.data(), frames);
    } else {
        sum_frames<2>(bytes, sums, channels, [](const std::byte* at) { return load<int16_t>(at); });
    }
}

// What from_float() gives, in single precision: scaling by a power of two is exact.
float from_single(float sample)
{
    constexpr auto kLimit = static_cast<float>(kLoudest);
    const float scaled = sample * static_cast<float>(kFullScale);
    const float below = scaled < kLimit ? scaled : kLimit; // the limit too for what is no number
    const float clipped = below > -kLimit ? below : -kLimit;
    return scaled == scaled ? clipped : 0.0F;
}

// One channel and two, as most sound has, without branches, so that compilers use vectors. A sum of
// two in single precision is that in double precision, rounded: a double has more than twice a
// single's bits.
template <size_t channels>
void sum_few_singles(const std::byte* bytes, float* sums, size_t frames)
{
    for (size_t i = 0; i < frames; ++i) {
        const std::byte* const at = bytes + 4 * channels * i;
        float sum = from_single(load<float>(at));
        if constexpr (channels == 2) {
            sum += from_single(load<float>(at + 4));
        }
        sums[i] = sum;
    }
}

void sum_singles(const std::byte* bytes, std::span<float> sums, uint32_t channels)
{
    if (channels == 1) {
        sum_few_singles<1>(bytes, sums.data(), sums.size());
    } else if (channels == 2) {
        sum_few_singles<2>(bytes, sums.data(), sums.size());
    } else {
        sum_frames<4>(bytes, sums, channels,
                      [](const std::byte* at) { return from_float(load<float>(at)); });
    }
}

void sum_channels(const SoundFormat& format, const std::byte* bytes, std::span<float> sums)
{
    const auto from_table = [](const int16_t* table, double sign) {
        return [=](const std::byte* at) { return sign * table[load<uint8_t>(at)]; };
    };
    const uint32_t channels = format.channels;
    switch (format.encoding) {
    case KZ_STREAM_FORMAT_PCM16:
        return sum_16_bits(bytes, sums, channels);
    case KZ_STREAM_FORMAT_ALAW: // the library's table has the sign inverted
        return sum_frames<1>(bytes, sums, channels, from_table(KZDSP_GetALawTable(), -1));
    case KZ_STREAM_FORMAT_ULAW:
        return sum_frames<1>(bytes, sums, channels, from_table(KZDSP_GetuLawTable(), 1));
    case KZ_STREAM_FORMAT_PCM24:
        return sum_frames<3>(bytes, sums, channels,
                             [](const std::byte* at) { return load_24_bits(at) * 0x1p-16; });
    case KZ_STREAM_FORMAT_PCM32:
        return sum_frames<4>(bytes, sums, channels,
                             [](const std::byte* at) { return load<int32_t>(at) * 0x1p-16; });
    case KZ_STREAM_FORMAT_FLOAT32:
        return sum_singles(bytes, sums, channels);
    case KZ_STREAM_FORMAT_FLOAT64:
        return sum_frames<8>(bytes, sums, channels,
                             [](const std::byte* at) { return from_float(load<double>(at)); });
    default: // 8 bits
        return sum_frames<1>(bytes, sums, channels,
                             [](const std::byte* at) { return (load<uint8_t>(at) - 128) * 256; });
    }
}

void require(bool holds, const std::string& sentence)
{
    if (!holds) {
        throw std::invalid_argument(sentence);
    }
}

void require_usable(const SoundFormat& format)
{
    require(bytes_per_sample(format.encoding) != 0,
            "Encoding " + std::to_string(format.encoding) +
                " of samples is not known; use one of KZ_STREAM_FORMAT_...");
    require(format.rate >= 1 && format.rate <= KZ_STREAM_MAX_RATE,
            "A sample rate of " + std::to_string(format.rate) +
                " Hz cannot be used; it must be 1 to " + std::to_string(KZ_STREAM_MAX_RATE) + ".");
    require(format.channels >= 1 && format.channels <= KZ_STREAM_MAX_CHANNELS,
            "Sound of " + std::to_string(format.channels) +
                " channels cannot be used; there must be 1 to " +
                std::to_string(KZ_STREAM_MAX_CHANNELS) + ".");
}

const SoundFormat& usable(const SoundFormat& format)
{
    require_usable(format);
    return format;
}

} // namespace

SoundReader::SoundReader(const SoundFormat& format)
    : format_(usable(format)), frame_bytes_(bytes_per_sample(format.encoding) * format.channels),
      block_frames_(std::clamp<size_t>(kBlockBytes / frame_bytes_, 1, format.rate)),
      sums_(block_frames_)
{
    partial_.reserve(frame_bytes_);
}

std::span<const float> SoundReader::read(std::span<const std::byte>& bytes)
{
    if (!partial_.empty()) {
        return complete_partial(bytes);
    }
    const size_t frames = take_frames(bytes);
    bytes = bytes.subspan(frames * frame_bytes_);
    if (frames == 0) {
        partial_.assign(bytes.begin(), bytes.end());
        bytes = {};
    }
    return std::span(sums_).first(frames);
}

size_t SoundReader::take_frames(std::span<const std::byte> bytes)
{
    const size_t frames = std::min(bytes.size() / frame_bytes_, block_frames_);
    sum_channels(format_, bytes.data(), std::span(sums_).first(frames));
    return frames;
}

// The frame of which the beginning was kept, if its end is here.
std::span<const float> SoundReader::complete_partial(std::span<const std::byte>& bytes)
{
    const size_t missing = std::min(frame_bytes_ - partial_.size(), bytes.size());
    partial_.insert(partial_.end(), bytes.begin(),
                    bytes.begin() + static_cast<std::ptrdiff_t>(missing));
    bytes = bytes.subspan(missing);
    const size_t frames = take_frames(partial_);
    if (frames != 0) {
        partial_.clear();
    }
    return std::span(sums_).first(frames);
}

} // namespace kzcat
