/// @file
/// The passes of a scan over some tracks. Codes of a segment are scanned in one go, across the ends
/// of tracks: a sequence that overhangs an end meets codes of the next track there, which weakens
/// the agreement but little.

#include "catalogue/match/scan_passes.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

#include "catalogue/match/scan_kernels.hpp"
#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

/// Codes of the coarse pass at each phase, and what a place has to reach to be looked at, in
/// deviations above the catalogue's mean: of the clip as it is, which most clips are, and of other
/// readings, of which there are 18 times as many.
struct Coarseness {
    size_t codes;
    double deviations;
};
constexpr Coarseness kAsItIs{.codes = 24, .deviations = 2.0};
constexpr Coarseness kOthers{.codes = 8, .deviations = 2.6};

constexpr Coarseness coarseness_of(const Hypothesis& hypothesis)
{
    return hypothesis == Hypothesis{} ? kAsItIs : kOthers;
}

/// Positions that are scanned at a time, at all phases: their codes stay in the first cache.
constexpr size_t kBlock = 2048;

/// The sequence with all codes masked but `kept` of them: those with the most bits that count, one
/// of each of as many equal parts.
Sequence thinned(const Sequence& sequence, size_t kept)
{
    const size_t length = sequence.codes.size();
    Sequence result = sequence;
    if (kept >= length) {
        return result;
    }
    std::fill(result.masks.begin(), result.masks.end(), 0);
    for (size_t part = 0; part < kept; ++part) {
        size_t best = part * length / kept;
        for (size_t i = best; i < (part + 1) * length / kept; ++i) {
            if (std::popcount(sequence.masks[i]) > std::popcount(sequence.masks[best])) {
                best = i;
            }
        }
        result.masks[best] = sequence.masks[best];
    }
    return result;
}

class SegmentScan {
public:
    SegmentScan(const Segment& segment, std::span<const CoarsePhase> phases)
        : segment_(segment), phases_(phases), best_(segment.tracks.size()), near_(kBlock)
    {
    }

    const std::vector<BestPlace>& run()
    {
        for (const CoarsePhase& phase : phases_) {
            longest_ = std::max(longest_, phase.coarse.length());
        }
        if (longest_ > 0 && !segment_.tracks.empty()) {
            scan_beginning();
            scan_whole();
            scan_end();
            look_at_short_tracks();
        }
        return best_;
    }

private:
    /// Positions that begin before the segment or reach beyond it see zeros there.
    void scan_beginning()
    {
        std::vector<Code> padded(longest_, 0);
        const size_t count = std::min(segment_.codes.size(), longest_);
        padded.insert(padded.end(), segment_.codes.begin(),
                      segment_.codes.begin() + static_cast<std::ptrdiff_t>(count));
        padded.resize(3 * longest_, 0);
        scan_block(padded.data(), longest_, -static_cast<int64_t>(longest_));
    }
    void scan_end()
    {
        const size_t count = std::min(segment_.codes.size(), longest_);
        std::vector<Code> padded(segment_.codes.end() - static_cast<std::ptrdiff_t>(count),
                                 segment_.codes.end());
        padded.resize(count + longest_, 0);
        scan_block(padded.data(), count, static_cast<int64_t>(segment_.codes.size() - count));
    }
    void scan_whole()
    {
        const size_t size = segment_.codes.size();
        const size_t positions = size > longest_ ? size - longest_ : 0;
        for (size_t begin = 0; begin < positions; begin += kBlock) {
            scan_block(segment_.codes.data() + begin, std::min(kBlock, positions - begin),
                       static_cast<int64_t>(begin));
        }
    }

    void scan_block(const Code* codes, size_t positions, int64_t first)
    {
        for (const CoarsePhase& phase : phases_) {
            if (!phase.plan.limit) {
                continue;
            }
            const auto probes = phase.coarse.probes();
            const size_t found = scan_kernels().near(codes, positions, probes.data(), probes.size(),
                                                     *phase.plan.limit, near_.data());
            look_at(phase, first, std::span(near_).first(found));
        }
    }

