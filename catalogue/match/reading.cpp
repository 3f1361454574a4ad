/// @file
/// From differences of bands to codes. The window's frames are brought to the grid of the track,
/// one step being kQueryHop samples of the track; a bit compares two points of that grid:
///
///     query frames        0     1     2     3     4     5     6  ...
///     grid, stretch > 1   0    1    2    3    4    5    6    7   ...   point g lies at g / stretch
///     even pairs                [g - 2]  g  [g + 2]                    change over 4 points
///     odd pairs      [g - 6]             g              [g + 6]        change over 12 points

#include "catalogue/match/reading.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <span>

#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

constexpr size_t kStepsPerTrailHop = kTrailHop / kQueryHop;
constexpr size_t kLongestLag = 3 * kStepsPerTrailHop;

using Row = std::array<float, kPairs>;

/// The energies of a frame, each with a small share of the whole added to it. Bands that hold less
/// than that, such as those beside a sine, then do not change, and their bits are masked.
void lift(std::span<const float> frame, std::span<float, kFineBands> lifted)
{
    float sum = 0;
    for (const float energy : frame) {
        sum += energy;
    }
    for (size_t i = 0; i < kFineBands; ++i) {
        lifted[i] = frame[i] + sum * kBandFloor;
    }
}

/// The differences at every point of the grid.
std::vector<Row> on_grid(std::span<const float> differences, double stretch)
{
    const size_t frames = differences.size() / kPairs;
    const auto points =
        static_cast<size_t>(std::floor(static_cast<double>(frames - 1) * stretch)) + 1;
    std::vector<Row> grid(points);
    for (size_t g = 0; g < points; ++g) {
        const double at = static_cast<double>(g) / stretch;
        const size_t frame = std::min(static_cast<size_t>(at), frames - 1);
        const size_t next = std::min(frame + 1, frames - 1);
        const auto part = static_cast<float>(at - static_cast<double>(frame));
        const auto a = differences.subspan(frame * kPairs, kPairs);
        const auto b = differences.subspan(next * kPairs, kPairs);
        for (size_t i = 0; i < kPairs; ++i) {
            grid[g][i] = a[i] + (b[i] - a[i]) * part;
        }
    }
    return grid;
}

/// How each pair changes around each point that has neighbours far enough on both sides.
std::vector<Row> changes_of(const std::vector<Row>& grid)
{
    if (grid.size() <= 2 * kLongestLag) {
        return {};
    }
    std::vector<Row> changes(grid.size() - 2 * kLongestLag);
    for (size_t k = 0; k < changes.size(); ++k) {
        const size_t g = k + kLongestLag;
        for (size_t i = 0; i < kPairs; ++i) {
            const size_t lag = pair_lag(i) * kStepsPerTrailHop;
            changes[k][i] = grid[g + lag][i] - grid[g - lag][i];
        }
    }
    return changes;
}

/// The change below which a bit is masked.
float mask_level(const std::vector<Row>& changes)
{
    std::vector<float> sizes;
    sizes.reserve(changes.size() * kPairs);
    for (const Row& row : changes) {
        for (const float change : row) {
            sizes.push_back(std::fabs(change));
        }
    }
    if (sizes.empty()) {
        return 0;
    }
    const auto rank = static_cast<std::ptrdiff_t>(kMaskedShare * static_cast<double>(sizes.size()));
    std::nth_element(sizes.begin(), sizes.begin() + rank, sizes.end());
    return sizes[static_cast<size_t>(rank)];
}

void add_code(Sequence& sequence, const Row& changes, float level)
{
    Code code = 0;
    Code mask = 0;
    BitStrengths strengths{};
    for (size_t i = 0; i < kPairs; ++i) {
        const float size = std::fabs(changes[i]);
        code |= Code{changes[i] > 0} << i;
        mask |= Code{size >= level && size > kNoChange} << i;
        strengths[i] = static_cast<uint8_t>(std::min(size * 32, 255.0F));
    }
    sequence.codes.push_back(code);
    sequence.masks.push_back(mask);
    sequence.strengths.push_back(strengths);
}

/// Where a point of the grid lies, in seconds of the track from the clip's first sample to the
/// first sample of the frame of the track that it is compared with. Middles of frames coincide:
/// half a frame of the clip is `stretch` halves of the track's.
double start_of(size_t first_frame, size_t point, double stretch)
{
    constexpr double kHalfFrame = kFrameLength / 2.0;
    const double clip = static_cast<double>(first_frame) * kQueryHop + kHalfFrame;
    return (clip * stretch + static_cast<double>(point) * kQueryHop - kHalfFrame) / kWorkingRate;
}

std::vector<Hypothesis> list_further()
{
    const auto octave_part = [](int steps) { // 2^(steps / 36), written out for equal bits
        constexpr std::array<double, 7> kPowers = {
            0.9438743126816935, 0.9622238368941451, 0.980930087668915,  1.0,
            1.0194406437021448, 1.0392592260318434, 1.0594630943592953,
        };
        const int place = steps + 3;
        return kPowers[static_cast<size_t>(place)];
    };
    std::vector<Hypothesis> all;
    for (const int steps : {-1, 1, -2, 2, -3, 3}) {
        all.push_back({.pitch_steps = steps, .stretch = octave_part(steps)});
    }
    for (const double stretch : {0.98, 1.02, 0.96, 1.04, 0.94, 1.06}) {
        all.push_back({.pitch_steps = 0, .stretch = stretch});
    }
    for (const int steps : {-1, 1, -2, 2, -3, 3}) {
        all.push_back({.pitch_steps = steps, .stretch = 1.0});
    }
    return all;
}

} // namespace

const std::vector<Hypothesis>& further_hypotheses()
{
    static const std::vector<Hypothesis> all = list_further();
    return all;
}

size_t fewest_frames() { return 2 * kLongestLag + kPhases; }

QueryReader::QueryReader(const QueryBands& bands, Window window)
    : bands_(bands), window_(window), by_pitch_(2 * kMaxPitchSteps + 1)
{
}

const QueryReader::Differences& QueryReader::differences(int pitch_steps)
{
    const int place = kMaxPitchSteps + pitch_steps;
    Differences& made = by_pitch_[static_cast<size_t>(place)];
    if (made.empty()) {
        made.resize(window_.count * kPairs);
        std::array<float, kFineBands> lifted;
        for (size_t i = 0; i < window_.count; ++i) {
            lift(bands_.frame(window_.first + i), lifted);
            pair_differences(lifted, pitch_steps,
                             std::span<float, kPairs>(made.data() + i * kPairs, kPairs));
        }
    }
    return made;
}

void QueryReader::release() { by_pitch_ = std::vector<Differences>(by_pitch_.size()); }

Reading QueryReader::read(const Hypothesis& hypothesis)
{
    Reading reading{.hypothesis = hypothesis, .sequences = {}};
    if (window_.count < fewest_frames()) {
        return reading;
    }
    const auto changes =
        changes_of(on_grid(differences(hypothesis.pitch_steps), hypothesis.stretch));
    const float level = mask_level(changes);
    for (size_t phase = 0; phase < kPhases && phase < changes.size(); ++phase) {
        Sequence sequence;
        sequence.start = start_of(window_.first, phase + kLongestLag, hypothesis.stretch);
        for (size_t k = phase; k < changes.size(); k += kPhases) {
            add_code(sequence, changes[k], level);
        }
        reading.sequences.push_back(std::move(sequence));
    }
    return reading;
}

} // namespace kzcat
