/// @file
/// Which name was meant by a mistyped one.
#pragma once

#include <span>
#include <string>
#include <string_view>

namespace kzfp {

/// Letters that are added, dropped, replaced or swapped with their neighbour, at the least, to make
/// one text out of the other (Damerau 1964; the form in which no part is edited twice).
size_t edit_distance(std::string_view a, std::string_view b);

/// The name that is near enough to be meant: at most one letter in three is wrong. Empty when none
/// is.
std::string most_similar(std::string_view word, std::span<const std::string> names);

} // namespace kzfp
