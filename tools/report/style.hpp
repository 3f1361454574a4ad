/// @file
/// How pages and drawings look.
#pragma once

#include <string>

namespace report {

/// Of a whole page, drawings included.
std::string page_style();

/// Of a drawing that is a file of its own.
std::string drawing_style();

} // namespace report
