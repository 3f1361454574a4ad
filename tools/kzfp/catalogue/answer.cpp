// Looking up, and what an answer means.

#include "kzfp/catalogue/answer.hpp"

#include <algorithm>

namespace kzfp {

namespace {

constexpr double kShortestGap = 2; ///< seconds; shorter ones are where two tracks meet

FoundTrack to_found(const kzcat_match& match)
{
    FoundTrack found = {.track = match.track,
                        .source = match.source,
                        .title = {},
                        .artist = {},
                        .score = match.score,
                        .threshold = match.threshold,
                        .offset = match.offset,
                        .speed = match.speed,
                        .tempo = match.tempo,
                        .pitch = match.pitch,
                        .clip_begin = match.clip_begin,
                        .clip_end = match.clip_end,
                        .by_document = match.by == KZCAT_BY_DOCUMENT,
                        .weak = match.weak != 0};
    if (match.title != nullptr) {
        found.title = match.title;
    }
    if (match.artist != nullptr) {
        found.artist = match.artist;
    }
    return found;
}

std::vector<FoundTrack> all_found(const kzcat_result& result, uint64_t count,
                                  kzcat_status (*get)(const kzcat_result*, uint64_t, kzcat_match*))
{
    std::vector<FoundTrack> all;
    for (uint64_t i = 0; i < count; ++i) {
        kzcat_match match;
        check(get(&result, i, &match));
        all.push_back(to_found(match));
    }
    return all;
}

} // namespace

Answer look_up(kzcat_catalogue& catalogue, const kzcat_query& query, const std::string& file,
               const Lookup& lookup)
{
    kzcat_match_options options;
    check(kzcat_initialize_match_options(&options));
    options.speeds = lookup.speeds ? 1 : 0;
    options.passages = lookup.passages ? 1 : 0;
    options.candidates = lookup.candidates.value_or(1);
    const auto result = made<Result>(kzcat_recognise, &catalogue, &query, &options);
    kzcat_summary summary;
    check(kzcat_result_get_summary(result.get(), &summary));
    return {.file = file,
            .verdict = summary.verdict,
            .error = {},
            .warning = {},
            .matches = all_found(*result, summary.match_count, kzcat_result_get_match),
            .candidates = all_found(*result, summary.candidate_count, kzcat_result_get_candidate),
            .runner_up = summary.runner_up,
            .seconds = summary.clip_seconds,
            .left_out = summary.left_out,
            .shards = summary.shards,
            .shards_answered = summary.shards_answered,
            .line = 0,
            .by_document = summary.by == KZCAT_BY_DOCUMENT};
}

const char* sure_text(const FoundTrack& track)
{
    if (track.by_document) {
        const bool reached = track.score >= track.threshold;
        return !reached ? "unlikely" : track.weak ? "perhaps" : "likely";
    }
    constexpr double kNear = 0.5; // "not sure" rather than "no match" from here on
    const double above = track.score - track.threshold;
    if (above >= 0) {
        return above >= 3 ? "certain" : above >= 1 ? "very likely" : "likely";
    }
    return above >= -kNear ? "perhaps" : "unlikely";
}

std::vector<ClipPart> parts_of(const Answer& answer)
{
    std::vector<const FoundTrack*> found;
    for (const FoundTrack& match : answer.matches) {
        found.push_back(&match);
    }
    std::ranges::stable_sort(found, {}, &FoundTrack::clip_begin);
    std::vector<ClipPart> parts;
    double at = 0;
    const auto add_gap = [&parts, &at](double end) {
        if (end - at >= kShortestGap) {
            parts.push_back({.begin = at, .end = end, .found = nullptr});
        }
    };
    for (const FoundTrack* match : found) {
        add_gap(match->clip_begin);
        parts.push_back({.begin = match->clip_begin, .end = match->clip_end, .found = match});
        at = std::max(at, match->clip_end);
    }
    add_gap(answer.seconds);
    return parts;
}

} // namespace kzfp
