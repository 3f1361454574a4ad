/// @file
/// The fillers between tracks are made from the silences that are known; everything else is a gap.

#include "catalogue/monitor/timeline.hpp"

#include <algorithm>

namespace kzcat {
namespace {

/// The longest time for which two tracks overlap, in seconds.
constexpr double kLongestFade = 12;

} // namespace

void Timeline::report(Stage stage, Heard heard, double begin, double end)
{
    MonitorEvent event = {
        .stage = stage, .heard = heard, .begin = begin, .end = end, .known = now_, .track = {}};
    if (heard == Heard::track) {
        event.track = *track_;
    }
    events_.push_back(event);
}

void Timeline::end_filler()
{
    if (filler_ && filler_->announced) {
        report(Stage::ends, filler_->heard, filler_->entry.begin, settled_);
    }
    filler_.reset();
}

void Timeline::fill(Heard heard, double until)
{
    if (until <= settled_) {
        return;
    }
    if (filler_ && filler_->heard != heard) {
        end_filler();
    }
    if (!filler_) {
        filler_ = {.heard = heard, .entry = {.begin = settled_, .reported = 0}};
    }
    settled_ = until;
    earliest_ = until;
    Entry& entry = filler_->entry;
    if (!filler_->announced) {
        if (heard == Heard::silence || until - entry.begin >= options_.least_gap) {
            filler_->announced = true;
            entry.reported = until;
            report(Stage::begins, heard, entry.begin, until);
        }
    } else if (options_.interval > 0 && until - entry.reported >= options_.interval) {
        entry.reported = until;
        report(Stage::goes_on, heard, entry.begin, until);
    }
}

void Timeline::settle(double until, const std::deque<Silence>& silences)
{
    for (const Silence& silence : silences) {
        fill(Heard::gap, std::min(silence.begin, until));
        if (silence.end > settled_) {
            fill(Heard::silence, std::min(silence.end, until));
        }
    }
    fill(Heard::gap, until);
}

void Timeline::begin_track(const HeardTrack& track, double begin,
                           const std::deque<Silence>& silences)
{
    settle(begin, silences);
    end_filler();
    track_ = track;
    track_->repeat = times_heard_[track.track]++;
    entry_ = {.begin = begin, .reported = now_};
    report(Stage::begins, Heard::track, begin, std::max(begin, now_));
}

void Timeline::continue_track(double until, double place)
{
    track_->place_end = place;
    if (options_.interval > 0 && until - entry_->reported >= options_.interval) {
        entry_->reported = until;
        report(Stage::goes_on, Heard::track, entry_->begin, until);
    }
}

void Timeline::end_track(double end, double place)
{
    track_->place_end = place;
    const double last = std::max(end, entry_->begin);
    report(Stage::ends, Heard::track, entry_->begin, last);
    settled_ = std::max(settled_, last);
    earliest_ = std::max(entry_->begin, settled_ - kLongestFade);
    entry_.reset();
    track_.reset();
}

void Timeline::finish(double end, const std::deque<Silence>& silences)
{
    settle(end, silences);
    end_filler();
}

} // namespace kzcat
