/// @file
/// Recognising a clip: verdicts, places and scores.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "catalogue/match/hypothesis.hpp"
#include "catalogue/match/searcher.hpp"
#include "catalogue/model/trail.hpp"

namespace kzcat {

enum class Verdict {
    match,
    no_match,
    not_sure,  ///< the best score is within half a unit of the threshold
    too_quiet, ///< or too short: too few frames say anything
};

/// One track in which the clip was found.
struct TrackMatch {
    int64_t track = 0;
    double score = 0;
    double threshold = 0;  ///< that this score had to reach
    double offset = 0;     ///< seconds of the track at which the clip begins; may be negative
    double speed = 1;      ///< pitch and tempo changed alike; 1 when unchanged
    double tempo = 1;      ///< the clip runs this much faster
    double pitch = 1;      ///< the clip's frequencies are this many times the track's
    double clip_begin = 0; ///< seconds of the clip where what was found begins and ends
    double clip_end = 0;
};

struct MatchOptions {
    bool speeds = true;      ///< try the 18 further hypotheses
    uint32_t candidates = 2; ///< tracks to report whatever their score
    bool passages = false;   ///< the clip may hold several tracks one after the other
};

struct MatchAnswer {
    Verdict verdict = Verdict::no_match;
    std::vector<TrackMatch> matches;    ///< those that reach their threshold, best first
    std::vector<TrackMatch> candidates; ///< the best tracks whatever their score
    double runner_up = 0;               ///< score of the second best track; 0 when there is none
};

/// Recognises a clip. Pure but for what the searcher does; the same bits on every processor.
MatchAnswer recognise(const QueryBands& query, Searcher& searcher, const MatchOptions& options);

/// Recognises a trail that was made as those of the catalogue are: one phase, nothing masked.
MatchAnswer recognise(const Trail& query, Searcher& searcher, const MatchOptions& options);

} // namespace kzcat
