#include "kzsdk/xml/xml.h"

#include <functional>
#include <map>
#include <thread>

#include "kzsdk/abs/memory.h"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

using Text = std::optional<std::string>;

/// What the installed maps do, for the library's pointers and for the model alike. They cannot be
/// removed again: a test that sets nothing here has maps that change nothing.
struct Maps {
    std::function<const char*(const char*)> tag_name = [](const char* name) { return name; };
    std::function<const char*(const char*, const char*)> attribute_name =
        [](const char*, const char* name) { return name; };
    std::function<const char*(const char*, const char*, const char*)> attribute_value =
        [](const char*, const char*, const char* value) { return value; };
};
Maps maps;

const char* map_tag_name(const char* name) { return maps.tag_name(name); }

const char* map_attribute_name(const char* tag, const char* name)
{
    return maps.attribute_name(tag, name);
}

const char* map_attribute_value(const char* tag, const char* name, const char* value)
{
    return maps.attribute_value(tag, name, value);
}

/// The first tests here use the library's own maps.
class DefaultMaps : public MemoryOn {};

class Mutation : public MemoryOn {
protected:
    void SetUp() override
    {
        MemoryOn::SetUp();
        maps = {};
        ASSERT_EQ(KZ_OK, SetMapXMLTagName(map_tag_name));
        ASSERT_EQ(KZ_OK, SetMapXMLAttrName(map_attribute_name));
        ASSERT_EQ(KZ_OK, SetMapXMLAttrValue(map_attribute_value));
    }
    void TearDown() override
    {
        maps = {};
        MemoryOn::TearDown();
    }
};

Tree mutated(const Tree& tree, uint8_t deep = 1)
{
    return Tree(CloneAndMutateXMLTag(tree.get(), deep));
}

/// R with attributes, and A, B (with an A and a C below it), A below it.
Tree example()
{
    Tree root = make_tag("R", "data");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(root.get(), "x", "1"));
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(root.get(), "y", "2"));
    add(root, "A", "first");
    XMLTag* b = add(root, "B");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(b, "x", "3"));
    add(b, "A", "below");
    add(b, "C", "deep");
    add(root, "A", "second");
    return root;
}

bool is(const char* text, const char* wanted) { return text != nullptr && wanted == Text(text); }

// ---- The maps that are there at first

TEST_F(DefaultMaps, ChangeNothing)
{
    Random random(31);
    for (int run = 0; run < 200; ++run) {
        const Tree source = random_tree(random, 5);
        const Tree copy = mutated(source);
        ASSERT_TRUE(copy);
        EXPECT_EQ(1u, EqualXMLTags(source.get(), copy.get()));
        EXPECT_EQ(model_of(source), model_of(copy));
    }
}

TEST_F(DefaultMaps, StayWhenNullIsInstalled)
{
    EXPECT_EQ(KZ_OK, SetMapXMLTagName(nullptr));
    EXPECT_EQ(KZ_OK, SetMapXMLAttrName(nullptr));
    EXPECT_EQ(KZ_OK, SetMapXMLAttrValue(nullptr));
    const Tree source = example();
    EXPECT_EQ(model_of(source), model_of(mutated(source)));
}

TEST_F(DefaultMaps, RefuseANamelessTag)
{
    const Tree nameless(CreateEmptyXMLTag());
    EXPECT_EQ(nullptr, CloneAndMutateXMLTag(nameless.get(), 1));
    const Tree parent = make_tag("R");
    EXPECT_EQ(KZ_OK, AddXMLSubTag(parent.get(), CreateEmptyXMLTag()));
    add(parent, "A");
    EXPECT_EQ(1u, GetXMLSubTagCount(mutated(parent).get()));
}

// ---- The flag and the tag given

TEST_F(Mutation, OfNullIsNull)
{
    EXPECT_EQ(nullptr, CloneAndMutateXMLTag(nullptr, 0));
    EXPECT_EQ(nullptr, CloneAndMutateXMLTag(nullptr, 1));
}

TEST_F(Mutation, TakesSubTagsAlongOnlyForExactly1)
{
    const Tree source = example();
    for (const uint8_t deep : {uint8_t{0}, uint8_t{2}, uint8_t{255}}) {
        const Tree copy = mutated(source, deep);
        ASSERT_TRUE(copy);
        EXPECT_EQ(0u, GetXMLSubTagCount(copy.get()));
        EXPECT_STREQ("data", GetXMLTagData(copy.get()));
        EXPECT_EQ(2u, GetXMLTagAttrCount(copy.get()));
    }
    EXPECT_EQ(3u, GetXMLSubTagCount(mutated(source).get()));
}

