/// @file
/// From sound to what a spectrogram shows.
#pragma once

#include <array>
#include <vector>

#include "report/bands.hpp"
#include "report/image.hpp"
#include "report/report.hpp"

namespace report {

struct Spectrum {
    Pixels pixels;                             ///< the lowest frequency at the bottom
    std::array<double, kDrawnBands> mean = {}; ///< decibels of a band, of its mean power over time
};

/// Levels down to this below the highest are drawn.
inline constexpr double kDrawnRange = 60;

/// Up to `columns` moments, with kRowsOfBand rows for each critical band. No pixels when there are
/// fewer samples than one transform takes.
Spectrum spectrum_of(const Sound& sound, uint32_t columns);

inline constexpr int kRowsOfBand = 12;

} // namespace report
