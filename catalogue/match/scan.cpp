/// @file
/// The scan over all segments.

#include "catalogue/match/scan.hpp"

#include <algorithm>

#include "catalogue/match/scan_passes.hpp"

namespace kzcat {
namespace {

struct Ranked {
    double deviations;
    Candidate candidate;
};

/// The higher first; of equals the older track.
bool comes_first(const Ranked& a, const Ranked& b)
{
    return a.deviations != b.deviations ? a.deviations > b.deviations
                                        : a.candidate.track < b.candidate.track;
}

} // namespace

ScanSearcher::ScanSearcher(Corpus catalogue)
    : catalogue_(std::move(catalogue)), population_(choose_population(catalogue_)),
      code_count_(catalogue_.code_count())
{
}

std::vector<Candidate> ScanSearcher::find(const Reading& reading, size_t limit)
{
    const auto phases = coarse_phases(reading, population());
    std::vector<Ranked> ranked;
    for (const Segment& segment : catalogue_.segments) {
        const auto best = best_places(segment, phases);
        for (size_t i = 0; i < best.size(); ++i) {
            if (best[i].found) {
                ranked.push_back({best[i].deviations,
                                  {.track = segment.tracks[i].id,
                                   .phase = best[i].phase,
                                   .position = best[i].position}});
            }
        }
    }
    const size_t kept = std::min(limit, ranked.size());
    std::partial_sort(ranked.begin(), ranked.begin() + static_cast<std::ptrdiff_t>(kept),
                      ranked.end(), comes_first);
    std::vector<Candidate> result;
    for (size_t i = 0; i < kept; ++i) {
        result.push_back(ranked[i].candidate);
    }
    return result;
}

std::span<const Code> ScanSearcher::codes(int64_t track)
{
    const auto before = [](const TrackSpan& one, int64_t id) { return one.id < id; };
    for (const Segment& segment : catalogue_.segments) {
        const auto found =
            std::lower_bound(segment.tracks.begin(), segment.tracks.end(), track, before);
        if (found != segment.tracks.end() && found->id == track) {
            return segment.of(*found);
        }
    }
    return {};
}

} // namespace kzcat
