#include "kzsdk/xml/xml.h"

#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

constexpr const char* kNames[] = {"A", "B", "AB", "a"};
constexpr const char* kTexts[] = {"", "1", "2", "longer text"};

/// A tag of the library's tree and the same tag of the model.
struct Twin {
    XMLTag* tag;
    ModelTag* model;
};

Twin random_place(Random& random, Twin twin)
{
    while (!twin.model->sub_tags.empty() && random.below(3) != 0) {
        const uint32_t index = random.below(static_cast<uint32_t>(twin.model->sub_tags.size()));
        twin = {GetXMLSubTag(twin.tag, index), &twin.model->sub_tags[index]};
    }
    return twin;
}

void set_attribute(Random& random, Twin at)
{
    const char* name = one_of(random, kNames);
    const char* value = one_of(random, kTexts);
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(at.tag, name, value));
    at.model->set_attribute(name, value);
}

void set_number(Random& random, Twin at)
{
    const char* name = one_of(random, kNames);
    const uint32_t number = random.next();
    EXPECT_EQ(KZ_OK, SetXMLTagAttrFromUInt(at.tag, name, number));
    at.model->set_attribute(name, std::to_string(number));
}

void set_data(Random& random, Twin at)
{
    const char* data = one_of(random, kTexts);
    EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(at.tag, data));
    at.model->set_data(data);
}

void set_name(Random& random, Twin at)
{
    const char* name = one_of(random, kNames);
    EXPECT_EQ(KZ_OK, SetXMLTagNameFromStr(at.tag, name));
    at.model->name = name;
}

void add_sub_tag(Random& random, Twin at)
{
    const char* name = one_of(random, kNames);
    const char* data = one_of(random, kTexts);
    add(at.tag, name, data);
    at.model->add(name).set_data(data);
}

void remove_sub_tag(Random& random, Twin at)
{
    if (!at.model->sub_tags.empty()) {
        const uint32_t index = random.below(static_cast<uint32_t>(at.model->sub_tags.size()));
        EXPECT_EQ(KZ_OK, RemoveXMLSubTag(at.tag, GetXMLSubTag(at.tag, index), 1));
        at.model->sub_tags.erase(at.model->sub_tags.begin() + static_cast<int>(index));
    }
}

void set_by_path(Random& random, Twin at)
{
    const char* first = one_of(random, kNames);
    const char* second = one_of(random, kNames);
    const char* data = one_of(random, kTexts);
    const std::string path = std::string(first) + "/" + second;
    EXPECT_EQ(KZ_OK, SetXMLSubTagDataFromStr(at.tag, path.c_str(), data, 1));
    ModelTag* child = at.model->sub_tag(first);
    child = child != nullptr ? child : &at.model->add(first);
    ModelTag* grandchild = child->sub_tag(second);
    grandchild = grandchild != nullptr ? grandchild : &child->add(second);
    grandchild->set_data(data);
}

/// Adds a clone of one tag below another, while the tree is small.
void graft_clone(Random& random, Twin root, Twin at)
{
    const Twin from = random_place(random, root);
    XMLTag* clone = CloneXMLTag(from.tag, 1);
    ModelTag model = *from.model;
    if (GetXMLSubTagCount(at.tag) + model.sub_tags.size() > 6) {
        EXPECT_EQ(KZ_OK, DisposeXMLTag(clone));
        return;
    }
    EXPECT_EQ(KZ_OK, AddXMLSubTag(at.tag, clone));
    at.model->sub_tags.push_back(std::move(model));
}

void copy_over(Random& random, Twin root, Twin at)
{
    const Twin from = random_place(random, root);
    const ModelTag model = *from.model;
    EXPECT_EQ(KZ_OK, CopyXMLTag(at.tag, from.tag));
    *at.model = model;
}

void check_queries(const Twin& at)
{
    ASSERT_EQ(at.model->attributes.size(), GetXMLTagAttrCount(at.tag));
    ASSERT_EQ(at.model->sub_tags.size(), GetXMLSubTagCount(at.tag));
    for (const char* name : kNames) {
        uint32_t named = 0;
        uintptr_t cursor = KZ_XML_CURSOR_START;
        for (uint32_t i = 0; i < at.model->sub_tags.size(); ++i) {
            if (at.model->sub_tags[i].name == name) {
                XMLTag* expected = GetXMLSubTag(at.tag, i);
                ASSERT_EQ(expected, GetXMLSubTagFromStrEx(at.tag, name, &cursor));
                if (named == 0) {
                    ASSERT_EQ(expected, GetXMLSubTagFromStr(at.tag, name));
                }
                ++named;
            }
        }
        ASSERT_EQ(nullptr, GetXMLSubTagFromStrEx(at.tag, name, &cursor));
        ASSERT_EQ(named, GetXMLNamedSubTagCount(at.tag, name));
        const char* value = GetXMLTagAttrFromStr(at.tag, name);
        const auto found =
            std::find_if(at.model->attributes.begin(), at.model->attributes.end(),
                         [&](const auto& attribute) { return attribute.first == name; });
        ASSERT_EQ(found == at.model->attributes.end() ? std::nullopt : std::optional(found->second),
                  optional_text(value));
    }
}

class RandomTree : public MemoryOn {};

TEST_F(RandomTree, AnySequenceOfCallsGivesTheModelsTree)
{
    Random random(8);
    for (int run = 0; run < 200; ++run) {
        const Tree tree = make_tag("ROOT");
        ModelTag model = model_of(tree);
        const Twin root{tree.get(), &model};
        for (int call = 0; call < 60; ++call) {
            const Twin at = random_place(random, root);
            switch (random.below(16)) {
            case 0:
                set_name(random, at);
                break;
            case 1:
                remove_sub_tag(random, at);
                break;
            case 2:
                set_by_path(random, at);
                break;
            case 3:
                graft_clone(random, root, at);
                break;
            case 4:
                copy_over(random, root, at);
                break;
            case 5:
                set_number(random, at);
                break;
            case 6:
            case 7:
                set_data(random, at);
                break;
            case 8:
            case 9:
            case 10:
                add_sub_tag(random, at);
                break;
            default:
                set_attribute(random, at);
            }
            ASSERT_EQ(model, model_of(tree)) << "run " << run << ", call " << call;
            ASSERT_NO_FATAL_FAILURE(check_queries(random_place(random, root)));
        }
    }
}

TEST_F(RandomTree, CloneAndCopyAreTheSameTree)
{
    Random random(9);
    for (int run = 0; run < 300; ++run) {
        const Tree source = random_tree(random, 5, 10);
        const ModelTag model = model_of(source);
        const Tree clone(CloneXMLTag(source.get(), 1));
        ASSERT_EQ(model, model_of(clone));
        const Tree destination = random_tree(random, 3, 10);
        ASSERT_EQ(KZ_OK, CopyXMLTag(destination.get(), source.get()));
        ASSERT_EQ(model, model_of(destination));
        ASSERT_EQ(model, model_of(source));
    }
}

} // namespace
