/// @file
/// How well a reading agrees at some places of a track: what candidates are put in order by.

#include "catalogue/index/ranking.hpp"

#include <algorithm>
#include <tuple>
#include <unordered_set>

#include "catalogue/match/thresholds.hpp"

namespace kzcat {

namespace {

/// The codes that a sequence at a position shares with a track.
struct Overlap {
    size_t begin = 0; ///< in the sequence
    size_t end = 0;

    Overlap(size_t length, size_t count, int64_t position)
        : begin(static_cast<size_t>(std::max<int64_t>(-position, 0))),
          end(static_cast<size_t>(std::clamp<int64_t>(static_cast<int64_t>(count) - position, 0,
                                                      static_cast<int64_t>(length))))
    {
    }

    /// Whether enough of the clip, or of a track that is shorter, lies within the other.
    bool is_enough(size_t length, size_t count) const
    {
        return begin < end && static_cast<double>(end - begin) >=
                                  kFewestOverlap * static_cast<double>(std::min(length, count));
    }
};

} // namespace

Ranking::Ranking(const Reading& reading)
{
    for (const auto& sequence : reading.sequences) {
        phases_.push_back({.sequence = &sequence, .scan = ScanSequence(sequence)});
        length_ = std::max(length_, sequence.codes.size());
    }
}

double Ranking::agreement_at(const Phase& phase, std::span<const Code> codes, int64_t position)
{
    const size_t length = phase.scan.length();
    const Overlap overlap(length, codes.size(), position);
    if (!overlap.is_enough(length, codes.size())) {
        return 0;
    }
    const auto first = static_cast<size_t>(position + static_cast<int64_t>(overlap.begin));
    const uint32_t distance = scan_kernels().distance(
        codes.data() + first, phase.sequence->codes.data() + overlap.begin,
        phase.sequence->masks.data() + overlap.begin, overlap.end - overlap.begin);
    return agreement(phase.scan.weight(overlap.begin, overlap.end), distance);
}

std::optional<RankedPlace> Ranking::best(int64_t track, std::span<const Code> codes, int64_t first,
                                         int64_t last) const
{
    std::optional<RankedPlace> best;
    for (int64_t position = first; position <= last; ++position) {
        for (uint32_t phase = 0; phase < phases_.size(); ++phase) {
            const double here = agreement_at(phases_[phase], codes, position);
            if (here > (best ? best->agreement : 0)) {
                best = {{.track = track, .phase = phase, .position = position}, here};
            }
        }
    }
    return best;
}

void keep_best(std::vector<RankedPlace>& places, size_t limit)
{
    const auto key = [](const RankedPlace& place) {
        return std::tuple(-place.agreement, place.place.track, place.place.position,
                          place.place.phase);
    };
    std::ranges::sort(places, {}, key);
    std::unordered_set<int64_t> seen;
    std::erase_if(places, [&](const RankedPlace& place) {
        return seen.size() >= limit || !seen.insert(place.place.track).second;
    });
}

} // namespace kzcat
