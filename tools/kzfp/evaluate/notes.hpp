/// @file
/// What is said of a table besides its rows.
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "kzfp/evaluate/table.hpp"

namespace kzfp::evaluate {

/// "1 clip", "2 clips".
std::string plural(size_t count, const char* one, const char* many);

/// "97.5 %"; a dash when there are none.
std::string share_text(size_t hits, size_t count);

/// The interval in per cent: "87 to 99"; empty when there are none.
std::string interval_text(size_t hits, size_t count);

/// "2 tracks in the catalogue, 1 stranger, 0.1 hours of music; seed 1".
std::string introduction(const Table& table);

/// Sentences: how many strangers matched, what the index missed, which kinds were not made and why,
/// which clips were left out.
std::vector<std::string> notes(const Table& table);

} // namespace kzfp::evaluate
