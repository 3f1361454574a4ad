/// @file
/// Equality of two tag trees: names, data, attributes in their order, and sub-tags in theirs.
///
/// Both trees are walked in step and without recursion. The roots' own siblings do not count.
#include <utility>

#include "kzsdk/abs/text.h"
#include "kzsdk/xml/open_tags.hpp"
#include "kzsdk/xml/xml.h"

namespace {

/// Two texts that may be missing: a missing one equals only a missing one.
bool same_text(const char* a, const char* b) noexcept
{
    return a == nullptr || b == nullptr ? a == b : kz_strcmp(a, b) == 0;
}

/// Two lists of attributes: the same names and values at the same places.
bool same_attributes(const XMLAttr* a, const XMLAttr* b) noexcept
{
    while (a != nullptr && b != nullptr && same_text(a->name, b->name) &&
           same_text(a->value, b->value)) {
        a = a->next;
        b = b->next;
    }
    return a == nullptr && b == nullptr;
}

/// Everything that two tags hold themselves.
bool same_without_sub_tags(const XMLTag& a, const XMLTag& b) noexcept
{
    return same_text(a.name, b.name) && same_text(a.data, b.data) &&
           same_attributes(a.attributes, b.attributes);
}

/// Tags in the same place of two lists of sub-tags; null behind the end of a list.
struct Pair {
    const XMLTag* a;
    const XMLTag* b;
};

/// Each open pair is the next one of a level; it moves on before its sub-tags are entered. False
/// too when memory for the way back up is short: what was not seen is not called equal.
bool same_trees(const XMLTag& a, const XMLTag& b) noexcept
{
    kz::xml::OpenTags<Pair> next;
    if (!same_without_sub_tags(a, b) || !next.push({a.sub_tags, b.sub_tags})) {
        return false;
    }
    while (!next.is_empty()) {
        Pair& top = next.top();
        if (top.a == nullptr || top.b == nullptr) {
            if (top.a != top.b) {
                return false;
            }
            next.pop();
            continue;
        }
        const Pair tags = std::exchange(top, {top.a->next_sibling, top.b->next_sibling});
        if (!same_without_sub_tags(*tags.a, *tags.b) ||
            !next.push({tags.a->sub_tags, tags.b->sub_tags})) {
            return false;
        }
    }
    return true;
}

} // namespace

// Two null tags are equal; a null tag and any other are not.
uint32_t EqualXMLTags(const XMLTag* a, const XMLTag* b) noexcept
{
    if (a == nullptr || b == nullptr) {
        return a == b ? 1 : 0;
    }
    return same_trees(*a, *b) ? 1 : 0;
}
