/// @file
/// A frame is silent as a whole, so a silence reaches from the first sample of its first frame to
/// the last sample of its last one.

#include "catalogue/monitor/quiet.hpp"

#include "catalogue/monitor/history.hpp"

namespace kzcat {
namespace {

/// The level of a sine at full scale, and decibels of an octave of energy.
constexpr double kFullSine = 41;
constexpr double kDecibels = 3.010299956639812;

constexpr double kFrameSeconds = double{kFrameLength} / kWorkingRate;

} // namespace

QuietMeter::QuietMeter(double decibels, double least)
    : loudest_(static_cast<float>(kFullSine + decibels / kDecibels)), least_(least)
{
}

void QuietMeter::hear(uint64_t frame, float level)
{
    if (level >= loudest_) {
        silent_ = false;
        listed_ = false;
        return;
    }
    if (!silent_) {
        silent_ = true;
        first_ = frame;
    }
    const Silence present = {.begin = seconds_at(first_), .end = seconds_at(frame) + kFrameSeconds};
    if (listed_) {
        silences_.back() = present;
    } else if (present.end - present.begin >= least_) {
        silences_.push_back(present);
        listed_ = true;
    }
}

void QuietMeter::forget(double before)
{
    while (silences_.size() > 1 && silences_.front().end <= before) {
        silences_.pop_front();
    }
}

} // namespace kzcat
