/// @file
/// How loud the frames of a query are.
#pragma once

#include <array>
#include <cstddef>

#include "catalogue/model/frame_analyser.hpp"
#include "catalogue/model/profile.hpp"

namespace kzcat {

/// The levels of frames that follow each other by kQueryHop. Each sample is looked at once, though
/// it lies in several frames.
class LevelMeter {
public:
    /// The level of the next frame: log2 of its energy about its mean, the sum of the squares of
    /// kFrameLength samples, plus one. 0 for silence and DC, 41 for a sine at full scale.
    float measure(Frame frame);

private:
    static constexpr size_t kBlocks = kFrameLength / kQueryHop;

    struct Sums {
        double samples;
        double squares;
    };
    static Sums sums_of(std::span<const float, kQueryHop> block);

    std::array<Sums, kBlocks> blocks_{}; ///< of the last frame, oldest first
    bool begun_ = false;
};

} // namespace kzcat
