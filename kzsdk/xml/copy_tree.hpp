/// @file
/// The walk of every deep copy. The caller decides what one tag becomes: its clone, a renamed copy,
/// or nothing.
#pragma once

#include <memory>
#include <utility>

#include "kzsdk/xml/open_tags.hpp"
#include "kzsdk/xml/xml.h"

namespace kz::xml {

/// Frees a tag with all below it.
struct DisposeTree {
    void operator()(XMLTag* tag) const noexcept { static_cast<void>(DisposeXMLTag(tag)); }
};
using owned_tree = std::unique_ptr<XMLTag, DisposeTree>;

/// What becomes of a copy when one of the sub-tags cannot be copied.
enum class IfRefused { fails_as_a_whole, leaves_it_out };

/// A copy whose sub-tags are being made: where the next goes, and what it will be a copy of. `end`
/// is the last link of the copies made so far, so none of them is walked again.
struct OpenCopy {
    XMLTag** end;
    const XMLTag* next;
};

/// Makes the next copy under the innermost open tag. False, with nothing added, when there is none
/// or no memory for the way back from below it.
template <class CopyOne>
bool add_next_copy(OpenTags<OpenCopy>& open, CopyOne& copy_one) noexcept
{
    OpenCopy& parent = open.top();
    const XMLTag* tag = std::exchange(parent.next, parent.next->next_sibling);
    owned_tree copy = copy_one(*tag);
    if (!copy) {
        return false;
    }
    XMLTag** const place = std::exchange(parent.end, &copy->next_sibling);
    if (tag->sub_tags != nullptr && !open.push({&copy->sub_tags, tag->sub_tags})) {
        parent.end = place;
        return false;
    }
    *place = copy.release();
    return true;
}

/// Copies a tag and all below it, parents before their sub-tags and those in their order.
/// `copy_one(tag)` makes the copy of one tag without sub-tags, or null.
template <class CopyOne>
owned_tree copy_tree(const XMLTag& source, IfRefused if_refused, CopyOne copy_one) noexcept
{
    owned_tree root = copy_one(source);
    OpenTags<OpenCopy> open;
    if (!root || !open.push({&root->sub_tags, source.sub_tags})) {
        return nullptr;
    }
    while (!open.is_empty()) {
        if (open.top().next == nullptr) {
            open.pop();
        } else if (!add_next_copy(open, copy_one) && if_refused == IfRefused::fails_as_a_whole) {
            return nullptr;
        }
    }
    return root;
}

} // namespace kz::xml
