/// @file
/// The constants of the band features. Bins are those of a 16384-point transform, 11025 / 65536 Hz
/// apart; the default bands reach from 0 to 2700 Hz.
#pragma once

#include <array>
#include <cstdint>

namespace kz::qvfixed {

/// Band edges as pairs of first and last bin of the 16384-point transform of a halved frame, both
/// inclusive: floor(f * 65536 / 11025) of the edges in hertz, truncated on purpose.
inline constexpr std::array<int32_t, 30> kFrequencyTable = {
    0,    593,  593,  1188, 1188, 1782, 1782, 2377, 2377,  3031,  3031,  3744,  3744,  4576,  4576,
    5468, 5468, 6419, 6419, 7548, 7548, 8797, 8797, 10223, 10223, 11888, 11888, 13790, 13790, 16049,
};

/// Factors of a band's energy before the square root, Q32: 256 / bins, less a few units. They make
/// the root 8 times the band's root-mean-square coefficient.
inline constexpr std::array<int32_t, 15> kBandWeightsQ32 = {
    1851029675, 1844818166, 1847918701, 1844818166, 1678643705, 1539932251, 1319941929, 1231256021,
    1154949188, 973019139,  879609301,  770505695,  659970964,  577778049,  486509569,
};

/// A run of bins over which the gain changes by the same step from bin to bin.
struct GainSegment {
    uint32_t first_bin;
    uint32_t end_bin; ///< exclusive
    int32_t gain_q30; ///< at the first bin
    int32_t step_q30; ///< per bin
};

/// Gains that make up for the decimator's roll-off in the top band. The last bins of that band,
/// from 15811 on, keep their level.
inline constexpr std::array<GainSegment, 8> kGainRamp = {{
    {13790, 14147, 1073741824, 32483},
    {14147, 14385, 1085338235, 73087},
    {14385, 14622, 1102732853, 140674},
    {14622, 14860, 1136072536, 149219},
    {14860, 15098, 1171586547, 121811},
    {15098, 15336, 1200577576, -194898},
    {15336, 15574, 1154191930, 992760},
    {15574, 15811, 1390468818, 819578},
}};

} // namespace kz::qvfixed
