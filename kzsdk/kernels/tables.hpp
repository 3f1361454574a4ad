/// @file
/// The coefficient tables that tables/tablegen.cpp writes during the build.
#pragma once

#include <cstdint>
#include <span>

namespace kz::kernels {

/// Butterfly factors of the 32768-point transform: entry h + j is 2^31 / h times
/// butterfly_factor(h, j), truncated. The first half serves the 16384-point transform.
extern const int32_t kDctCoefficients[32768];

/// What fill_dct_factors() writes. The first 2^n serve the floating-point transform of as many
/// points.
extern const float kDctFactors[32768];

/// Writes the factors of the floating-point transform of `factors.size()` points, a power of two.
void fill_dct_factors(std::span<float> factors) noexcept;

/// Prototypes of the floating-point decimators; in Q31 they serve the fixed-point ones. The
/// half-band filter has its centre tap, 0.5, at index 21; the quarter-band filter its own, 0.25, at
/// index 43.
extern const float coefficients_2to1[42];
extern const float coefficients_4to1[84];

/// The prototype that design_windowed_sinc() makes for a ratio, phase by phase: tap k of phase p,
/// which is tap p + k * up of the prototype, is taps[p * taps_per_phase + k].
struct DesignedFilter {
    uint32_t up;
    uint32_t down;
    uint32_t taps_per_phase;
    const float* taps;
};

/// Those of the rates that both fingerprinters accept.
extern const DesignedFilter designed_filters[5];

/// A fixed-point prototype with the taps of each phase side by side, as the inner loops take them:
/// oldest sample first, rows in the order in which outputs use the phases, each row filled up with
/// zeros. Zeros also lie before the first row, at least 8 in each table.
struct PhaseRows {
    uint32_t up;
    uint32_t row_length;       ///< a multiple of 8
    uint32_t used;             ///< taps up to the last one of any row that is not zero
    int32_t largest_high;      ///< the largest magnitude among the high halves
    const uint16_t* row_of;    ///< by phase
    const int32_t* taps;       ///< low half above, high half below
    const int16_t* high_parts; ///< high half, plus 1 where the low half has its top bit
    const int32_t* high_sums;  ///< by row: the sum of the high halves
};

extern const PhaseRows rows_8000;
extern const PhaseRows rows_16000;
extern const PhaseRows rows_22050;
extern const PhaseRows rows_24000;
extern const PhaseRows rows_32000;
extern const PhaseRows rows_44100;
extern const PhaseRows rows_48000;

} // namespace kz::kernels
