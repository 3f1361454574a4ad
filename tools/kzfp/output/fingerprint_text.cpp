// Each form has one place for every file, so that results and files can be laid side by side.

#include "kzfp/output/fingerprint_text.hpp"

#include <cmath>
#include <cstdio>
#include <vector>

#include "kzfp/output/csv.hpp"
#include "kzfp/output/fingerprint_bars.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/text.hpp"
#include "kzfp/output/wrapped_documents.hpp"

namespace kzfp {

namespace {

constexpr size_t kBands = 15;

double to_microseconds(double seconds) { return std::round(seconds * 1e6) / 1e6; }

/// "12.345", without more digits than it has.
std::string seconds_text(double seconds)
{
    char text[64];
    std::snprintf(text, sizeof text, "%.15g", to_microseconds(seconds));
    return text;
}

std::string time_text(const std::optional<double>& time) { return time ? seconds_text(*time) : ""; }

std::vector<std::string> csv_names()
{
    std::vector<std::string> names = {"file",
                                      "time",
                                      "algorithm",
                                      "duration",
                                      "sample_rate",
                                      "channels",
                                      "signal_offset_seconds"};
    for (const char* half : {"mean_", "spread_"}) {
        for (size_t band = 1; band <= kBands; ++band) {
            names.push_back(half + std::to_string(band));
        }
    }
    names.emplace_back("error");
    return names;
}

std::string csv_text(const FingerprintRecord& record)
{
    const double silence = static_cast<double>(record.fingerprint.signal_offset) / kWorkingRate;
    std::vector<std::string> fields = {record.file,
                                       time_text(record.time),
                                       std::string(record.algorithm),
                                       time_text(record.facts.duration),
                                       std::to_string(record.facts.rate),
                                       std::to_string(record.facts.channels),
                                       seconds_text(silence)};
    for (const int16_t value : record.fingerprint.values) {
        fields.push_back(std::to_string(value));
    }
    fields.emplace_back();
    return csv_line(fields);
}

std::string csv_failure(const std::string& file, const std::string& error,
                        const std::optional<double>& time)
{
    std::vector<std::string> fields(csv_names().size());
    fields[0] = file;
    fields[1] = time_text(time);
    fields.back() = error;
    return csv_line(fields);
}

std::string json_failure(const std::string& file, const std::string& error,
                         const std::optional<double>& time)
{
    JsonObject object = make_object();
    set_path(object, "file", file);
    if (time) {
        object["time"] = to_microseconds(*time);
    }
    object["error"] = error;
    return to_line(object);
}

std::string values_text(const FingerprintRecord& record)
{
    return (record.time ? seconds_text(*record.time) + ' ' : "") +
           to_text(record.fingerprint.values);
}

} // namespace

std::string fingerprint_heading(const FingerprintForm& form)
{
    if (form.format == Format::csv) {
        return csv_line(csv_names());
    }
    return form.wrapped ? wrapper_start() : "";
}

std::string fingerprint_text(const FingerprintForm& form, const FingerprintRecord& record)
{
    switch (form.format) {
    case Format::json:
        return to_json(record);
    case Format::csv:
        return csv_text(record);
    case Format::values:
        return values_text(record);
    case Format::human:
        return human_text(record);
    case Format::xml:
        break;
    }
    const std::string& document = record.fingerprint.document;
    return form.wrapped ? wrapped_document(record.file, document) : document + '\n';
}

std::string failure_text(const FingerprintForm& form, const std::string& file,
                         const std::string& error, std::optional<double> time)
{
    switch (form.format) {
    case Format::json:
        return json_failure(file, error, time);
    case Format::csv:
        return csv_failure(file, error, time);
    case Format::values:
        return time_text(time) + '\n';
    case Format::human:
        return time ? human_failure(error, *time) : "";
    case Format::xml:
        break;
    }
    return form.wrapped ? wrapped_failure(file, error) : "";
}

std::string fingerprint_ending(const FingerprintForm& form)
{
    return form.wrapped ? wrapper_end() : "";
}

} // namespace kzfp
