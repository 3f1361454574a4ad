// Looking up, and the two forms of an answer.

#include "kzfp/catalogue/answer.hpp"

#include <cmath>
#include <cstdio>

#include <nlohmann/json.hpp>

#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

using Object = nlohmann::ordered_json;

FoundTrack to_found(const kzcat_match& match)
{
    FoundTrack found = {.track = match.track,
                        .source = match.source,
                        .title = {},
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

/// Scores, times and factors are good to a fraction of this.
double rounded(double number) { return std::round(number * 1e4) / 1e4; }

Object to_object(const FoundTrack& found, const Lookup& lookup)
{
    Object object = Object::object_t();
    object["track"] = found.track;
    object["source"] = found.source;
    object["title"] = nullptr;
    if (found.title) {
        object["title"] = *found.title;
    }
    object["score"] = rounded(found.score);
    object["threshold"] = rounded(found.threshold);
    object["offset"] = rounded(found.offset);
    object["speed"] = rounded(found.speed);
    object["tempo"] = rounded(found.tempo);
    object["pitch"] = rounded(found.pitch);
    object["by"] = found.by_document ? "document" : "trail";
    if (found.by_document) {
        object["weak"] = found.weak;
    }
    if (lookup.passages) {
        object["clip_begin"] = rounded(found.clip_begin);
        object["clip_end"] = rounded(found.clip_end);
    }
    return object;
}

Object to_objects(const std::vector<FoundTrack>& tracks, const Lookup& lookup)
{
    Object list = Object::array_t();
    for (const FoundTrack& found : tracks) {
        list.push_back(to_object(found, lookup));
    }
    return list;
}

std::string printed(const char* format, double number)
{
    char text[64];
    std::snprintf(text, sizeof text, format, number);
    return text;
}

/// ", 3.9 % faster"; nothing for less than the numbers are good for.
std::string percent_text(double factor, const char* more, const char* less)
{
    const double percent = (factor - 1) * 100;
    if (std::fabs(percent) < 0.25) {
        return {};
    }
    return ", " + printed("%.1f %% ", std::fabs(percent)) + (percent > 0 ? more : less);
}

/// "Title (path) at 1:02.3, score 23.1 (7.3 needed)".
std::string to_text(const FoundTrack& found, const Lookup& lookup)
{
    std::string text = name_text(found) + " at " + clock_text(found.offset);
    if (lookup.passages) {
        text += " from " + clock_text(found.clip_begin) + " to " + clock_text(found.clip_end) +
                " of the clip";
    }
    if (found.by_document) {
        return text + ", by document" + (found.weak ? ", weak" : "") + ", distance " +
               printed("%.0f", -found.score) + printed(" (%.0f allowed)", -found.threshold);
    }
    return text + ", score " + printed("%.1f", found.score) +
           printed(" (%.1f needed)", found.threshold) + change_text(found);
}

std::string verdict_line(const Answer& answer, const Lookup& lookup)
{
    if (answer.verdict == KZCAT_VERDICT_MATCH && !answer.matches.empty()) {
        return to_text(answer.matches.front(), lookup);
    }
    if (answer.verdict == KZCAT_VERDICT_NOT_SURE && !answer.candidates.empty()) {
        return "not sure: perhaps " + to_text(answer.candidates.front(), lookup);
    }
    if (answer.verdict == KZCAT_VERDICT_TOO_QUIET) {
        return "too quiet or too short to say anything";
    }
    return kzcat_verdict_text(answer.verdict);
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
            .runner_up = summary.runner_up};
}

std::string to_json(const Answer& answer, const Lookup& lookup)
{
    Object object = Object::object_t();
    object["file"] = answer.file;
    if (answer.error.empty()) {
        object["verdict"] = kzcat_verdict_text(answer.verdict);
    } else {
        object["verdict"] = "error";
        object["error"] = answer.error;
    }
    object["matches"] = to_objects(answer.matches, lookup);
    object["runner_up"] = rounded(answer.runner_up);
    if (lookup.candidates) {
        object["candidates"] = to_objects(answer.candidates, lookup);
    }
    // A name that is not UTF-8 is shown with replacement characters.
    return object.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + '\n';
}

std::string to_text(const Answer& answer, const Lookup& lookup)
{
    const auto line = [](const std::string& text) {
        return without_control_characters(text) + '\n';
    };
    std::string text = line(answer.file + ": " + verdict_line(answer, lookup));
    for (size_t i = 1; i < answer.matches.size(); ++i) {
        text += line(answer.file + ": also " + to_text(answer.matches[i], lookup));
    }
    if (lookup.candidates) {
        for (const FoundTrack& candidate : answer.candidates) {
            text += line(answer.file + ": candidate " + to_text(candidate, lookup));
        }
    }
    return text;
}

std::string clock_text(double seconds)
{
    const auto tenths = static_cast<int64_t>(std::llround(std::fabs(seconds) * 10));
    char text[64];
    const int64_t minutes = tenths / 600;
    if (minutes < 60) {
        std::snprintf(text, sizeof text, "%lld:%02lld.%lld", static_cast<long long>(minutes),
                      static_cast<long long>(tenths / 10 % 60),
                      static_cast<long long>(tenths % 10));
    } else {
        std::snprintf(text, sizeof text, "%lld:%02lld:%02lld.%lld",
                      static_cast<long long>(minutes / 60), static_cast<long long>(minutes % 60),
                      static_cast<long long>(tenths / 10 % 60),
                      static_cast<long long>(tenths % 10));
    }
    std::string result = seconds < 0 && tenths > 0 ? "-" : "";
    return result.append(text);
}

std::string name_text(const FoundTrack& track)
{
    if (track.source.empty()) {
        return "track " + std::to_string(track.track);
    }
    return track.title ? *track.title + " (" + track.source + ")" : track.source;
}

std::string change_text(const FoundTrack& track)
{
    if (std::fabs(track.speed - 1) >= 0.0025) {
        return percent_text(track.speed, "faster", "slower");
    }
    return percent_text(track.tempo, "quicker in tempo", "slower in tempo") +
           percent_text(track.pitch, "higher in pitch", "lower in pitch");
}

} // namespace kzfp
