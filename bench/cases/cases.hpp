/// @file
/// The cases, by what they measure.
#pragma once

#include <vector>

#include "case.hpp"

namespace kz::bench {

std::vector<Case> fingerprint_cases();
std::vector<Case> transform_cases();
std::vector<Case> resampler_cases();
std::vector<Case> frame_cases();
std::vector<Case> converter_cases();
std::vector<Case> detector_cases();
std::vector<Case> document_cases();
std::vector<Case> trail_cases();
std::vector<Case> lookup_document_cases();

} // namespace kz::bench
