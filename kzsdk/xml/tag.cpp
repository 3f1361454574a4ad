/// @file
/// Tags and trees of them: making, copying, freeing, and what a tag holds apart from attributes.
///
///     tag --sub_tags--> tag --next_sibling--> tag --next_sibling--> null
///                        |                     |
///                     sub_tags              sub_tags
///
/// A tag does not store its parent. No function recurses, so a tree may be of any depth. Every
/// stored text is a copy of its own.
#include "kzsdk/xml/xml.h"

#include <cassert>
#include <utility>

#include "kzsdk/xml/attributes.hpp"
#include "kzsdk/xml/copy_tree.hpp"
#include "kzsdk/xml/text.hpp"

namespace {

using kz::owned;
using kz::xml::copy_of;
using kz::xml::owned_tree;
using kz::xml::Text;
using kz::xml::text_of;

/// Frees the trees of a list of siblings.
void dispose_list(XMLTag* first) noexcept
{
    while (first != nullptr) {
        owned_tree tag(first);
        first = std::exchange(first->next_sibling, nullptr);
    }
}

/// The null link at the end of a list.
XMLTag** end_of(XMLTag** link) noexcept
{
    while (*link != nullptr) {
        link = &(*link)->next_sibling;
    }
    return link;
}

/// Copies a text that may be missing: then there is nothing to do, and that succeeds.
bool copy_text(char*& copy, const char* text) noexcept
{
    copy = text != nullptr ? copy_of(text_of(text)).release() : nullptr;
    return copy != nullptr || text == nullptr;
}

/// Gives an empty tag the source's name and data: both, or on failure neither.
kz_status copy_texts(XMLTag& copy, const XMLTag& source) noexcept
{
    const bool has_data = !text_of(source.data).is_empty();
    if (copy_text(copy.name, source.name) &&
        copy_text(copy.data, has_data ? source.data : nullptr)) {
        return KZ_OK;
    }
    kz::xml::replace(copy.name, nullptr);
    return KZ_XML_ERROR_MEMORY;
}

/// Null when memory is short.
owned_tree clone_without_sub_tags(const XMLTag& source) noexcept
{
    owned_tree clone(CreateEmptyXMLTag());
    if (!clone || copy_texts(*clone, source) != KZ_OK ||
        kz::xml::copy_attributes(*clone, source) != KZ_OK) {
        return nullptr;
    }
    return clone;
}

/// A deep copy, or null: nothing of it is left when a part fails.
owned_tree clone_tree(const XMLTag& source) noexcept
{
    return kz::xml::copy_tree(source, kz::xml::IfRefused::fails_as_a_whole, clone_without_sub_tags);
}

/// Gives a tag without sub-tags copies of the source's, in order, up to the first that fails.
kz_status copy_sub_tags(XMLTag& copy, const XMLTag& source) noexcept
{
    XMLTag** end = &copy.sub_tags;
    for (const XMLTag* tag = source.sub_tags; tag != nullptr; tag = tag->next_sibling) {
        *end = clone_tree(*tag).release();
        if (*end == nullptr) {
            return KZ_XML_ERROR_MEMORY;
        }
        end = &(*end)->next_sibling;
    }
    return KZ_OK;
}

/// Frees everything that a tag holds, sub-tags apart, and the tag.
void dispose_one(XMLTag* tag) noexcept
{
    static_cast<void>(_kzmem_free(tag->name));
    static_cast<void>(_kzmem_free(tag->data));
    kz::xml::dispose_attributes(tag->attributes);
    static_cast<void>(_kzmem_free(tag));
}

/// The first of a tag and its later siblings with this name.
XMLTag* first_of(XMLTag* tag, Text name) noexcept
{
    while (tag != nullptr && !kz::xml::matches(tag->name, name)) {
        tag = tag->next_sibling;
    }
    return tag;
}

/// Where a search by cursor begins. A cursor of 0 is the end.
XMLTag* at_cursor(const XMLTag& parent, uintptr_t cursor) noexcept
{
    // A tag never lies at an odd address, so the 32-bit start value can be told from one.
    const bool is_start = cursor == KZ_XML_CURSOR_START || cursor == UINT32_MAX;
    return is_start ? parent.sub_tags : reinterpret_cast<XMLTag*>(cursor);
}

} // namespace

// ---- making, copying and disposing

