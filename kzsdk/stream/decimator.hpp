/// @file
/// Frames of a rate that is two, four, eight or sixteen times one that the fixed-point
/// fingerprinter takes, brought down to it.
#pragma once

#include <cstdint>
#include <span>

#include "kzsdk/dsp/resampler.h"

namespace kz::stream {

inline constexpr uint32_t kMaxHalvings = 4;
inline constexpr uint32_t kDecimatedBlock = 4096; ///< frames that are decimated together

/// One or two channels of 16-bit samples on their way through 2:1 filters. Cleared memory is a
/// decimator that has nothing to do; destroy() gives back what make() allocated.
///
/// How a block is cut shows in the last bits of the filters' sums. So frames are collected until a
/// block is full, and only the last block of a stream may be shorter.
struct Decimator {
    uint32_t halvings; ///< 0 .. kMaxHalvings
    uint32_t channels;
    KZDSP_resampler_fixed* filters[2][kMaxHalvings]; ///< by channel; owned
    int16_t* block;                                  ///< frames collected; owned
    uint32_t filled;                                 ///< of kDecimatedBlock
    int32_t* words;                                  ///< two blocks of one channel; owned
    int16_t* output;                                 ///< frames of the last block; owned

    /// @return False when memory is short; destroy() is due then too.
    bool make(uint32_t halving_count, uint32_t channel_count) noexcept;
    void destroy() noexcept;

    uint32_t room() const noexcept { return kDecimatedBlock - filled; }

    /// Collects frames, at most room() of them.
    void collect(const int16_t* frames, uint32_t count) noexcept;

    /// Decimates what was collected.
    ///
    /// @return Interleaved samples of whole frames, valid until the next call.
    std::span<const int16_t> decimate() noexcept;

private:
    uint32_t decimate_channel(uint32_t channel) noexcept;
};

} // namespace kz::stream
