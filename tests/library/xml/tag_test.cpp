#include "kzsdk/xml/xml.h"

#include <cstddef>
#include <cstring>
#include <iterator>
#include <limits>

#include "kzsdk/abs/memory.h"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

static_assert(offsetof(XMLTag, name) == 0);
static_assert(offsetof(XMLTag, data) == sizeof(void*));
static_assert(offsetof(XMLTag, attributes) == 2 * sizeof(void*));
static_assert(offsetof(XMLTag, sub_tags) == 3 * sizeof(void*));
static_assert(offsetof(XMLTag, next_sibling) == 4 * sizeof(void*));
static_assert(sizeof(XMLTag) == 5 * sizeof(void*));
static_assert(offsetof(XMLAttr, name) == 0);
static_assert(offsetof(XMLAttr, value) == sizeof(void*));
static_assert(offsetof(XMLAttr, next) == 2 * sizeof(void*));
static_assert(sizeof(XMLAttr) == 3 * sizeof(void*));

class TagTree : public MemoryOn {};

/// R with data, two attributes and A, B (with a sub-tag C), A below it.
Tree example()
{
    Tree root = make_tag("R", "data");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(root.get(), "x", "1"));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(root.get(), "y", "2"));
    add(root, "A", "first");
    XMLTag* b = add(root, "B");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(b, "z", "3"));
    add(b, "C", "deep");
    add(root, "A", "second");
    return root;
}

// ---- Making

TEST_F(TagTree, AnEmptyTagHasNothing)
{
    const Tree tag(CreateEmptyXMLTag());
    ASSERT_TRUE(tag);
    EXPECT_EQ(nullptr, tag->name);
    EXPECT_EQ(nullptr, tag->data);
    EXPECT_EQ(nullptr, tag->attributes);
    EXPECT_EQ(nullptr, tag->sub_tags);
    EXPECT_EQ(nullptr, tag->next_sibling);
}

TEST_F(TagTree, ATagNeedsAName)
{
    EXPECT_EQ(nullptr, CreateXMLTagFromStr("", "data"));
    EXPECT_EQ(nullptr, CreateXMLTagFromStr(nullptr, "data"));
    EXPECT_EQ(nullptr, CreateXMLTagFromBuf("A", 0, "data", 4));
    EXPECT_EQ(nullptr, CreateXMLTagFromBuf("\0A", 2, "data", 4));
    EXPECT_EQ(nullptr, CreateXMLTagFromBuf(nullptr, 2, "data", 4));
}

TEST_F(TagTree, EmptyDataIsNoData)
{
    for (const Tree& tag :
         {make_tag("A", ""), make_tag("A", nullptr), Tree(CreateXMLTagFromBuf("A", 1, "x", 0)),
          Tree(CreateXMLTagFromBuf("A", 1, "\0x", 2)),
          Tree(CreateXMLTagFromBuf("A", 1, nullptr, 2))}) {
        ASSERT_TRUE(tag);
        EXPECT_STREQ("A", GetXMLTagName(tag.get()));
        EXPECT_EQ(nullptr, GetXMLTagData(tag.get()));
    }
}

TEST_F(TagTree, CountedTextsAreTakenByTheirCount)
{
    const Tree tag(CreateXMLTagFromBuf("NAME and more", 4, "data\0more", 9));
    ASSERT_TRUE(tag);
    EXPECT_STREQ("NAME", GetXMLTagName(tag.get()));
    EXPECT_EQ(0, std::memcmp("data\0more", GetXMLTagData(tag.get()), 10)) << "all bytes, and a NUL";
}

TEST_F(TagTree, TextsAreCopied)
{
    char name[] = "name";
    char data[] = "data";
    const Tree tag = make_tag(name, data);
    name[0] = data[0] = 'X';
    EXPECT_STREQ("name", GetXMLTagName(tag.get()));
    EXPECT_STREQ("data", GetXMLTagData(tag.get()));
}

