/// @file
/// What was recognised of a file, as it is printed.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/catalogue/handles.hpp"

namespace kzfp {

/// A track in which a clip was found.
struct FoundTrack {
    int64_t track = 0;
    std::string source;
    std::optional<std::string> title;
    std::optional<std::string> artist;
    double score = 0;
    double threshold = 0;
    double offset = 0; ///< seconds of the track at which the clip begins
    double speed = 1;
    double tempo = 1;
    double pitch = 1;
    double clip_begin = 0;
    double clip_end = 0;
    bool by_document = false;
    bool weak = false;
};

struct Answer {
    std::string file;
    uint32_t verdict = 0; ///< KZCAT_VERDICT_...; 0 when there is an error instead
    std::string error;
    std::string warning; ///< what was wrong with the file although it could be looked up
    std::vector<FoundTrack> matches;
    std::vector<FoundTrack> candidates;
    double runner_up = 0;
    double seconds = 0;    ///< of the clip; 0 when that is not known
    uint32_t left_out = 0; ///< tracks that are damaged and were not looked through
    uint32_t shards = 1;   ///< servers that have tracks
    uint32_t shards_answered = 1;
    size_t line = 0;          ///< of the file, which holds a clip on each line; otherwise 0
    bool by_document = false; ///< looked up by 30 values alone
};

/// How clips are looked up and which of it is shown.
struct Lookup {
    bool speeds = true;
    bool passages = false; ///< everything that is recognised in the clip, in the order of time
    std::optional<uint32_t> candidates; ///< shown only when a number of them is given
};

/// Looks a query up. Throws CatalogueError.
Answer look_up(kzcat_catalogue& catalogue, const kzcat_query& query, const std::string& file,
               const Lookup& lookup);

/// One object on one line.
std::string to_json(const Answer& answer, const Lookup& lookup);

/// The names of the columns of to_csv(), with a line break.
std::string csv_header();

/// A line for the best match, or for each candidate, or for each part of a clip of passages.
std::string to_csv(const Answer& answer, const Lookup& lookup);

/// A line for people, or several when there are several matches or candidates.
std::string to_text(const Answer& answer, const Lookup& lookup);

/// How sure it is that a clip is from a track: "certain", "very likely" or "likely" when the score
/// is at least 3 above what is needed, at least 1, or reaches it; "perhaps" within half a unit
/// below it; "unlikely". By document: "likely", or "perhaps" when it is weak.
const char* sure_text(const FoundTrack& track);

/// A part of a clip: a track, or nothing that was recognised.
struct ClipPart {
    double begin;
    double end;
    const FoundTrack* found; ///< null for a gap
};

/// The passages of an answer in the order of time, with gaps of two seconds or more between them.
std::vector<ClipPart> parts_of(const Answer& answer);

/// "1:02:03.4", "2:03.4" or "0:03.4"; with a minus sign when negative.
std::string clock_text(double seconds);

/// "Title (path)".
std::string name_text(const FoundTrack& track);

/// ", 3.9 % faster", ", 2.0 % higher", or nothing when nothing is changed.
std::string change_text(const FoundTrack& track);

} // namespace kzfp
