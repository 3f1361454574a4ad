/// @file
/// Levels in double precision. Sums run in eight lanes, which are then added in order; sums of
/// blocks are added oldest first.

#include "catalogue/model/level_meter.hpp"

#include <algorithm>

#include "catalogue/model/lanes.hpp"
#include "catalogue/model/logarithm.hpp"

namespace kzcat {

LevelMeter::Sums LevelMeter::sums_of(std::span<const float, kQueryHop> block)
{
    double samples[kLanes] = {};
    double squares[kLanes] = {};
    for (size_t i = 0; i < kQueryHop; i += kLanes) {
        for (size_t lane = 0; lane < kLanes; ++lane) {
            const double sample = block[i + lane];
            samples[lane] += sample;
            squares[lane] += sample * sample;
        }
    }
    Sums sums{};
    for (size_t lane = 0; lane < kLanes; ++lane) {
        sums.samples += samples[lane];
        sums.squares += squares[lane];
    }
    return sums;
}

float LevelMeter::measure(Frame frame)
{
    std::rotate(blocks_.begin(), blocks_.begin() + 1, blocks_.end());
    for (size_t block = begun_ ? kBlocks - 1 : 0; block < kBlocks; ++block) {
        const auto samples = frame.subspan(block * kQueryHop, kQueryHop);
        blocks_[block] = sums_of(samples.first<kQueryHop>());
    }
    begun_ = true;
    Sums total{};
    for (const Sums& block : blocks_) {
        total.samples += block.samples;
        total.squares += block.squares;
    }
    const double about_mean =
        std::max(0.0, total.squares - total.samples * total.samples / kFrameLength);
    return log2_of(static_cast<float>(about_mean) + 1);
}

} // namespace kzcat