TEST_F(TagTree, MakingATagReportsShortMemory)
{
    for_every_failed_allocation([](auto fired) {
        const Tree tag = make_tag("A", "data");
        EXPECT_EQ(fired(), tag == nullptr);
    });
    for_every_failed_allocation([](auto fired) {
        const Tree tag(CreateEmptyXMLTag());
        EXPECT_EQ(fired(), tag == nullptr);
    });
}

// ---- Name and data

TEST_F(TagTree, NameAndDataCanBeReplaced)
{
    const Tree tag = make_tag("A", "1");
    EXPECT_EQ(KZ_OK, SetXMLTagNameFromStr(tag.get(), "B"));
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag.get(), "2"));
    EXPECT_STREQ("B", GetXMLTagName(tag.get()));
    EXPECT_STREQ("2", GetXMLTagData(tag.get()));
    EXPECT_EQ(KZ_OK, SetXMLTagNameFromBuf(tag.get(), "CDE", 2));
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromBuf(tag.get(), "345", 2));
    EXPECT_STREQ("CD", GetXMLTagName(tag.get()));
    EXPECT_STREQ("34", GetXMLTagData(tag.get()));
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag.get(), ""));
    EXPECT_EQ(nullptr, GetXMLTagData(tag.get()));
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag.get(), "3"));
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag.get(), nullptr));
    EXPECT_EQ(nullptr, GetXMLTagData(tag.get()));
}

TEST_F(TagTree, AnEmptyNameIsRefusedAndTheOldOneStays)
{
    const Tree tag = make_tag("A");
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagNameFromStr(tag.get(), ""));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagNameFromStr(tag.get(), nullptr));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagNameFromBuf(tag.get(), "B", 0));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagNameFromBuf(tag.get(), "\0B", 2));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagNameFromStr(nullptr, "B"));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, SetXMLTagDataFromStr(nullptr, "B"));
    EXPECT_STREQ("A", GetXMLTagName(tag.get()));
    EXPECT_EQ(nullptr, GetXMLTagName(nullptr));
    EXPECT_EQ(nullptr, GetXMLTagData(nullptr));
}

TEST_F(TagTree, ATagCanBeGivenItsOwnTexts)
{
    const Tree tag = make_tag("NAME", "data");
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag.get(), GetXMLTagData(tag.get())));
    EXPECT_STREQ("data", GetXMLTagData(tag.get()));
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag.get(), GetXMLTagData(tag.get()) + 2));
    EXPECT_STREQ("ta", GetXMLTagData(tag.get()));
    EXPECT_EQ(KZ_OK, SetXMLTagNameFromStr(tag.get(), GetXMLTagName(tag.get()) + 1));
    EXPECT_STREQ("AME", GetXMLTagName(tag.get()));
}

TEST_F(TagTree, AFailedSetLeavesNoOldDataAndNoOldName)
{
    for_every_failed_allocation([](auto fired) {
        const Tree tag = make_tag("A", "1");
        if (!tag) {
            return;
        }
        const kz_status data = SetXMLTagDataFromStr(tag.get(), "2");
        EXPECT_EQ(optional_text(data == KZ_OK ? "2" : nullptr),
                  optional_text(GetXMLTagData(tag.get())));
        const kz_status name = SetXMLTagNameFromStr(tag.get(), "B");
        EXPECT_EQ(optional_text(name == KZ_OK ? "B" : nullptr),
                  optional_text(GetXMLTagName(tag.get())));
        EXPECT_EQ(fired(), data == KZ_XML_ERROR_MEMORY || name == KZ_XML_ERROR_MEMORY);
    });
}

// ---- Sub-tags

