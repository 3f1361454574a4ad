/// @file
/// The search of a window. Scores depend on the reading and the track alone, so it does not matter
/// how a candidate was found.

#include "catalogue/match/search.hpp"

#include <algorithm>
#include <cmath>

#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

/// Tracks that are scored exactly: of the clip as it is, and of each further reading.
constexpr size_t kScoredTracks = 16;
constexpr size_t kScoredTracksOfOthers = 4;

bool comes_first(const Hit& a, const Hit& b)
{
    return a.margin() != b.margin() ? a.margin() > b.margin() : a.track < b.track;
}

/// Whether any phase of a reading has enough codes that say something.
bool says_enough(const Reading& reading)
{
    return std::any_of(reading.sequences.begin(), reading.sequences.end(), [](const auto& one) {
        const auto silent = std::count(one.masks.begin(), one.masks.end(), Code{0});
        return one.masks.size() - static_cast<size_t>(silent) >= kFewestCodes;
    });
}

/// Of the first window; the others are as long.
double window_seconds(const ClipSource& source)
{
    return source.windows() == 0 ? 0.0 : source.end(0) - source.begin(0);
}

Verdict verdict_of(const WindowHits& found)
{
    if (!found.heard) {
        return Verdict::too_quiet;
    }
    if (found.hits.matched()) {
        return Verdict::match;
    }
    return found.hits.best_margin() >= -kUnsureBelow ? Verdict::not_sure : Verdict::no_match;
}

} // namespace

void Hits::take(const Hit& hit)
{
    const auto known = std::find_if(hits_.begin(), hits_.end(),
                                    [&](const Hit& one) { return one.track == hit.track; });
    if (known == hits_.end()) {
        hits_.push_back(hit);
    } else if (hit.margin() > known->margin()) {
        *known = hit;
    }
}

void Hits::take(const Hits& others)
{
    for (const Hit& hit : others.hits_) {
        take(hit);
    }
    sort();
}

void Hits::sort() { std::sort(hits_.begin(), hits_.end(), comes_first); }

WindowSearch::WindowSearch(ClipSource& source, Searcher& searcher, const MatchOptions& options)
    : source_(source), searcher_(searcher), speeds_(options.speeds && source.adjustable()),
      threshold_(threshold_for(searcher.code_count(), source.windows(), window_seconds(source)))
{
}

WindowHits WindowSearch::search(size_t window, bool further)
{
    WindowHits found;
    search_in(searcher_, window, further && speeds_, found);
    Searcher* thorough = searcher_.thorough();
    if (thorough != nullptr && found.heard && !found.hits.matched()) {
        search_in(*thorough, window, further && speeds_, found);
    }
    return found;
}

void WindowSearch::search_in(Searcher& searcher, size_t window, bool further, WindowHits& found)
{
    const Attempt* base = attempt(window, {});
    if (base == nullptr) {
        return;
    }
    found.heard = true;
    score_found(searcher, *base, kScoredTracks, found.hits);
    const auto& best = found.hits.all();
    if (!further || (!best.empty() && best.front().score.score >= kBeyondDoubt)) {
        return;
    }
    for (const Hypothesis& hypothesis : further_hypotheses()) {
        const Attempt* other = attempt(window, hypothesis);
        if (other != nullptr) {
            score_found(searcher, *other, kScoredTracksOfOthers, found.hits);
        }
    }
}

const Attempt* WindowSearch::attempt(size_t window, const Hypothesis& hypothesis)
{
    for (const auto& known : attempts_) {
        if (known->window == window && known->reading.hypothesis == hypothesis) {
            return known.get();
        }
    }
    Reading reading = source_.read(window, hypothesis);
    if (!says_enough(reading)) {
        return nullptr;
    }
    const double margin = hypothesis == Hypothesis{} ? 0 : kFurtherMargin;
    attempts_.push_back(std::make_unique<Attempt>(window, std::move(reading),
                                                  searcher_.population(), threshold_ + margin));
    return attempts_.back().get();
}

void WindowSearch::score_found(Searcher& searcher, const Attempt& attempt, size_t limit, Hits& hits)
{
    for (const Candidate& candidate : searcher.find(attempt.reading, limit)) {
        const TrackScore score = attempt.scorer.score(searcher.codes(candidate.track));
        if (score.found) {
            hits.take({.track = candidate.track, .score = score, .attempt = &attempt});
        }
    }
    hits.sort();
}

TrackScore WindowSearch::score_near(size_t window, int64_t track, const Placement& alignment,
                                    int64_t codes)
{
    const Attempt* here = attempt(window, alignment.hypothesis);
    return here == nullptr
               ? TrackScore{}
               : here->scorer.score_near(searcher_.codes(track), alignment.offset, codes);
}

double WindowSearch::offset_of(size_t window, const Placement& alignment, const TrackScore& score)
{
    const Attempt* here = attempt(window, alignment.hypothesis);
    return here == nullptr ? alignment.offset : coarse_alignment(here->reading, score).offset;
}

Placement WindowSearch::align(const Hit& hit)
{
    if (hit.margin() < -kUnsureBelow) {
        return coarse_alignment(hit.attempt->reading, hit.score);
    }
    for (const Aligned& known : aligned_) {
        if (known.attempt == hit.attempt && known.track == hit.track) {
            return known.alignment;
        }
    }
    const Placement alignment = source_.align(hit.attempt->window, searcher_.codes(hit.track),
                                              hit.attempt->reading, hit.score);
    aligned_.push_back({.attempt = hit.attempt, .track = hit.track, .alignment = alignment});
    return alignment;
}

// An attempt may come to lie where another one was, so what was aligned with that one goes too.
void WindowSearch::keep(std::span<const Attempt* const> used)
{
    const auto is_unused = [used](const Attempt* attempt) {
        return std::find(used.begin(), used.end(), attempt) == used.end();
    };
    std::erase_if(aligned_, [&](const Aligned& one) { return is_unused(one.attempt); });
    std::erase_if(attempts_, [&](const auto& one) { return is_unused(one.get()); });
}

TrackMatch WindowSearch::describe(const Hit& hit, const Placement& alignment) const
{
    TrackMatch match{.track = hit.track,
                     .score = hit.score.score,
                     .threshold = hit.attempt->threshold,
                     .offset = alignment.offset,
                     .tempo = alignment.stretch,
                     .pitch = alignment.pitch,
                     .clip_begin = source_.begin(hit.attempt->window),
                     .clip_end = source_.end(hit.attempt->window)};
    // A clip may begin before the track does, or go on behind its end.
    const double track = static_cast<double>(searcher_.codes(hit.track).size()) * kCodeSeconds;
    match.clip_begin = std::max(match.clip_begin, -match.offset / match.tempo);
    match.clip_end = std::min(match.clip_end, (track - match.offset) / match.tempo);
    match.clip_end = std::max(match.clip_end, match.clip_begin);
    if (alignment.stretch == alignment.pitch) {
        match.speed = alignment.stretch;
    }
    return match;
}

MatchAnswer WindowSearch::summary(const WindowHits& found, const MatchOptions& options)
{
    const auto& hits = found.hits.all();
    MatchAnswer answer{.verdict = verdict_of(found), .matches = {}, .candidates = {}};
    for (size_t i = 0; i < hits.size() && i < options.candidates; ++i) {
        answer.candidates.push_back(describe(hits[i], align(hits[i])));
    }
    answer.runner_up = hits.size() > 1 ? hits[1].score.score : 0;
    return answer;
}

} // namespace kzcat
