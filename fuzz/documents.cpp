// Query documents: a text that is read as one is well-formed XML to an independent parser, which
// reads the same tree from it; and whatever band energies are stored, the documents of a track can
// be compared.

#include <expat.h>

#include "catalogue/match/documents.hpp"
#include "catalogue/model/small_xml.hpp"
#include "fuzz.hpp"

namespace kz::fuzz {

namespace {

using kzcat::XmlElement;

struct Reading {
    XmlElement top;          // the root is its child
    std::vector<size_t> way; // indexes from the top to the open element

    XmlElement& open()
    {
        XmlElement* element = &top;
        for (const size_t index : way) {
            element = &element->children[index];
        }
        return *element;
    }
};

void XMLCALL on_start(void* context, const XML_Char* name, const XML_Char** attributes)
{
    auto& reading = *static_cast<Reading*>(context);
    XmlElement& parent = reading.open();
    XmlElement element;
    element.name = name;
    for (; *attributes != nullptr; attributes += 2) {
        element.attributes.emplace_back(attributes[0], attributes[1]);
    }
    parent.children.push_back(element);
    reading.way.push_back(parent.children.size() - 1);
}

void XMLCALL on_end(void* context, const XML_Char* /*name*/)
{
    static_cast<Reading*>(context)->way.pop_back();
}

void XMLCALL on_text(void* context, const XML_Char* text, int count)
{
    static_cast<Reading*>(context)->open().text.append(text, static_cast<size_t>(count));
}

XmlElement parsed(const std::string& text)
{
    const std::unique_ptr<XML_ParserStruct, void (*)(XML_Parser)> parser(XML_ParserCreate(nullptr),
                                                                         XML_ParserFree);
    Reading reading;
    XML_SetUserData(parser.get(), &reading);
    XML_SetElementHandler(parser.get(), on_start, on_end);
    XML_SetCharacterDataHandler(parser.get(), on_text);
    const auto status =
        XML_Parse(parser.get(), text.data(), static_cast<int>(text.size()), XML_TRUE);
    EXPECT_EQ(XML_STATUS_OK, status) << XML_ErrorString(XML_GetErrorCode(parser.get())) << text;
    return reading.top.children.at(0);
}

void expect_equal(const XmlElement& expected, const XmlElement& read)
{
    ASSERT_EQ(expected.name, read.name);
    ASSERT_EQ(expected.attributes, read.attributes);
    ASSERT_EQ(expected.text, read.text);
    ASSERT_EQ(expected.children.size(), read.children.size());
    for (size_t i = 0; i < read.children.size(); ++i) {
        expect_equal(expected.children[i], read.children[i]);
    }
}

void check_text(const std::string& text)
{
    try {
        const XmlElement root = kzcat::read_small_xml(text);
        expect_equal(parsed(text), root);
        const kzcat::DocumentValues values = kzcat::read_document(text);
        ASSERT_EQ(values, kzcat::checked_values(values));
    } catch (const kzcat::DocumentError& error) {
        ASSERT_TRUE(std::string_view(error.what()).starts_with("the document ")) << error.what();
    }
}

void check_bands(const std::vector<uint16_t>& bands)
{
    const auto rows = kzcat::document_rows(bands);
    for (size_t first = 0; first < rows.size(); ++first) {
        const kzcat::DocumentValues values = kzcat::document_at(bands, first);
        ASSERT_EQ(values, kzcat::checked_values(values));
        ASSERT_EQ(kzcat::document_row(values), rows[first]);
        kzcat::DocumentSearch search(values);
        search.offer(1, rows);
        ASSERT_LE(search.finish(1).candidates.size(), 1U);
    }
}

} // namespace

void run(Choices& choices)
{
    std::vector<uint16_t> bands(choices.ConsumeIntegralInRange<size_t>(0, 25 * 15));
    for (uint16_t& number : bands) {
        number = choices.ConsumeIntegral<uint16_t>();
    }
    check_bands(bands);
    check_text(choices.ConsumeRemainingBytesAsString());
}

} // namespace kz::fuzz
