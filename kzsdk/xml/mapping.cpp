/// @file
/// Clones with mapped names and values, and the three maps of the process.
///
/// Each map starts as one that returns its argument, and is read anew for every tag or attribute.
/// The texts that a map returns stay its own; they are copied at once.
#include <atomic>

#include "kzsdk/xml/copy_tree.hpp"
#include "kzsdk/xml/xml.h"

namespace {

using kz::xml::owned_tree;

const char* same_tag_name(const char* tag_name) noexcept { return tag_name; }

const char* same_attribute_name(const char* /*tag_name*/, const char* attribute_name) noexcept
{
    return attribute_name;
}

const char* same_attribute_value(const char* /*tag_name*/, const char* /*attribute_name*/,
                                 const char* value) noexcept
{
    return value;
}

// Relaxed: a reader sees the old map or the new one. Data that a map itself reads must be published
// by its owner before the map is installed.
constinit std::atomic<XMLMapTagName> map_tag_name{same_tag_name};
constinit std::atomic<XMLMapAttrName> map_attribute_name{same_attribute_name};
constinit std::atomic<XMLMapAttrValue> map_attribute_value{same_attribute_value};

template <class Map>
Map installed(const std::atomic<Map>& map) noexcept
{
    return map.load(std::memory_order_relaxed);
}

/// Null is ignored, so the library's own map cannot be restored once it was replaced.
template <class Map>
kz_status install(std::atomic<Map>& map, Map function) noexcept
{
    if (function != nullptr) {
        map.store(function, std::memory_order_relaxed);
    }
    return KZ_OK;
}

/// Sets one attribute on the copy; the maps receive the copy's name, not the source's. A refused
/// attribute is no failure.
kz_status set_mapped_attribute(XMLTag& copy, const XMLAttr& attribute) noexcept
{
    const char* name = installed(map_attribute_name)(copy.name, attribute.name);
    if (name == nullptr) {
        return KZ_OK;
    }
    const char* value = installed(map_attribute_value)(copy.name, name, attribute.value);
    return SetXMLTagAttrFromStr(&copy, name, value);
}

/// One tag of the copy. Null when its name is refused or memory is short.
owned_tree mutated_without_sub_tags(const XMLTag& tag) noexcept
{
    const char* name = installed(map_tag_name)(tag.name);
    owned_tree copy(name != nullptr ? CreateXMLTagFromStr(name, tag.data) : nullptr);
    if (!copy) {
        return nullptr;
    }
    for (const XMLAttr* attribute = tag.attributes; attribute != nullptr;
         attribute = attribute->next) {
        if (set_mapped_attribute(*copy, *attribute) != KZ_OK) {
            return nullptr;
        }
    }
    return copy;
}

} // namespace

// Sub-tags that are refused, or that memory is too short for, are left out with all below them.
XMLTag* CloneAndMutateXMLTag(const XMLTag* tag, uint8_t deep) noexcept
{
    if (tag == nullptr) {
        return nullptr;
    }
    if (deep != 1) {
        return mutated_without_sub_tags(*tag).release();
    }
    return kz::xml::copy_tree(*tag, kz::xml::IfRefused::leaves_it_out, mutated_without_sub_tags)
        .release();
}

// All three may be called while another thread clones: each map is replaced in one step.
kz_status SetMapXMLTagName(XMLMapTagName function) noexcept
{
    return install(map_tag_name, function);
}

kz_status SetMapXMLAttrName(XMLMapAttrName function) noexcept
{
    return install(map_attribute_name, function);
}

kz_status SetMapXMLAttrValue(XMLMapAttrValue function) noexcept
{
    return install(map_attribute_value, function);
}
