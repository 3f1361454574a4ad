// Trees without memory: to make, change, copy, compare and render them.

#include <memory>
#include <utility>

#include "library/xml/tree_model.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

using SharedTree = std::shared_ptr<XMLTag>;

SharedTree tree_of(XMLTag* tag) { return SharedTree(tag, DisposeXMLTag); }

/// A tag with all that a tag can have, and sub-tags.
SharedTree small_tree()
{
    XMLTag* const root = CreateXMLTagFromStr("A", "data");
    SetXMLTagAttrFromStr(root, "name", "value");
    SetXMLTagAttrFromStr(root, "other", "value");
    SetXMLTagAttrFromStr(add(root, "B", "more"), "name", "value");
    add(add(root, "C"), "D");
    return tree_of(root);
}

/// So deep that a walk needs memory for the way back up.
SharedTree deep_tree()
{
    XMLTag* const root = CreateXMLTagFromStr("A", nullptr);
    XMLTag* tag = root;
    for (int level = 0; level < 100; ++level) {
        tag = add(tag, "B");
    }
    return tree_of(root);
}

template <class Make>
Attempt copies(SharedTree tree, Make make)
{
    return [tree, make] {
        XMLTag* const copy = make(tree.get(), uint8_t{1});
        const bool is_whole = copy != nullptr && model_of(*copy) == model_of(*tree);
        DisposeXMLTag(copy);
        return is_whole;
    };
}

/// A call on a tag of its own. `keeps` says that a failure leaves the tag as it was.
template <class Call>
Attempt changes(bool keeps, Call call)
{
    return [keeps, call] {
        const auto tag = tree_of(CloneXMLTag(std::make_unique<XMLTag>().get(), 0));
        if (tag == nullptr || SetXMLTagNameFromStr(tag.get(), "A") != KZ_OK ||
            SetXMLTagDataFromStr(tag.get(), "old") != KZ_OK ||
            SetXMLTagAttrFromStr(tag.get(), "name", "old") != KZ_OK) {
            return false;
        }
        const ModelTag before = model_of(*tag);
        const kz_status status = call(tag.get());
        EXPECT_TRUE(status == KZ_OK || status == KZ_XML_ERROR_MEMORY);
        if (keeps && status != KZ_OK) {
            EXPECT_EQ(before, model_of(*tag));
        }
        return status == KZ_OK;
    };
}

int32_t resolve_to_element(XMLTag*, const char*, uint32_t, uintptr_t, const char** name,
                           uint32_t* kind)
{
    *name = "B";
    *kind = KZ_XML_KIND_ELEMENT;
    return 1;
}

kz_status set_resolved(XMLTag* tag)
{
    const int32_t set = XMLSetValueAtPath(tag, "x/y", "value", 1, resolve_to_element);
    return set == 1 ? KZ_OK : KZ_XML_ERROR_MEMORY;
}

template <class Render>
Attempt renders(SharedTree tree, const Render& render)
{
    return [tree, render] { return given_back(render(tree.get())); };
}

} // namespace

std::vector<Case> xml_cases()
{
    return {
        {"CreateEmptyXMLTag", Reports,
         [] { return [] { return disposed_of(CreateEmptyXMLTag()); }; }},
        {"CreateXMLTagFromStr", Reports,
         [] { return [] { return disposed_of(CreateXMLTagFromStr("A", "data")); }; }},
        {"CreateXMLTagFromBuf", Reports,
         [] { return [] { return disposed_of(CreateXMLTagFromBuf("A", 1, "d", 1)); }; }},
        {"CloneXMLTag", Reports, [] { return copies(small_tree(), CloneXMLTag); }},
        {"CloneAndMutateXMLTag", Reports, // an incomplete copy counts as a failure here
         [] { return copies(small_tree(), CloneAndMutateXMLTag); }},
        {"CopyXMLTag", Reports,
         [] {
             return changes(false, [source = small_tree()](XMLTag* tag) {
                 return CopyXMLTag(tag, source.get());
             });
         }},
        {"EqualXMLTags", Reports,
         [] {
             return
                 [a = deep_tree(), b = deep_tree()] { return EqualXMLTags(a.get(), b.get()) == 1; };
         }},
        {"SetXMLTagNameFromStr", Reports,
         [] { return changes(false, [](auto* t) { return SetXMLTagNameFromStr(t, "new"); }); }},
        {"SetXMLTagNameFromBuf", Reports,
         [] { return changes(false, [](auto* t) { return SetXMLTagNameFromBuf(t, "new", 3); }); }},
        {"SetXMLTagDataFromStr", Reports,
         [] { return changes(false, [](auto* t) { return SetXMLTagDataFromStr(t, "new"); }); }},
        {"SetXMLTagDataFromBuf", Reports,
         [] { return changes(false, [](auto* t) { return SetXMLTagDataFromBuf(t, "new", 3); }); }},
        {"SetXMLTagAttrFromStr", Reports,
         [] {
             return changes(true, [](auto* t) { return SetXMLTagAttrFromStr(t, "name", "new"); });
         }},
        {"SetXMLTagAttrFromBuf", Reports,
         [] {
             return changes(true,
                            [](auto* t) { return SetXMLTagAttrFromBuf(t, "name", 4, "new", 3); });
         }},
        {"SetXMLTagAttrFromInt", Reports,
         [] { return changes(true, [](auto* t) { return SetXMLTagAttrFromInt(t, "name", -1); }); }},
        {"SetXMLTagAttrFromUInt", Reports,
         [] { return changes(true, [](auto* t) { return SetXMLTagAttrFromUInt(t, "name", 1); }); }},
        {"SetXMLSubTagDataFromStr", Reports,
         [] {
             return changes(false,
                            [](auto* t) { return SetXMLSubTagDataFromStr(t, "B/C", "x", 1); });
         }},
        {"SetXMLSubTagDataFromUInt", Reports,
         [] {
             return changes(false,
                            [](auto* t) { return SetXMLSubTagDataFromUInt(t, "B/C", 1, 1); });
         }},
        {"XMLSetValueAtPath", Reports, [] { return changes(false, set_resolved); }},
        {"RenderXMLTagToStrEx", Reports,
         [] {
             return renders(small_tree(), [](auto* t) { return RenderXMLTagToStrEx(t, 1, 0, 0); });
         }},
        {"RenderXMLTagToStr", Conceals, // indentation forgets failures
         [] { return renders(deep_tree(), [](auto* t) { return RenderXMLTagToStr(t, 1); }); }},
    };
}

} // namespace kz::test::failures
