/// @file
/// A border is a change point: with a the surplus and w the weight of each code, the sum of a - b w
/// is highest over the codes that the track is heard in. b lies halfway between the share by which
/// the track agrees and the 0 of chance, or lower, so that a track which is being faded belongs to
/// it as long as it can be heard.

#include "catalogue/monitor/line.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

#include "catalogue/match/reading.hpp"

namespace kzcat {
namespace {

/// How far a line may move at once, in seconds of the track: the tempo is known well enough for
/// that.
constexpr double kFarthest = 0.12;

constexpr double kHalfFrame = kFrameLength / 2.0 / kWorkingRate;

/// The highest b. A code has some 48 bits that count, so chance reaches shares of 0.14.
constexpr double kHighestBar = 0.15;

double bar_of(double share) { return std::min(share / 2, kHighestBar); }

/// A code that says less counts as if it had this many bits, so that a silence does not join a code
/// before it, which agrees by chance, to the track behind it.
constexpr int32_t kLeastBits = 16;

double gain_of(const CodeAgreement& one, double bar)
{
    return one.surplus - bar * std::max(one.weight, kLeastBits);
}

/// Rounds of finding a stretch and taking its average anew.
constexpr int kRounds = 4;

/// A phase of a reading, and the place of its first code among those of the track.
struct Grid {
    const Sequence* sequence = nullptr;
    int64_t position = 0;
    double moved = 0; ///< seconds of the track by which this lies beside the line
};

/// Calls `take(code, weight, surplus)` for each code that lies on the track.
template <class Take>
void visit(const Grid& grid, std::span<const Code> track, Take take)
{
    for (size_t k = 0; k < grid.sequence->codes.size(); ++k) {
        const int64_t at = grid.position + static_cast<int64_t>(k);
        if (at < 0 || at >= static_cast<int64_t>(track.size())) {
            continue;
        }
        const Code mask = grid.sequence->masks[k];
        const Code differing = (grid.sequence->codes[k] ^ track[static_cast<size_t>(at)]) & mask;
        const int32_t weight = std::popcount(mask);
        take(k, weight, weight - 2 * std::popcount(differing));
    }
}

int64_t whole_surplus(const Grid& grid, std::span<const Code> track)
{
    int64_t sum = 0;
    visit(grid, track, [&sum](size_t, int32_t, int32_t surplus) { sum += surplus; });
    return sum;
}

/// All phases at all places that are near the line, the nearest one first.
std::vector<Grid> grids_near(const Reading& reading, double place)
{
    std::vector<Grid> grids;
    for (const Sequence& sequence : reading.sequences) {
        const double expected = (place + sequence.start) / kCodeSeconds;
        for (const int beside : {-1, 0, 1}) {
            const double position = std::floor(expected + 0.5) + beside;
            grids.push_back({.sequence = &sequence,
                             .position = static_cast<int64_t>(position),
                             .moved = (position - expected) * kCodeSeconds});
        }
    }
    std::stable_sort(grids.begin(), grids.end(), [](const Grid& a, const Grid& b) {
        return std::fabs(a.moved) < std::fabs(b.moved);
    });
    return grids;
}

Grid best_grid(const std::vector<Grid>& grids, std::span<const Code> track)
{
    Grid best = grids.front();
    int64_t most = whole_surplus(best, track);
    for (const Grid& grid : grids) {
        const int64_t here = whole_surplus(grid, track);
        if (std::fabs(grid.moved) <= kFarthest && here > most) {
            most = here;
            best = grid;
        }
    }
    return best;
}

/// The codes of the stretch with the highest sum of surplus less `bar` times the weight.
struct Range {
    size_t first = 0;
    size_t end = 0;
};

Range best_range(const Agreements& agreements, double bar)
{
    Range best;
    double most = 0;
    double sum = 0;
    size_t first = 0;
    for (size_t k = 0; k < agreements.size(); ++k) {
        const double gain = gain_of(agreements[k], bar);
        if (sum <= 0) {
            sum = 0;
            first = k;
        }
        sum += gain;
        if (sum > most) {
            most = sum;
            best = {.first = first, .end = k + 1};
        }
    }
    return best;
}

double share_of(std::span<const CodeAgreement> agreements)
{
    int64_t surplus = 0;
    int64_t weight = 0;
    for (const CodeAgreement& one : agreements) {
        surplus += one.surplus;
        weight += one.weight;
    }
    return weight == 0 ? 0 : static_cast<double>(surplus) / static_cast<double>(weight);
}

} // namespace

Agreements compare(const FrameHistory& history, uint64_t first, size_t count,
                   std::span<const Code> track, Line& line, bool follow)
{
    const QueryBands bands = history.bands(first, count);
    const Reading reading = QueryReader(bands, {.first = 0, .count = count}).read(line.hypothesis);
    if (reading.sequences.empty()) {
        return {};
    }
    const double begin = seconds_at(first);
    const std::vector<Grid> grids = grids_near(reading, line.place(begin));
    const Grid grid = follow ? best_grid(grids, track) : grids.front();
    if (follow) {
        line = {.track = line.track,
                .hypothesis = line.hypothesis,
                .pitch = line.pitch,
                .time = begin,
                .at_time = line.place(begin) + grid.moved};
    }
    Agreements agreements;
    visit(grid, track, [&](size_t code, int32_t weight, int32_t surplus) {
        const double middle =
            grid.sequence->start + static_cast<double>(code) * kCodeSeconds + kHalfFrame;
        agreements.push_back({.time = begin + middle / line.hypothesis.stretch,
                              .weight = weight,
                              .surplus = surplus});
    });
    return agreements;
}

Level level_of(const Agreements& agreements, double from, double to)
{
    int64_t surplus = 0;
    Level level;
    for (const CodeAgreement& one : agreements) {
        if (one.time >= from && one.time < to) {
            surplus += one.surplus;
            level.weight += one.weight;
        }
    }
    level.share = level.weight == 0 ? 0 : static_cast<double>(surplus) / level.weight;
    return level;
}

std::optional<Stretch> heard_stretch(const Agreements& agreements)
{
    double share = share_of(agreements);
    Range range;
    for (int round = 0; round < kRounds; ++round) {
        range = share > 0 ? best_range(agreements, bar_of(share)) : Range{};
        if (range.end == range.first) {
            return {};
        }
        share = share_of(std::span(agreements).subspan(range.first, range.end - range.first));
    }
    return Stretch{.begin = agreements[range.first].time - kCodeSeconds / 2,
                   .end = agreements[range.end - 1].time + kCodeSeconds / 2,
                   .share = share};
}

double heard_until(const Agreements& agreements, double sure, double share)
{
    double until = sure;
    double sum = 0;
    double most = 0;
    for (const CodeAgreement& one : agreements) {
        if (one.time < sure) {
            continue;
        }
        sum += gain_of(one, bar_of(share));
        if (sum > most) {
            most = sum;
            until = one.time + kCodeSeconds / 2;
        }
    }
    return until;
}

} // namespace kzcat
