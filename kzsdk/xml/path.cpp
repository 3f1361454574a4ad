/// @file
/// Reading and setting data by a path of names with "/" between them.
///
/// The five functions differ in whether the path begins with the tag's own name, in what a leading
/// "/" does, and in whether the last name may be an attribute; the table in xml.h has all of it.
/// All of them walk down without recursion, so a path may be of any length.
#include "kzsdk/xml/xml.h"

#include "kzsdk/xml/text.hpp"

namespace {

using kz::xml::Text;
using kz::xml::text_of;

/// A path cut at its first "/".
struct Cut {
    Text segment;
    const char* rest; ///< behind the "/"; null when there is none
};

/// An empty segment, as before a leading "/" or between two, is one that matches no name.
Cut cut(const char* path) noexcept
{
    const char* slash = kz_strchr(path, '/');
    if (slash == nullptr) {
        return {text_of(path), nullptr};
    }
    return {{path, static_cast<uint32_t>(slash - path)}, slash + 1};
}

bool has_more(const char* path) noexcept { return path != nullptr && path[0] != '\0'; }

/// The first sub-tag of this name; null when there is none or the tag is null.
XMLTag* sub_tag(const XMLTag* tag, Text name) noexcept
{
    return GetXMLSubTagFromBuf(tag, name.bytes, name.count);
}

/// Appends an empty sub-tag. Null when memory is short.
XMLTag* add_new_sub_tag(XMLTag& tag, Text name) noexcept
{
    XMLTag* child = CreateXMLTagFromBuf(name.bytes, name.count, nullptr, 0);
    static_cast<void>(AddXMLSubTag(&tag, child));
    return child;
}

/// What the last segment names: an attribute first, else a sub-tag.
const char* value_or_data(const XMLTag& tag, Text name) noexcept
{
    const char* value = GetXMLTagAttrFromBuf(&tag, name.bytes, name.count);
    return value != nullptr ? value : GetXMLTagData(sub_tag(&tag, name));
}

/// A segment of XMLSetValueAtPath():
///
///     segment = ["/"] name ["+"] ["/"]        name = one or more letters, digits or "_"
///
/// So two "/" in a row are accepted, one from each segment, and three are not.
struct Segment {
    Text name{}; ///< missing where the path ends behind the leading "/"
    bool adds = false;
    const char* rest = nullptr; ///< null: the path is malformed
};

/// Letters, digits and "_"; no byte beyond ASCII is one.
bool is_name_byte(char byte) noexcept
{
    return byte == '_' || kz_isalnum(static_cast<uint8_t>(byte)) != 0;
}

/// Parses the first segment of a path that is not empty. "/" alone is well-formed and has no name.
Segment parse_segment(const char* path) noexcept
{
    if (path[0] == '/') {
        ++path;
    }
    if (path[0] == '\0') {
        return {.rest = path};
    }
    Segment segment{.name = {path, 0}};
    while (is_name_byte(*path)) {
        ++segment.name.count;
        ++path;
    }
    if (segment.name.count == 0) {
        return {};
    }
    if (path[0] == '+') { // only one: a second is neither a "/" nor the end
        segment.adds = true;
        ++path;
    }
    if (path[0] == '/') {
        ++path;
    } else if (path[0] != '\0') {
        return {};
    }
    segment.rest = path;
    return segment;
}

/// What the caller's resolver has made of a segment.
struct Resolved {
    const char* name = nullptr;
    uint32_t kind = 1;
};

/// The sub-tag that an element segment stands for: one that is there unless the segment adds, else
/// a new one. Null when memory is short or the name empty.
XMLTag* element(XMLTag& tag, const char* name, bool adds) noexcept
{
    XMLTag* child = adds ? nullptr : GetXMLSubTagFromStr(&tag, name);
    return child != nullptr ? child : add_new_sub_tag(tag, text_of(name));
}

} // namespace

// ---- reading

// An empty path is the tag itself, so a "/" at the end changes nothing.
XMLTag* GetXMLSubTagFromPath(XMLTag* tag, const char* path) noexcept
{
    while (tag != nullptr && has_more(path)) {
        const auto [segment, rest] = cut(path);
        tag = sub_tag(tag, segment);
        path = rest;
    }
    return tag;
}

