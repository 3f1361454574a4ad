// Sequences of calls on a tag tree against the same tree in standard containers.

#include "tags.hpp"

namespace kz::fuzz {

namespace {

constexpr size_t kWide = 8; ///< sub-tags, so that clones of clones do not fill the memory

void set_name(Choices& choices, Place at)
{
    const std::string name = choose_name(choices);
    ASSERT_EQ(KZ_OK, SetXMLTagNameFromBuf(at.tag, name.data(), count_of(name)));
    at.model->name = name;
}

void set_data(Choices& choices, Place at)
{
    const std::string data = choose_text(choices);
    ASSERT_EQ(KZ_OK, SetXMLTagDataFromBuf(at.tag, data.data(), count_of(data)));
    at.model->set_data(as_read(data));
}

void set_attribute(Choices& choices, Place at)
{
    const std::string name = choose_name(choices);
    const std::string value = choose_text(choices);
    ASSERT_EQ(KZ_OK, SetXMLTagAttrFromBuf(at.tag, name.data(), count_of(name), value.data(),
                                          count_of(value)));
    at.model->set_attribute(name, value);
    if (!value.empty()) {
        at.model->attributes.back().second = as_read(value);
    }
}

void set_number(Choices& choices, Place at)
{
    const std::string name = choose_name(choices);
    const auto number = choices.ConsumeIntegral<int32_t>();
    if (choices.ConsumeBool()) {
        ASSERT_EQ(KZ_OK, SetXMLTagAttrFromInt(at.tag, name.c_str(), number));
        at.model->set_attribute(name, std::to_string(number));
    } else {
        ASSERT_EQ(KZ_OK,
                  SetXMLTagAttrFromUInt(at.tag, name.c_str(), static_cast<uint32_t>(number)));
        at.model->set_attribute(name, std::to_string(static_cast<uint32_t>(number)));
    }
}

void add_sub_tag(Choices& choices, Place at)
{
    if (at.model->sub_tags.size() >= kWide) {
        return;
    }
    if (one_in(choices, 8)) {
        ASSERT_EQ(KZ_OK, AddXMLSubTag(at.tag, CreateEmptyXMLTag()));
        at.model->sub_tags.emplace_back();
        return;
    }
    const std::string name = choose_name(choices);
    const std::string data = choose_text(choices);
    XMLTag* const tag =
        CreateXMLTagFromBuf(name.data(), count_of(name), data.data(), count_of(data));
    ASSERT_EQ(KZ_OK, AddXMLSubTag(at.tag, tag));
    at.model->add(name).set_data(as_read(data));
}

void remove_sub_tag(Choices& choices, Place at)
{
    if (at.model->sub_tags.empty()) {
        return;
    }
    const auto last = static_cast<uint32_t>(at.model->sub_tags.size() - 1);
    const auto index = choices.ConsumeIntegralInRange<uint32_t>(0, last);
    XMLTag* tag = GetXMLSubTag(at.tag, index);
    const bool dispose = choices.ConsumeBool();
    ASSERT_EQ(KZ_OK, RemoveXMLSubTag(at.tag, tag, dispose ? 1 : 0));
    if (!dispose) {
        ASSERT_EQ(nullptr, GetXMLSiblingTag(tag));
        ASSERT_EQ(KZ_OK, SmartDisposeXMLTag(&tag));
    }
    at.model->sub_tags.erase(at.model->sub_tags.begin() + static_cast<int>(index));
}

/// As a clone has it: without values that are stored empty.
ModelTag cloned(ModelTag model)
{
    std::erase_if(model.attributes, [](const auto& attribute) { return attribute.second.empty(); });
    for (ModelTag& sub_tag : model.sub_tags) {
        sub_tag = cloned(std::move(sub_tag));
    }
    return model;
}

/// Without what the default maps refuse: tags without a name.
void prune_nameless(ModelTag& model)
{
    std::erase_if(model.sub_tags, [](const ModelTag& tag) { return !tag.name; });
    for (ModelTag& sub_tag : model.sub_tags) {
        prune_nameless(sub_tag);
    }
}

void graft_clone(Choices& choices, Place root, Place at)
{
    const Place from = choose_place(choices, root);
    const bool mutated = choices.ConsumeBool();
    const bool deep = choices.ConsumeBool();
    if (mutated && !from.model->name) {
        ASSERT_EQ(nullptr, CloneAndMutateXMLTag(from.tag, deep ? 1 : 0));
        return;
    }
    ModelTag model = cloned(*from.model);
    if (!deep) {
        model.sub_tags.clear();
    }
    if (mutated) {
        prune_nameless(model);
    }
    Tree clone((mutated ? CloneAndMutateXMLTag : CloneXMLTag)(from.tag, deep ? 1 : 0));
    ASSERT_EQ(model, test::model_of(clone));
    ASSERT_EQ(model == *from.model ? 1U : 0U, EqualXMLTags(clone.get(), from.tag));
    if (at.model->sub_tags.size() + model.sub_tags.size() < kWide && clone->sub_tags == nullptr) {
        ASSERT_EQ(KZ_OK, AddXMLSubTag(at.tag, clone.release()));
        at.model->sub_tags.push_back(std::move(model));
    }
}

/// Either may lie below the other.
void copy_over(Choices& choices, Place root, Place at)
{
    const Place from = choose_place(choices, root);
    if (from.tag == at.tag) {
        ASSERT_EQ(KZ_OK, CopyXMLTag(at.tag, from.tag));
        return;
    }
    const ModelTag model = cloned(*from.model);
    if (model.sub_tags.size() <= 2) {
        ASSERT_EQ(KZ_OK, CopyXMLTag(at.tag, from.tag));
        *at.model = model;
    }
}

void expect_same_answers(Choices& choices, Place at)
{
    ASSERT_EQ(at.model->attributes.size(), GetXMLTagAttrCount(at.tag));
    ASSERT_EQ(at.model->sub_tags.size(), GetXMLSubTagCount(at.tag));
    const std::string name = choose_name(choices);
    uint32_t named = 0;
    uintptr_t cursor = KZ_XML_CURSOR_START;
    for (uint32_t i = 0; i < at.model->sub_tags.size(); ++i) {
        if (at.model->sub_tags[i].name == name) {
            ASSERT_EQ(GetXMLSubTag(at.tag, i),
                      GetXMLSubTagFromStrEx(at.tag, name.c_str(), &cursor));
            ++named;
        }
    }
    ASSERT_EQ(nullptr, GetXMLSubTagFromStrEx(at.tag, name.c_str(), &cursor));
    ASSERT_EQ(named, GetXMLNamedSubTagCount(at.tag, name.c_str()));
    const auto& attributes = at.model->attributes;
    for (uint32_t i = 0; i < attributes.size(); ++i) {
        ASSERT_EQ(attributes[i].first, GetXMLTagAttrName(at.tag, i));
        ASSERT_EQ(attributes[i].second, GetXMLTagAttrValue(at.tag, i));
        ASSERT_EQ(attributes[i].second, GetXMLTagAttrFromBuf(at.tag, attributes[i].first.data(),
                                                             count_of(attributes[i].first)));
    }
    const auto beyond = static_cast<uint32_t>(attributes.size());
    ASSERT_EQ(nullptr, GetXMLTagAttrName(at.tag, beyond));
}

void call(Choices& choices, Place root)
{
    const Place at = choose_place(choices, root);
    switch (choices.ConsumeIntegralInRange<int>(0, 8)) {
    case 0:
        return set_name(choices, at);
    case 1:
        return set_data(choices, at);
    case 2:
        return set_attribute(choices, at);
    case 3:
        return set_number(choices, at);
    case 4:
        return remove_sub_tag(choices, at);
    case 5:
        return graft_clone(choices, root, at);
    case 6:
        return copy_over(choices, root, at);
    case 7:
        return expect_same_answers(choices, at);
    default:
        return add_sub_tag(choices, at);
    }
}

} // namespace

void run(Choices& choices)
{
    const Tree tree = test::make_tag("ROOT");
    ModelTag model = test::model_of(tree);
    const Place root{tree.get(), &model};
    for (int calls = 0; calls < 100 && choices.remaining_bytes() > 0; ++calls) {
        call(choices, root);
    }
    ASSERT_EQ(model, test::model_of(tree));
}

} // namespace kz::fuzz
