/// @file
/// Whole attribute lists, for the functions that work on whole tags.
#pragma once

#include "kzsdk/xml/xml.h"

namespace kz::xml {

/// Frees a whole list; null is an empty one.
void dispose_attributes(XMLAttr* first) noexcept;

/// Sets copies of the source's attributes, in order, up to the first that fails. One by one and by
/// the public call: an attribute that reads as empty is not in the copy.
kz_status copy_attributes(XMLTag& destination, const XMLTag& source) noexcept;

} // namespace kz::xml
