/// @file
/// From frames as callers have them to frames as the extraction interface takes them.
#pragma once

#include <cstdint>
#include <span>

#include "kzsdk/stream/stream.h"

namespace kz::stream {

/// How frames come in, and how they go on.
struct FrameLayout {
    uint32_t format;         ///< KZ_STREAM_FORMAT_...
    uint32_t channels;       ///< that come in
    uint32_t frame_bytes;    ///< of all of these channels
    uint32_t piece_format;   ///< KZ_FPX_FORMAT_..., as they go on
    uint32_t piece_channels; ///< 1 or 2, that go on
    uint8_t goes_as_it_is;   ///< the bytes that come in are those that go on

    /// Of a frame as it goes on.
    uint32_t piece_frame_bytes() const noexcept
    {
        return piece_channels * (piece_format == KZ_FPX_FORMAT_PCM16 ? 2 : 1);
    }
};

/// Bytes of a sample; 0 for a number that is no format.
uint32_t bytes_per_sample(uint32_t format) noexcept;

/// @param decimated  The rate is one that the fingerprinter does not take: samples have to be
///                   words.
FrameLayout layout_of(uint32_t format, uint32_t channels, bool decimated) noexcept;

/// Turns frames that do not go as they are into 16-bit words of `piece_channels` channels.
///
/// @param bytes    `frames` frames of `layout.frame_bytes`, at any address.
/// @param samples  Room for every channel that comes in; the words that go on are at its start.
void read_frames(const FrameLayout& layout, const uint8_t* bytes, uint32_t frames,
                 int16_t* samples) noexcept;

} // namespace kz::stream
