// The verdict, what it rests on, and how often such a verdict was wrong.

#include "kzfp/compare/output.hpp"

#include <algorithm>
#include <cmath>

#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/printed.hpp"
#include "kzfp/output/style.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

double rounded(double number) { return std::round(number * 1e4) / 1e4; }

bool agrees(const Comparison& comparison)
{
    return comparison.trails && comparison.trails->found != 0;
}

/// "98 % of the sound agrees with 3.1 % of the bits wrong", "score 31.2 (7.3 needed)", ...
std::string evidence_text(const Comparison& comparison)
{
    std::string text;
    const auto add = [&text](const std::string& more) { text.append(", ").append(more); };
    if (const auto offset = offset_of(comparison); offset && std::fabs(*offset) >= 0.05) {
        add("begins at " + clock_text(*offset) + " of the first");
    }
    if (agrees(comparison)) {
        add(printed("%.0f %% of the sound agrees", 100 * agreeing_share(comparison)) +
            printed(" with %.1f %% of the bits wrong", 100 * comparison.trails->agreeing_rate));
    }
    if (comparison.found) {
        const bool reached = comparison.found->score >= comparison.found->threshold;
        text += offset_of(comparison) && reached ? change_text(*comparison.found) : "";
        add(printed("score %.1f", comparison.found->score) +
            printed(" (%.1f needed)", comparison.found->threshold));
    }
    if (comparison.document_distance) {
        add(printed("documents %.1f apart", *comparison.document_distance));
    }
    return text;
}

/// "; 2 of 900 such verdicts were wrong".
std::string error_text(const Comparison& comparison)
{
    const MeasuredError error = measured_error(comparison.verdict, comparison.by_document);
    if (error.pairs == 0) {
        return {};
    }
    return "; " + std::to_string(error.wrong) + " of " + std::to_string(error.pairs) +
           " such verdicts " + (error.wrong == 1 ? "was" : "were") + " wrong when measured";
}

std::string verdict_text(PairVerdict verdict, const Style& style)
{
    const std::string name(name_of(verdict));
    switch (verdict) {
    case PairVerdict::same_recording:
        return style.green(name);
    case PairVerdict::same_start:
    case PairVerdict::related:
        return style.yellow(name);
    case PairVerdict::too_quiet:
        return "too quiet or too short to say anything";
    case PairVerdict::different:
        break;
    }
    return style.bold(name);
}

JsonObject number_or_null(std::optional<double> number)
{
    return number ? JsonObject(rounded(*number)) : JsonObject();
}

JsonObject begin_object(const std::string& first, const std::string& second)
{
    JsonObject object = make_object();
    set_path(object, "first", first);
    set_path(object, "second", second);
    return object;
}

void add_found(JsonObject& object, const std::optional<FoundTrack>& found)
{
    const auto add = [&](const char* name, double FoundTrack::*member) {
        object[name] = found ? JsonObject(rounded((*found).*member)) : JsonObject();
    };
    add("score", &FoundTrack::score);
    add("threshold", &FoundTrack::threshold);
    add("speed", &FoundTrack::speed);
    add("tempo", &FoundTrack::tempo);
    add("pitch", &FoundTrack::pitch);
}

void add_trails(JsonObject& object, const Comparison& comparison)
{
    const bool both = comparison.trails.has_value();
    object["first_seconds"] = both ? JsonObject(rounded(comparison.first_seconds)) : JsonObject();
    object["second_seconds"] = both ? JsonObject(rounded(comparison.second_seconds)) : JsonObject();
    object["agreeing_seconds"] =
        both ? JsonObject(rounded(comparison.trails->agreeing)) : JsonObject();
    object["agreeing_share"] =
        both ? JsonObject(rounded(agreeing_share(comparison))) : JsonObject();
    object["bit_error_rate"] =
        agrees(comparison) ? JsonObject(rounded(comparison.trails->agreeing_rate)) : JsonObject();
}

std::string field(std::optional<double> number) { return number ? printed("%.4f", *number) : ""; }

} // namespace

std::string to_text(const ComparedPair& pair)
{
    const Style style = output_style();
    return without_control_characters(pair.second) + " and " +
           without_control_characters(pair.first) + ": " +
           verdict_text(pair.comparison.verdict, style) + evidence_text(pair.comparison) +
           error_text(pair.comparison) + '\n';
}

std::string to_json(const ComparedPair& pair)
{
    const Comparison& comparison = pair.comparison;
    JsonObject object = begin_object(pair.first, pair.second);
    object["verdict"] = name_of(comparison.verdict);
    object["by"] = comparison.by_document ? "document" : "trail";
    object["offset"] = number_or_null(offset_of(comparison));
    add_found(object, comparison.found);
    add_trails(object, comparison);
    object["document_distance"] = number_or_null(comparison.document_distance);
    const MeasuredError error = measured_error(comparison.verdict, comparison.by_document);
    JsonObject measured = JsonObject::object_t();
    measured["wrong"] = error.wrong;
    measured["pairs"] = error.pairs;
    object["measured_error"] = measured;
    return to_line(object);
}

std::string comparison_csv_header()
{
    return "first,second,verdict,offset,score,threshold,speed,tempo,pitch,agreeing_seconds,"
           "bit_error_rate,document_distance,error\n";
}

std::string to_csv(const ComparedPair& pair)
{
    const Comparison& comparison = pair.comparison;
    const auto found = [&](double FoundTrack::*member) {
        return comparison.found ? printed("%.4f", (*comparison.found).*member) : std::string();
    };
    return csv_line(std::vector<std::string>{
        pair.first, pair.second, std::string(name_of(comparison.verdict)),
        field(offset_of(comparison)), found(&FoundTrack::score), found(&FoundTrack::threshold),
        found(&FoundTrack::speed), found(&FoundTrack::tempo), found(&FoundTrack::pitch),
        agrees(comparison) ? printed("%.4f", comparison.trails->agreeing) : std::string(),
        agrees(comparison) ? printed("%.4f", comparison.trails->agreeing_rate) : std::string(),
        field(comparison.document_distance), std::string()});
}

std::string failed_json(const std::string& first, const std::string& second,
                        const std::string& error)
{
    JsonObject object = begin_object(first, second);
    object["verdict"] = "error";
    object["error"] = error;
    return to_line(object);
}

std::string failed_csv(const std::string& first, const std::string& second,
                       const std::string& error)
{
    std::vector<std::string> fields(13);
    fields[0] = first;
    fields[1] = second;
    fields[2] = "error";
    fields[12] = error;
    return csv_line(fields);
}

} // namespace kzfp
