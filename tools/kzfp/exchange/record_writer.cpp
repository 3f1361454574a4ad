// Each line ends with a sum of what comes before it, so that a changed byte is noticed.

#include "kzfp/exchange/record.hpp"

#include <utility>

#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/output/encoding.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp {

namespace {

std::string with_sum(const JsonObject& object)
{
    std::string line = to_line(object);
    line.resize(line.size() - 2); // "}\n"
    return line + R"(,"sum":")" + to_hexadecimal(sha256(line)) + "\"}\n";
}

std::string trail_bytes(const Trail& trail)
{
    uint64_t size = 0;
    check(kzcat_trail_write(trail.get(), nullptr, 0, &size));
    std::string bytes(size, '\0');
    check(kzcat_trail_write(trail.get(), bytes.data(), size, &size));
    return bytes;
}

/// The numbers as 16 bits, the lower byte first.
std::string band_bytes(const Trail& trail)
{
    uint64_t count = 0;
    check(kzcat_trail_get_document_bands(trail.get(), nullptr, 0, &count));
    std::vector<uint16_t> bands(count);
    check(kzcat_trail_get_document_bands(trail.get(), bands.data(), count, &count));
    std::string bytes;
    for (const uint16_t band : bands) {
        bytes += static_cast<char>(band & 0xffU);
        bytes += static_cast<char>(band >> 8U);
    }
    return bytes;
}

JsonObject to_json(const kzcat_source& source)
{
    JsonObject object = JsonObject::object_t();
    set_path(object, "path", source.uri);
    if (source.size >= 0) {
        object["size"] = source.size;
    }
    if (source.mtime_ns >= 0) {
        object["mtime_ns"] = source.mtime_ns;
    }
    if (source.hash != nullptr) {
        object["sha256"] =
            to_hexadecimal({reinterpret_cast<const char*>(source.hash), size_t{KZCAT_HASH_SIZE}});
    }
    return object;
}

/// A list of pairs, since several tags may have one name.
JsonObject to_json(const std::vector<kzcat_tag>& tags)
{
    JsonObject list = JsonObject::array();
    for (const kzcat_tag& tag : tags) {
        JsonObject pair = JsonObject::array();
        pair.push_back(tag.name);
        pair.push_back(tag.value);
        list.push_back(std::move(pair));
    }
    return list;
}

} // namespace

std::string begin_line(uint64_t tracks)
{
    JsonObject object = JsonObject::object_t();
    object["schema"] = kExportSchema;
    object["kind"] = "kzfp catalogue export";
    if (tracks != 0) {
        object["tracks"] = tracks;
    }
    return with_sum(object);
}

std::string line_of(const Track& track, const Trail& trail)
{
    const kzcat_track_facts facts = facts_of(track);
    JsonObject object = JsonObject::object_t();
    object["track"] = facts.track;
    object["seconds"] = static_cast<double>(facts.samples) / facts.sample_rate;
    object["added"] = facts.added;
    object["tags"] = to_json(tags_of(track));
    object["sources"] = JsonObject::array();
    for (const kzcat_source& source : sources_of(track)) {
        object["sources"].push_back(to_json(source));
    }
    object["trail"] = to_base64(trail_bytes(trail));
    if (const std::string bands = band_bytes(trail); !bands.empty()) {
        object["document_bands"] = to_base64(bands);
    }
    return with_sum(object);
}

std::string end_line(uint64_t tracks)
{
    JsonObject object = JsonObject::object_t();
    object["end"] = true;
    object["tracks"] = tracks;
    return with_sum(object);
}

} // namespace kzfp