XMLTag* CreateEmptyXMLTag() noexcept { return kz::make_record<XMLTag>().release(); }

// The record is made only for a name that is not empty; the setters then copy both texts.
XMLTag* CreateXMLTagFromBuf(const char* name, uint32_t name_count, const char* data,
                            uint32_t data_count) noexcept
{
    owned_tree tag;
    if (!Text{name, name_count}.is_empty()) {
        tag.reset(CreateEmptyXMLTag());
    }
    if (!tag || SetXMLTagNameFromBuf(tag.get(), name, name_count) != KZ_OK ||
        SetXMLTagDataFromBuf(tag.get(), data, data_count) != KZ_OK) {
        return nullptr;
    }
    return tag.release();
}

XMLTag* CreateXMLTagFromStr(const char* name, const char* data) noexcept
{
    return CreateXMLTagFromBuf(name, text_of(name).count, data, text_of(data).count);
}

// Deep is 1 and nothing else, unlike the flags of other calls.
XMLTag* CloneXMLTag(const XMLTag* tag, uint8_t deep) noexcept
{
    if (tag == nullptr) {
        return nullptr;
    }
    return (deep == 1 ? clone_tree(*tag) : clone_without_sub_tags(*tag)).release();
}

// The destination keeps its place among its siblings. Copying a tag onto itself does nothing.
kz_status CopyXMLTag(XMLTag* destination, const XMLTag* source) noexcept
{
    if (destination == nullptr || source == nullptr) {
        return KZ_XML_ERROR_INVALID_ARGUMENT;
    }
    if (destination == source) {
        return KZ_OK;
    }
    // All is copied before anything of the destination is freed: the source may lie below it, or
    // above. How far a failed copy came decides which of the old parts are replaced.
    XMLTag copy{};
    const kz_status texts = copy_texts(copy, *source);
    const kz_status attributes = texts == KZ_OK ? kz::xml::copy_attributes(copy, *source) : texts;
    const kz_status sub_tags = attributes == KZ_OK ? copy_sub_tags(copy, *source) : attributes;

    kz::xml::replace(destination->name, owned<char>(copy.name));
    kz::xml::replace(destination->data, owned<char>(copy.data));
    if (texts == KZ_OK) {
        kz::xml::dispose_attributes(std::exchange(destination->attributes, copy.attributes));
    }
    if (attributes == KZ_OK) {
        dispose_list(std::exchange(destination->sub_tags, copy.sub_tags));
    }
    return sub_tags;
}

// Frees a tag and all below it; its own siblings are left alone.
kz_status DisposeXMLTag(XMLTag* tag) noexcept
{
    if (tag == nullptr || kzmem_query_availability() != KZ_MEM_ALREADY_ON) {
        return KZ_OK; // nothing could be freed, so the tree is left whole
    }
    // The tags still to be freed form one list. The sub-tags of the one that is freed next are put
    // in front of the others, so nothing has to be remembered.
    tag->next_sibling = nullptr;
    while (tag != nullptr) {
        *end_of(&tag->sub_tags) = tag->next_sibling;
        dispose_one(std::exchange(tag, tag->sub_tags));
    }
    return KZ_OK;
}

// The caller's pointer becomes null even when memory is off and nothing is freed.
kz_status SmartDisposeXMLTag(XMLTag** tag) noexcept
{
    return tag != nullptr ? DisposeXMLTag(std::exchange(*tag, nullptr)) : KZ_OK;
}

// ---- sub-tags

uint32_t GetXMLSubTagCount(const XMLTag* tag) noexcept
{
    uint32_t count = 0;
    for (const XMLTag* child = GetXMLSubTag(tag, 0); child != nullptr;
         child = child->next_sibling) {
        ++count;
    }
    return count;
}

// A null name matches nothing; nameless sub-tags are passed over.
uint32_t GetXMLNamedSubTagCount(const XMLTag* tag, const char* name) noexcept
{
    if (name == nullptr) {
        return 0;
    }
    uint32_t count = 0;
    for (const XMLTag* child = GetXMLSubTag(tag, 0); child != nullptr;
         child = child->next_sibling) {
        count += child->name != nullptr && kz_strcmp(child->name, name) == 0;
    }
    return count;
}

