/// @file
/// Refinement: one search along the stretch, one along the pitch, each among a few readings that
/// are compared at all phases and places near the one that was found. What is kept fixed while the
/// stretch changes is the place of the clip's middle; its beginning moves.

#include "catalogue/match/refine.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdlib>
#include <optional>
#include <utility>

namespace kzcat {
namespace {

constexpr double kWideStep = 0.01;
constexpr int kWideSteps = 7;
constexpr double kNarrowStep = 0.005;
constexpr int kPlaces = 3; ///< codes looked at before and after the one that was found

/// Changes of tempo smaller than this are none, and pitches closer than this to each other are the
/// same: the interpolation is not more exact.
constexpr double kUnchanged = 0.0025;
constexpr double kSamePitch = 0.0075;

/// Most clips have the track's tempo, so that is what they are taken to have as long as another
/// reading does not agree better by this many deviations of independent bits: in noise the best one
/// is often a little off.
constexpr double kUnchangedMargin = 2.0;

/// The fine bands' ratio and its square root, 2^(1 / 36) and 2^(1 / 72).
constexpr double kBandRatio = 1.0194406437021448;

/// The agreement at places that do not exist.
constexpr double kNowhere = -1e9;

/// Where the highest value of a parabola through three points lies, -1/2 .. 1/2 from the middle
/// one, which is not below the others.
double peak_of(double before, double middle, double after)
{
    const double bend = before - 2 * middle + after;
    return bend < 0 ? std::clamp(0.5 * (before - after) / bend, -0.5, 0.5) : 0.0;
}

/// How well a reading agrees with the track at its best place near an expected one.
struct Fit {
    double agreement = kNowhere;
    double middle = 0; ///< seconds of the track at which the clip's middle lies
};

class Refiner {
public:
    Refiner(QueryReader& reader, std::span<const Code> track) : reader_(reader), track_(track)
    {
        const Window& window = reader.window();
        half_ = (static_cast<double>(window.first) + static_cast<double>(window.count) / 2) *
                kQueryHop / kWorkingRate;
    }

    /// Seconds of the clip up to the middle of its window.
    double half() const { return half_; }

    Fit fit(const Hypothesis& hypothesis, double middle)
    {
        const Reading reading = reader_.read(hypothesis);
        constexpr int kSteps = (2 * kPlaces + 1) * static_cast<int>(kPhases);
        std::array<double, kSteps> agreements;
        agreements.fill(kNowhere);
        const double beginning = middle - half_ * hypothesis.stretch;
        int best = 0;
        const int64_t around = place_near(reading, beginning);
        for (int step = 0; step < kSteps; ++step) {
            const auto at = static_cast<size_t>(step);
            agreements[at] = at_step(reading, around, step);
            best = agreements[at] > agreements[static_cast<size_t>(best)] ? step : best;
        }
        return interpolated(reading, agreements, around, best);
    }

private:
    int64_t place_near(const Reading& reading, double beginning) const
    {
        const double start = reading.sequences.empty() ? 0 : reading.sequences[0].start;
        return static_cast<int64_t>(std::floor((beginning + start) / kCodeSeconds + 0.5));
    }

    /// Steps of one phase: a later phase begins later in the clip, so at the same position of the
    /// track the clip begins earlier.
    static size_t phase_of(int step) { return kPhases - 1 - static_cast<size_t>(step) % kPhases; }
    static int64_t place_of(int64_t around, int step)
    {
        return around - kPlaces + step / static_cast<int>(kPhases);
    }

    double at_step(const Reading& reading, int64_t around, int step) const
    {
        if (phase_of(step) >= reading.sequences.size()) {
            return kNowhere;
        }
        const Sequence& sequence = reading.sequences[phase_of(step)];
        return agreement_at(ScanSequence(sequence), sequence, track_, place_of(around, step))
            .value_or(kNowhere);
    }

    template <class Agreements>
    Fit interpolated(const Reading& reading, const Agreements& agreements, int64_t around,
                     int best) const
    {
        const auto at = static_cast<size_t>(best);
        const Sequence* sequence = phase_of(best) < reading.sequences.size()
                                       ? &reading.sequences[phase_of(best)]
                                       : nullptr;
        if (sequence == nullptr || agreements[at] <= kNowhere) {
            return {};
        }
        double part = 0;
        if (at > 0 && at + 1 < agreements.size() && agreements[at - 1] > kNowhere &&
            agreements[at + 1] > kNowhere) {
            part = peak_of(agreements[at - 1], agreements[at], agreements[at + 1]);
        }
        const double beginning = static_cast<double>(place_of(around, best)) * kCodeSeconds -
                                 sequence->start + part * kQueryHop / kWorkingRate;
        return {.agreement = agreements[at],
                .middle = beginning + half_ * reading.hypothesis.stretch};
    }

