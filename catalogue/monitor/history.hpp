/// @file
/// The last minute of a stream, as the bands of its frames.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/model/fine_bands.hpp"

namespace kzcat {

/// A ring of frames, numbered from the beginning of the stream.
class FrameHistory {
public:
    static constexpr size_t kCapacity = 1280; ///< 59 s, 1.1 MB

    FrameHistory();

    void add(std::span<const float, kFineBands> energies, float level);

    /// A frame that says nothing, in place of sound that is missing.
    void add_silence();

    uint64_t begin() const { return end_ < kCapacity ? 0 : end_ - kCapacity; } ///< oldest kept
    uint64_t end() const { return end_; }

    /// A copy of `count` frames from `first` on, all of which have to be kept.
    QueryBands bands(uint64_t first, size_t count) const;

private:
    std::vector<float> energies_;
    std::vector<float> levels_;
    uint64_t end_ = 0;
};

/// The first sample of a frame, in seconds of the stream.
constexpr double seconds_at(uint64_t frame)
{
    return static_cast<double>(frame) * kQueryHop / kWorkingRate;
}

} // namespace kzcat
