// In lines for people, what has not changed is only counted, and what failed is a message instead.

#include "kzfp/adding/arrival.hpp"

#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr std::array<const char*, kOutcomeCount> kOutcomes = {"added",     "known", "moved",
                                                              "unchanged", "error", "left"};

const char* word_of(Outcome outcome) { return kOutcomes.at(static_cast<size_t>(outcome)); }

std::string to_json(const Arrival& arrival)
{
    JsonObject object = make_object();
    set_path(object, "file", arrival.path);
    object["outcome"] = word_of(arrival.outcome);
    object["track"] = nullptr;
    if (arrival.track != 0) {
        object["track"] = arrival.track;
    }
    if (arrival.outcome == Outcome::failed) {
        object["error"] = arrival.error;
    }
    if (!arrival.warning.empty()) {
        object["warning"] = arrival.warning;
    }
    return to_line(object);
}

std::string to_csv(const Arrival& arrival)
{
    return csv_line(std::array<std::string, 5>{
        arrival.path, word_of(arrival.outcome),
        arrival.track != 0 ? std::to_string(arrival.track) : "", arrival.error, arrival.warning});
}

} // namespace

kzcat_source source_of(const Arrival& arrival)
{
    return {.uri = arrival.path.c_str(),
            .size = arrival.state.size,
            .mtime_ns = arrival.state.mtime_ns,
            .hash = arrival.hash ? arrival.hash->data() : nullptr};
}

std::string line_of(const Arrival& arrival, Format format)
{
    if (format == Format::json) {
        return to_json(arrival);
    }
    if (format == Format::csv) {
        return to_csv(arrival);
    }
    if (arrival.outcome == Outcome::failed || arrival.outcome == Outcome::unchanged) {
        return {};
    }
    return without_control_characters(std::string(word_of(arrival.outcome)) + " " + arrival.path) +
           '\n';
}

std::string first_line_of_arrivals(Format format)
{
    constexpr const char* kNames = "file,outcome,track,error,warning\n";
    return format == Format::csv ? kNames : "";
}

std::string counts_text(const std::array<uint64_t, kOutcomeCount>& counts)
{
    std::string text;
    for (size_t i = 0; i < static_cast<size_t>(Outcome::left); ++i) {
        const char* const word =
            i == static_cast<size_t>(Outcome::failed) ? "failed" : kOutcomes.at(i);
        if (counts.at(i) != 0) {
            text += (text.empty() ? "" : ", ") + std::to_string(counts.at(i)) + " " + word;
        }
    }
    return text;
}

} // namespace kzfp