TEST_F(TagTree, SubTagsStayInTheOrderOfAdding)
{
    const Tree root = make_tag("R");
    XMLTag* a = add(root, "A");
    XMLTag* b = add(root, "B");
    XMLTag* second_a = add(root, "A");
    EXPECT_EQ(3u, GetXMLSubTagCount(root.get()));
    EXPECT_EQ(a, GetXMLSubTag(root.get(), 0));
    EXPECT_EQ(b, GetXMLSubTag(root.get(), 1));
    EXPECT_EQ(second_a, GetXMLSubTag(root.get(), 2));
    EXPECT_EQ(nullptr, GetXMLSubTag(root.get(), 3));
    EXPECT_EQ(nullptr, GetXMLSubTag(root.get(), std::numeric_limits<uint32_t>::max()));
    EXPECT_EQ(b, GetXMLSiblingTag(a));
    EXPECT_EQ(nullptr, GetXMLSiblingTag(second_a));
    EXPECT_EQ(a, GetXMLSubTagFromStr(root.get(), "A"));
    EXPECT_EQ(b, GetXMLSubTagFromBuf(root.get(), "BX", 1));
    EXPECT_EQ(2u, GetXMLNamedSubTagCount(root.get(), "A"));
    EXPECT_EQ(0u, GetXMLNamedSubTagCount(root.get(), "a"));
}

TEST_F(TagTree, SubTagNamesMatchByAllTheirBytes)
{
    const Tree root = make_tag("R");
    add(root, "AB");
    for (const char* name : {"A", "ABC", "ab", ""}) {
        EXPECT_EQ(nullptr, GetXMLSubTagFromStr(root.get(), name)) << name;
        EXPECT_EQ(0u, GetXMLNamedSubTagCount(root.get(), name)) << name;
    }
}

TEST_F(TagTree, NullArgumentsFindNothing)
{
    const Tree root = make_tag("R");
    add(root, "A");
    EXPECT_EQ(0u, GetXMLSubTagCount(nullptr));
    EXPECT_EQ(0u, GetXMLNamedSubTagCount(nullptr, "A"));
    EXPECT_EQ(0u, GetXMLNamedSubTagCount(root.get(), nullptr));
    EXPECT_EQ(nullptr, GetXMLSubTag(nullptr, 0));
    EXPECT_EQ(nullptr, GetXMLSiblingTag(nullptr));
    EXPECT_EQ(nullptr, GetXMLSubTagFromStr(nullptr, "A"));
    EXPECT_EQ(nullptr, GetXMLSubTagFromStr(root.get(), nullptr));
    EXPECT_EQ(nullptr, GetXMLSubTagFromBuf(root.get(), "A", 0));
    EXPECT_EQ(nullptr, GetXMLSubTagFromBuf(root.get(), nullptr, 1));
}

TEST_F(TagTree, LookUpsPassOverNamelessSubTags)
{
    const Tree root = make_tag("R");
    EXPECT_EQ(KZ_OK, AddXMLSubTag(root.get(), CreateEmptyXMLTag()));
    XMLTag* a = add(root, "A", "1");
    EXPECT_EQ(2u, GetXMLSubTagCount(root.get()));
    EXPECT_EQ(1u, GetXMLNamedSubTagCount(root.get(), "A"));
    EXPECT_EQ(0u, GetXMLNamedSubTagCount(root.get(), ""));
    EXPECT_EQ(a, GetXMLSubTagFromStr(root.get(), "A"));
    EXPECT_EQ(a, GetXMLSubTagFromPath(root.get(), "A"));
    EXPECT_EQ(nullptr, GetXMLSubTagFromPath(root.get(), "/A"));
    EXPECT_STREQ("1", GetXMLSubTagData(root.get(), "A"));
    EXPECT_STREQ("1", XMLGetDataAtPath(root.get(), "R/A"));
    uintptr_t cursor = KZ_XML_CURSOR_START;
    EXPECT_EQ(a, GetXMLSubTagFromStrEx(root.get(), "A", &cursor));
    const Tree nameless(CreateEmptyXMLTag());
    EXPECT_EQ(nullptr, XMLGetDataAtPath(nameless.get(), "R"));
}