    QueryReader& reader_;
    std::span<const Code> track_;
    double half_;
};

/// The best stretch around one, and where between it and its neighbours the peak lies.
struct Stretched {
    Fit fit;
    double stretch = 1;
    double interpolated = 1;
};

/// First in wide steps, since a clip may be recognised by a reading that is far off, then in narrow
/// ones.
Stretched best_stretch(Refiner& refiner, const Hypothesis& around, double middle)
{
    const auto fit_at = [&](double stretch) {
        return refiner.fit({.pitch_steps = around.pitch_steps, .stretch = stretch}, middle);
    };
    Stretched best{.fit = fit_at(around.stretch), .stretch = around.stretch};
    for (int step = -kWideSteps; step <= kWideSteps; ++step) {
        const double stretch = around.stretch * (1 + kWideStep * step);
        const Fit here = step == 0 ? best.fit : fit_at(stretch);
        if (here.agreement > best.fit.agreement) {
            best = {.fit = here, .stretch = stretch};
        }
    }
    const double narrow = around.stretch * kNarrowStep;
    Fit before = fit_at(best.stretch - narrow);
    Fit after = fit_at(best.stretch + narrow);
    if (std::max(before.agreement, after.agreement) > best.fit.agreement) {
        const bool down = before.agreement > after.agreement;
        const Fit old = std::exchange(best.fit, down ? before : after);
        best.stretch += down ? -narrow : narrow;
        (down ? after : before) = old;
        (down ? before : after) = fit_at(best.stretch + (down ? -narrow : narrow));
    }
    best.interpolated =
        best.stretch + narrow * peak_of(before.agreement, best.fit.agreement, after.agreement);
    return best;
}

double pitch_ratio(double steps)
{
    const double whole = std::floor(steps);
    double ratio = 1 + (steps - whole) * (kBandRatio - 1); // within 0.005 % of the power
    for (double i = 0; i < whole; ++i) {
        ratio *= kBandRatio;
    }
    for (double i = 0; i > whole; --i) {
        ratio /= kBandRatio;
    }
    return ratio;
}

/// The best pitch among a few fine bands, and where between it and its neighbours the peak lies.
struct Pitched {
    Fit fit;
    int steps = 0;
    double interpolated = 0; ///< steps
};

Pitched best_pitch(Refiner& refiner, const Hypothesis& around, double middle)
{
    const auto fit_at = [&](int steps) {
        return std::abs(steps) > kMaxPitchSteps
                   ? Fit{}
                   : refiner.fit({.pitch_steps = steps, .stretch = around.stretch}, middle);
    };
    int steps = around.pitch_steps;
    std::array<Fit, 3> fits = {fit_at(steps - 1), fit_at(steps), fit_at(steps + 1)};
    if (fits[0].agreement > fits[1].agreement) {
        fits = {fit_at(--steps - 1), fits[0], fits[1]};
    } else if (fits[2].agreement > fits[1].agreement) {
        fits = {fits[1], fits[2], fit_at(++steps + 1)};
    }
    const double peak = fits[0].agreement > kNowhere && fits[2].agreement > kNowhere
                            ? peak_of(fits[0].agreement, fits[1].agreement, fits[2].agreement)
                            : 0;
    return {.fit = fits[1], .steps = steps, .interpolated = steps + peak};
}

/// The pitch that is reported: that of a change of speed, or none, when it is as close as the
/// interpolation between fine bands can say.
double reported_pitch(double pitch, double stretch)
{
    const double from_speed = std::fabs(pitch - stretch);
    const double from_none = std::fabs(pitch - 1);
    if (std::min(from_speed, from_none) > kSamePitch) {
        return pitch;
    }
    return from_speed < from_none ? stretch : 1.0;
}

} // namespace

Placement coarse_alignment(const Reading& reading, const TrackScore& score)
{
    const Sequence& sequence = reading.sequences[score.phase];
    return {.hypothesis = reading.hypothesis,
            .offset = static_cast<double>(score.position) * kCodeSeconds - sequence.start,
            .stretch = reading.hypothesis.stretch,
            .pitch = pitch_ratio(reading.hypothesis.pitch_steps),
            .agreement = 0};
}

Placement refined_alignment(QueryReader& reader, std::span<const Code> track,
                            const Reading& reading, const TrackScore& score)
{
    const Placement coarse = coarse_alignment(reading, score);
    Refiner refiner(reader, track);
    Hypothesis best = reading.hypothesis;
    Stretched stretched =
        best_stretch(refiner, best, coarse.offset + refiner.half() * coarse.stretch);
    best.stretch = stretched.stretch;

    const double middle = stretched.fit.middle;
    const Pitched pitched = best_pitch(refiner, best, middle);
    best.pitch_steps = pitched.steps;
    Placement result{.hypothesis = best, .offset = 0, .stretch = stretched.interpolated};
    Fit fit = pitched.fit;
    const Fit same_tempo = refiner.fit({.pitch_steps = best.pitch_steps}, middle);
    if (std::fabs(result.stretch - 1) < kUnchanged ||
        same_tempo.agreement > fit.agreement - kUnchangedMargin) {
        fit = same_tempo;
        result.stretch = 1;
    }
    result.hypothesis.stretch = result.stretch;
    result.pitch = reported_pitch(pitch_ratio(pitched.interpolated), result.stretch);
    result.agreement = fit.agreement;
    result.offset = fit.middle - refiner.half() * result.stretch;
    return result;
}

} // namespace kzcat
