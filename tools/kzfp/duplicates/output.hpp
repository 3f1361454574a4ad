/// @file
/// Groups of duplicates as they are printed.
#pragma once

#include <cstddef>
#include <string>

#include "kzfp/duplicates/finding.hpp"
#include "kzfp/output/style.hpp"

namespace kzfp {

/// A line for each file, under a heading.
std::string to_text(const Finding& finding, size_t number, const Style& style);

/// One object on one line.
std::string to_json(const Finding& finding, size_t number);

/// A line for each file.
std::string to_csv(const Finding& finding, size_t number);

/// The names of what to_csv() gives.
std::string duplicates_csv_header();

/// "2 groups of duplicates: 5 files more than recordings", or that there are none.
std::string summary_text(size_t groups, size_t more, size_t recordings);

} // namespace kzfp
