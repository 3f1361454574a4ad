// Trees as deep as an attacker likes, walked on a stack that holds about a thousand calls.

#include "kzsdk/xml/xml.h"

#include <pthread.h>

#include <cstring>
#include <functional>
#include <string>

#include "kzsdk/abs/memory.h"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

constexpr size_t kStack = 256 * 1024;
constexpr uint32_t kMillion = 1'000'000;

// A sanitizer's heap moves a block at each growth, so the text's linear growth shows there.
#if defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define KZ_TEST_SANITIZER_HEAP
#endif
#elif defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define KZ_TEST_SANITIZER_HEAP
#endif
#if defined(KZ_TEST_SANITIZER_HEAP)
constexpr uint32_t kRenderedDepth = 60'000;
#else
constexpr uint32_t kRenderedDepth = kMillion;
#endif

void* call(void* function)
{
    (*static_cast<const std::function<void()>*>(function))();
    return nullptr;
}

void on_a_small_stack(const std::function<void()>& function)
{
    pthread_attr_t attributes;
    ASSERT_EQ(0, pthread_attr_init(&attributes));
    ASSERT_EQ(0, pthread_attr_setstacksize(&attributes, kStack));
    pthread_t thread{};
    auto* argument = const_cast<std::function<void()>*>(&function);
    ASSERT_EQ(0, pthread_create(&thread, &attributes, call, argument));
    EXPECT_EQ(0, pthread_join(thread, nullptr));
    EXPECT_EQ(0, pthread_attr_destroy(&attributes));
}

/// Each tag has one below it; with `sides`, one tag more on each side of that.
Tree deep_tree(uint32_t depth, bool sides)
{
    Tree root = make_tag("R");
    XMLTag* tag = root.get();
    for (uint32_t level = 0; level < depth; ++level) {
        if (sides) {
            add(tag, "B");
        }
        XMLTag* below = add(tag, "A");
        if (sides) {
            add(tag, "C");
        }
        tag = below;
    }
    return root;
}

/// Walks down both in parallel: comparing models would recurse.
void expect_same_shape(const XMLTag* a, const XMLTag* b)
{
    while (a != nullptr && b != nullptr) {
        ASSERT_STREQ(a->name, b->name);
        const uint32_t count = GetXMLSubTagCount(a);
        ASSERT_EQ(count, GetXMLSubTagCount(b));
        const XMLTag* next_a = GetXMLSubTag(a, count / 2);
        const XMLTag* next_b = GetXMLSubTag(b, count / 2);
        a = next_a;
        b = next_b;
    }
    ASSERT_EQ(a == nullptr, b == nullptr);
}

std::string repeated(const char* text, uint32_t times)
{
    std::string all;
    for (uint32_t i = 0; i < times; ++i) {
        all += text;
    }
    return all;
}

class DeepTree : public MemoryOn {};

TEST_F(DeepTree, AMillionLevelsAreClonedCopiedAndDisposedOf)
{
    Tree root = deep_tree(kMillion, false);
    on_a_small_stack([&] {
        Tree clone(CloneXMLTag(root.get(), 1));
        ASSERT_TRUE(clone);
        expect_same_shape(root.get(), clone.get());
        clone.reset();
        Tree copy = make_tag("X");
        ASSERT_EQ(KZ_OK, CopyXMLTag(copy.get(), root.get()));
        expect_same_shape(root.get(), copy.get());
        root.reset();
    });
}

TEST_F(DeepTree, AMillionLevelsAreComparedAndMutated)
{
    Tree root = deep_tree(kMillion, false);
    on_a_small_stack([&] {
        Tree clone(CloneAndMutateXMLTag(root.get(), 1));
        ASSERT_TRUE(clone);
        expect_same_shape(root.get(), clone.get());
        EXPECT_EQ(1u, EqualXMLTags(root.get(), clone.get()));
        XMLTag* last = clone.get();
        while (last->sub_tags != nullptr) {
            last = last->sub_tags;
        }
        EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(last, "different"));
        EXPECT_EQ(0u, EqualXMLTags(root.get(), clone.get()));
        clone.reset();
        root.reset();
    });
}

