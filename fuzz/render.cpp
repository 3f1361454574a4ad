// Rendering: what is written for a tree of well-formed names is well-formed, and an independent
// parser reads the same tree from it.

#include <algorithm>

#include <expat.h>

#include "tags.hpp"

namespace kz::fuzz {

namespace {

/// Bytes that are text in every single-byte encoding, without line breaks, which a parser may
/// change.
std::string printable(std::string text)
{
    std::ranges::replace_if(
        text, [](char c) { return static_cast<unsigned char>(c) < 32 || c == 127; }, '~');
    return text;
}

void grow(Choices& choices, Place at, int depth)
{
    const std::string data = printable(choose_text(choices));
    ASSERT_EQ(KZ_OK, SetXMLTagDataFromStr(at.tag, data.c_str()));
    at.model->set_data(data);
    for (auto count = choices.ConsumeIntegralInRange<int>(0, 3); count > 0; --count) {
        const std::string name = choose_name(choices);
        const std::string value = printable(choose_text(choices));
        ASSERT_EQ(KZ_OK, SetXMLTagAttrFromStr(at.tag, name.c_str(), value.c_str()));
        at.model->set_attribute(name, value);
    }
    const auto sub_tags =
        depth > 0 && choices.remaining_bytes() > 0 ? choices.ConsumeIntegralInRange<int>(0, 3) : 0;
    for (int i = 0; i < sub_tags; ++i) {
        const std::string name = choose_name(choices);
        XMLTag* const tag = test::add(at.tag, name.c_str());
        grow(choices, {tag, &at.model->add(name)}, depth - 1);
    }
}

/// The parser returns UTF-8 for what was declared as Latin-1.
std::string to_bytes(const char* text, size_t count)
{
    std::string bytes;
    for (size_t i = 0; i < count; ++i) {
        auto byte = static_cast<unsigned char>(text[i]);
        if (byte >= 0xc0) {
            byte = static_cast<unsigned char>(byte << 6 | (text[++i] & 0x3f));
        }
        bytes += static_cast<char>(byte);
    }
    return bytes;
}

struct Reading {
    ModelTag top;            ///< the document's root is its sub-tag
    std::vector<size_t> way; ///< indexes from the top to the open tag

    ModelTag& open()
    {
        ModelTag* tag = &top;
        for (const size_t index : way) {
            tag = &tag->sub_tags[index];
        }
        return *tag;
    }
};

void XMLCALL on_start(void* context, const XML_Char* name, const XML_Char** attributes)
{
    auto& reading = *static_cast<Reading*>(context);
    ModelTag& parent = reading.open();
    ModelTag& tag = parent.add(name);
    for (; *attributes != nullptr; attributes += 2) {
        tag.attributes.emplace_back(to_bytes(attributes[0], std::strlen(attributes[0])),
                                    to_bytes(attributes[1], std::strlen(attributes[1])));
    }
    reading.way.push_back(parent.sub_tags.size() - 1);
}

void XMLCALL on_end(void* context, const XML_Char* /*name*/)
{
    static_cast<Reading*>(context)->way.pop_back();
}

void XMLCALL on_text(void* context, const XML_Char* text, int count)
{
    ModelTag& tag = static_cast<Reading*>(context)->open();
    tag.data = tag.data.value_or("") + to_bytes(text, static_cast<size_t>(count));
}

ModelTag parsed(const std::string& text)
{
    const std::unique_ptr<XML_ParserStruct, void (*)(XML_Parser)> parser(
        XML_ParserCreate("ISO-8859-1"), XML_ParserFree);
    Reading reading;
    XML_SetUserData(parser.get(), &reading);
    XML_SetElementHandler(parser.get(), on_start, on_end);
    XML_SetCharacterDataHandler(parser.get(), on_text);
    const auto status =
        XML_Parse(parser.get(), text.data(), static_cast<int>(text.size()), XML_TRUE);
    EXPECT_EQ(XML_STATUS_OK, status) << XML_ErrorString(XML_GetErrorCode(parser.get())) << text;
    return reading.top.sub_tags.at(0);
}

/// Line breaks and indentation are text to a parser.
void drop_layout(ModelTag& tag)
{
    if (tag.data) {
        std::string text;
        bool in_layout = false;
        for (const char c : *tag.data) {
            in_layout = c == '\n' || (in_layout && c == ' ');
            text += in_layout ? "" : std::string(1, c);
        }
        tag.set_data(text);
    }
    for (ModelTag& sub_tag : tag.sub_tags) {
        drop_layout(sub_tag);
    }
}

/// Leading spaces of data cannot be distinguished from indentation.
void drop_leading_spaces(ModelTag& tag)
{
    if (tag.data) {
        const size_t begin = std::min(tag.data->find_first_not_of(' '), tag.data->size());
        tag.set_data(tag.data->substr(begin));
    }
    for (ModelTag& sub_tag : tag.sub_tags) {
        drop_leading_spaces(sub_tag);
    }
}

std::string rendered(const XMLTag* tag, bool header, bool indent, bool newlines)
{
    char* const text = RenderXMLTagToStrEx(tag, header ? 1 : 0, indent ? 1 : 0, newlines ? 1 : 0);
    EXPECT_NE(nullptr, text);
    std::string result = text;
    EXPECT_EQ(KZ_OK, _kzmem_free(text));
    return result;
}

} // namespace

void run(Choices& choices)
{
    const bool header = choices.ConsumeBool();
    const bool indent = choices.ConsumeBool();
    const bool newlines = choices.ConsumeBool();
    const Tree tree = test::make_tag("ROOT");
    ModelTag model = test::model_of(tree);
    grow(choices, {tree.get(), &model}, 5);
    const std::string text = rendered(tree.get(), header, indent, newlines);
    ASSERT_EQ(header, text.starts_with("<?xml version=\"1.0\" encoding=\"UTF-8\" ?>"));
    ModelTag read = parsed(text);
    if (newlines || indent) {
        drop_layout(read);
        drop_leading_spaces(read);
        drop_leading_spaces(model);
    }
    if (indent && !newlines) {
        return; // spaces without lines: well-formed is all that can be said
    }
    ASSERT_EQ(model, read) << text;
}

} // namespace kz::fuzz