TEST_F(TagTree, ACursorGoesThroughAllSubTagsOfAName)
{
    const Tree root = make_tag("R");
    XMLTag* first = add(root, "A");
    add(root, "B");
    XMLTag* second = add(root, "A");
    for (const uintptr_t start : {uintptr_t{KZ_XML_CURSOR_START}, uintptr_t{0xffffffffu}}) {
        uintptr_t cursor = start;
        EXPECT_EQ(first, GetXMLSubTagFromStrEx(root.get(), "A", &cursor));
        EXPECT_EQ(second, GetXMLSubTagFromStrEx(root.get(), "A", &cursor));
        EXPECT_EQ(0u, cursor) << "the last match has no sibling";
        EXPECT_EQ(nullptr, GetXMLSubTagFromStrEx(root.get(), "A", &cursor));
        EXPECT_EQ(0u, cursor);
    }
    uintptr_t cursor = KZ_XML_CURSOR_START;
    EXPECT_EQ(nullptr, GetXMLSubTagFromStrEx(root.get(), "X", &cursor));
    EXPECT_EQ(0u, cursor);
}

TEST_F(TagTree, ACursorHoldsTheTagBehindTheMatch)
{
    const Tree root = make_tag("R");
    add(root, "A");
    XMLTag* b = add(root, "B");
    uintptr_t cursor = KZ_XML_CURSOR_START;
    ASSERT_NE(nullptr, GetXMLSubTagFromStrEx(root.get(), "A", &cursor));
    EXPECT_EQ(reinterpret_cast<uintptr_t>(b), cursor);
}

TEST_F(TagTree, ACursorIsLeftAloneByBadArguments)
{
    const Tree root = make_tag("R");
    add(root, "A");
    uintptr_t cursor = KZ_XML_CURSOR_START;
    EXPECT_EQ(nullptr, GetXMLSubTagFromStrEx(nullptr, "A", &cursor));
    EXPECT_EQ(nullptr, GetXMLSubTagFromStrEx(root.get(), "", &cursor));
    EXPECT_EQ(nullptr, GetXMLSubTagFromStrEx(root.get(), nullptr, &cursor));
    EXPECT_EQ(nullptr, GetXMLSubTagFromStrEx(root.get(), "A", nullptr));
    EXPECT_EQ(uintptr_t{KZ_XML_CURSOR_START}, cursor);
}

TEST_F(TagTree, AChainOfSiblingsIsAddedWhole)
{
    const Tree root = make_tag("R");
    add(root, "A");
    XMLTag* b = CreateXMLTagFromStr("B", nullptr);
    b->next_sibling = CreateXMLTagFromStr("C", nullptr);
    EXPECT_EQ(KZ_OK, AddXMLSubTag(root.get(), b));
    EXPECT_EQ(3u, GetXMLSubTagCount(root.get()));
    EXPECT_STREQ("C", GetXMLTagName(GetXMLSubTag(root.get(), 2)));
}

TEST_F(TagTree, AddingNothingDoesNothing)
{
    const Tree root = make_tag("R");
    EXPECT_EQ(KZ_OK, AddXMLSubTag(root.get(), nullptr));
    EXPECT_EQ(KZ_OK, AddXMLSubTag(nullptr, root.get()));
    EXPECT_EQ(0u, GetXMLSubTagCount(root.get()));
}

#ifndef NDEBUG
// In a release build these cause endless walks and double frees, which callers must avoid. Blocks
// are not counted here: the test framework frees some of its own for each death.
TEST(MisplacedTag, StopsADebugBuild)
{
    ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
    {
        const Tree root = make_tag("R");
        XMLTag* a = add(root, "A");
        EXPECT_DEATH(AddXMLSubTag(root.get(), root.get()), "its own sub-tag");
        EXPECT_DEATH(AddXMLSubTag(root.get(), a), "in the list already");
    }
    EXPECT_EQ(KZ_OK, kzmem_shutdown());
}
#endif

TEST_F(TagTree, ASubTagCanBeTakenOutOfAnyPlace)
{
    for (uint32_t place = 0; place < 3; ++place) {
        const Tree root = example();
        ModelTag expected = model_of(root);
        expected.sub_tags.erase(std::next(expected.sub_tags.begin(), static_cast<int>(place)));
        const Tree taken(GetXMLSubTag(root.get(), place));
        EXPECT_EQ(KZ_OK, RemoveXMLSubTag(root.get(), taken.get(), 0));
        EXPECT_EQ(nullptr, taken->next_sibling);
        EXPECT_EQ(expected, model_of(root));
    }
}

