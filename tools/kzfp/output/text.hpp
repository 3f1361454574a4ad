/// @file
/// Results as text for people and for shells. Every text ends with a line break.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "kzfp/disc/content.hpp"
#include "kzfp/disc/labels.hpp"

namespace kzfp {

/// The values of a fingerprint on one line.
std::string to_text(const std::vector<int16_t>& values);

std::string to_text(const DiscContent& content);

/// Control characters in the labels are shown as question marks.
std::string to_text(const DiscLabels& labels);

} // namespace kzfp