    /// Scores the whole sequence at positions of the segment, which rise, on the tracks that they
    /// lie on.
    void look_at(const CoarsePhase& phase, int64_t first, std::span<const uint32_t> positions)
    {
        const auto tracks = segment_.tracks;
        const auto ends_before = [](const TrackSpan& track, int64_t place) {
            return static_cast<int64_t>(track.first + track.count) <= place;
        };
        auto begin = std::lower_bound(tracks.begin(), tracks.end(), first, ends_before);
        for (const uint32_t position : positions) {
            const int64_t at = first + position;
            const int64_t end = at + static_cast<int64_t>(phase.whole.length());
            while (begin != tracks.end() && ends_before(*begin, at)) {
                ++begin;
            }
            for (auto track = begin;
                 track != tracks.end() && static_cast<int64_t>(track->first) < end; ++track) {
                take(phase, static_cast<size_t>(track - tracks.begin()),
                     at - static_cast<int64_t>(track->first));
            }
        }
    }

    void take(const CoarsePhase& phase, size_t number, int64_t position)
    {
        const auto codes = segment_.of(segment_.tracks[number]);
        const size_t length = phase.whole.length();
        double deviations = 0;
        if (position >= 0 && static_cast<size_t>(position) + length <= codes.size() &&
            length >= kFewestCodes) {
            const uint32_t distance =
                scan_kernels().distance(codes.data() + position, phase.sequence->codes.data(),
                                        phase.sequence->masks.data(), length);
            deviations = (agreement(phase.whole.weight(), distance) - phase.plan.spread.mean) /
                         phase.plan.spread.deviation;
        } else {
            const auto agreed = agreement_at(phase.whole, *phase.sequence, codes, position);
            if (!agreed) {
                return;
            }
            deviations = (*agreed - phase.plan.spread.mean) / phase.plan.spread.deviation;
        }
        BestPlace& best = best_[number];
        if (!best.found || deviations > best.deviations) {
            best = {.deviations = deviations,
                    .phase = phase.phase,
                    .position = position,
                    .found = true};
        }
    }

    /// On tracks shorter than the sequence a few codes spread over it may all miss.
    void look_at_short_tracks()
    {
        for (size_t number = 0; number < best_.size(); ++number) {
            const auto count = static_cast<int64_t>(segment_.tracks[number].count);
            for (const CoarsePhase& phase : phases_) {
                const auto length = static_cast<int64_t>(phase.whole.length());
                for (int64_t at = -length; count < length && at < count; ++at) {
                    take(phase, number, at);
                }
            }
        }
    }

    const Segment& segment_;
    std::span<const CoarsePhase> phases_;
    std::vector<BestPlace> best_;
    std::vector<uint32_t> near_;
    size_t longest_ = 0;
};

/// The coarse distance up to which a place is looked at.
std::optional<uint32_t> limit_of(const ScanSequence& coarse, const Spread& thin, double deviations)
{
    const double bits = coarse.weight();
    const double least = thin.mean + deviations * thin.deviation;
    const double most = std::floor((bits - std::sqrt(bits) * least) / 2);
    if (most >= 0 && bits > 0) {
        return static_cast<uint32_t>(most);
    }
    return std::nullopt;
}

} // namespace

CoarsePhase::CoarsePhase(const Reading& reading, uint32_t number, const Corpus& population)
    : CoarsePhase(reading, number, PassPlan{.codes = coarseness_of(reading.hypothesis).codes})
{
    plan.spread = population_spread(whole, population);
    plan.limit = limit_of(coarse, population_spread(coarse, population),
                          coarseness_of(reading.hypothesis).deviations);
}

CoarsePhase::CoarsePhase(const Reading& reading, uint32_t number, const PassPlan& as_planned)
    : phase(number), sequence(&reading.sequences[number]),
      coarse(thinned(*sequence, as_planned.codes)), whole(*sequence), plan(as_planned)
{
}

std::vector<CoarsePhase> coarse_phases(const Reading& reading, const Corpus& population)
{
    std::vector<CoarsePhase> phases;
    for (uint32_t i = 0; i < reading.sequences.size(); i += 2) {
        phases.emplace_back(reading, i, population);
    }
    return phases;
}

std::vector<BestPlace> best_places(const Segment& segment, std::span<const CoarsePhase> phases)
{
    SegmentScan scan(segment, phases);
    return scan.run();
}

} // namespace kzcat
