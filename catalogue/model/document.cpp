/// @file
/// Query documents: the elements, attributes and values that one must have to be compared.
#include "catalogue/model/document.hpp"

#include <algorithm>
#include <charconv>
#include <string>

#include "catalogue/model/small_xml.hpp"

namespace kzcat {

namespace {

constexpr int32_t kWholeShare = 32768;

[[noreturn]] void refuse(const std::string& what) { throw DocumentError("the document " + what); }

// An attribute that a document has with this value and no other.
void expect(const XmlElement& element, std::string_view attribute, std::string_view expected)
{
    const std::string* value = element.attribute(attribute);
    if (value == nullptr || *value != expected) {
        refuse("has " + element.name + " elements whose " + std::string(attribute) + " is not \"" +
               std::string(expected) + "\"");
    }
}

// The algorithm may be missing from a document that was made when memory was short.
void check_algorithm(const XmlElement& root)
{
    const XmlElement* algorithm = root.child("ALGORITHM");
    if (algorithm == nullptr) {
        return;
    }
    const XmlElement* name = algorithm->child("NAME");
    const XmlElement* version = algorithm->child("VERSION");
    if ((name != nullptr && name->text != "Quenvar") ||
        (version != nullptr && version->text != "1.1")) {
        refuse("is of another algorithm than Quenvar 1.1, so its values cannot be compared");
    }
}

// The one block of 30 values.
const XmlElement& find_block(const XmlElement& root)
{
    const XmlElement* blocks = root.child("FP_BLOCKS");
    const XmlElement* block = blocks == nullptr ? nullptr : blocks->child("FP_BLOCK");
    if (block == nullptr) {
        refuse("has no FP_BLOCK element in FP_BLOCKS");
    }
    if (blocks->children.size() != 1) {
        refuse("has more than one fingerprint");
    }
    expect(*block, "TYPE", "SIGNED_INT_16");
    expect(*block, "COUNT", "30");
    expect(*block, "ENCODING", "ASCII");
    expect(*block, "SEPARATOR", " ");
    return *block;
}

// Takes the next number off the text; -1 when there is none.
int32_t take_number(std::string_view& text)
{
    constexpr std::string_view kWhiteSpace = " \t\r\n";
    text.remove_prefix(std::min(text.find_first_not_of(kWhiteSpace), text.size()));
    if (text.empty()) {
        return -1;
    }
    const std::string_view digits = text.substr(0, text.find_first_of(kWhiteSpace));
    int32_t number = -1;
    const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), number);
    if (error != std::errc() || end != digits.data() + digits.size() || number < 0 ||
        number > kWholeShare) {
        refuse("holds \"" + std::string(digits.substr(0, 20)) +
               "\" where a share of 0 to 32768 should be");
    }
    text.remove_prefix(digits.size());
    return number;
}

DocumentValues read_values(std::string_view text)
{
    DocumentValues values{};
    for (int16_t& value : values) {
        const int32_t number = take_number(text);
        if (number < 0) {
            refuse("holds fewer than 30 values");
        }
        value = static_cast<int16_t>(number == kWholeShare ? -kWholeShare : number);
    }
    if (take_number(text) >= 0) {
        refuse("holds more than 30 values");
    }
    return values;
}

} // namespace

DocumentValues read_document(std::string_view text)
{
    if (text.size() > kLongestDocument) {
        refuse("is longer than " + std::to_string(kLongestDocument) + " bytes");
    }
    const XmlElement root = read_small_xml(text);
    if (root.name != "KZFPX_FP_QUERY") {
        refuse("is not a query document: its root is " + root.name + ", not KZFPX_FP_QUERY");
    }
    expect(root, "VERSION", "1.0");
    check_algorithm(root);
    return read_values(find_block(root).text);
}

DocumentValues checked_values(std::span<const int16_t> values)
{
    if (values.size() != kDocumentValueCount) {
        throw DocumentError("there are " + std::to_string(values.size()) +
                            " values where a fingerprint has 30");
    }
    const auto bad = std::find_if(values.begin(), values.end(),
                                  [](int16_t value) { return value < 0 && value != -kWholeShare; });
    if (bad != values.end()) {
        throw DocumentError("the value " + std::to_string(*bad) +
                            " is no share: 0 to 32767, or -32768 for the whole");
    }
    DocumentValues checked{};
    std::copy(values.begin(), values.end(), checked.begin());
    return checked;
}

} // namespace kzcat
