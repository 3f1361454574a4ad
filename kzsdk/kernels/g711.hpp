/// @file
/// G.711 expansion: code bytes to 16-bit samples, after the rules of ITU-T G.711.
///
/// Both laws write a sample as sign, segment and step. The steps of a segment have one size, twice
/// that of the segment below, and a code stands for the middle of its step.
#pragma once

#include <array>
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

using Table = std::array<int16_t, 256>;

constexpr Table expansion_table(int16_t (*expand)(uint8_t) noexcept) noexcept
{
    Table table{};
    for (uint32_t byte = 0; byte < table.size(); ++byte) {
        table[byte] = expand(static_cast<uint8_t>(byte));
    }
    return table;
}

inline constexpr Table kULaw = expansion_table(expand_ulaw);
inline constexpr Table kALaw = expansion_table(expand_alaw);

} // namespace kz::g711
