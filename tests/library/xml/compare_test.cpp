#include "kzsdk/xml/xml.h"

#include <cstring>

#include "kzsdk/abs/memory.h"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

uint32_t equal(const Tree& a, const Tree& b) { return EqualXMLTags(a.get(), b.get()); }

/// Both ways round: the answer must not depend on which comes first.
void expect_equal(const Tree& a, const Tree& b)
{
    EXPECT_EQ(1u, equal(a, b));
    EXPECT_EQ(1u, equal(b, a));
}

void expect_different(const Tree& a, const Tree& b)
{
    EXPECT_EQ(0u, equal(a, b));
    EXPECT_EQ(0u, equal(b, a));
}

Tree with_attributes(std::initializer_list<std::pair<const char*, const char*>> attributes)
{
    Tree tag = make_tag("A");
    for (const auto& [name, value] : attributes) {
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag.get(), name, value));
    }
    return tag;
}

Tree with_sub_tags(std::initializer_list<const char*> names)
{
    Tree tag = make_tag("A");
    for (const char* name : names) {
        add(tag, name);
    }
    return tag;
}

class Comparison : public MemoryOn {};

TEST_F(Comparison, NullEqualsOnlyNull)
{
    const Tree tag = make_tag("A");
    EXPECT_EQ(1u, EqualXMLTags(nullptr, nullptr));
    EXPECT_EQ(0u, EqualXMLTags(tag.get(), nullptr));
    EXPECT_EQ(0u, EqualXMLTags(nullptr, tag.get()));
    EXPECT_EQ(1u, EqualXMLTags(tag.get(), tag.get()));
}

TEST_F(Comparison, NamesCountByteByByte)
{
    expect_equal(make_tag("A"), make_tag("A"));
    expect_different(make_tag("A"), make_tag("a"));
    expect_different(make_tag("A"), make_tag("AA"));
}

TEST_F(Comparison, ANamelessTagEqualsOnlyANamelessOne)
{
    const Tree nameless(CreateEmptyXMLTag());
    expect_equal(nameless, Tree(CreateEmptyXMLTag()));
    expect_different(nameless, make_tag("A"));
}

TEST_F(Comparison, DataCountByteByByte)
{
    expect_equal(make_tag("A", "x"), make_tag("A", "x"));
    expect_different(make_tag("A", "x"), make_tag("A", "y"));
    expect_different(make_tag("A", "x"), make_tag("A", "xx"));
}

TEST_F(Comparison, MissingDataDiffersFromDataBothWaysRound)
{
    expect_different(make_tag("A", "x"), make_tag("A"));
    expect_equal(make_tag("A", ""), make_tag("A"));
}

TEST_F(Comparison, AttributesCountInTheirOrder)
{
    const Tree tag = with_attributes({{"x", "1"}, {"y", "2"}});
    expect_equal(tag, with_attributes({{"x", "1"}, {"y", "2"}}));
    expect_different(tag, with_attributes({{"y", "2"}, {"x", "1"}}));
    expect_different(tag, with_attributes({{"x", "1"}, {"y", "3"}}));
    expect_different(tag, with_attributes({{"x", "1"}, {"z", "2"}}));
    expect_different(tag, with_attributes({{"x", "1"}}));
    expect_different(tag, make_tag("A"));
}

TEST_F(Comparison, AMissingAttributeTextEqualsOnlyAMissingOne)
{
    const Tree tag = with_attributes({{"x", "1"}});
    const Tree broken = with_attributes({{"x", "1"}});
    char* name = std::exchange(broken->attributes->name, nullptr);
    expect_different(tag, broken);
    broken->attributes->name = name;
    char* value = std::exchange(broken->attributes->value, nullptr);
    expect_different(tag, broken);
    const Tree as_broken = with_attributes({{"x", "1"}});
    char* other = std::exchange(as_broken->attributes->value, nullptr);
    expect_equal(broken, as_broken);
    broken->attributes->value = value;
    as_broken->attributes->value = other;
}

TEST_F(Comparison, SubTagsCountInTheirOrder)
{
    const Tree tag = with_sub_tags({"X", "Y"});
    expect_equal(tag, with_sub_tags({"X", "Y"}));
    expect_different(tag, with_sub_tags({"Y", "X"}));
    expect_different(tag, with_sub_tags({"X"}));
    expect_different(tag, with_sub_tags({"X", "Y", "Z"}));
    expect_different(tag, make_tag("A"));
}

TEST_F(Comparison, DifferentDataOfAGrandchildMakesTreesDifferent)
{
    const auto family = [](const char* data) {
        Tree root = make_tag("R");
        add(add(root, "C"), "G", data);
        add(root, "D");
        return root;
    };
    expect_equal(family("x"), family("x"));
    expect_different(family("x"), family("y"));
    expect_different(family("x"), family(nullptr));
}

