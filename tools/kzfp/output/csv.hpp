/// @file
/// Comma-separated values (RFC 4180, with a line feed at the end of a line).
#pragma once

#include <span>
#include <string>

namespace kzfp {

/// One line with its line break; fields are quoted where they need it.
std::string csv_line(std::span<const std::string> fields);

} // namespace kzfp
