/// @file
/// Sound for pictures: one channel, at a low rate.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "audio/stream_format.hpp"

namespace audio {

struct Mono {
    std::vector<float> samples; ///< full scale is 1
    uint32_t rate = 0;          ///< hertz
};

constexpr uint32_t kMonoRate = 11025; ///< hertz

/// Reads a section of a file at kMonoRate. Headerless sound, which looks like `raw`, keeps its rate
/// where that is lower, or where it is not 16-bit PCM. Memory grows with the section. Throws
/// FileError.
Mono read_mono(const std::string& path, const std::optional<StreamFormat>& raw,
               const Section& section);

} // namespace audio
