// Answers for programs: JSON Lines and comma-separated values.

#include <cmath>

#include "kzfp/catalogue/answer_object.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/printed.hpp"

namespace kzfp {

namespace {

/// Scores, times and factors are good to a fraction of this.
double rounded(double number) { return std::round(number * 1e4) / 1e4; }

JsonObject text_or_null(const std::optional<std::string>& text)
{
    return text ? JsonObject(*text) : JsonObject();
}

JsonObject to_object(const FoundTrack& found)
{
    JsonObject object = JsonObject::object_t();
    object["track"] = found.track;
    set_path(object, "source", found.source);
    object["title"] = text_or_null(found.title);
    object["artist"] = text_or_null(found.artist);
    object["sure"] = sure_text(found);
    object["score"] = rounded(found.score);
    object["threshold"] = rounded(found.threshold);
    object["offset"] = rounded(found.offset);
    object["speed"] = rounded(found.speed);
    object["tempo"] = rounded(found.tempo);
    object["pitch"] = rounded(found.pitch);
    object["by"] = found.by_document ? "document" : "trail";
    if (found.by_document) {
        object["weak"] = found.weak;
    } else {
        object["clip_begin"] = rounded(found.clip_begin);
        object["clip_end"] = rounded(found.clip_end);
    }
    return object;
}

JsonObject to_objects(const std::vector<FoundTrack>& tracks)
{
    JsonObject list = JsonObject::array_t();
    for (const FoundTrack& found : tracks) {
        list.push_back(to_object(found));
    }
    return list;
}

JsonObject gaps_of(const Answer& answer)
{
    JsonObject list = JsonObject::array_t();
    for (const ClipPart& part : parts_of(answer)) {
        if (part.found == nullptr) {
            JsonObject gap = JsonObject::object_t();
            gap["clip_begin"] = rounded(part.begin);
            gap["clip_end"] = rounded(part.end);
            list.push_back(gap);
        }
    }
    return list;
}

std::string number_field(double number) { return printed("%.4f", rounded(number)); }

/// Everything about a file that is the same on all of its lines of CSV comes first.
std::string csv_row(const Answer& answer, const char* result, const FoundTrack* found,
                    const ClipPart* part, const std::string& error)
{
    std::vector<std::string> fields = {answer.file,
                                       answer.line == 0 ? "" : std::to_string(answer.line), result};
    fields.push_back(part == nullptr ? "" : number_field(part->begin));
    fields.push_back(part == nullptr ? "" : number_field(part->end));
    if (found == nullptr) {
        fields.resize(fields.size() + 11);
    } else {
        for (std::string field :
             {std::to_string(found->track), found->source, found->title.value_or(""),
              found->artist.value_or(""), number_field(found->offset),
              std::string(sure_text(*found)), number_field(found->score),
              number_field(found->threshold), number_field(found->speed),
              number_field(found->tempo), number_field(found->pitch)}) {
            fields.push_back(std::move(field));
        }
    }
    fields.push_back(error);
    return csv_line(fields);
}

std::string csv_row(const Answer& answer, const char* result, const FoundTrack& found)
{
    const ClipPart part = {.begin = found.clip_begin, .end = found.clip_end, .found = &found};
    return csv_row(answer, result, &found, found.by_document ? nullptr : &part, {});
}

std::string csv_rows(const Answer& answer, const std::vector<ClipPart>& parts)
{
    std::string text;
    for (const ClipPart& part : parts) {
        text += csv_row(answer, part.found == nullptr ? "gap" : "match", part.found, &part, {});
    }
    return text;
}

} // namespace

void set_answer(JsonObject& object, const Answer& answer, const Lookup& lookup)
{
    object["verdict"] = answer.error.empty() ? kzcat_verdict_text(answer.verdict) : "error";
    if (!answer.error.empty()) {
        object["error"] = answer.error;
    }
    if (!answer.warning.empty()) {
        object["warning"] = answer.warning;
    }
    object["matches"] = to_objects(answer.matches);
    object["runner_up"] = rounded(answer.runner_up);
    if (lookup.candidates) {
        object["candidates"] = to_objects(answer.candidates);
    }
    if (lookup.passages && answer.error.empty()) {
        object["gaps"] = gaps_of(answer);
        object["seconds"] = rounded(answer.seconds);
    }
    if (answer.left_out != 0) {
        object["left_out"] = answer.left_out;
    }
    if (answer.shards_answered < answer.shards) {
        object["shards"] = {{"answered", answer.shards_answered}, {"of", answer.shards}};
    }
}

std::string to_json(const Answer& answer, const Lookup& lookup)
{
    JsonObject object = make_object();
    set_path(object, "file", answer.file);
    if (answer.line != 0) {
        object["line"] = answer.line;
    }
    set_answer(object, answer, lookup);
    return to_line(object);
}

std::string csv_header()
{
    return "file,line,result,clip_begin,clip_end,track,source,title,artist,offset,sure,score,"
           "threshold,speed,tempo,pitch,error\n";
}

std::string to_csv(const Answer& answer, const Lookup& lookup)
{
    if (!answer.error.empty()) {
        return csv_row(answer, "error", nullptr, nullptr, answer.error);
    }
    if (lookup.passages && answer.verdict == KZCAT_VERDICT_MATCH) {
        return csv_rows(answer, parts_of(answer));
    }
    std::string text =
        answer.verdict == KZCAT_VERDICT_MATCH && !answer.matches.empty()
            ? csv_row(answer, "match", answer.matches.front())
            : csv_row(answer, kzcat_verdict_text(answer.verdict), nullptr, nullptr, {});
    if (lookup.candidates) {
        for (const FoundTrack& candidate : answer.candidates) {
            text += csv_row(answer, "candidate", candidate);
        }
    }
    return text;
}

} // namespace kzfp