TEST_F(DeepTree, SideBranchesAreNotLost)
{
    Tree root = deep_tree(100'000, true);
    on_a_small_stack([&] {
        const Tree clone(CloneXMLTag(root.get(), 1));
        ASSERT_TRUE(clone);
        expect_same_shape(root.get(), clone.get());
        EXPECT_EQ(1u, EqualXMLTags(root.get(), clone.get()));
        const Tree mutated(CloneAndMutateXMLTag(root.get(), 1));
        EXPECT_EQ(1u, EqualXMLTags(root.get(), mutated.get()));
        root.reset();
    });
}

TEST_F(DeepTree, AMillionLevelsAreRendered)
{
    const Tree root = deep_tree(kRenderedDepth, false);
    std::string text;
    on_a_small_stack([&] {
        char* rendered = RenderXMLTagToStrEx(root.get(), 0, 0, 0);
        ASSERT_NE(nullptr, rendered);
        text = rendered;
        EXPECT_EQ(KZ_OK, _kzmem_free(rendered));
    });
    const std::string expected =
        "<R>" + repeated("<A>", kRenderedDepth) + repeated("</A>", kRenderedDepth) + "</R>";
    EXPECT_TRUE(expected == text) << text.size() << " bytes, not " << expected.size();
}

TEST_F(DeepTree, IndentedLevelsComeAndGo)
{
    constexpr uint32_t kDepth = 300;
    const Tree root = deep_tree(kDepth, false);
    std::string text;
    on_a_small_stack([&] {
        char* rendered = RenderXMLTagToStr(root.get(), 0);
        ASSERT_NE(nullptr, rendered);
        text = rendered;
        EXPECT_EQ(KZ_OK, _kzmem_free(rendered));
    });
    std::string expected = "<R>\n";
    for (uint32_t level = 1; level <= kDepth; ++level) {
        expected += std::string(2 * size_t{level}, ' ') + (level < kDepth ? "<A>\n" : "<A></A>\n");
    }
    for (uint32_t level = kDepth - 1; level >= 1; --level) {
        expected += std::string(2 * size_t{level}, ' ') + "</A>\n";
    }
    EXPECT_TRUE(expected + "</R>\n" == text);
}

TEST_F(DeepTree, APathOfAMillionSegmentsIsFollowed)
{
    const std::string path = repeated("A/", kMillion) + "A";
    Tree root = make_tag("R");
    on_a_small_stack([&] {
        ASSERT_EQ(KZ_OK, SetXMLSubTagDataFromStr(root.get(), path.c_str(), "deep", 1));
        EXPECT_STREQ("deep", GetXMLSubTagData(root.get(), path.c_str()));
        EXPECT_STREQ("deep", GetXMLTagData(GetXMLSubTagFromPath(root.get(), path.c_str())));
        EXPECT_STREQ("deep", XMLGetDataAtPath(root.get(), ("R/" + path).c_str()));
        const auto resolver = [](XMLTag*, const char*, uint32_t, uintptr_t, const char** name,
                                 uint32_t* kind) {
            *name = "A";
            *kind = KZ_XML_KIND_ELEMENT;
            return 1;
        };
        EXPECT_EQ(1, XMLSetValueAtPath(root.get(), path.c_str(), "deeper", 1, resolver));
        EXPECT_STREQ("deeper", GetXMLSubTagData(root.get(), path.c_str()));
        root.reset();
    });
}

TEST_F(DeepTree, ALongListIsClonedInOnePass)
{
    Tree root = make_tag("R");
    XMLTag* last = add(root, "A");
    for (uint32_t i = 1; i < 300'000;
         ++i) { // linked by hand: adding searches for the end each time
        last->next_sibling = CreateXMLTagFromStr("A", nullptr);
        last = last->next_sibling;
    }
    const Tree clone(CloneXMLTag(root.get(), 1));
    EXPECT_EQ(300'000u, GetXMLSubTagCount(clone.get()));
    const Tree mutated(CloneAndMutateXMLTag(root.get(), 1));
    EXPECT_EQ(300'000u, GetXMLSubTagCount(mutated.get()));
    EXPECT_EQ(1u, EqualXMLTags(clone.get(), mutated.get()));
    const Tree copy = make_tag("X");
    EXPECT_EQ(KZ_OK, CopyXMLTag(copy.get(), root.get()));
    EXPECT_EQ(300'000u, GetXMLSubTagCount(copy.get()));
}

TEST_F(DeepTree, ShortMemoryOnTheWayDownLeavesNothing)
{
    const Tree root = deep_tree(70, true); // the way back up outgrows its array, once
    for_every_failed_allocation([&](auto fired) {
        const Tree clone(CloneXMLTag(root.get(), 1));
        EXPECT_EQ(fired(), clone == nullptr);
    });
    for_every_failed_allocation([&](auto fired) {
        char* text = RenderXMLTagToStrEx(root.get(), 1, 0, 1);
        EXPECT_EQ(fired(), text == nullptr);
        static_cast<void>(_kzmem_free(text));
    });
}

} // namespace
