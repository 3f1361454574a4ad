/// @file
/// The attributes of a tag: a singly linked list in the order in which they were set.
///
/// Setting an attribute removes every one of its name and appends a new record, so the order of a
/// rendered tag follows the calls. Stored texts end at their first NUL when they are read, whatever
/// was stored behind it.
#include "kzsdk/xml/attributes.hpp"

#include <utility>

#include "kzsdk/xml/text.hpp"

namespace {

using kz::owned;
using kz::xml::Text;
using kz::xml::text_of;

constexpr uint32_t kNumberSize = 64;

/// Null for a null tag and for an index behind the end.
const XMLAttr* attribute_at(const XMLTag* tag, uint32_t index) noexcept
{
    const XMLAttr* attribute = tag != nullptr ? tag->attributes : nullptr;
    while (attribute != nullptr && index != 0) {
        attribute = attribute->next;
        --index;
    }
    return attribute;
}

/// Frees one record, which no list holds any more.
void dispose_attribute(XMLAttr* attribute) noexcept
{
    static_cast<void>(_kzmem_free(attribute->name));
    static_cast<void>(_kzmem_free(attribute->value));
    static_cast<void>(_kzmem_free(attribute));
}

/// A record of its own with copies of both texts. Null when memory is short.
XMLAttr* make_attribute(Text name, Text value) noexcept
{
    auto attribute = kz::make_record<XMLAttr>();
    auto name_copy = kz::xml::copy_of(name);
    auto value_copy = kz::xml::copy_of(value);
    if (!attribute || !name_copy || !value_copy) {
        return nullptr;
    }
    attribute->name = name_copy.release();
    attribute->value = value_copy.release();
    return attribute.release();
}

/// Removes every attribute of a name. There can be several: names that were set with a NUL inside
/// match up to that NUL, but are no match for one another when they are set.
///
/// @return The link at the end of the list.
XMLAttr** remove_attributes(XMLTag& tag, Text name) noexcept
{
    XMLAttr* removed = nullptr; // freed last: the name may be the text of one of them
    XMLAttr** link = &tag.attributes;
    while (XMLAttr* attribute = *link) {
        if (kz::xml::matches(attribute->name, name)) {
            *link = attribute->next;
            attribute->next = std::exchange(removed, attribute);
        } else {
            link = &attribute->next;
        }
    }
    kz::xml::dispose_attributes(removed);
    return link;
}

/// The new record is made first: a failure changes nothing.
kz_status set_attribute(XMLTag& tag, Text name, Text value) noexcept
{
    XMLAttr* attribute = make_attribute(name, value);
    if (attribute == nullptr) {
        return KZ_XML_ERROR_MEMORY;
    }
    *remove_attributes(tag, name) = attribute;
    return KZ_OK;
}

} // namespace

void kz::xml::dispose_attributes(XMLAttr* first) noexcept
{
    while (first != nullptr) {
        XMLAttr* next = first->next;
        dispose_attribute(first);
        first = next;
    }
}

kz_status kz::xml::copy_attributes(XMLTag& destination, const XMLTag& source) noexcept
{
    kz_status status = KZ_OK;
    for (const XMLAttr* attribute = source.attributes; attribute != nullptr && status == KZ_OK;
         attribute = attribute->next) {
        status = SetXMLTagAttrFromStr(&destination, attribute->name, attribute->value);
    }
    return status;
}

// ---- reading

uint32_t GetXMLTagAttrCount(const XMLTag* tag) noexcept
{
    uint32_t count = 0;
    for (const XMLAttr* attribute = attribute_at(tag, 0); attribute != nullptr;
         attribute = attribute->next) {
        ++count;
    }
    return count;
}

const char* GetXMLTagAttrName(const XMLTag* tag, uint32_t index) noexcept
{
    const XMLAttr* attribute = attribute_at(tag, index);
    return attribute != nullptr ? attribute->name : nullptr;
}

const char* GetXMLTagAttrValue(const XMLTag* tag, uint32_t index) noexcept
{
    const XMLAttr* attribute = attribute_at(tag, index);
    return attribute != nullptr ? attribute->value : nullptr;
}

// The first of the name, should there be several.
const char* GetXMLTagAttrFromBuf(const XMLTag* tag, const char* name, uint32_t count) noexcept
{
    const Text wanted{name, count};
    if (wanted.is_empty()) {
        return nullptr;
    }
    const XMLAttr* attribute = attribute_at(tag, 0);
    while (attribute != nullptr && !kz::xml::matches(attribute->name, wanted)) {
        attribute = attribute->next;
    }
    return attribute != nullptr ? attribute->value : nullptr;
}

const char* GetXMLTagAttrFromStr(const XMLTag* tag, const char* name) noexcept
{
    return GetXMLTagAttrFromBuf(tag, name, text_of(name).count);
}

// ---- setting and removing

// No value, that is null or a count of 0, removes.
kz_status SetXMLTagAttrFromBuf(XMLTag* tag, const char* name, uint32_t name_count,
                               const char* value, uint32_t value_count) noexcept
{
    const Text wanted{name, name_count};
    if (tag == nullptr || wanted.is_empty()) {
        return KZ_XML_ERROR_INVALID_ARGUMENT;
    }
    if (value != nullptr && value_count != 0) { // a first byte of NUL is a value here
        return set_attribute(*tag, wanted, {value, value_count});
    }
    remove_attributes(*tag, wanted);
    return KZ_OK;
}

// The Str form cannot pass a value that begins with NUL: its count is 0, which removes.
kz_status SetXMLTagAttrFromStr(XMLTag* tag, const char* name, const char* value) noexcept
{
    return SetXMLTagAttrFromBuf(tag, name, text_of(name).count, value, text_of(value).count);
}

// The formats are those of C's long, so the 32-bit values are widened to it.
kz_status SetXMLTagAttrFromInt(XMLTag* tag, const char* name, int32_t value) noexcept
{
    char number[kNumberSize] = {};
    static_cast<void>(kz_snprintf(number, kNumberSize, "%ld", static_cast<long>(value)));
    return SetXMLTagAttrFromStr(tag, name, number);
}

kz_status SetXMLTagAttrFromUInt(XMLTag* tag, const char* name, uint32_t value) noexcept
{
    char number[kNumberSize] = {};
    static_cast<void>(kz_snprintf(number, kNumberSize, "%lu", static_cast<unsigned long>(value)));
    return SetXMLTagAttrFromStr(tag, name, number);
}
