/// @file
/// A comparison as it is printed.
#pragma once

#include <string>

#include "kzfp/compare/comparison.hpp"

namespace kzfp {

/// A pair of files, and what came of comparing them.
struct ComparedPair {
    const std::string& first;
    const std::string& second;
    const Comparison& comparison;
};

/// "b.mp3 and a.mp3: same recording, 98 % of the sound agrees ...".
std::string to_text(const ComparedPair& pair);

/// One object on one line.
std::string to_json(const ComparedPair& pair);

/// The names of the columns of to_csv(), with a line break.
std::string comparison_csv_header();
std::string to_csv(const ComparedPair& pair);

/// The lines of a pair that could not be compared.
std::string failed_json(const std::string& first, const std::string& second,
                        const std::string& error);
std::string failed_csv(const std::string& first, const std::string& second,
                       const std::string& error);

} // namespace kzfp
