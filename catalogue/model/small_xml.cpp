/// @file
/// A reader of small XML texts. Each function reads what its name says from the current place on
/// and leaves the place behind it; the first fault ends the reading with a sentence that holds its
/// line.
#include "catalogue/model/small_xml.hpp"

#include <algorithm>
#include <charconv>

#include "catalogue/model/document.hpp"

namespace kzcat {

namespace {

constexpr std::string_view kWhiteSpace = " \t\r\n";

bool is_white(char c) { return kWhiteSpace.find(c) != std::string_view::npos; }

bool is_letter(char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_'; }

bool is_name_part(char c) { return is_letter(c) || (c >= '0' && c <= '9') || c == '-' || c == '.'; }

bool is_character(uint32_t c)
{
    return (c >= 32 && c < 128) || c == '\t' || c == '\n' || c == '\r';
}

// Lines end with a line feed, whatever they end with in the text.
std::string with_line_feeds(std::string_view text)
{
    std::string result;
    for (size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '\r') {
            result += text[i];
        } else if (!text.substr(i + 1).starts_with('\n')) {
            result += '\n';
        }
    }
    return result;
}

class Reader {
public:
    explicit Reader(std::string text) : text_(std::move(text)) {}

    XmlElement read()
    {
        skip("\xEF\xBB\xBF"); // a byte order mark
        check_characters();
        read_declaration();
        skip_between_elements();
        if (!skip("<")) {
            fail("has no root element");
        }
        XmlElement root = read_element(1);
        skip_between_elements();
        if (!at_end()) {
            fail("goes on behind its root element");
        }
        return root;
    }

private:
    [[noreturn]] void fail(const std::string& what) const
    {
        const auto line =
            std::count(text_.begin(), text_.begin() + static_cast<ptrdiff_t>(place_), '\n');
        throw DocumentError("the document " + what + " (line " + std::to_string(line + 1) + ")");
    }

    bool at_end() const { return place_ == text_.size(); }
    std::string_view rest() const
    {
        std::string_view text = text_;
        text.remove_prefix(place_);
        return text;
    }

    char next()
    {
        if (at_end()) {
            fail("ends too early");
        }
        return text_[place_++];
    }

    bool skip(std::string_view expected)
    {
        const bool here = rest().starts_with(expected);
        place_ += here ? expected.size() : 0;
        return here;
    }

    bool skip_white_space()
    {
        const size_t before = place_;
        place_ = std::min(text_.find_first_not_of(kWhiteSpace, place_), text_.size());
        return place_ != before;
    }

    void check_characters()
    {
        const auto begin = text_.begin() + static_cast<ptrdiff_t>(place_);
        const auto bad = std::find_if_not(
            begin, text_.end(), [](char c) { return is_character(static_cast<unsigned char>(c)); });
        if (bad != text_.end()) {
            place_ = static_cast<size_t>(bad - text_.begin());
            fail("holds a byte that is not a printable ASCII character");
        }
    }

    // <?xml version="1.0" encoding="UTF-8"?> and nothing else; ASCII is UTF-8.
    void read_declaration()
    {
        if (!rest().starts_with("<?xml") || rest().size() < 6 || !is_white(rest()[5])) {
            return;
        }
        place_ += 5;
        XmlElement declaration;
        read_attributes(declaration);
        const std::string* version = declaration.attribute("version");
        const std::string* encoding = declaration.attribute("encoding");
        const bool known = version != nullptr && *version == "1.0" &&
                           declaration.attributes.front().first == "version" &&
                           declaration.attributes.size() == (encoding == nullptr ? 1U : 2U);
        if (!known || !skip("?>")) {
            fail("has an XML declaration other than version=\"1.0\" encoding=\"UTF-8\"");
        }
        if (encoding != nullptr && *encoding != "UTF-8" && *encoding != "utf-8" &&
            *encoding != "US-ASCII" && *encoding != "us-ascii") {
            fail("declares an encoding other than UTF-8");
        }
    }

    void skip_comment()
    {
        const size_t end = rest().find("--");
        if (end == std::string_view::npos) {
            fail("has a comment without an end");
        }
        place_ += end;
        if (!skip("-->")) {
            fail("has two hyphens inside a comment");
        }
    }

    bool skip_comments()
    {
        if (!skip("<!--")) {
            return false;
        }
        skip_comment();
        return true;
    }

    void skip_between_elements()
    {
        do {
            skip_white_space();
        } while (skip_comments());
    }

