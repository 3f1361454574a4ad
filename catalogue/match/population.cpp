/// @file
/// The choice of the places that stand for a whole catalogue.

#include "catalogue/match/population.hpp"

#include <algorithm>

namespace kzcat {
namespace {

/// Enough for a deviation that is right to 1 %: neighbouring places resemble each other, so the
/// number of runs counts more than their length, which has to hold a sequence and a few more.
constexpr size_t kRuns = 192;
constexpr uint64_t kRunLength = 160;

/// SplitMix64.
uint64_t random_at(uint64_t index)
{
    uint64_t x = (index + 1) * 0x9E3779B97F4A7C15U;
    x = (x ^ (x >> 30)) * 0xBF58476D1CE4E5B9U;
    x = (x ^ (x >> 27)) * 0x94D049BB133111EBU;
    return x ^ (x >> 31);
}

/// An even share of 0 .. below - 1: the remainder's unevenness, below / 2^64, does not matter.
uint64_t place_at(uint64_t index, uint64_t below) { return random_at(index) % below; }

/// The run that begins at a code, or earlier where the track ends too soon; `before` counts the
/// codes before each track.
PopulationRun run_at(uint64_t code, std::span<const uint64_t> counts,
                     std::span<const uint64_t> before)
{
    const auto next = std::upper_bound(before.begin(), before.end(), code);
    const auto track = static_cast<size_t>(next - before.begin()) - 1;
    const uint64_t length = std::min(counts[track], kRunLength);
    return {.track = track,
            .first = std::min(code - before[track], counts[track] - length),
            .count = length};
}

} // namespace

std::vector<PopulationRun> choose_runs(std::span<const uint64_t> counts)
{
    std::vector<uint64_t> before;
    uint64_t codes = 0;
    for (const uint64_t count : counts) {
        before.push_back(codes);
        codes += count;
    }
    std::vector<PopulationRun> runs;
    if (codes <= kRuns * kRunLength) {
        for (size_t track = 0; track < counts.size(); ++track) {
            runs.push_back({.track = track, .first = 0, .count = counts[track]});
        }
    } else {
        for (size_t i = 0; i < kRuns; ++i) {
            runs.push_back(run_at(place_at(i, codes), counts, before));
        }
    }
    return runs;
}

void Population::add_run(std::span<const Code> codes)
{
    runs_.push_back(
        {.id = static_cast<int64_t>(runs_.size()), .first = codes_.size(), .count = codes.size()});
    codes_.insert(codes_.end(), codes.begin(), codes.end());
}

Population::Population(std::span<const std::span<const Code>> runs)
{
    const std::span<const Code> background = background_codes();
    const size_t piece = background.size() / kBackgroundPieces;
    for (size_t i = 0; i < kBackgroundPieces; ++i) {
        add_run(background.subspan(i * piece, piece));
    }
    std::ranges::for_each(runs, [this](const auto run) { add_run(run); });
    corpus_.segments = {{.codes = codes_, .tracks = runs_}};
}

Population choose_population(const Corpus& catalogue)
{
    std::vector<std::span<const Code>> tracks;
    std::vector<uint64_t> counts;
    for (const Segment& segment : catalogue.segments) {
        for (const TrackSpan& track : segment.tracks) {
            tracks.push_back(segment.of(track));
            counts.push_back(track.count);
        }
    }
    std::vector<std::span<const Code>> runs;
    for (const PopulationRun& run : choose_runs(counts)) {
        runs.push_back(tracks[run.track].subspan(static_cast<size_t>(run.first),
                                                 static_cast<size_t>(run.count)));
    }
    return Population(runs);
}

} // namespace kzcat
