/// @file
/// The library's stored filters, for models that are to agree to the word.
#pragma once

#include <cstddef>
#include <cstdint>
#include <stdexcept>
#include <vector>

#include "kzsdk/dsp/resampler.h"
#include "whole/model/fingerprint.hpp"
#include "whole/model/resampler.hpp"

namespace kz::model {

struct StoredTaps {
    uint32_t hertz;
    const int16_t* (*msb)();
    const uint16_t* (*lsb)();
    uint32_t (*length)();
};

inline constexpr StoredTaps kStoredTaps[] = {
    {8000, kzdsp_get_8000_11025_fixed_coeff_msb, kzdsp_get_8000_11025_fixed_coeff_lsb,
     kzdsp_get_8000_11025_fixed_coeff_length},
    {16000, kzdsp_get_16000_11025_fixed_coeff_msb, kzdsp_get_16000_11025_fixed_coeff_lsb,
     kzdsp_get_16000_11025_fixed_coeff_length},
    {22050, kzdsp_get_22050_11025_fixed_coeff_msb, kzdsp_get_22050_11025_fixed_coeff_lsb,
     kzdsp_get_22050_11025_fixed_coeff_length},
    {24000, kzdsp_get_24000_11025_fixed_coeff_msb, kzdsp_get_24000_11025_fixed_coeff_lsb,
     kzdsp_get_24000_11025_fixed_coeff_length},
    {32000, kzdsp_get_32000_11025_fixed_coeff_msb, kzdsp_get_32000_11025_fixed_coeff_lsb,
     kzdsp_get_32000_11025_fixed_coeff_length},
    {44100, kzdsp_get_44100_11025_fixed_coeff_msb, kzdsp_get_44100_11025_fixed_coeff_lsb,
     kzdsp_get_44100_11025_fixed_coeff_length},
    {48000, kzdsp_get_48000_11025_fixed_coeff_msb, kzdsp_get_48000_11025_fixed_coeff_lsb,
     kzdsp_get_48000_11025_fixed_coeff_length},
};

/// The taps of a ratio in Q31; none where samples are copied. Halving uses those of 22050 Hz.
inline std::vector<int32_t> library_taps(const Ratio& ratio)
{
    if (ratio.length == 0) {
        return {};
    }
    const uint32_t hertz = ratio.hertz == kHalf.hertz ? 22050 : ratio.hertz;
    for (const StoredTaps& stored : kStoredTaps) {
        if (stored.hertz == hertz) {
            std::vector<int32_t> taps(stored.length());
            for (size_t i = 0; i < taps.size(); ++i) {
                taps[i] = stored.msb()[i] * 65536 + stored.lsb()[i];
            }
            return taps;
        }
    }
    throw std::invalid_argument("no such rate");
}

inline Filters library_filters(const Ratio& ratio)
{
    return {library_taps(ratio), library_taps(kHalf)};
}

} // namespace kz::model
