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

/// The tracks of a corpus, numbered through, with the number of codes before each.
struct TrackList {
    std::vector<std::span<const Code>> tracks;
    std::vector<uint64_t> before;
    uint64_t codes = 0;

    explicit TrackList(const Corpus& corpus)
    {
        for (const Segment& segment : corpus.segments) {
            for (const TrackSpan& track : segment.tracks) {
                tracks.push_back(segment.of(track));
                before.push_back(codes);
                codes += track.count;
            }
        }
    }

    /// The run that begins at a code, or earlier where the track ends too soon.
    std::span<const Code> run_at(uint64_t code) const
    {
        const auto next = std::upper_bound(before.begin(), before.end(), code);
        const auto track = static_cast<size_t>(next - before.begin()) - 1;
        const uint64_t count = tracks[track].size();
        const uint64_t length = std::min(count, kRunLength);
        const uint64_t begin = std::min(code - before[track], count - length);
        return tracks[track].subspan(static_cast<size_t>(begin), static_cast<size_t>(length));
    }
};

} // namespace

void Population::add_run(std::span<const Code> codes)
{
    runs_.push_back(
        {.id = static_cast<int64_t>(runs_.size()), .first = codes_.size(), .count = codes.size()});
    codes_.insert(codes_.end(), codes.begin(), codes.end());
}

Population choose_population(const Corpus& catalogue)
{
    Population population;
    const std::span<const Code> background = background_codes();
    const size_t piece = background.size() / kBackgroundPieces;
    for (size_t i = 0; i < kBackgroundPieces; ++i) {
        population.add_run(background.subspan(i * piece, piece));
    }
    const TrackList list(catalogue);
    if (list.codes <= kRuns * kRunLength) {
        for (const auto track : list.tracks) {
            population.add_run(track);
        }
    } else {
        for (size_t i = 0; i < kRuns; ++i) {
            population.add_run(list.run_at(place_at(i, list.codes)));
        }
    }
    population.corpus_.segments = {{.codes = population.codes_, .tracks = population.runs_}};
    return population;
}

} // namespace kzcat
