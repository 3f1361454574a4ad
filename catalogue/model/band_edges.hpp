/// @file
/// Which bins of a transform make up each fine band, and the window: numbers worked out by the
/// compiler, whose arithmetic is the same for every processor.
#pragma once

#include <cstddef>
#include <cstdint>

#include "catalogue/model/fine_bands.hpp"
#include "catalogue/model/profile.hpp"

namespace kzcat {

/// The bins of one fine band. Bin k covers k - 1/2 to k + 1/2 bins of frequency, and a band takes
/// of its outermost bins the share that lies inside it.
struct BandBins {
    uint32_t first;       ///< the lowest bin of which the band has any part
    uint32_t whole_begin; ///< bins that lie inside as a whole
    uint32_t whole_count;
    uint32_t last;      ///< the highest bin of which the band has any part
    float first_weight; ///< share of the lowest bin
    float last_weight;  ///< share of the highest bin; 0 when that is the lowest
};

/// 2^(1/36) to the powers 0 .. 35.
inline constexpr double kFineSteps[] = {
    1,
    1.0194406437021448,
    1.0392592260318434,
    1.0594630943592953,
    1.0800597388923061,
    1.1010567954531432,
    1.122462048309373,
    1.1442834330597351,
    1.1665290395761165,
    1.189207115002721,
    1.2123260668135445,
    1.2358944659292892,
    1.2599210498948732,
    1.2844147261187115,
    1.3093845751749735,
    1.3348398541700344,
    1.3607900001743769,
    1.3872446337212085,
    1.4142135623730951,
    1.4417067843579314,
    1.4697344922755988,
    1.4983070768766815,
    1.5274351309146432,
    1.5571294530728936,
    1.5874010519681996,
    1.6182611502319231,
    1.6497211886706049,
    1.681792830507429,
    1.7144879657061456,
    1.7478187153790539,
    1.7817974362806785,
    1.8164367253888063,
    1.8517494245745809,
    1.8877486253633871,
    1.9244476737882903,
    1.96186017533783,
};

/// Where fine edge `j`, 160 Hz * 2^(j / 36), lies in a transform: its frequency in bins, plus 1/2.
constexpr double edge_position(int j)
{
    constexpr int kOctave = 36;
    constexpr int kFiveOctaves = 5 * kOctave; // keeps the quotient from rounding towards 0
    const int shifted = j + kFiveOctaves;
    const auto octave = static_cast<uint32_t>(shifted / kOctave);
    const double hertz = 5.0 * (uint32_t{1} << octave) * kFineSteps[shifted % kOctave];
    return hertz * (2.0 * kFrameLength) / kWorkingRate + 0.5;
}

constexpr BandBins bins_between(double low, double high)
{
    const auto first = static_cast<uint32_t>(low);
    const auto last = static_cast<uint32_t>(high);
    if (first == last) {
        return {first, first, 0, first, static_cast<float>(high - low), 0};
    }
    return {first,
            first + 1,
            last - first - 1,
            last,
            static_cast<float>(first + 1 - low),
            static_cast<float>(high - last)};
}

/// An array that can be read without a function: the inner loops must not share any.
struct BandTable {
    BandBins bands[kFineBands];
};

constexpr BandTable make_band_bins()
{
    BandTable table{};
    for (size_t i = 0; i < kFineBands; ++i) {
        const int j = kFirstFineBand + static_cast<int>(i);
        table.bands[i] = bins_between(edge_position(j), edge_position(j + 1));
    }
    return table;
}

inline constexpr BandTable kBandBins = make_band_bins();

} // namespace kzcat
