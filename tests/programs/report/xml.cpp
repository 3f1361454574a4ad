#include "programs/report/xml.hpp"

#include <memory>

#include <expat.h>
#include <gtest/gtest.h>

namespace report::test {

namespace {

struct Reading {
    std::vector<Element> elements;
    std::vector<size_t> open;
};

void begin(void* context, const char* name, const char** attributes)
{
    auto& reading = *static_cast<Reading*>(context);
    Element element = {.name = name, .parent = {}, .attributes = {}, .text = {}};
    if (!reading.open.empty()) {
        element.parent = reading.elements[reading.open.back()].name;
    }
    for (size_t i = 0; attributes[i] != nullptr; i += 2) {
        element.attributes[attributes[i]] = attributes[i + 1];
    }
    reading.open.push_back(reading.elements.size());
    reading.elements.push_back(element);
}

void end(void* context, const char*) { static_cast<Reading*>(context)->open.pop_back(); }

void text(void* context, const char* characters, int count)
{
    auto& reading = *static_cast<Reading*>(context);
    reading.elements[reading.open.back()].text.append(characters, static_cast<size_t>(count));
}

} // namespace

double Element::number(const std::string& attribute) const
{
    const auto found = attributes.find(attribute);
    if (found == attributes.end()) {
        ADD_FAILURE() << name << " has no attribute " << attribute;
        return 0;
    }
    size_t read = 0;
    const double value = std::stod(found->second, &read);
    EXPECT_EQ(found->second.size(), read) << attribute << "=" << found->second;
    return value;
}

std::vector<Element> elements_of(const std::string& page)
{
    const std::unique_ptr<XML_ParserStruct, void (*)(XML_Parser)> parser(XML_ParserCreate("UTF-8"),
                                                                         XML_ParserFree);
    Reading reading;
    XML_SetUserData(parser.get(), &reading);
    XML_SetElementHandler(parser.get(), begin, end);
    XML_SetCharacterDataHandler(parser.get(), text);
    EXPECT_EQ(XML_STATUS_OK,
              XML_Parse(parser.get(), page.data(), static_cast<int>(page.size()), XML_TRUE))
        << XML_ErrorString(XML_GetErrorCode(parser.get())) << " in line "
        << XML_GetCurrentLineNumber(parser.get());
    return reading.elements;
}

std::vector<Element> elements_of(const std::string& page, const std::string& name)
{
    std::vector<Element> all = elements_of(page);
    std::erase_if(all, [&name](const Element& element) { return element.name != name; });
    return all;
}

} // namespace report::test
