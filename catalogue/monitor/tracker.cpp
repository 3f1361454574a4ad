/// @file
/// Steps, and what is decided in each.

#include "catalogue/monitor/tracker.hpp"

#include <algorithm>
#include <cmath>

#include "catalogue/match/source.hpp"

namespace kzcat {
namespace {

/// Frames of a window, 14.3 s, from step to step, 4.6 s, and of the first window, 6.4 s.
constexpr size_t kWindow = 300;
constexpr uint64_t kStep = 100;
constexpr uint64_t kFirstWindow = 130;

/// Windows that begin this far apart have little in common: a third of them.
constexpr uint64_t kApart = 2 * kStep;

/// Every so many searches are made at other speeds too, and look at every place: 19 times the work.
constexpr uint64_t kThoroughEvery = 3;

/// A hit is believed at once when its score is this far above the threshold: what the threshold
/// grows by when 17,000 windows are searched, as in a day, instead of one.
constexpr double kBeyondDoubt = 1.7;

/// A score along a line, in a window of its own, that confirms a hit. A dozen places are compared
/// rather than a whole catalogue, so less than the threshold is enough.
constexpr double kConfirms = 6.0;
constexpr int64_t kNearby = 3; ///< codes

/// The last seconds, by which it is decided whether a track goes on. The last 0.7 s have no codes
/// yet. They agree when they do so by this share of what the track did before, and by no less than
/// kLeastShare, which 25 codes of anything else seldom reach.
constexpr double kTail = 5.4;
constexpr double kTailShare = 0.4;
constexpr double kLeastShare = 0.08;
constexpr int32_t kLeastWeight = 200;

/// A track that did not agree for so many steps, 18.6 s, has ended.
constexpr uint32_t kPatience = 4;

/// A track of which less is heard, in seconds, is not reported.
constexpr double kLeastHeard = 3;

/// Places closer than this are the same, in seconds; a jump that is shorter than kLongestJump, as
/// of a stream that lost some sound, is not a track begun again.
constexpr double kSamePlace = 1;
constexpr double kLongestJump = 10;

/// How far from the beginning or the end of the stream a track begins or ends with it: the first
/// and the last code lie 0.7 s within.
constexpr double kAtTheEnd = 1.5;

constexpr double kFrameSeconds = double{kFrameLength} / kWorkingRate;

bool same_line(const Line& a, const Line& b, double time)
{
    return a.track == b.track && std::fabs(a.place(time) - b.place(time)) < kSamePlace;
}

/// A searcher that never looks everywhere when it has found nothing.
class QuickSearcher final : public Searcher {
public:
    explicit QuickSearcher(Searcher& searcher) : searcher_(searcher) {}
    std::vector<Candidate> find(const Reading& reading, size_t limit) override
    {
        return searcher_.find(reading, limit);
    }
    std::span<const Code> codes(int64_t track) override { return searcher_.codes(track); }
    const Corpus& population() override { return searcher_.population(); }
    uint64_t code_count() override { return searcher_.code_count(); }

private:
    Searcher& searcher_;
};

} // namespace

double Tracker::now() const
{
    return history_.end() == 0 ? 0 : seconds_at(history_.end() - 1) + kFrameSeconds;
}

uint64_t Tracker::window_begin() const
{
    return history_.end() - std::min<uint64_t>(history_.end(), kWindow);
}

Agreements Tracker::compare_from(Searcher& searcher, double from, Line& line, bool follow) const
{
    const double frame = std::max(0.0, std::floor(from * kWorkingRate / kQueryHop));
    const uint64_t first =
        std::clamp(static_cast<uint64_t>(frame), history_.begin(), history_.end());
    return compare(history_, first, static_cast<size_t>(history_.end() - first),
                   searcher.codes(line.track), line, follow);
}

bool Tracker::is_due() const { return history_.end() >= std::max(next_step_, kFirstWindow); }

void Tracker::step(Searcher& searcher)
{
    next_step_ = history_.end() + kStep;
    timeline_.advance(now());
    if (running_) {
        follow(searcher);
    }
    if (!running_ || running_->bad_steps > 0) {
        search(searcher);
    }
    if (running_ && running_->bad_steps > 0 && is_over(searcher)) {
        end(searcher, now() + kAtTheEnd);
    }
    settle();
}

/// Compares the last window along the line of the track that was heard.
void Tracker::follow(Searcher& searcher)
{
    Line line = running_->line;
    const Agreements agreements = compare_from(searcher, seconds_at(window_begin()), line, true);
    const Level tail = level_of(agreements, now() - kTail, now());
    const double least = std::max(kTailShare * running_->share, kLeastShare);
    if (tail.weight < kLeastWeight || tail.share < least) {
        ++running_->bad_steps;
        return;
    }
    running_->line = line;
    running_->last_good = now();
    running_->share += (tail.share - running_->share) / 4;
    running_->bad_steps = 0;
    searches_ = 0;
    pending_.reset();
    timeline_.continue_track(now(), line.place(now()));
}

bool Tracker::is_over(Searcher& searcher) const
{
    const double length =
        static_cast<double>(searcher.codes(running_->line.track).size()) * kCodeSeconds;
    return running_->bad_steps >= kPatience || running_->line.place(now() - kTail / 2) > length;
}

void Tracker::search(Searcher& searcher)
{
    if (quiet_.silent_since(window_begin())) {
        pending_.reset();
        return;
    }
    const bool thoroughly = ++searches_ % kThoroughEvery == 0;
    if (const auto found = search_window(searcher, thoroughly)) {
        judge(searcher, *found);
    } else if (pending_) {
        judge_pending(searcher);
    }
}

std::optional<Tracker::Found> Tracker::search_window(Searcher& searcher, bool thoroughly) const
{
    const uint64_t first = window_begin();
    const QueryBands bands = history_.bands(first, static_cast<size_t>(history_.end() - first));
    const auto source = source_of(bands);
    QuickSearcher quick(searcher);
    WindowSearch search(*source, thoroughly ? searcher : quick, {.speeds = speeds_});
    const WindowHits hits = search.search(0, thoroughly);
    for (const Hit& hit : hits.hits.all()) {
        if (hit.margin() < 0) {
            break;
        }
        const Found found = describe(hit, search.align(hit));
        if (!running_ || !same_line(found.line, running_->line, seconds_at(first))) {
            return found;
        }
    }
    return {};
}

Tracker::Found Tracker::describe(const Hit& hit, const Placement& place) const
{
    return {.line = {.track = hit.track,
                     .hypothesis = place.hypothesis,
                     .pitch = place.pitch,
                     .time = seconds_at(window_begin()),
                     .at_time = place.offset},
            .score = hit.score.score,
            .threshold = hit.attempt->threshold,
            .window = window_begin(),
            .beyond_doubt = hit.margin() >= kBeyondDoubt};
}

void Tracker::judge(Searcher& searcher, const Found& found)
{
    const bool known = pending_ && same_line(found.line, pending_->line, found.line.time);
    if (found.beyond_doubt || (known && found.window >= pending_->window + kApart)) {
        begin(searcher, found);
    } else if (!known) {
        pending_ = found;
    }
}

void Tracker::judge_pending(Searcher& searcher)
{
    if (window_begin() < pending_->window + kApart) {
        return;
    }
    if (agrees_again(searcher, *pending_)) {
        begin(searcher, Found(*pending_));
    } else {
        pending_.reset();
    }
}

bool Tracker::agrees_again(Searcher& searcher, const Found& found) const
{
    const uint64_t first = window_begin();
    const QueryBands bands = history_.bands(first, static_cast<size_t>(history_.end() - first));
    const auto source = source_of(bands);
    WindowSearch search(*source, searcher, {.speeds = speeds_});
    Placement place;
    place.hypothesis = found.line.hypothesis;
    place.offset = found.line.place(seconds_at(first));
    const TrackScore score = search.score_near(0, found.line.track, place, kNearby);
    return score.found && score.score >= kConfirms;
}

/// Reports the track that was found, with where it began.
void Tracker::begin(Searcher& searcher, const Found& found)
{
    pending_.reset();
    Line line = found.line;
    const double from = running_ ? running_->begin : timeline_.earliest();
    const auto heard = heard_stretch(compare_from(searcher, from, line, false));
    if (!heard || heard->end - heard->begin < kLeastHeard) {
        return;
    }
    if (running_ && running_->line.track == line.track && goes_on_as(found, *heard)) {
        return;
    }
    if (running_) {
        end(searcher, now() + kAtTheEnd);
    }
    const double begin = begin_of(line, *heard);
    const double stretch = line.hypothesis.stretch;
    running_ = {.line = line, .begin = begin, .last_good = heard->end, .share = heard->share};
    searches_ = 0;
    timeline_.begin_track({.track = line.track,
                           .score = found.score,
                           .threshold = found.threshold,
                           .speed = stretch == line.pitch ? stretch : 1,
                           .tempo = stretch,
                           .pitch = line.pitch,
                           .place_begin = line.place(begin),
                           .place_end = line.place(heard->end)},
                          begin, quiet_.silences());
}

double Tracker::begin_of(const Line& line, const Stretch& heard) const
{
    const double begin = heard.begin < kAtTheEnd ? std::max(0.0, line.time_of(0)) : heard.begin;
    return std::max(std::min(begin, heard.begin), timeline_.earliest());
}

/// Whether the track that is heard was found at another place, and is not begun again: the new
/// place explains what was heard before too, or the stream has jumped a little.
bool Tracker::goes_on_as(const Found& found, const Stretch& heard)
{
    const double kept = std::max(running_->begin, seconds_at(history_.begin()));
    const double jump = found.line.place(now()) - running_->line.place(now());
    const bool explains_all = heard.begin < kept + kTail;
    const bool jumped =
        std::fabs(jump) < kLongestJump && heard.begin < running_->last_good + kLongestJump;
    if (!explains_all && !jumped) {
        return false;
    }
    running_->line = found.line;
    running_->last_good = heard.end;
    running_->share = heard.share;
    running_->bad_steps = 0;
    return true;
}

void Tracker::end(Searcher& searcher, double stream_end)
{
    Line line = running_->line;
    const double sure = std::max(running_->begin, running_->last_good - kTail);
    const Agreements agreements = compare_from(searcher, sure - kTail, line, false);
    double until = agreements.empty() ? running_->last_good // the track was removed meanwhile
                                      : heard_until(agreements, sure, running_->share);
    if (until > stream_end - kAtTheEnd) {
        until = stream_end;
    }
    timeline_.end_track(until, line.place(until));
    running_.reset();
    searches_ = 0;
}

/// What lies so far back that nothing which is found later can begin in it is a gap or silence.
void Tracker::settle()
{
    if (!running_) {
        const uint64_t window = pending_ ? pending_->window : window_begin();
        timeline_.settle(seconds_at(window - std::min(window, 2 * kStep)), quiet_.silences());
    }
}

void Tracker::finish(Searcher& searcher, double stream_end)
{
    if (history_.end() > 0) {
        step(searcher);
    }
    if (pending_) {
        begin(searcher, Found(*pending_));
    }
    timeline_.advance(stream_end);
    if (running_) {
        end(searcher, stream_end);
    }
    timeline_.finish(stream_end, quiet_.silences());
}

} // namespace kzcat
