/// @file
/// Text of any bytes on its way into a page.
#pragma once

#include <string>
#include <string_view>

namespace report {

/// As text or the value of an attribute in XML. What is not UTF-8, what XML forbids, and what turns
/// round the direction of writing becomes U+FFFD; line breaks and tabs become spaces.
std::string escaped(std::string_view text);

/// Not yet escaped: cut with an ellipsis so that it takes at most `width` times the size of its
/// font, as far as that can be known without the font. Nothing is cut between a letter and its
/// accent, nor within an emoji.
std::string shortened(std::string_view text, double width);

/// About how many times the size of its font a text is wide.
double width_of(std::string_view text);

} // namespace report
