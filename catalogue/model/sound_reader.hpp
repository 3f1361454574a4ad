/// @file
/// Bytes of interleaved samples as one channel of floats.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/model/extractor.hpp"

namespace kzcat {

/// Adds up the channels of a stream of bytes that may be cut anywhere. Full scale of one channel is
/// 32768. Floats beyond 16 times full scale are clipped there, and those that are no numbers are
/// silence. Both 8-bit encodings are read as samples that are silent at 128.
class SoundReader {
public:
    /// Throws std::invalid_argument with a sentence when the format cannot be used.
    explicit SoundReader(const SoundFormat& format);

    /// Reads whole frames from the front of `bytes`, up to a block of them and no more than
    /// a second, and keeps the bytes of a frame that is not yet whole.
    ///
    /// @return The sums, one a frame, valid until the next call; empty when all bytes are used.
    std::span<const float> read(std::span<const std::byte>& bytes);

private:
    size_t take_frames(std::span<const std::byte> bytes);
    std::span<const float> complete_partial(std::span<const std::byte>& bytes);

    SoundFormat format_;
    size_t frame_bytes_;
    size_t block_frames_;
    std::vector<std::byte> partial_; ///< the beginning of a frame
    std::vector<float> sums_;
};

} // namespace kzcat
