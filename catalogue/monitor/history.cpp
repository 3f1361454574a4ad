/// @file
/// Frames lie at their number modulo the capacity.

#include "catalogue/monitor/history.hpp"

#include <algorithm>
#include <array>

namespace kzcat {

FrameHistory::FrameHistory() : energies_(kCapacity * kFineBands), levels_(kCapacity) {}

void FrameHistory::add(std::span<const float, kFineBands> energies, float level)
{
    const auto at = static_cast<size_t>(end_ % kCapacity);
    std::copy(energies.begin(), energies.end(),
              energies_.begin() + static_cast<std::ptrdiff_t>(at * kFineBands));
    levels_[at] = level;
    ++end_;
}

void FrameHistory::add_silence()
{
    static constexpr std::array<float, kFineBands> kNothing{};
    add(kNothing, 0);
}

QueryBands FrameHistory::bands(uint64_t first, size_t count) const
{
    QueryBands bands;
    bands.samples = count == 0 ? 0 : (count - 1) * kQueryHop + kFrameLength;
    bands.energies.reserve(count * kFineBands);
    bands.levels.reserve(count);
    for (uint64_t frame = first; frame < first + count; ++frame) {
        const auto at = static_cast<size_t>(frame % kCapacity);
        const auto row = std::span(energies_).subspan(at * kFineBands, kFineBands);
        bands.energies.insert(bands.energies.end(), row.begin(), row.end());
        bands.levels.push_back(levels_[at]);
    }
    return bands;
}

} // namespace kzcat
