// Whatever a line holds, it is either a whole track or an error.

#include "kzfp/exchange/record.hpp"

#include <string_view>

#include "kzfp/output/encoding.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp {

namespace {

constexpr std::string_view kSumName = R"(,"sum":")";
constexpr size_t kSumSize = kSumName.size() + 64 + 2; ///< with the digits and the end

void check_sum(const std::string& line)
{
    const size_t begin = line.size() < kSumSize ? 0 : line.size() - kSumSize;
    const std::string_view text = line;
    if (begin == 0 || !text.substr(begin).starts_with(kSumName)) {
        throw LineError("its \"sum\" is not its last member; export it again, or remove that "
                        "member when the line was changed on purpose");
    }
    if (to_hexadecimal(sha256(text.substr(0, begin))) != text.substr(begin + kSumName.size(), 64)) {
        throw LineError("it was changed since it was written, as its \"sum\" shows; export it "
                        "again, or remove that member when the line was changed on purpose");
    }
}

[[noreturn]] void refuse(const std::string& member, const std::string& wanted)
{
    throw LineError("its member \"" + member + "\" is not " + wanted + "; export it again");
}

const JsonObject& member_of(const JsonObject& object, const char* name)
{
    const auto found = object.find(name);
    if (found == object.end()) {
        throw LineError(std::string("it has no member \"") + name + "\"; export it again");
    }
    return *found;
}

/// A text without NUL, which would end it early.
std::string text_of(const JsonObject& value, const char* name)
{
    if (!value.is_string() || value.get_ref<const std::string&>().find('\0') != std::string::npos) {
        refuse(name, "a text");
    }
    return value.get<std::string>();
}

int64_t number_of(const JsonObject& object, const char* name, int64_t otherwise)
{
    const auto found = object.find(name);
    if (found == object.end()) {
        return otherwise;
    }
    if (!found->is_number_integer() ||
        (found->is_number_unsigned() && found->get<uint64_t>() > uint64_t{INT64_MAX})) {
        refuse(name, "a whole number");
    }
    return found->get<int64_t>();
}

uint64_t count_of(const JsonObject& object)
{
    const int64_t count = number_of(object, "tracks", 0);
    if (count < 0) {
        refuse("tracks", "a number of tracks");
    }
    return static_cast<uint64_t>(count);
}

std::string path_of(const JsonObject& object)
{
    const auto bytes = object.find("path_bytes");
    if (bytes == object.end()) {
        return text_of(member_of(object, "path"), "path");
    }
    const auto path = from_hexadecimal(text_of(*bytes, "path_bytes"));
    if (!path || path->find('\0') != std::string::npos) {
        refuse("path_bytes", "a path in hexadecimal digits");
    }
    return *path;
}

ExportedSource to_source(const JsonObject& object)
{
    if (!object.is_object()) {
        refuse("sources", "a list of objects");
    }
    ExportedSource source = {.path = path_of(object),
                             .size = number_of(object, "size", -1),
                             .mtime_ns = number_of(object, "mtime_ns", -1),
                             .hash = {}};
    if (const auto hash = object.find("sha256"); hash != object.end()) {
        source.hash = from_hexadecimal(text_of(*hash, "sha256")).value_or("");
        if (source.hash.size() != KZCAT_HASH_SIZE) {
            refuse("sha256", "64 hexadecimal digits");
        }
    }
    return source;
}

ExportedTag to_tag(const JsonObject& pair)
{
    if (!pair.is_array() || pair.size() != 2) {
        refuse("tags", "a list of pairs of texts");
    }
    return {.name = text_of(pair[0], "tags"), .value = text_of(pair[1], "tags")};
}

std::string base64_of(const JsonObject& value, const char* name)
{
    auto bytes = from_base64(text_of(value, name));
    if (!bytes) {
        refuse(name, "Base64");
    }
    return *std::move(bytes);
}

std::vector<uint16_t> to_bands(const std::string& bytes)
{
    if (bytes.size() % 2 != 0) {
        refuse("document_bands", "a list of numbers of two bytes");
    }
    std::vector<uint16_t> bands;
    for (size_t i = 0; i < bytes.size(); i += 2) {
        const uint32_t low = static_cast<uint8_t>(bytes[i]);
        const uint32_t high = static_cast<uint8_t>(bytes[i + 1]);
        bands.push_back(static_cast<uint16_t>(low | (high << 8U)));
    }
    return bands;
}

Trail to_trail(const JsonObject& object)
{
    const std::string bytes = base64_of(member_of(object, "trail"), "trail");
    Trail trail = made<Trail>(kzcat_trail_read, bytes.data(), bytes.size());
    if (const auto text = object.find("document_bands"); text != object.end()) {
        const std::vector<uint16_t> bands = to_bands(base64_of(*text, "document_bands"));
        trail = made<Trail>(kzcat_trail_create_with_document_bands,
                            static_cast<const kzcat_trail*>(trail.get()), bands.data(),
                            uint64_t{bands.size()});
    }
    return trail;
}

template <class Item, class Convert>
std::vector<Item> list_of(const JsonObject& object, const char* name, Convert convert)
{
    const JsonObject& list = member_of(object, name);
    if (!list.is_array()) {
        refuse(name, "a list");
    }
    std::vector<Item> items;
    for (const JsonObject& item : list) {
        items.push_back(convert(item));
    }
    return items;
}

ExportBegin to_begin(const JsonObject& object)
{
    if (text_of(object.at("kind"), "kind") != "kzfp catalogue export") {
        refuse("kind", "that of an exported catalogue");
    }
    if (number_of(object, "schema", 0) > kExportSchema) {
        throw LineError("it was written by a newer kzfp; update this one");
    }
    return {.tracks = count_of(object)};
}

} // namespace

ExportLine read_line(const std::string& line)
{
    const JsonObject object = JsonObject::parse(line, nullptr, false);
    if (object.is_discarded() || !object.is_object()) {
        throw LineError("it is no JSON object, as 'kzfp export' writes; export it again");
    }
    if (object.contains("sum")) {
        check_sum(line);
    }
    if (object.contains("kind")) {
        return to_begin(object);
    }
    if (object.contains("end")) {
        return ExportEnd{.tracks = count_of(object)};
    }
    try {
        return ExportedTrack{.trail = to_trail(object),
                             .sources = list_of<ExportedSource>(object, "sources", to_source),
                             .tags = list_of<ExportedTag>(object, "tags", to_tag),
                             .added = number_of(object, "added", 0)};
    } catch (const CatalogueError& error) {
        throw LineError(error.what());
    }
}

} // namespace kzfp
