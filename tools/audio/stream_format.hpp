/// @file
/// How samples lie in a stream, and which part of it is listened to.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>

namespace audio {

/// How one sample is written; floats have their full scale at 1.
enum class Encoding { u8, s16, alaw, ulaw, f32 };

constexpr size_t sample_bytes(Encoding encoding)
{
    switch (encoding) {
    case Encoding::f32:
        return 4;
    case Encoding::s16:
        return 2;
    case Encoding::u8:
    case Encoding::alaw:
    case Encoding::ulaw:
        break;
    }
    return 1;
}

/// How a stream of interleaved samples is to be read.
struct StreamFormat {
    uint32_t rate = 0; ///< hertz
    uint32_t channels = 0;
    Encoding encoding = Encoding::s16;

    /// Bytes of one sample of every channel.
    size_t frame_bytes() const { return size_t{channels} * sample_bytes(encoding); }
};

/// What a sound file may have at all, hertz.
constexpr uint32_t kLowestRate = 1000;
constexpr uint32_t kHighestRate = 768000;

constexpr bool is_usual_rate(uint32_t rate) { return rate >= kLowestRate && rate <= kHighestRate; }

/// Whether samples of a rate are given as they are. Sound files of other rates are converted.
using AcceptsRate = std::function<bool(uint32_t rate)>;

constexpr uint32_t kConvertedRate = 44100; ///< hertz; what all other rates are converted to

constexpr double kLongestSeconds = 1e9; ///< for a section's bounds: no counter wraps below

/// Which part of an input is listened to, in seconds.
struct Section {
    double start = 0;
    std::optional<double> length; ///< to the end when not given
};

} // namespace audio
