/// @file
/// The page of an evaluation: --report.
#pragma once

#include <string>

#include "kzfp/evaluate/table.hpp"

namespace kzfp::evaluate {

/// The page as HTML.
std::string to_page(const Table& table);

} // namespace kzfp::evaluate
