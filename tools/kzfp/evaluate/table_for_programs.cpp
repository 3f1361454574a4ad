// The table as JSON Lines and as comma-separated values.

#include <cmath>

#include "kzfp/evaluate/table.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp::evaluate {

namespace {

/// To four places, so that the text does not depend on the last bits.
JsonObject number(std::optional<double> value)
{
    return value ? JsonObject(std::round(*value * 1e4) / 1e4) : JsonObject();
}

std::optional<double> share(size_t hits, size_t count)
{
    return count == 0 ? std::optional<double>()
                      : static_cast<double>(hits) / static_cast<double>(count);
}

void add_tally(JsonObject& object, const Tally& tally)
{
    const Interval recall = confidence(tally.right, tally.clips);
    const Interval matched = confidence(tally.false_matches, tally.strangers);
    object["clips"] = tally.clips;
    object["first"] = tally.first;
    object["right"] = tally.right;
    object["recall"] = number(share(tally.right, tally.clips));
    object["recall_low"] = number(recall.low);
    object["recall_high"] = number(recall.high);
    object["wrong"] = tally.wrong;
    object["strangers"] = tally.strangers;
    object["false_matches"] = tally.false_matches;
    object["false_matches_low"] = number(matched.low);
    object["false_matches_high"] = number(matched.high);
    object["place_median"] = number(quantile(tally.place_errors, 0.5));
    object["place_95"] = number(quantile(tally.place_errors, 0.95));
    object["look_up_ms"] = number(quantile(tally.milliseconds, 0.5));
    object["same_sound"] = tally.same_sound;
    object["silent"] = tally.silent;
    object["failed"] = tally.failed;
}

std::string row_line(const Table::Row& row)
{
    JsonObject object = make_object();
    object["kind"] = row.name;
    object["explanation"] = row.explanation;
    object["length"] = row.seconds;
    if (row.not_made.empty()) {
        add_tally(object, row.tally);
    } else {
        object["not_made"] = row.not_made;
    }
    return to_line(object);
}

JsonObject pair_object(const SameRecording& pair)
{
    JsonObject object = JsonObject::object_t();
    set_path(object, "file", pair.one);
    set_path(object, "other", pair.other);
    return object;
}

std::string summary_line(const Table& table)
{
    JsonObject object = make_object();
    object["kind"] = "all";
    object["partial"] = table.partial;
    object["tracks"] = table.tracks;
    object["stranger_tracks"] = table.strangers;
    object["catalogue_tracks"] = table.catalogue_tracks;
    object["hours"] = number(table.hours);
    object["seed"] = table.seed;
    add_tally(object, table.all());
    if (table.both_plans) {
        object["by_scan"] = table.all().scanned;
        object["of_these_by_parts"] = table.all().by_parts;
    }
    object["identical"] = JsonObject::array_t();
    for (const SameRecording& pair : table.identical) {
        object["identical"].push_back(pair_object(pair));
    }
    object["same_sound_pairs"] = JsonObject::array_t();
    for (const auto& [pair, clips] : table.same_sound) {
        JsonObject one = pair_object(pair);
        one["clips"] = clips;
        object["same_sound_pairs"].push_back(one);
    }
    return to_line(object);
}

/// The members of one line, in the order of the columns; the texts of numbers are those of JSON.
constexpr const char* kColumns[] = {"clips",
                                    "first",
                                    "right",
                                    "recall",
                                    "recall_low",
                                    "recall_high",
                                    "wrong",
                                    "strangers",
                                    "false_matches",
                                    "false_matches_low",
                                    "false_matches_high",
                                    "place_median",
                                    "place_95",
                                    "look_up_ms",
                                    "same_sound",
                                    "silent",
                                    "failed"};

std::string csv_row(const std::string& name, const std::string& seconds,
                    const std::string& not_made, const Tally& tally)
{
    JsonObject object = JsonObject::object_t();
    add_tally(object, tally);
    std::vector<std::string> fields = {name, seconds};
    for (const char* const column : kColumns) {
        const JsonObject& value = object[column];
        fields.push_back(value.is_null() || !not_made.empty() ? "" : value.dump());
    }
    fields.push_back(not_made);
    return csv_line(fields);
}

} // namespace

std::string to_json(const Table& table)
{
    std::string text;
    for (const Table::Row& row : table.rows) {
        text += row_line(row);
    }
    return text + summary_line(table);
}

std::string to_csv(const Table& table)
{
    std::vector<std::string> names = {"kind", "length"};
    names.insert(names.end(), std::begin(kColumns), std::end(kColumns));
    names.emplace_back("not_made");
    std::string text = csv_line(names);
    for (const Table::Row& row : table.rows) {
        text += csv_row(row.name, JsonObject(row.seconds).dump(), row.not_made, row.tally);
    }
    return text + csv_row(table.partial ? "all so far" : "all", "", "", table.all());
}

} // namespace kzfp::evaluate
