// Two measures decide: whether the shorter file is recognised in the longer one, at any speed, and
// how much of their trails agrees when one is laid over the other.

#include "kzfp/compare/comparison.hpp"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <functional>
#include <numeric>

namespace kzfp {

namespace {

/// Mean absolute difference of the values from which on two starts are taken to differ.
constexpr double kLargestDistance = 100;

/// The share of the sound of the longer file that agrees in the same recording.
constexpr double kWholeShare = 0.75;

/// Seconds by which the starts of two files may differ for the same start.
constexpr double kStartDifference = 3;

/// Seconds that have to agree for the same start, and for files to be related at all.
constexpr double kAgreeingSeconds = 6;

/// A change of speed, tempo or pitch from here on makes another recording of one.
constexpr double kSameSpeed = 0.01;

/// Recordings longer than this that share sound at the same speed have stretches that agree. Where
/// a look-up found one such recording in another without any, it was by chance whenever that was
/// measured.
constexpr double kLongSeconds = 30;

std::optional<double> distance_of(const Side& first, const Side& second)
{
    if (first.values.empty() || second.values.empty()) {
        return {};
    }
    const double sum =
        std::transform_reduce(first.values.begin(), first.values.end(), second.values.begin(), 0.0,
                              std::plus<>(), [](int a, int b) { return std::abs(a - b); });
    return sum / static_cast<double>(first.values.size());
}

Query query_of(const Side& side, const SoundOptions& options)
{
    if (side.is_sound) {
        return read_clip(side.path, options).query;
    }
    return made<Query>(kzcat_query_create_from_trail,
                       static_cast<const kzcat_trail*>(side.trail.get()));
}

/// Looks the sound of `clip` up in a catalogue of `track` alone.
Answer look_up_in(const Side& track, const Side& clip, const SoundOptions& options)
{
    const auto catalogue =
        made<Catalogue>(kzcat_open, static_cast<const char*>(nullptr),
                        uint32_t{KZCAT_ACCESS_CREATE}, static_cast<const kzcat_settings*>(nullptr));
    const kzcat_new_track added = {
        .trail = track.trail.get(),
        .source = {.uri = track.path.c_str(), .size = -1, .mtime_ns = -1, .hash = nullptr},
        .tags = nullptr,
        .tag_count = 0};
    check(kzcat_add(catalogue.get(), &added, 1, nullptr));
    return look_up(*catalogue, *query_of(clip, options), clip.path, {});
}

/// The same finding seen from the other file: its place and speed in the first one.
void turn_round(FoundTrack& found)
{
    const double begin = found.offset + found.clip_begin * found.tempo;
    const double end = found.offset + found.clip_end * found.tempo;
    found.offset = -found.offset / found.tempo;
    found.speed = 1 / found.speed;
    found.tempo = 1 / found.tempo;
    found.pitch = 1 / found.pitch;
    found.clip_begin = begin;
    found.clip_end = end;
}

/// The shorter file is looked up in the longer one; what is found is stated for the second one.
uint32_t find(const Side& first, const Side& second, const SoundOptions& options,
              Comparison& comparison)
{
    const bool turned = first.seconds < second.seconds;
    const Answer answer =
        turned ? look_up_in(second, first, options) : look_up_in(first, second, options);
    const std::vector<FoundTrack>& best =
        answer.matches.empty() ? answer.candidates : answer.matches;
    if (!best.empty()) {
        comparison.found = best.front();
        if (turned) {
            turn_round(*comparison.found);
        }
    }
    return answer.verdict;
}

bool runs_alike(const FoundTrack& found)
{
    return std::fabs(found.tempo - 1) < kSameSpeed && std::fabs(found.pitch - 1) < kSameSpeed;
}

bool is_long(const Comparison& comparison)
{
    return std::min(comparison.first_seconds, comparison.second_seconds) > kLongSeconds;
}

bool starts_alike(const kzcat_alignment& trails)
{
    return std::fabs(trails.offset) <= kStartDifference && trails.agreeing >= kAgreeingSeconds &&
           trails.begin <= kStartDifference;
}

} // namespace

std::string_view name_of(PairVerdict verdict)
{
    switch (verdict) {
    case PairVerdict::same_recording:
        return "same recording";
    case PairVerdict::same_start:
        return "same start";
    case PairVerdict::related:
        return "related";
    case PairVerdict::different:
        return "different";
    case PairVerdict::too_quiet:
        break;
    }
    return "too quiet";
}

std::optional<double> offset_of(const Comparison& comparison)
{
    if (comparison.verdict == PairVerdict::different ||
        comparison.verdict == PairVerdict::too_quiet) {
        return {};
    }
    if (comparison.found && comparison.found->score >= comparison.found->threshold) {
        return comparison.found->offset;
    }
    const bool agrees = comparison.trails && comparison.trails->found != 0;
    return agrees ? std::optional(comparison.trails->offset) : std::nullopt;
}

double agreeing_share(const Comparison& comparison)
{
    if (!comparison.trails) {
        return 0;
    }
    const kzcat_alignment& trails = *comparison.trails;
    const double longer = std::max(trails.first_sounding, trails.second_sounding);
    return longer > 0 ? trails.agreeing / longer : 0;
}

PairVerdict verdict_of(const Comparison& comparison, uint32_t verdict)
{
    if (comparison.by_document) {
        return comparison.document_distance.value_or(kLargestDistance) < kLargestDistance
                   ? PairVerdict::same_start
                   : PairVerdict::different;
    }
    const bool agrees = comparison.trails && comparison.trails->found != 0;
    const bool found = verdict == KZCAT_VERDICT_MATCH && comparison.found.has_value();
    const bool alike = !found || runs_alike(*comparison.found);
    if (agrees && alike) {
        if (agreeing_share(comparison) >= kWholeShare) {
            return PairVerdict::same_recording;
        }
        if (starts_alike(*comparison.trails)) {
            return PairVerdict::same_start;
        }
    }
    if ((agrees && comparison.trails->agreeing >= kAgreeingSeconds) ||
        (found && (agrees || !alike || !is_long(comparison)))) {
        return PairVerdict::related;
    }
    return verdict == KZCAT_VERDICT_TOO_QUIET ? PairVerdict::too_quiet : PairVerdict::different;
}

Comparison compare(const Side& first, const Side& second, const SoundOptions& options)
{
    Comparison comparison;
    comparison.first_seconds = first.seconds;
    comparison.second_seconds = second.seconds;
    comparison.document_distance = distance_of(first, second);
    uint32_t verdict = 0;
    if (first.trail != nullptr && second.trail != nullptr) {
        comparison.trails.emplace();
        check(kzcat_trail_align(first.trail.get(), second.trail.get(), &*comparison.trails));
        verdict = find(first, second, options, comparison);
    } else if (comparison.document_distance) {
        comparison.by_document = true;
    } else {
        throw audio::FileError("has nothing that can be compared with " + first.path +
                               ": one is a trail and the other a document, or too short for one; "
                               "compare the sound files");
    }
    comparison.verdict = verdict_of(comparison, verdict);
    return comparison;
}

// The tables of docs/comparing.md.
MeasuredError measured_error(PairVerdict verdict, bool by_document)
{
    switch (verdict) {
    case PairVerdict::same_recording:
        return {.wrong = 0, .pairs = 198};
    case PairVerdict::same_start:
        return by_document ? MeasuredError{.wrong = 0, .pairs = 220}
                           : MeasuredError{.wrong = 2, .pairs = 49};
    case PairVerdict::related:
        return {.wrong = 1, .pairs = 247};
    case PairVerdict::different:
        return by_document ? MeasuredError{.wrong = 0, .pairs = 20705}
                           : MeasuredError{.wrong = 7, .pairs = 4326};
    case PairVerdict::too_quiet:
        break;
    }
    return {.wrong = 0, .pairs = 0};
}

} // namespace kzfp