// The list is walked from its start each time; GetXMLSiblingTag() takes one step.
XMLTag* GetXMLSubTag(const XMLTag* tag, uint32_t index) noexcept
{
    XMLTag* child = tag != nullptr ? tag->sub_tags : nullptr;
    while (child != nullptr && index != 0) {
        child = child->next_sibling;
        --index;
    }
    return child;
}

XMLTag* GetXMLSiblingTag(const XMLTag* tag) noexcept
{
    return tag != nullptr ? tag->next_sibling : nullptr;
}

// A match is exact: the same bytes, and no more of them.
XMLTag* GetXMLSubTagFromBuf(const XMLTag* tag, const char* name, uint32_t count) noexcept
{
    const Text wanted{name, count};
    return wanted.is_empty() ? nullptr : first_of(GetXMLSubTag(tag, 0), wanted);
}

XMLTag* GetXMLSubTagFromStr(const XMLTag* tag, const char* name) noexcept
{
    return GetXMLSubTagFromBuf(tag, name, text_of(name).count);
}

// The cursor holds the address of the tag behind the match, so no tag may go while it is in use.
XMLTag* GetXMLSubTagFromStrEx(const XMLTag* tag, const char* name, uintptr_t* cursor) noexcept
{
    const Text wanted = text_of(name);
    if (tag == nullptr || cursor == nullptr || wanted.is_empty()) {
        return nullptr;
    }
    XMLTag* found = first_of(at_cursor(*tag, *cursor), wanted);
    *cursor = reinterpret_cast<uintptr_t>(GetXMLSiblingTag(found));
    return found;
}

// The child's own siblings come along. Debug builds stop at the two misplacements that can be seen
// from here; both would make the list endless.
kz_status AddXMLSubTag(XMLTag* parent, XMLTag* child) noexcept
{
    if (parent == nullptr || child == nullptr) {
        return KZ_OK;
    }
    assert(parent != child && "a tag cannot be its own sub-tag");
    XMLTag** link = &parent->sub_tags;
    while (*link != nullptr) {
        assert(*link != child && "the tag is in the list already");
        link = &(*link)->next_sibling;
    }
    *link = child;
    return KZ_OK;
}

// Looks for the record itself, not for its name.
kz_status RemoveXMLSubTag(XMLTag* parent, XMLTag* child, uint8_t dispose) noexcept
{
    if (parent == nullptr || child == nullptr) {
        return KZ_OK;
    }
    XMLTag** link = &parent->sub_tags;
    while (*link != nullptr && *link != child) {
        link = &(*link)->next_sibling;
    }
    if (*link == nullptr) {
        return KZ_OK;
    }
    *link = std::exchange(child->next_sibling, nullptr);
    return dispose != 0 ? DisposeXMLTag(child) : KZ_OK;
}

// ---- name and data

const char* GetXMLTagData(const XMLTag* tag) noexcept
{
    return tag != nullptr ? tag->data : nullptr;
}

const char* GetXMLTagName(const XMLTag* tag) noexcept
{
    return tag != nullptr ? tag->name : nullptr;
}

// When memory is short the old data is gone too: the tag is left without.
kz_status SetXMLTagDataFromBuf(XMLTag* tag, const char* data, uint32_t count) noexcept
{
    if (tag == nullptr) {
        return KZ_XML_ERROR_INVALID_ARGUMENT;
    }
    const bool has_data = !Text{data, count}.is_empty();
    kz::xml::replace(tag->data, has_data ? copy_of({data, count}) : nullptr);
    return !has_data || tag->data != nullptr ? KZ_OK : KZ_XML_ERROR_MEMORY;
}

kz_status SetXMLTagDataFromStr(XMLTag* tag, const char* data) noexcept
{
    return SetXMLTagDataFromBuf(tag, data, text_of(data).count);
}

// An empty name keeps the old one; short memory loses it.
kz_status SetXMLTagNameFromBuf(XMLTag* tag, const char* name, uint32_t count) noexcept
{
    if (tag == nullptr || Text{name, count}.is_empty()) {
        return KZ_XML_ERROR_INVALID_ARGUMENT;
    }
    kz::xml::replace(tag->name, copy_of({name, count}));
    return tag->name != nullptr ? KZ_OK : KZ_XML_ERROR_MEMORY;
}

kz_status SetXMLTagNameFromStr(XMLTag* tag, const char* name) noexcept
{
    return SetXMLTagNameFromBuf(tag, name, text_of(name).count);
}
