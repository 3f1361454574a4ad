// Answers for people.

#include <cmath>
#include <cstdio>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/output/printed.hpp"
#include "kzfp/output/style.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

/// ", 3.9 % faster"; nothing for less than the numbers are good for.
std::string percent_text(double factor, const char* more, const char* less)
{
    const double percent = (factor - 1) * 100;
    if (std::fabs(percent) < 0.25) {
        return {};
    }
    std::string text = printed(", %.1f %% ", std::fabs(percent));
    return text.append(percent > 0 ? more : less);
}

std::string range_text(double begin, double end)
{
    std::string text = clock_text(begin);
    return text.append(" - ").append(clock_text(end));
}

/// "certain (score 23.1, 7.3 needed), 3.9 % faster".
std::string score_text(const FoundTrack& found)
{
    if (found.by_document) {
        return std::string(sure_text(found)) + " by document" + (found.weak ? ", weak" : "") +
               printed(" (distance %.0f, ", -found.score) +
               printed("%.0f allowed)", -found.threshold);
    }
    std::string text = sure_text(found);
    return text.append(printed(" (score %.1f, ", found.score))
        .append(printed("%.1f needed)", found.threshold))
        .append(change_text(found));
}

/// "Title (path) at 1:02.3, certain (score 23.1, 7.3 needed), 0:00.0 - 0:14.3 of the clip".
std::string track_text(const FoundTrack& found, const Style& style)
{
    std::string text = style.bold(without_control_characters(name_text(found))) + " at " +
                       clock_text(found.offset) + ", " + score_text(found);
    if (!found.by_document) {
        text += ", " + range_text(found.clip_begin, found.clip_end) + " of the clip";
    }
    return text;
}

std::string verdict_text(const Answer& answer, const Style& style)
{
    if (answer.verdict == KZCAT_VERDICT_MATCH && !answer.matches.empty()) {
        return track_text(answer.matches.front(), style);
    }
    if (answer.verdict == KZCAT_VERDICT_NOT_SURE && !answer.candidates.empty()) {
        return style.yellow("not sure") + ": perhaps " +
               track_text(answer.candidates.front(), style);
    }
    if (answer.verdict == KZCAT_VERDICT_TOO_QUIET) {
        return "too quiet or too short to say anything";
    }
    return kzcat_verdict_text(answer.verdict);
}

/// "0:35.2 - 1:10.0  Title (path) at 0:12.0, certain (score 23.1, 7.3 needed)".
std::string part_text(const ClipPart& part, const Style& style)
{
    const std::string range = range_text(part.begin, part.end) + "  ";
    if (part.found == nullptr) {
        return range + style.dim("not recognised");
    }
    return range + style.bold(without_control_characters(name_text(*part.found))) + " at " +
           clock_text(part.found->offset + part.begin * part.found->tempo) + ", " +
           score_text(*part.found);
}

/// "mix.wav", or "songs.txt:3" for a line of it.
std::string clip_text(const Answer& answer)
{
    return without_control_characters(answer.file) +
           (answer.line == 0 ? std::string() : ':' + std::to_string(answer.line));
}

} // namespace

std::string to_text(const Answer& answer, const Lookup& lookup)
{
    const Style style = output_style();
    const std::string name = clip_text(answer) + ": ";
    const bool listed = lookup.passages && answer.verdict == KZCAT_VERDICT_MATCH;
    std::string text;
    if (listed) {
        for (const ClipPart& part : parts_of(answer)) {
            text += name + part_text(part, style) + '\n';
        }
    } else {
        text = name + verdict_text(answer, style) + '\n';
        for (size_t i = 1; i < answer.matches.size(); ++i) {
            text += name + "also " + track_text(answer.matches[i], style) + '\n';
        }
    }
    if (lookup.candidates) {
        for (const FoundTrack& candidate : answer.candidates) {
            text += name + "candidate " + track_text(candidate, style) + '\n';
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