TEST_F(TagTree, ARemovedSubTagIsDisposedOfOnRequest)
{
    const Tree root = example();
    for (const uint8_t dispose : {uint8_t{1}, uint8_t{2}, uint8_t{255}}) {
        EXPECT_EQ(KZ_OK, RemoveXMLSubTag(root.get(), GetXMLSubTag(root.get(), 0), dispose));
    }
    EXPECT_EQ(nullptr, root->sub_tags);
}

TEST_F(TagTree, RemovingWhatIsNotASubTagChangesNothing)
{
    const Tree root = example();
    const Tree other = make_tag("A");
    const ModelTag before = model_of(root);
    EXPECT_EQ(KZ_OK, RemoveXMLSubTag(root.get(), other.get(), 1));
    EXPECT_EQ(KZ_OK, RemoveXMLSubTag(root.get(), GetXMLSubTagFromPath(root.get(), "B/C"), 1));
    EXPECT_EQ(KZ_OK, RemoveXMLSubTag(root.get(), nullptr, 1));
    EXPECT_EQ(KZ_OK, RemoveXMLSubTag(nullptr, other.get(), 1));
    EXPECT_EQ(before, model_of(root));
    EXPECT_STREQ("A", GetXMLTagName(other.get()));
}

// ---- Disposing

TEST_F(TagTree, DisposingFollowsNoSibling)
{
    XMLTag* a = CreateXMLTagFromStr("A", nullptr);
    const Tree b = make_tag("B");
    a->next_sibling = b.get();
    EXPECT_EQ(KZ_OK, DisposeXMLTag(a));
    EXPECT_STREQ("B", GetXMLTagName(b.get()));
    EXPECT_EQ(KZ_OK, DisposeXMLTag(nullptr));
}

TEST_F(TagTree, SmartDisposingClearsTheVariable)
{
    XMLTag* tag = example().release();
    EXPECT_EQ(KZ_OK, SmartDisposeXMLTag(&tag));
    EXPECT_EQ(nullptr, tag);
    EXPECT_EQ(KZ_OK, SmartDisposeXMLTag(&tag));
    EXPECT_EQ(KZ_OK, SmartDisposeXMLTag(nullptr));
}

// Nothing could be freed, so nothing may be taken apart: the tree can still be disposed of later.
TEST_F(TagTree, DisposingWithMemoryOffLeavesTheTreeWhole)
{
    Tree root = example();
    const ModelTag before = model_of(root);
    ASSERT_EQ(KZ_OK, kzmem_shutdown());
    EXPECT_EQ(KZ_OK, DisposeXMLTag(root.get()));
    EXPECT_EQ(before, model_of(root));
    ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
}

TEST_F(TagTree, WithMemoryOffNothingIsMade)
{
    const Tree root = example();
    ASSERT_EQ(KZ_OK, kzmem_shutdown());
    EXPECT_EQ(nullptr, CreateEmptyXMLTag());
    EXPECT_EQ(nullptr, CreateXMLTagFromStr("A", nullptr));
    EXPECT_EQ(nullptr, CloneXMLTag(root.get(), 1));
    EXPECT_EQ(nullptr, RenderXMLTagToStr(root.get(), 0));
    EXPECT_EQ(KZ_XML_ERROR_MEMORY, SetXMLTagAttrFromStr(root.get(), "a", "1"));
    ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
}

// ---- Cloning

TEST_F(TagTree, ADeepCloneIsTheWholeTree)
{
    const Tree root = example();
    const Tree clone(CloneXMLTag(root.get(), 1));
    EXPECT_EQ(model_of(root), model_of(clone));
    EXPECT_NE(root->name, clone->name);
    EXPECT_NE(root->sub_tags, clone->sub_tags);
}

