/// @file
/// Passages. A track that was found in one window is expected to go on in the next, where one look
/// at the expected place replaces the search.

#include "catalogue/match/passages.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <optional>

#include "catalogue/match/thresholds.hpp"

namespace kzcat {
namespace {

/// A score at the expected place from which on a track is taken to go on. A dozen places are
/// compared rather than a whole catalogue, so less is enough.
constexpr double kGoesOn = 5.0;

/// Codes around an expected place: half a second for the error of the tempo.
constexpr int64_t kNearby = 3;

/// Windows whose scores are added up.
constexpr size_t kPooledWindows = 8;

/// Codes over which agreement is averaged to see where a track begins and ends, 1.5 s, what it has
/// to reach, in deviations of independent bits, and how many such blocks may fail in a row.
constexpr size_t kBlockCodes = 8;
constexpr double kBlockAgreement = 4.0;
constexpr int kFailures = 2;

/// Two places of a track are the same passage when they are this close, in seconds.
constexpr double kSamePlace = 1.0;

/// A track in some windows of a clip, one after the other.
struct Passage {
    Hit hit;
    size_t first;          ///< window
    size_t last;           ///< window
    Placement first_place; ///< of the track, as each of these windows has it: over a long passage a
    Placement last_place;  ///< small error of the tempo adds up
};

/// Whether the track goes on in another window; its place there, if so.
std::optional<Placement> place_in(WindowSearch& search, const Hit& hit, const Placement& expected,
                                  size_t window)
{
    const TrackScore score = search.score_near(window, hit.track, expected, kNearby);
    if (!score.found || score.score < kGoesOn) {
        return std::nullopt;
    }
    Placement place = expected;
    place.offset = search.offset_of(window, expected, score);
    return place;
}

/// Looks whether the passage goes on in the next window, and follows it.
bool goes_on(WindowSearch& search, Passage& passage)
{
    const auto place = place_in(search, passage.hit, passage.last_place, passage.last + 1);
    if (place) {
        ++passage.last;
        passage.last_place = *place;
    }
    return place.has_value();
}

bool came_before(WindowSearch& search, Passage& passage)
{
    const auto place = place_in(search, passage.hit, passage.first_place, passage.first - 1);
    if (place) {
        --passage.first;
        passage.first_place = *place;
    }
    return place.has_value();
}

Passage passage_of(WindowSearch& search, const Hit& hit)
{
    const Placement place = search.align(hit);
    const size_t window = hit.attempt->window;
    return {.hit = hit, .first = window, .last = window, .first_place = place, .last_place = place};
}

/// The phase of a reading that lies closest to the codes of a track, and the place of its first
/// code there.
struct Grid {
    const Sequence* sequence;
    int64_t position;
};

Grid grid_of(const Reading& reading, double offset)
{
    Grid best{.sequence = nullptr, .position = 0};
    double least = 1;
    for (const Sequence& sequence : reading.sequences) {
        const double place = (offset + sequence.start) / kCodeSeconds;
        const double whole = std::floor(place + 0.5);
        if (std::fabs(place - whole) < least) {
            least = std::fabs(place - whole);
            best = {.sequence = &sequence, .position = static_cast<int64_t>(whole)};
        }
    }
    return best;
}

/// Whether a block of codes agrees with the track.
bool agrees(const Grid& grid, std::span<const Code> track, size_t first)
{
    uint32_t weight = 0;
    uint32_t distance = 0;
    const size_t end = std::min(first + kBlockCodes, grid.sequence->codes.size());
    for (size_t k = first; k < end; ++k) {
        const int64_t at = grid.position + static_cast<int64_t>(k);
        if (at < 0 || at >= static_cast<int64_t>(track.size())) {
            continue;
        }
        const Code mask = grid.sequence->masks[k];
        weight += static_cast<uint32_t>(std::popcount(mask));
        distance += static_cast<uint32_t>(
            std::popcount((grid.sequence->codes[k] ^ track[static_cast<size_t>(at)]) & mask));
    }
    return agreement(weight, distance) >= kBlockAgreement;
}

/// The first and the last code of the blocks that agree, from one in the middle on.
struct CodeRange {
    size_t first;
    size_t last;
};

CodeRange agreeing_range(const Grid& grid, std::span<const Code> track, size_t middle)
{
    CodeRange range{.first = middle, .last = middle};
    int failures = 0;
    for (size_t k = middle; k >= kBlockCodes && failures < kFailures;) {
        k -= kBlockCodes;
        const bool good = agrees(grid, track, k);
        failures = good ? 0 : failures + 1;
        range.first = good ? k : range.first;
    }
    failures = 0;
    for (size_t k = middle; k < grid.sequence->codes.size() && failures < kFailures;
         k += kBlockCodes) {
        const bool good = agrees(grid, track, k);
        failures = good ? 0 : failures + 1;
        range.last = good ? std::min(k + kBlockCodes, grid.sequence->codes.size()) - 1 : range.last;
    }
    return range;
}

/// Seconds of the clip over which a window and its neighbours agree with a track.
struct Extent {
    double begin;
    double end;
};

Extent extent_of(WindowSearch& search, int64_t track, const Placement& place, size_t window)
{
    ClipSource& source = search.source();
    const size_t first = window > 0 ? window - 1 : 0;
    const size_t end = std::min(window + 2, source.windows());
    const Reading reading = source.read_windows(first, end - first, place.hypothesis);
    const Grid grid = grid_of(reading, place.offset);
    if (grid.sequence == nullptr) {
        return {.begin = source.begin(window), .end = source.end(window)};
    }
    constexpr double kHalfFrame = kFrameLength / 2.0 / kWorkingRate;
    const auto middle_of = [&](size_t code) { // of its frame, seconds of the clip
        return (grid.sequence->start + static_cast<double>(code) * kCodeSeconds + kHalfFrame) /
               place.hypothesis.stretch;
    };
    const double middle = (source.begin(window) + source.end(window)) / 2;
    size_t code = 0;
    while (code + 1 < grid.sequence->codes.size() && middle_of(code) < middle) {
        ++code;
    }
    const CodeRange range = agreeing_range(grid, search.codes(track), code);
    return {.begin = std::max(0.0, middle_of(range.first) - kHalfFrame),
            .end = std::min(source.seconds(), middle_of(range.last) + kHalfFrame)};
}

TrackMatch describe_passage(WindowSearch& search, const Passage& passage)
{
    TrackMatch match = search.describe(passage.hit, passage.first_place);
    const int64_t track = passage.hit.track;
    match.clip_begin = extent_of(search, track, passage.first_place, passage.first).begin;
    match.clip_end = extent_of(search, track, passage.last_place, passage.last).end;
    return match;
}

/// Adds a hit: to the passage before it, if that only paused, or as a new one.
void add_passage(std::vector<Passage>& passages, const Passage& passage)
{
    if (!passages.empty() && passages.back().hit.track == passage.hit.track &&
        std::fabs(passages.back().last_place.offset - passage.first_place.offset) < kSamePlace) {
        passages.back().last = passage.last;
        passages.back().last_place = passage.last_place;
    } else {
        passages.push_back(passage);
    }
}

/// Frees what was made for a window that has been dealt with, but for what is still referred to:
/// 1.8 MB, which would be 9 GB for a day.
void release(WindowSearch& search, size_t window, const Hits& hits,
             std::span<const Passage> passages)
{
    std::vector<const Attempt*> used;
    for (const Hit& hit : hits.all()) {
        used.push_back(hit.attempt);
    }
    for (const Passage& passage : passages) {
        used.push_back(passage.hit.attempt);
    }
    search.keep(used);
    search.source().release(window);
}

/// Searches a window for a track that begins in it.
void search_passage(WindowSearch& search, size_t window, const MatchOptions& options,
                    WindowHits& all, std::vector<Passage>& passages)
{
    const WindowHits found = search.search(window, true);
    all.heard = all.heard || found.heard;
    all.hits.take(found.hits);
    all.hits.keep(std::max<size_t>(options.candidates, 2)); // and the runner-up
    if (found.hits.matched()) {
        add_passage(passages, passage_of(search, found.hits.all().front()));
    }
}

} // namespace

TrackMatch describe_long(WindowSearch& search, const Hit& hit)
{
    Passage passage = passage_of(search, hit);
    while (passage.first > 0 && came_before(search, passage)) {
    }
    while (passage.last + 1 < search.source().windows() && goes_on(search, passage)) {
    }
    return describe_passage(search, passage);
}

double pooled_score(WindowSearch& search, const Hit& hit)
{
    const size_t windows = search.source().windows();
    const size_t own = hit.attempt->window;
    const size_t first = std::min(own - std::min(own, kPooledWindows / 2),
                                  windows - std::min(windows, kPooledWindows));
    const size_t end = std::min(first + kPooledWindows, windows);
    const Placement place = coarse_alignment(hit.attempt->reading, hit.score);
    double sum = 0;
    for (size_t window = first; window < end; ++window) {
        const TrackScore here =
            window == own ? hit.score : search.score_near(window, hit.track, place, kNearby);
        sum += here.found ? here.score : 0;
    }
    return sum / std::sqrt(static_cast<double>(end - first));
}

MatchAnswer recognise_passages(WindowSearch& search, const MatchOptions& options)
{
    std::vector<Passage> passages;
    WindowHits all;
    for (size_t window = 0; window < search.source().windows(); ++window) {
        if (passages.empty() || passages.back().last + 1 != window ||
            !goes_on(search, passages.back())) {
            search_passage(search, window, options, all, passages);
        }
        release(search, window, all.hits, passages);
    }
    MatchAnswer answer = search.summary(all, options);
    for (const Passage& passage : passages) {
        answer.matches.push_back(describe_passage(search, passage));
    }
    return answer;
}

} // namespace kzcat
