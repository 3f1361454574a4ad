/// @file
/// A reader of small XML texts in ASCII, such as query documents.
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace kzcat {

/// An element with what it holds.
struct XmlElement {
    std::string name;
    std::vector<std::pair<std::string, std::string>> attributes; ///< in the order of the text
    std::string text; ///< all text directly in the element, without that of its children
    std::vector<XmlElement> children;

    /// Value of an attribute; null when there is none.
    const std::string* attribute(std::string_view wanted) const;

    /// The first child of a name; null when there is none.
    const XmlElement* child(std::string_view wanted) const;
};

/// Elements may be nested this deep.
constexpr int kDeepestElement = 16;

/// Reads a text and returns its root. Takes a subset of XML 1.0 and nothing that is not
/// well-formed: elements, attributes, the five named entities, references to ASCII characters,
/// comments, and a declaration at the start. What is beyond that is refused: document types (and so
/// entities of one's own), processing instructions, CDATA sections, and characters beyond ASCII.
///
/// Throws DocumentError.
XmlElement read_small_xml(std::string_view text);

} // namespace kzcat
