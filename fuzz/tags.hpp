/// @file
/// Trees that a target builds beside their model.
#pragma once

#include "fuzz.hpp"
#include "library/xml/tree_model.hpp"

namespace kz::fuzz {

using test::ModelTag;
using test::Tree;

/// A tag of the library's tree and the same tag of the model.
struct Place {
    XMLTag* tag;
    ModelTag* model;
};

inline Place choose_place(Choices& choices, Place at)
{
    while (!at.model->sub_tags.empty() && choices.ConsumeBool()) {
        const auto last = static_cast<uint32_t>(at.model->sub_tags.size() - 1);
        const auto index = choices.ConsumeIntegralInRange<uint32_t>(0, last);
        at = {GetXMLSubTag(at.tag, index), &at.model->sub_tags[index]};
    }
    return at;
}

/// Few names, so that they meet again.
inline std::string choose_name(Choices& choices)
{
    static constexpr const char* kNames[] = {"A", "B", "AB", "a", "_9", "Long_name_42"};
    return choices.PickValueInArray(kNames);
}

/// Any bytes.
inline std::string choose_text(Choices& choices) { return choices.ConsumeRandomLengthString(40); }

inline uint32_t count_of(const std::string& text) { return static_cast<uint32_t>(text.size()); }

/// What a stored text reads as: it ends at its first NUL.
inline std::string as_read(const std::string& text) { return text.c_str(); }

} // namespace kz::fuzz
