/// @file
/// What --version says.
#pragma once

#include <string>

namespace kzfp {

/// The program, the libraries that it uses and what it reads sound with; without a line break at
/// the end.
std::string versions_text();

} // namespace kzfp
