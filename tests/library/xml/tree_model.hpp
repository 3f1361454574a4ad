/// @file
/// Tag trees in standard containers, written without the library: what tests compare it with.
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <optional>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/xml/xml.h"
#include "support/signals.hpp"

namespace kz::test {

struct Dispose {
    void operator()(XMLTag* tag) const { EXPECT_EQ(KZ_OK, DisposeXMLTag(tag)); }
};
/// A tree that the test owns.
using Tree = std::unique_ptr<XMLTag, Dispose>;

inline Tree make_tag(const char* name, const char* data = nullptr)
{
    return Tree(CreateXMLTagFromStr(name, data));
}

/// Adds a new sub-tag and returns it, the parent's.
inline XMLTag* add(XMLTag* parent, const char* name, const char* data = nullptr)
{
    XMLTag* child = CreateXMLTagFromStr(name, data);
    EXPECT_EQ(KZ_OK, AddXMLSubTag(parent, child));
    return child;
}

inline XMLTag* add(const Tree& parent, const char* name, const char* data = nullptr)
{
    return add(parent.get(), name, data);
}

struct ModelTag {
    std::optional<std::string> name;
    std::optional<std::string> data;
    std::vector<std::pair<std::string, std::string>> attributes;
    std::vector<ModelTag> sub_tags;

    bool operator==(const ModelTag&) const = default;

    void set_attribute(const std::string& key, const std::string& value)
    {
        std::erase_if(attributes, [&](const auto& attribute) { return attribute.first == key; });
        if (!value.empty()) {
            attributes.emplace_back(key, value);
        }
    }

    ModelTag* sub_tag(const std::string& wanted)
    {
        const auto found = std::find_if(sub_tags.begin(), sub_tags.end(),
                                        [&](const ModelTag& tag) { return tag.name == wanted; });
        return found != sub_tags.end() ? &*found : nullptr;
    }

    ModelTag& add(const std::string& new_name)
    {
        return sub_tags.emplace_back(
            ModelTag{.name = new_name, .data = {}, .attributes = {}, .sub_tags = {}});
    }

    void set_data(const std::string& text)
    {
        data = text.empty() ? std::nullopt : std::optional(text);
    }
};

inline std::optional<std::string> optional_text(const char* text)
{
    return text != nullptr ? std::optional<std::string>(text) : std::nullopt;
}

/// Reads a tree through its public fields.
inline ModelTag model_of(const XMLTag& tag)
{
    ModelTag model{optional_text(tag.name), optional_text(tag.data), {}, {}};
    for (const XMLAttr* attribute = tag.attributes; attribute != nullptr;
         attribute = attribute->next) {
        model.attributes.emplace_back(attribute->name, attribute->value);
    }
    for (const XMLTag* child = tag.sub_tags; child != nullptr; child = child->next_sibling) {
        model.sub_tags.push_back(model_of(*child));
    }
    return model;
}

inline ModelTag model_of(const Tree& tree) { return model_of(*tree); }

/// For messages of failed comparisons.
inline void PrintTo(const ModelTag& tag, std::ostream* out)
{
    *out << "(" << tag.name.value_or("?") << " '" << tag.data.value_or("-") << "'";
    for (const auto& [name, value] : tag.attributes) {
        *out << " " << name << "=" << value;
    }
    for (const ModelTag& child : tag.sub_tags) {
        PrintTo(child, out);
    }
    *out << ")";
}

template <size_t N>
const char* one_of(Random& random, const char* const (&texts)[N])
{
    return texts[random.below(N)];
}

/// Some tree of the given depth at most, made by the library's calls. One tag in `nameless_in` has
/// no name; 0: all have one.
inline XMLTag* random_tag(Random& random, uint32_t depth, uint32_t nameless_in = 0)
{
    static constexpr const char* kNames[] = {"A", "B", "AB", "a", "Long_name_42"};
    static constexpr const char* kTexts[] = {
        "x",
        "",
        "a<b",
        "\"quoted\" & 'more'",
        "\xc3\xa4\x01",
        "a text that takes its place in the buffer, so that now and then the buffer has to grow"};
    const bool nameless = nameless_in != 0 && random.below(nameless_in) == 0;
    XMLTag* tag = nameless ? CreateEmptyXMLTag() : CreateXMLTagFromStr(one_of(random, kNames), "");
    EXPECT_NE(nullptr, tag);
    if (random.below(2) == 0) {
        EXPECT_EQ(KZ_OK, SetXMLTagDataFromStr(tag, one_of(random, kTexts)));
    }
    for (uint32_t i = random.below(4); i > 0; --i) {
        EXPECT_EQ(KZ_OK, SetXMLTagAttrFromStr(tag, one_of(random, kNames), one_of(random, kTexts)));
    }
    for (uint32_t i = depth > 0 ? random.below(4) : 0; i > 0; --i) {
        EXPECT_EQ(KZ_OK, AddXMLSubTag(tag, random_tag(random, depth - 1, nameless_in)));
    }
    return tag;
}

inline Tree random_tree(Random& random, uint32_t depth, uint32_t nameless_in = 0)
{
    return Tree(random_tag(random, depth, nameless_in));
}

} // namespace kz::test
