/// @file
/// The elements of a page, read by a parser that accepts nothing but well-formed XML.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace report::test {

struct Element {
    std::string name;
    std::string parent; ///< its name; empty at the root
    std::map<std::string, std::string> attributes;
    std::string text; ///< directly within it

    /// A numeric attribute; fails the test when it is none.
    double number(const std::string& attribute) const;
};

/// All elements in the order of the text. Fails the test when the text is not well-formed.
std::vector<Element> elements_of(const std::string& page);

/// Those of a name.
std::vector<Element> elements_of(const std::string& page, const std::string& name);

} // namespace report::test