TEST_F(Mutation, LeavesSiblingsBehind)
{
    const Tree source = example();
    const Tree copy(CloneAndMutateXMLTag(GetXMLSubTag(source.get(), 0), 1));
    EXPECT_EQ(nullptr, GetXMLSiblingTag(copy.get()));
}

// ---- Each map

TEST_F(Mutation, RenamesTagsAllTheWayDown)
{
    maps.tag_name = [](const char* name) { return is(name, "A") ? "renamed" : name; };
    const Tree copy = mutated(example());
    EXPECT_STREQ("R", GetXMLTagName(copy.get()));
    EXPECT_EQ(2u, GetXMLNamedSubTagCount(copy.get(), "renamed"));
    EXPECT_STREQ("below", GetXMLSubTagData(copy.get(), "B/renamed"));
    EXPECT_EQ(nullptr, GetXMLSubTagFromPath(copy.get(), "A"));
}

TEST_F(Mutation, LeavesOutARefusedTagWithAllBelowIt)
{
    maps.tag_name = [](const char* name) { return is(name, "B") ? nullptr : name; };
    const Tree copy = mutated(example());
    ASSERT_EQ(2u, GetXMLSubTagCount(copy.get()));
    EXPECT_STREQ("first", GetXMLTagData(GetXMLSubTag(copy.get(), 0)));
    EXPECT_STREQ("second", GetXMLTagData(GetXMLSubTag(copy.get(), 1)));
    EXPECT_EQ(nullptr, GetXMLSubTagFromPath(copy.get(), "B"));
}

TEST_F(Mutation, OfARefusedTagIsNull)
{
    maps.tag_name = [](const char* name) { return is(name, "R") ? nullptr : name; };
    EXPECT_EQ(nullptr, CloneAndMutateXMLTag(example().get(), 1));
    EXPECT_EQ(nullptr, CloneAndMutateXMLTag(example().get(), 0));
}

TEST_F(Mutation, TakesAnEmptyTagNameForARefusal)
{
    maps.tag_name = [](const char* name) { return is(name, "A") ? "" : name; };
    EXPECT_EQ(1u, GetXMLSubTagCount(mutated(example()).get()));
}

TEST_F(Mutation, CanNameANamelessTag)
{
    maps.tag_name = [](const char* name) { return name != nullptr ? name : "named"; };
    const Tree nameless(CreateEmptyXMLTag());
    EXPECT_STREQ("named", GetXMLTagName(mutated(nameless).get()));
}

TEST_F(Mutation, DropsARefusedAttributeFromEveryTag)
{
    maps.attribute_name = [](const char*, const char* name) {
        return is(name, "x") ? nullptr : name;
    };
    const Tree copy = mutated(example());
    EXPECT_EQ(nullptr, GetXMLTagAttrFromStr(copy.get(), "x"));
    EXPECT_STREQ("2", GetXMLTagAttrFromStr(copy.get(), "y"));
    EXPECT_EQ(0u, GetXMLTagAttrCount(GetXMLSubTagFromPath(copy.get(), "B")));
}

TEST_F(Mutation, KeepsTheLaterOfTwoAttributesThatGetOneName)
{
    const Tree source = make_tag("R");
    for (const char* name : {"x", "y", "z"}) {
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(source.get(), name, name));
    }
    maps.attribute_name = [](const char*, const char* name) { return is(name, "z") ? "x" : name; };
    const ModelTag copy = model_of(mutated(source));
    const ModelTag expected{"R", {}, {{"y", "y"}, {"x", "z"}}, {}};
    EXPECT_EQ(expected, copy);
}

TEST_F(Mutation, SetsNothingForAMissingOrEmptyValue)
{
    const char* answer = nullptr;
    maps.attribute_value = [&](const char*, const char* name, const char* value) {
        return is(name, "x") ? answer : value;
    };
    for (const char* nothing : {static_cast<const char*>(nullptr), ""}) {
        answer = nothing;
        const Tree copy = mutated(example());
        ASSERT_TRUE(copy);
        EXPECT_EQ(1u, GetXMLTagAttrCount(copy.get()));
    }
}

// An empty value takes out what was set before under the name.
TEST_F(Mutation, LosesBothAttributesWhenTheLaterHasNoValue)
{
    maps.attribute_name = [](const char*, const char*) { return "same"; };
    maps.attribute_value = [](const char*, const char*, const char* value) {
        return is(value, "2") ? "" : value;
    };
    EXPECT_EQ(0u, GetXMLTagAttrCount(mutated(example()).get()));
}