TEST_F(TagTree, OnlyTheFlagOneClonesDeep)
{
    const Tree root = example();
    ModelTag expected = model_of(root);
    expected.sub_tags.clear();
    for (const uint8_t deep : {uint8_t{0}, uint8_t{2}, uint8_t{255}}) {
        const Tree clone(CloneXMLTag(root.get(), deep));
        EXPECT_EQ(expected, model_of(clone));
    }
}

TEST_F(TagTree, ACloneHasNoSiblings)
{
    const Tree root = example();
    for (const uint8_t deep : {uint8_t{0}, uint8_t{1}}) {
        const Tree clone(CloneXMLTag(GetXMLSubTag(root.get(), 0), deep));
        EXPECT_EQ(nullptr, clone->next_sibling);
        EXPECT_EQ(0u, GetXMLSubTagCount(clone.get()));
    }
    EXPECT_EQ(nullptr, CloneXMLTag(nullptr, 1));
}

TEST_F(TagTree, AMissingNameStaysMissingInAClone)
{
    const Tree root(CreateEmptyXMLTag());
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(root.get(), "data"));
    EXPECT_EQ(KZ_OK, AddXMLSubTag(root.get(), CreateEmptyXMLTag()));
    const Tree clone(CloneXMLTag(root.get(), 1));
    EXPECT_EQ(model_of(root), model_of(clone));
}

TEST_F(TagTree, AFailedCloneLeavesNothing)
{
    const Tree root = example();
    const ModelTag before = model_of(root);
    for_every_failed_allocation([&](auto fired) {
        const Tree clone(CloneXMLTag(root.get(), 1));
        EXPECT_EQ(fired(), clone == nullptr);
        EXPECT_EQ(before, model_of(root));
    });
}

// ---- Copying

TEST_F(TagTree, ACopyReplacesAllButThePlace)
{
    const Tree source = example();
    const Tree parent = make_tag("P");
    XMLTag* destination = add(parent, "D", "old");
    add(destination, "OLD");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(destination, "old", "1"));
    XMLTag* sibling = add(parent, "S");
    EXPECT_EQ(KZ_OK, CopyXMLTag(destination, source.get()));
    EXPECT_EQ(model_of(source), model_of(*destination));
    EXPECT_EQ(sibling, destination->next_sibling);
}

TEST_F(TagTree, CopyingAnEmptyTagEmptiesTheDestination)
{
    const Tree destination = example();
    const Tree source(CreateEmptyXMLTag());
    EXPECT_EQ(KZ_OK, CopyXMLTag(destination.get(), source.get()));
    EXPECT_EQ(ModelTag{}, model_of(destination));
}

TEST_F(TagTree, CopyingNeedsTwoTags)
{
    const Tree tag = example();
    const ModelTag before = model_of(tag);
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, CopyXMLTag(tag.get(), nullptr));
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, CopyXMLTag(nullptr, tag.get()));
    EXPECT_EQ(before, model_of(tag));
}

TEST_F(TagTree, CopyingATagOntoItselfDoesNothing)
{
    const Tree tag = example();
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromBuf(tag.get(), "kept", 4, "", 1)); // a copy would drop it
    const ModelTag before = model_of(tag);
    AllocationFault fault(1, AllocationFault::FromThenOn);
    EXPECT_EQ(KZ_OK, CopyXMLTag(tag.get(), tag.get()));
    EXPECT_FALSE(fault.fired());
    EXPECT_EQ(before, model_of(tag));
}

TEST_F(TagTree, ATagBelowCanBeCopiedOverTheTagAbove)
{
    const Tree root = example();
    XMLTag* below = GetXMLSubTagFromStr(root.get(), "B");
    const ModelTag expected = model_of(*below);
    EXPECT_EQ(KZ_OK, CopyXMLTag(root.get(), below));
    EXPECT_EQ(expected, model_of(root));
}

TEST_F(TagTree, ATagAboveIsCopiedAsItWasBeforeTheCall)
{
    const Tree root = example();
    ModelTag expected = model_of(root);
    expected.sub_tags[1].sub_tags[0] = model_of(root);
    EXPECT_EQ(KZ_OK, CopyXMLTag(GetXMLSubTagFromPath(root.get(), "B/C"), root.get()));
    EXPECT_EQ(expected, model_of(root));
}

