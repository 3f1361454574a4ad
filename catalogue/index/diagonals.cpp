/// @file
/// Counting hits on diagonals, and choosing the diagonals that have most.

#include "catalogue/index/diagonals.hpp"

#include <array>
#include <functional>

namespace kzcat {

namespace {

constexpr uint8_t kMostHits = 127; ///< so that two neighbours' sum fits a byte
constexpr size_t kBlock = 64;

/// A diagonal's hits together with its right neighbour's.
uint8_t sum_at(std::span<const uint8_t> hits, size_t bin)
{
    return static_cast<uint8_t>(hits[bin] + hits[bin + 1]);
}

} // namespace

size_t diagonals_of(uint32_t units, uint32_t shift)
{
    return ((size_t{units} + shift) / kBlock + 1) * kBlock + 1;
}

void count_list(std::span<const std::byte> list, uint32_t units, uint32_t first,
                std::span<uint8_t> hits)
{
    uint8_t* diagonal = hits.data() + first;
    for_each_unit(list, units, [&](uint32_t unit) {
        diagonal[unit] = static_cast<uint8_t>(diagonal[unit] + (diagonal[unit] < kMostHits));
    });
}

void Peaks::add_run(std::span<const uint8_t> hits)
{
    runs_.push_back(hits);
    for (size_t block = 0; block < hits.size() / kBlock; ++block) {
        const uint8_t* own = hits.data() + block * kBlock;
        uint8_t highest = 0;
        for (size_t i = 0; i < kBlock; ++i) {
            highest = std::max(highest, static_cast<uint8_t>(own[i] + own[i + 1]));
        }
        most_.push_back(highest);
    }
}

/// The least hits that no more than kLooks blocks have.
uint32_t Peaks::least_hits() const
{
    std::array<size_t, 256> histogram{};
    for (const uint8_t hits : most_) {
        ++histogram[hits];
    }
    size_t blocks = 0;
    uint32_t least = 256;
    while (least > 2 && blocks + histogram[least - 1] <= kLooks) {
        blocks += histogram[--least];
    }
    return least;
}

std::vector<Peak> Peaks::take()
{
    const uint32_t least = least_hits();
    std::vector<Peak> peaks;
    size_t block = 0;
    for (uint32_t run = 0; run < runs_.size(); ++run) {
        const auto hits = runs_[run];
        for (size_t begin = 0; begin + kBlock < hits.size(); begin += kBlock, ++block) {
            for (size_t bin = begin; most_[block] >= least && bin < begin + kBlock; ++bin) {
                const uint32_t here = sum_at(hits, bin);
                if (here >= least) {
                    peaks.push_back({here, static_cast<uint32_t>(bin), run});
                }
            }
        }
    }
    std::ranges::stable_sort(peaks, std::ranges::greater{}, &Peak::hits);
    peaks.resize(std::min(peaks.size(), kLooks));
    return peaks;
}

TrackUnits::TrackUnits(std::span<const TrackSpan> tracks)
{
    uint64_t unit = 0;
    for (const auto& track : tracks) {
        first_units_.push_back(static_cast<uint32_t>(unit));
        unit += units_of(track.count);
    }
    first_units_.push_back(static_cast<uint32_t>(unit));
}

/// The track that has a unit, or the one that is nearest to it.
size_t TrackUnits::track_of(int64_t unit) const
{
    const auto clamped =
        static_cast<uint32_t>(std::clamp<int64_t>(unit, 0, int64_t{first_units_.back()} - 1));
    const auto behind = std::upper_bound(first_units_.begin(), first_units_.end(), clamped);
    return static_cast<size_t>(behind - first_units_.begin()) - 1;
}

} // namespace kzcat