// As above; a tag that is found but has no data gives null as one that is missing does.
const char* GetXMLSubTagData(const XMLTag* tag, const char* path) noexcept
{
    while (tag != nullptr && has_more(path)) {
        const auto [segment, rest] = cut(path);
        tag = sub_tag(tag, segment);
        path = rest;
    }
    return GetXMLTagData(tag);
}

// ---- setting

// Tags made on the way stay when a later segment fails. A "/" at the end makes an empty last
// segment and is refused, after the tags before it were made.
kz_status SetXMLSubTagDataFromStr(XMLTag* tag, const char* path, const char* data,
                                  uint8_t create) noexcept
{
    if (tag == nullptr || path == nullptr) {
        return KZ_XML_ERROR_INVALID_ARGUMENT;
    }
    while (path != nullptr) {
        const auto [segment, rest] = cut(path);
        if (segment.is_empty()) {
            return KZ_XML_ERROR_INVALID_ARGUMENT;
        }
        XMLTag* child = sub_tag(tag, segment);
        if (child == nullptr && create == 0) {
            return KZ_XML_ERROR_NOT_FOUND;
        }
        if (child == nullptr) {
            child = add_new_sub_tag(*tag, segment);
        }
        if (child == nullptr) {
            return KZ_XML_ERROR_MEMORY;
        }
        tag = child;
        path = rest;
    }
    return SetXMLTagDataFromStr(tag, data);
}

kz_status SetXMLSubTagDataFromUInt(XMLTag* tag, const char* path, uint32_t value,
                                   uint8_t create) noexcept
{
    char number[16];
    static_cast<void>(kz_snprintf(number, sizeof number, "%u", value));
    return SetXMLSubTagDataFromStr(tag, path, number, create);
}

// The only one whose path begins with the name of the tag itself, after any number of "/".
const char* XMLGetDataAtPath(const XMLTag* tag, const char* path) noexcept
{
    if (tag == nullptr || path == nullptr) {
        return nullptr;
    }
    while (path[0] == '/') { // any number, where the other functions accept one at most
        ++path;
    }
    const auto [root, below] = cut(path);
    if (root.is_empty() || !kz::xml::matches(tag->name, root)) {
        return nullptr;
    }
    if (!has_more(below)) {
        return GetXMLTagData(tag);
    }
    // Names before the last are sub-tags. A "/" at the end leaves nothing behind it, so the name
    // before it is the last.
    Cut next = cut(below);
    while (tag != nullptr && has_more(next.rest)) {
        tag = sub_tag(tag, next.segment);
        next = cut(next.rest);
    }
    return tag != nullptr ? value_or_data(*tag, next.segment) : nullptr;
}

// The resolver turns each segment into the name and the kind of what it stands for. A segment with
// "+" always makes a new element. What was made before a failure stays.
int32_t XMLSetValueAtPath(XMLTag* tag, const char* path, const char* value, uintptr_t context,
                          XMLPathResolver resolver) noexcept
{
    if (tag == nullptr || !has_more(path) || context == 0 || resolver == nullptr) {
        return 0;
    }
    while (true) {
        const Segment segment = parse_segment(path);
        Resolved resolved;
        if (segment.rest == nullptr || resolver(tag, segment.name.bytes, segment.name.count,
                                                context, &resolved.name, &resolved.kind) == 0) {
            return 0;
        }
        const bool is_last = !has_more(segment.rest);
        if (resolved.kind == KZ_XML_KIND_ATTRIBUTE) { // nothing lies below an attribute
            return is_last && SetXMLTagAttrFromStr(tag, resolved.name, value) == KZ_OK ? 1 : 0;
        }
        if (resolved.kind != KZ_XML_KIND_ELEMENT) {
            return 0;
        }
        tag = element(*tag, resolved.name, segment.adds);
        if (tag == nullptr) {
            return 0;
        }
        if (is_last) {
            return SetXMLTagDataFromStr(tag, value) == KZ_OK ? 1 : 0;
        }
        path = segment.rest;
    }
}