    std::string read_name()
    {
        size_t end = place_;
        while (end < text_.size() && is_name_part(text_[end])) {
            ++end;
        }
        std::string name = text_.substr(place_, end - place_);
        if (name.empty() || !is_letter(name.front())) {
            fail("has an element or an attribute without a valid name; document types, processing "
                 "instructions and CDATA sections are not read");
        }
        place_ += name.size();
        return name;
    }

    // Behind the '&'.
    char read_reference()
    {
        const size_t end = std::min(rest().find(';'), size_t{9});
        if (end >= rest().size() || rest()[end] != ';') {
            fail("has an '&' that begins no known reference");
        }
        const std::string_view name = rest().substr(0, end);
        place_ += end + 1;
        constexpr std::pair<std::string_view, char> kEntities[] = {
            {"lt", '<'}, {"gt", '>'}, {"amp", '&'}, {"apos", '\''}, {"quot", '"'}};
        for (const auto& [entity, character] : kEntities) {
            if (name == entity) {
                return character;
            }
        }
        return numbered_character(name);
    }

    char numbered_character(std::string_view name) const
    {
        uint32_t number = 0;
        const bool hexadecimal = name.starts_with("#x");
        const std::string_view digits =
            name.substr(std::min<size_t>(hexadecimal ? 2 : 1, name.size()));
        const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(),
                                                  number, hexadecimal ? 16 : 10);
        if (!name.starts_with('#') || digits.empty() || error != std::errc() ||
            end != digits.data() + digits.size() || !is_character(number)) {
            fail("has a reference to something other than an ASCII character: &" +
                 std::string(name) + ";");
        }
        return static_cast<char>(number);
    }

    // From the white space before the first attribute to what follows the last.
    void read_attributes(XmlElement& element)
    {
        while (skip_white_space() && !at_end() && is_letter(rest().front())) {
            std::string name = read_name();
            skip_white_space();
            if (!skip("=")) {
                fail("has the attribute " + name + " without a value");
            }
            skip_white_space();
            if (element.attribute(name) != nullptr) {
                fail("has the attribute " + name + " twice in one element");
            }
            std::string value = read_value();
            element.attributes.emplace_back(std::move(name), std::move(value));
        }
    }

    std::string read_value()
    {
        const char quote = next();
        if (quote != '"' && quote != '\'') {
            fail("has the value of an attribute without quotes");
        }
        std::string value;
        for (char c = next(); c != quote; c = next()) {
            if (c == '<') {
                fail("has a '<' in the value of an attribute");
            }
            value += c == '&' ? read_reference() : is_white(c) ? ' ' : c;
        }
        return value;
    }

    // Behind the '<' of the start tag.
    XmlElement read_element(int depth)
    {
        if (depth > kDeepestElement) {
            fail("nests its elements too deep");
        }
        XmlElement element;
        element.name = read_name();
        read_attributes(element);
        if (skip("/>")) {
            return element;
        }
        if (!skip(">")) {
            fail("has a start tag of " + element.name + " that is not closed by '>'");
        }
        read_content(element, depth);
        return element;
    }

    // Up to and with the end tag.
    void read_content(XmlElement& element, int depth)
    {
        while (!skip("</")) {
            if (skip("<!--")) {
                skip_comment();
            } else if (skip("<")) {
                element.children.push_back(read_element(depth + 1));
            } else if (rest().starts_with("]]>")) {
                fail("has \"]]>\" in its text");
            } else {
                const char c = next();
                element.text += c == '&' ? read_reference() : c;
            }
        }
        if (read_name() != element.name || (skip_white_space(), !skip(">"))) {
            fail("does not close the element " + element.name);
        }
    }

    std::string text_;
    size_t place_ = 0;
};

} // namespace

const std::string* XmlElement::attribute(std::string_view wanted) const
{
    const auto found = std::find_if(attributes.begin(), attributes.end(),
                                    [wanted](const auto& pair) { return pair.first == wanted; });
    return found == attributes.end() ? nullptr : &found->second;
}

const XmlElement* XmlElement::child(std::string_view wanted) const
{
    const auto found =
        std::find_if(children.begin(), children.end(),
                     [wanted](const XmlElement& element) { return element.name == wanted; });
    return found == children.end() ? nullptr : &*found;
}

XmlElement read_small_xml(std::string_view text) { return Reader(with_line_feeds(text)).read(); }

} // namespace kzcat
