/// @file
/// The features of all frames to the 30 values: shares of the band means, shares of the spreads.
#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <span>

#include "whole/model/frame.hpp"
#include "whole/model/words.hpp"

namespace kz::model {

using Values = std::array<int16_t, 2 * kBands>;

/// Each value's share of the sum of all, 32768 for the whole; 0 for every one when the sum is
/// small.
inline void store_shares(std::span<const uint32_t, kBands> values,
                         std::span<int16_t, kBands> shares)
{
    int64_t total = 0;
    for (const uint32_t value : values) {
        total += word(value) >> 2;
    }
    const int32_t divisor = word(total) >> 16;
    for (size_t band = 0; band < kBands; ++band) {
        const int32_t quotient = divisor == 0 ? 0 : word(values[band]) / divisor;
        shares[band] = static_cast<int16_t>(quotient >> 3);
    }
}

inline Values condense(std::span<const Features> frames)
{
    const auto count = static_cast<uint32_t>(frames.size());
    const int32_t per_frame = scaled_reciprocal(count);
    std::array<uint32_t, kBands> mean{};
    std::array<int32_t, kBands> mean_amplitude{};
    const auto distance = [&](const Features& frame, size_t band) {
        return word(int64_t{frame.amplitude[band] >> 1} - mean_amplitude[band]);
    };

    uint32_t largest = 0;
    for (size_t band = 0; band < kBands; ++band) {
        int64_t energies = 0;
        int64_t amplitudes = 0;
        for (const Features& frame : frames) {
            energies += frame.energy[band] >> 2;
            amplitudes += word(frame.amplitude[band]) >> 3;
        }
        mean[band] = square_root(unsigned_word(high_product(word(energies), per_frame)));
        mean_amplitude[band] = high_product(word(amplitudes), per_frame);
        for (const Features& frame : frames) {
            largest = std::max(largest, unsigned_word(std::abs(int64_t{distance(frame, band)})));
        }
    }

    // The squares are taken with all the bits that the largest distance leaves free.
    const int free_bits = leading_zeros(largest);
    const int shift = free_bits < 14 ? free_bits - 2 : 11;
    const int32_t per_distance = scaled_reciprocal(count - 1);
    std::array<uint32_t, kBands> spread{};
    for (size_t band = 0; band < kBands; ++band) {
        int64_t squares = 0;
        for (const Features& frame : frames) {
            const int64_t scaled = shifted_left(distance(frame, band), shift);
            const int32_t e = word(std::min<int64_t>(std::abs(scaled), INT32_MAX));
            squares += high_product(e, e);
        }
        spread[band] = square_root(unsigned_word(high_product(word(squares), per_distance)));
    }

    Values values{};
    store_shares(mean, std::span(values).first<kBands>());
    store_shares(spread, std::span(values).last<kBands>());
    return values;
}

} // namespace kz::model
