/// @file
/// The parts that all pages are made of. Every `content` is HTML already; other texts are escaped
/// here.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "report/report.hpp"

namespace report {

/// <name attributes>content</name>.
std::string element(std::string_view name, std::string_view attributes, std::string_view content);

/// A name of any bytes and any script, kept apart from the direction of the text around it.
std::string name_element(std::string_view name);

std::string to_html(const std::vector<Fact>& facts);

std::string to_html(const Table& table);

/// A table that is folded under a line that says what is in it.
std::string folded(const Table& table);

/// A drawing with its title, an explanation below it, and the same in numbers.
struct Figure {
    std::string title;
    std::string explanation; ///< HTML; may be empty
    std::string drawing;     ///< an <svg> element
    std::string numbers;     ///< HTML; may be empty
};

std::string to_html(const Figure& figure);

/// What else is to be said. Empty text when there is nothing.
std::string notes_list(const std::vector<std::string>& notes);

/// A part of a page under a heading.
std::string section(std::string_view title, const std::string& content);

/// The whole page around its body.
std::string whole_page(const Heading& heading, const std::string& body);

/// A small square in a series' colour with its name. `kind` is the class of the drawing's element.
std::string legend_entry(std::string_view kind, std::string_view name);

} // namespace report
