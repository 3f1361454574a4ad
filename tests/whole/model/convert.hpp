/// @file
/// Audio bytes to mono words, Q29 from one channel, Q30 (the average) from two, or to mono floats.
#pragma once

#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "whole/model/words.hpp"

namespace kz::model {

enum class Format : uint32_t { pcm8 = 1, pcm16 = 2, alaw = 3, ulaw = 4 };

/// G.711 mu-law to 16 bits: a sign, three bits of exponent and four of mantissa, all inverted, with
/// a bias of 132.
constexpr int32_t ulaw_value(uint8_t code)
{
    const int32_t bits = code ^ 0xff;
    const int32_t magnitude = (((bits & 15) * 8 + 132) << ((bits >> 4) & 7)) - 132;
    return (bits & 0x80) != 0 ? -magnitude : magnitude;
}

/// G.711 A-law to 16 bits with the sign turned round.
constexpr int32_t inverted_alaw_value(uint8_t code)
{
    const int32_t bits = code ^ 0x55;
    const int32_t exponent = (bits >> 4) & 7;
    const int32_t mantissa = (bits & 15) * 16 + 8;
    const int32_t magnitude = exponent == 0 ? mantissa : (mantissa + 256) << (exponent - 1);
    return (bits & 0x80) != 0 ? -magnitude : magnitude;
}

static_assert(ulaw_value(0x00) == -32124 && ulaw_value(0x7f) == 0);
static_assert(ulaw_value(0x80) == 32124 && ulaw_value(0xff) == 0);
static_assert(inverted_alaw_value(0x2a) == 32256 && inverted_alaw_value(0x55) == 8);
static_assert(inverted_alaw_value(0xaa) == -32256 && inverted_alaw_value(0xd5) == -8);

constexpr size_t bytes_per_sample(Format format) { return format == Format::pcm16 ? 2 : 1; }

/// Which byte of a 16-bit sample is the low one, in the processor's order.
inline constexpr size_t kLowByte = std::endian::native == std::endian::little ? 0 : 1;

/// One sample as an integer; 8-bit samples below the middle come out as 128..255.
constexpr int32_t sample_value(Format format, std::span<const uint8_t> bytes)
{
    switch (format) {
    case Format::pcm8:
        return bytes[0] ^ 0x80;
    case Format::pcm16:
        return static_cast<int16_t>(
            static_cast<uint16_t>(bytes[kLowByte] | bytes[1 - kLowByte] << 8));
    case Format::alaw:
        return inverted_alaw_value(bytes[0]);
    case Format::ulaw:
        return ulaw_value(bytes[0]);
    }
    return 0;
}

/// The sum of each frame's samples. Whole frames only: a rest of bytes at the end is left out.
inline std::vector<int64_t> frame_sums(Format format, size_t channels,
                                       std::span<const uint8_t> bytes)
{
    const size_t sample_bytes = bytes_per_sample(format);
    std::vector<int64_t> sums(bytes.size() / (sample_bytes * channels), 0);
    for (size_t frame = 0; frame < sums.size(); ++frame) {
        for (size_t channel = 0; channel < channels; ++channel) {
            sums[frame] +=
                sample_value(format, bytes.subspan((frame * channels + channel) * sample_bytes));
        }
    }
    return sums;
}

inline std::vector<int32_t> to_mono(Format format, size_t channels, std::span<const uint8_t> bytes)
{
    const int64_t unit = int64_t{1} << (format == Format::pcm8 ? 22 : 14);
    const std::vector<int64_t> sums = frame_sums(format, channels, bytes);
    std::vector<int32_t> mono(sums.size());
    std::transform(sums.begin(), sums.end(), mono.begin(),
                   [unit](int64_t sum) { return word(sum * unit); });
    return mono;
}

/// Without the average: two full channels give twice the level of one.
inline std::vector<float> to_mono_float(Format format, size_t channels,
                                        std::span<const uint8_t> bytes)
{
    const int64_t unit = format == Format::pcm8 ? 256 : 1;
    const std::vector<int64_t> sums = frame_sums(format, channels, bytes);
    std::vector<float> mono(sums.size());
    std::transform(sums.begin(), sums.end(), mono.begin(),
                   [unit](int64_t sum) { return static_cast<float>(sum * unit); });
    return mono;
}

} // namespace kz::model