TEST_F(Mutation, FailsATagWhoseAttributeGetsAnEmptyName)
{
    maps.attribute_name = [](const char* tag, const char* name) {
        return is(tag, "B") ? "" : name;
    };
    const Tree copy = mutated(example());
    EXPECT_EQ(2u, GetXMLSubTagCount(copy.get())) << "without B";
    maps.attribute_name = [](const char*, const char*) { return ""; };
    EXPECT_EQ(nullptr, CloneAndMutateXMLTag(example().get(), 1));
}

TEST_F(Mutation, TellsTheMapsTheNamesOfTheCopy)
{
    std::string seen;
    maps.tag_name = [&](const char* name) {
        seen += std::string("t:") + name + " ";
        return is(name, "B") ? "b" : name;
    };
    maps.attribute_name = [&](const char* tag, const char* name) {
        seen += std::string("n:") + tag + "," + name + " ";
        return is(name, "x") ? "X" : nullptr;
    };
    maps.attribute_value = [&](const char* tag, const char* name, const char* value) {
        seen += std::string("v:") + tag + "," + name + "," + value + " ";
        return value;
    };
    EXPECT_TRUE(mutated(example()));
    EXPECT_EQ("t:R n:R,x v:R,X,1 n:R,y t:A t:B n:b,x v:b,X,3 t:A t:C t:A ", seen);
}

// A map may answer from one buffer that it writes anew each time.
TEST_F(Mutation, CopiesATagsNameBeforeTheNextQuestion)
{
    static char buffer[16];
    maps.tag_name = [](const char* name) {
        std::snprintf(buffer, sizeof buffer, "tag-%s", name);
        return buffer;
    };
    std::string seen;
    maps.attribute_name = [&](const char* tag, const char* name) {
        std::snprintf(buffer, sizeof buffer, "%s", name);
        seen = tag;
        return buffer;
    };
    const Tree source = make_tag("A");
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(source.get(), "x", "1"));
    const Tree copy = mutated(source);
    EXPECT_STREQ("tag-A", GetXMLTagName(copy.get()));
    EXPECT_EQ("tag-A", seen);
}

TEST_F(Mutation, LeavesTheSourceAlone)
{
    maps.tag_name = [](const char* name) { return is(name, "B") ? nullptr : "other"; };
    maps.attribute_value = [](const char*, const char*, const char*) { return "other"; };
    const Tree source = example();
    const ModelTag before = model_of(source);
    EXPECT_TRUE(mutated(source));
    EXPECT_EQ(before, model_of(source));
}

// ---- Installing

TEST_F(Mutation, KeepsAMapWhenNullIsInstalled)
{
    maps.tag_name = [](const char*) { return "mine"; };
    maps.attribute_name = [](const char*, const char*) { return "my"; };
    maps.attribute_value = [](const char*, const char*, const char*) { return "own"; };
    EXPECT_EQ(KZ_OK, SetMapXMLTagName(nullptr));
    EXPECT_EQ(KZ_OK, SetMapXMLAttrName(nullptr));
    EXPECT_EQ(KZ_OK, SetMapXMLAttrValue(nullptr));
    const Tree copy = mutated(example(), 0);
    const ModelTag expected{"mine", "data", {{"my", "own"}}, {}};
    EXPECT_EQ(expected, model_of(copy));
}

TEST_F(Mutation, UsesTheMapsOfTheWholeProcess)
{
    std::thread([] { SetMapXMLTagName([](const char*) { return "theirs"; }); }).join();
    EXPECT_STREQ("theirs", GetXMLTagName(mutated(make_tag("mine")).get()));
}

// The thread sanitizer sees a race here if there is one.
TEST_F(Mutation, CanRunWhileAnotherThreadInstallsAMap)
{
    const XMLMapTagName one = [](const char*) { return "one"; };
    const XMLMapTagName two = [](const char*) { return "two"; };
    SetMapXMLTagName(one);
    std::thread other([&] {
        for (int i = 0; i < 2000; ++i) {
            SetMapXMLTagName(i % 2 == 0 ? two : one);
        }
    });
    const Tree source = make_tag("A");
    for (int i = 0; i < 2000; ++i) {
        const Tree copy = mutated(source);
        EXPECT_TRUE(is(GetXMLTagName(copy.get()), "one") || is(GetXMLTagName(copy.get()), "two"));
    }
    other.join();
}

// ---- Against the model

Text text_or_none(const char* text) { return optional_text(text); }

const char* pointer(const Text& text) { return text ? text->c_str() : nullptr; }