TEST_F(Comparison, TheSameTagsInAnotherShapeAreDifferent)
{
    const Tree flat = with_sub_tags({"X", "Y"});
    const Tree deep = with_sub_tags({"X"});
    add(GetXMLSubTag(deep.get(), 0), "Y");
    expect_different(flat, deep);
}

TEST_F(Comparison, SiblingsOfTheTwoTagsDoNotCount)
{
    const Tree parent = with_sub_tags({"X", "Y"});
    const Tree alone = make_tag("X");
    EXPECT_EQ(1u, EqualXMLTags(GetXMLSubTag(parent.get(), 0), alone.get()));
    EXPECT_EQ(1u, EqualXMLTags(alone.get(), GetXMLSubTag(parent.get(), 0)));
}

TEST_F(Comparison, ACloneEqualsItsSource)
{
    Random random(21);
    for (int run = 0; run < 200; ++run) {
        const Tree tree = random_tree(random, 5, 10);
        expect_equal(tree, Tree(CloneXMLTag(tree.get(), 1)));
    }
}

/// Changes one text, or one place of a list, somewhere in the tree.
void change_one_thing(Random& random, XMLTag* tag)
{
    while (tag->sub_tags != nullptr && random.below(3) != 0) {
        tag = GetXMLSubTag(tag, random.below(GetXMLSubTagCount(tag)));
    }
    switch (random.below(5)) {
    case 0:
        EXPECT_EQ(KZ_OK, SetXMLTagNameFromStr(tag, "changed"));
        break;
    case 1:
        EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag, "changed"));
        break;
    case 2:
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag, "A", "changed"));
        break;
    case 3:
        EXPECT_EQ(KZ_OK, RemoveXMLSubTag(tag, tag->sub_tags, 1)); // may have none: no change
        break;
    default:
        add(tag, "changed");
    }
}

TEST_F(Comparison, OfRandomTreesIsThatOfTheirModels)
{
    Random random(22);
    uint32_t counts[2] = {};
    for (int run = 0; run < 1000; ++run) {
        const Tree a = random_tree(random, 4, 10);
        const Tree b(CloneXMLTag(a.get(), 1));
        change_one_thing(random, b.get());
        const uint32_t expected = model_of(a) == model_of(b) ? 1u : 0u;
        ASSERT_EQ(expected, equal(a, b)) << "run " << run;
        ASSERT_EQ(expected, equal(b, a)) << "run " << run;
        ++counts[expected];
    }
    EXPECT_GT(counts[0], 500u);
    EXPECT_GT(counts[1], 50u);
}

// Two small trees out of few: equal ones are met, and different ones of every kind.
TEST_F(Comparison, OfUnrelatedSmallTreesIsThatOfTheirModels)
{
    Random random(23);
    uint32_t found_equal = 0;
    for (int run = 0; run < 20'000; ++run) {
        const uint32_t depth = random.below(2);
        const Tree a = random_tree(random, depth, 3);
        const Tree b = random_tree(random, depth, 3);
        const bool expected = model_of(a) == model_of(b);
        ASSERT_EQ(expected ? 1u : 0u, equal(a, b)) << "run " << run;
        found_equal += expected ? 1u : 0u;
    }
    EXPECT_GT(found_equal, 50u);
}

TEST_F(Comparison, ChangesNothing)
{
    Random random(24);
    const Tree a = random_tree(random, 4, 10);
    const Tree b = random_tree(random, 4, 10);
    const ModelTag before_a = model_of(a);
    const ModelTag before_b = model_of(b);
    static_cast<void>(equal(a, b));
    EXPECT_EQ(before_a, model_of(a));
    EXPECT_EQ(before_b, model_of(b));
}

// What could not be compared to its end is not called equal.
TEST_F(Comparison, OfTreesTooDeepForTheMemoryIsDifferent)
{
    const auto chain = [](int levels) {
        Tree root = make_tag("R");
        XMLTag* tag = root.get();
        for (int level = 0; level < levels; ++level) {
            tag = add(tag, "A");
        }
        return root;
    };
    const Tree a = chain(70);
    const Tree b = chain(70);
    for_every_failed_allocation([&](auto fired) {
        const uint32_t result = equal(a, b);
        EXPECT_EQ(fired() ? 0u : 1u, result);
    });
    const Tree shallow = chain(30);
    const Tree other = chain(30);
    const AllocationFault fault(1, AllocationFault::FromThenOn);
    EXPECT_EQ(1u, equal(shallow, other));
    EXPECT_FALSE(fault.fired());
}

} // namespace
