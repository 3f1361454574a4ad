/// @file
/// From what decoders make to 16-bit samples.
#pragma once

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <span>

namespace audio {

/// Full scale is 32768, so that 16-bit samples come back unchanged from a file of floats. Rounded
/// to the nearest, clipped at full scale; what is not a number is silence.
inline int16_t to_16_bits(float sample)
{
    const float scaled = sample * 32768.0f;
    if (std::isnan(scaled)) {
        return 0;
    }
    return static_cast<int16_t>(std::lrint(std::clamp(scaled, -32768.0f, 32767.0f)));
}

/// Leaves one sample for each frame at the start of `samples`. The library's rule for many
/// channels: the sum divided by the smallest power of two that is not below their number, here
/// rounded to the nearest 16-bit word.
inline void mix_down(std::span<int16_t> samples, size_t channels)
{
    if (channels < 2) {
        return;
    }
    const auto shift = static_cast<int>(std::bit_width(channels - 1));
    const int32_t half = int32_t{1} << (shift - 1);
    for (size_t i = 0; i < samples.size() / channels; ++i) {
        int32_t sum = 0;
        for (size_t c = 0; c < channels; ++c) {
            sum += samples[i * channels + c];
        }
        samples[i] = static_cast<int16_t>((sum + half) >> shift);
    }
}

} // namespace audio
