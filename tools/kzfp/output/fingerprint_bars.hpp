/// @file
/// A fingerprint for people: numbers, and bars where they are seen.
#pragma once

#include <string>

#include "kzfp/output/json.hpp"

namespace kzfp {

/// The file, its facts and a line for each frequency band; with a time, one line.
std::string human_text(const FingerprintRecord& record);

/// The line of a window that has no fingerprint.
std::string human_failure(const std::string& error, double time);

} // namespace kzfp