/// The rules once more, on the model: recursive, and calling the same maps.
std::optional<ModelTag> mutated_model(const ModelTag& source)
{
    const Text name = text_or_none(maps.tag_name(pointer(source.name)));
    if (!name || name->empty()) {
        return std::nullopt;
    }
    ModelTag copy{name, source.data, {}, {}};
    for (const auto& [key, value] : source.attributes) {
        const Text new_key = text_or_none(maps.attribute_name(name->c_str(), key.c_str()));
        if (!new_key) {
            continue;
        }
        if (new_key->empty()) {
            return std::nullopt;
        }
        const Text new_value =
            text_or_none(maps.attribute_value(name->c_str(), new_key->c_str(), value.c_str()));
        copy.set_attribute(*new_key, new_value.value_or(""));
    }
    for (const ModelTag& child : source.sub_tags) {
        if (auto sub_tag = mutated_model(child)) {
            copy.sub_tags.push_back(std::move(*sub_tag));
        }
    }
    return copy;
}

/// Draws an answer for each argument and returns the same one for it from then on.
class RandomAnswers {
public:
    explicit RandomAnswers(Random& random) : random_(random) {}

    /// Often the text itself; now and then another, an empty one or none.
    const char* operator()(const std::string& question, const char* text)
    {
        const auto [known, is_new] = answers_.try_emplace(question, 0u);
        if (is_new) {
            known->second = random_.below(12);
        }
        switch (known->second) {
        case 0:
            return nullptr;
        case 1:
            return "";
        case 2:
            return "other";
        case 3:
            return "B";
        default:
            return text;
        }
    }

private:
    Random& random_;
    std::map<std::string, uint32_t> answers_;
};

std::string shown(const char* text) { return text != nullptr ? text : "(none)"; }

TEST_F(Mutation, OfRandomTreesByRandomMapsIsThatOfTheModel)
{
    Random random(32);
    uint32_t refused = 0;
    uint32_t changed = 0;
    for (int run = 0; run < 2000; ++run) {
        RandomAnswers answers(random);
        maps.tag_name = [&](const char* name) { return answers("t" + shown(name), name); };
        maps.attribute_name = [&](const char* tag, const char* name) {
            return answers("n" + shown(tag) + "|" + shown(name), name);
        };
        maps.attribute_value = [&](const char* tag, const char* name, const char* value) {
            return answers("v" + shown(tag) + "|" + shown(name) + "|" + shown(value), value);
        };
        const Tree source = random_tree(random, 4, 20);
        const ModelTag before = model_of(source);
        const auto expected = mutated_model(before);
        const Tree copy = mutated(source);
        ASSERT_EQ(expected.has_value(), copy != nullptr) << "run " << run;
        if (expected) {
            ASSERT_EQ(*expected, model_of(copy)) << "run " << run;
            changed += *expected == before ? 0u : 1u;
        } else {
            ++refused;
        }
    }
    EXPECT_GT(refused, 50u);
    EXPECT_GT(changed, 500u);
}

// ---- Short memory

// A failed allocation costs the tag that it was for, with all below it; at the root it costs all.
TEST_F(Mutation, LeavesOutWhatMemoryIsTooShortFor)
{
    const Tree source = example();
    const ModelTag whole = model_of(source);
    uint32_t incomplete = 0;
    for_every_failed_allocation([&](auto fired) {
        const Tree copy = mutated(source);
        if (!fired()) {
            EXPECT_EQ(whole, model_of(copy));
        } else if (copy != nullptr) {
            EXPECT_NE(whole, model_of(copy));
            EXPECT_EQ(whole.attributes, model_of(copy).attributes);
            ++incomplete;
        }
    });
    EXPECT_GT(incomplete, 10u);
}

TEST_F(Mutation, LeavesOutASubTreeTooDeepForTheMemory)
{
    constexpr uint32_t kInPlace = 32; // levels that need no memory for the way back
    const Tree source = make_tag("R");
    XMLTag* tag = source.get();
    for (int level = 0; level < 40; ++level) {
        add(tag, "before");
        XMLTag* below = add(tag, "A");
        add(tag, "behind");
        tag = below;
    }
    uint32_t cut = 0;
    for_every_failed_allocation([&](auto fired) {
        const Tree copy = mutated(source);
        if (fired() && copy != nullptr) {
            uint32_t levels = 0;
            for (XMLTag* at = copy.get(); at != nullptr; at = GetXMLSubTagFromStr(at, "A")) {
                ++levels;
            }
            cut += levels == kInPlace && GetXMLSubTagCount(copy.get()) == 3 ? 1u : 0u;
        }
    });
    EXPECT_GT(cut, 0u);
}

} // namespace
