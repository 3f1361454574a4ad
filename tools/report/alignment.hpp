/// @file
/// A clip's codes laid against a track's.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "report/image.hpp"
#include "report/report.hpp"

namespace report {

/// Share of the 64 bits in which the clip's code differs from the track's. Nothing where the track
/// has no code, or one of both is silent.
using ErrorRates = std::vector<std::optional<double>>;

/// For each code of the clip.
ErrorRates error_rates(const Trails& trails);

/// The mean of a stretch of codes; nothing when none of them has a rate.
std::optional<double> mean_of(const ErrorRates& rates, size_t begin, size_t end);

/// Codes as pixels, 64 rows with bit 0 at the bottom, in at most `columns` columns, each of which
/// stands for as many codes as it takes: the ink is the share of ones.
struct CodePixels {
    Pixels track; ///< the part of the track that the clip lies on
    Pixels clip;
    Pixels different; ///< no ink where the track has no code
};

CodePixels code_pixels(const Trails& trails, uint32_t columns);

} // namespace report
