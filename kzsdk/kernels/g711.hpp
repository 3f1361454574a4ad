/// @file
/// G.711 expansion: code bytes to 16-bit samples, after the rules of ITU-T G.711.
///
/// Both laws write a sample as sign, segment and step. The steps of a segment have one size, twice
/// that of the segment below, and a code stands for the middle of its step.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace kz::g711 {

struct Code {
    bool sign_bit;
    int32_t segment; ///< 0 .. 7
    int32_t step;    ///< 0 .. 15
};

constexpr Code split(uint8_t bits) noexcept
{
    return {(bits & 0x80) != 0, (bits >> 4) & 7, bits & 15};
}

/// mu-law: all bits are sent inverted, and a bias of 33 (of 8192) makes every segment start at a
/// power of two. 0x00 gives -32124, 0x7f and 0xff give 0.
constexpr int16_t expand_ulaw(uint8_t byte) noexcept
{
    const Code code = split(static_cast<uint8_t>(~byte));
    const int32_t size = (((2 * code.step + 33) << code.segment) - 33) * 4;
    return static_cast<int16_t>(code.sign_bit ? -size : size);
}

/// A-law: even bits are sent inverted, segments 0 and 1 have steps of one size. The polarity is the
/// opposite of the recommendation's: bytes without their top bit are positive here. 0x2a gives
/// 32256, 0xd5 gives -8.
constexpr int16_t expand_alaw(uint8_t byte) noexcept
{
    const Code code = split(byte ^ 0x55);
    const int32_t size = code.segment == 0 ? (2 * code.step + 1) * 8
                                           : ((2 * code.step + 33) << (code.segment - 1)) * 8;
    return static_cast<int16_t>(code.sign_bit ? -size : size);
}

constexpr std::array<int16_t, 256> expansion_table(int16_t (*expand)(uint8_t) noexcept) noexcept
{
    std::array<int16_t, 256> table{};
    for (uint32_t byte = 0; byte < table.size(); ++byte) {
        table[byte] = expand(static_cast<uint8_t>(byte));
    }
    return table;
}

/// From what a vector makes samples, byte by byte, of the halves of their codes:
///
///     sample = 2^unit_log2 * (scales[high] * sign * steps[low] - biases[high])
///
/// The sign is that of biases[high], which is never 0.
struct LawParts {
    int32_t unit_log2;
    int8_t steps[16];
    uint8_t scales[16];
    int8_t biases[16];
};

/// Segments above the first are written with steps that are larger by one, so that they have a
/// bias.
constexpr LawParts alaw_parts() noexcept
{
    LawParts parts{.unit_log2 = 3, .steps = {}, .scales = {}, .biases = {}};
    for (int32_t half = 0; half < 16; ++half) {
        const Code high = split(static_cast<uint8_t>((half << 4) ^ 0x55));
        const Code low = split(static_cast<uint8_t>(half ^ 0x55));
        const int32_t scale = high.segment == 0 ? 1 : 1 << (high.segment - 1);
        const int32_t bias = high.segment == 0 ? 33 : scale;
        parts.steps[half] = static_cast<int8_t>(2 * low.step + 34);
        parts.scales[half] = static_cast<uint8_t>(scale);
        parts.biases[half] = static_cast<int8_t>(high.sign_bit ? -bias : bias);
    }
    return parts;
}

constexpr LawParts ulaw_parts() noexcept
{
    LawParts parts{.unit_log2 = 2, .steps = {}, .scales = {}, .biases = {}};
    for (int32_t half = 0; half < 16; ++half) {
        const Code high = split(static_cast<uint8_t>(~(half << 4)));
        const Code low = split(static_cast<uint8_t>(~half));
        parts.steps[half] = static_cast<int8_t>(2 * low.step + 33);
        parts.scales[half] = static_cast<uint8_t>(1 << high.segment);
        parts.biases[half] = static_cast<int8_t>(high.sign_bit ? -33 : 33);
    }
    return parts;
}

} // namespace kz::g711
