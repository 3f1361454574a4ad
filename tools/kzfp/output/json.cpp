// Objects keep the order of their members, so that lines of one command can be compared as text.

#include "kzfp/output/json.hpp"

#include <cmath>

#include "kzfp/output/json_object.hpp"

namespace kzfp {

namespace {

double to_microseconds(double seconds) { return std::round(seconds * 1e6) / 1e6; }

} // namespace

std::string to_json(const FingerprintRecord& record)
{
    const uint32_t offset = record.fingerprint.signal_offset;
    JsonObject object = make_object();
    set_path(object, "file", record.file);
    if (record.time) {
        object["time"] = to_microseconds(*record.time);
    }
    object["algorithm"] = record.algorithm;
    object["duration"] = nullptr;
    if (record.facts.duration) {
        object["duration"] = to_microseconds(*record.facts.duration);
    }
    object["sample_rate"] = record.facts.rate;
    object["channels"] = record.facts.channels;
    object["signal_offset_seconds"] = to_microseconds(static_cast<double>(offset) / kWorkingRate);
    object["signal_offset_samples"] = offset;
    object["signal_offset_rate"] = kWorkingRate;
    object["values"] = record.fingerprint.values;
    if (!record.warning.empty()) {
        object["warning"] = record.warning;
    }
    return to_line(object);
}

std::string to_json(const std::string& path, const DiscContent& content)
{
    JsonObject object = make_object();
    set_path(object, "path", path);
    object["bluray"] = content.is_bluray;
    object["dvd"] = content.is_dvd;
    object["control_files"] = JsonObject::object();
    for (const ControlFile& file : content.control_files) {
        object["control_files"][file.name] = file.found;
    }
    object["playlists"] = content.playlists;
    object["title_sets"] = content.title_sets;
    return to_line(object);
}

std::string to_json(const std::string& path, const DiscLabels& labels)
{
    JsonObject object = make_object();
    set_path(object, "path", path);
    object["iso9660_label"] = nullptr;
    object["udf_label"] = nullptr;
    if (labels.iso9660) {
        object["iso9660_label"] = *labels.iso9660;
    }
    if (labels.udf) {
        object["udf_label"] = *labels.udf;
    }
    return to_line(object);
}

} // namespace kzfp