// What is left of the destination depends on how far the copy came.
TEST_F(TagTree, AFailedCopyLeavesAHalfCopiedTag)
{
    const Tree source = example();
    const ModelTag whole = model_of(source);
    const Tree original = make_tag("D", "old");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(original.get(), "old", "1"));
    add(original, "OLD");
    const ModelTag old = model_of(original);

    ModelTag no_texts = old; // neither name nor data could be copied, or only one
    no_texts.name.reset();
    no_texts.data.reset();
    std::vector<ModelTag> stages{no_texts, no_texts};
    for (size_t count = 0; count < 2; ++count) { // three allocations for an attribute
        ModelTag stage{whole.name, whole.data, {}, old.sub_tags};
        stage.attributes.assign(whole.attributes.begin(),
                                whole.attributes.begin() + static_cast<int>(count));
        stages.insert(stages.end(), 3, stage);
    }
    // A and A: record, name, data. B: record, name, three for its attribute, and three for C.
    constexpr size_t kBlocks[] = {3, 8, 3};
    for (size_t count = 0; count < 3; ++count) {
        ModelTag stage{whole.name, whole.data, whole.attributes, {}};
        stage.sub_tags.assign(whole.sub_tags.begin(),
                              whole.sub_tags.begin() + static_cast<int>(count));
        stages.insert(stages.end(), kBlocks[count], stage);
    }

    size_t nth = 0;
    for (; nth < stages.size(); ++nth) {
        const Tree destination(CloneXMLTag(original.get(), 1));
        AllocationFault fault(nth + 1);
        EXPECT_EQ(KZ_XML_ERROR_MEMORY, CopyXMLTag(destination.get(), source.get())) << nth;
        EXPECT_EQ(stages[nth], model_of(destination)) << nth;
    }
    const Tree destination(CloneXMLTag(original.get(), 1));
    AllocationFault fault(nth + 1);
    EXPECT_EQ(KZ_OK, CopyXMLTag(destination.get(), source.get()));
    EXPECT_EQ(whole, model_of(destination));
}

TEST_F(TagTree, AnAttributeWithoutANameStopsACopy)
{
    const Tree source = make_tag("S", "data");
    for (const char* name : {"a", "b", "c"}) {
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(source.get(), name, "1"));
    }
    EXPECT_EQ(KZ_OK, _kzmem_free(source->attributes->next->name));
    source->attributes->next->name = nullptr;
    const Tree destination = make_tag("D");
    add(destination, "OLD");
    EXPECT_EQ(KZ_XML_ERROR_INVALID_ARGUMENT, CopyXMLTag(destination.get(), source.get()));
    EXPECT_STREQ("S", GetXMLTagName(destination.get()));
    EXPECT_EQ(1u, GetXMLTagAttrCount(destination.get()));
    EXPECT_EQ(1u, GetXMLNamedSubTagCount(destination.get(), "OLD"));
    EXPECT_EQ(nullptr, CloneXMLTag(source.get(), 0));
}

TEST_F(TagTree, CopyingLeaksNothingWhenMemoryIsShort)
{
    const Tree source = example();
    const Tree original = example();
    for_every_failed_allocation([&](auto fired) {
        const Tree destination(CloneXMLTag(original.get(), 1));
        if (destination) {
            const kz_status status = CopyXMLTag(destination.get(), source.get());
            EXPECT_EQ(fired() ? KZ_XML_ERROR_MEMORY : 0u, status);
        }
    });
    for_every_failed_allocation([&](auto fired) { // from below: the old sub-tags hold the source
        const Tree destination(CloneXMLTag(original.get(), 1));
        if (destination) {
            const XMLTag* below = GetXMLSubTagFromStr(destination.get(), "B");
            const kz_status status = CopyXMLTag(destination.get(), below);
            EXPECT_EQ(fired() ? KZ_XML_ERROR_MEMORY : 0u, status);
        }
    });
}

} // namespace
