/// @file
/// What surrounds the arithmetic of both equalisers: guards, the table of ranks, silent frames.
///
/// A twin brings
///
///     Sample, Rank                     of the samples, and of the values that replace levels
///     Extremes                         take(samples), is_silent()
///     run(pieces, extremes, output, histogram, ranks)      the histogram comes cleared
#pragma once

#include <algorithm>
#include <cstdint>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/status.h"
#include "kzsdk/qv/frame_pieces.hpp"

namespace kz::qv {

/// Equalises a frame that comes in two pieces. Silent frames are copied; so is every frame when
/// memory is short. The histogram is cleared for a silent frame too, and left alone only when
/// memory is short.
template <class Equaliser, class Sample = typename Equaliser::Sample>
kz_status equalise_two_pieces(const Sample* first, uint32_t first_count, const Sample* second,
                              uint32_t second_count, Sample* output, uint32_t output_length,
                              uint32_t* histogram, uint32_t levels) noexcept
{
    if (output == nullptr || histogram == nullptr || levels == 0) {
        return KZ_OK;
    }
    const auto pieces = cut_to_frame(first, first_count, second, second_count, output_length);
    const auto ranks = make_array<typename Equaliser::Rank>(levels);
    if (!ranks) {
        copy_whole_frame(pieces, second, output, output_length);
        return KZ_OK;
    }
    std::fill_n(histogram, levels, 0U);
    typename Equaliser::Extremes extremes;
    extremes.take(pieces.older);
    extremes.take(pieces.newer);
    if (extremes.is_silent()) {
        copy_whole_frame(pieces, second, output, output_length);
        return KZ_OK;
    }
    Equaliser::run(pieces, extremes, output, std::span(histogram, levels),
                   std::span(ranks.get(), levels));
    return KZ_OK;
}

/// A frame that is equalised in place needs no copy of itself.
template <class Sample>
void copy_unless_in_place(const Sample* input, Sample* output, uint32_t count) noexcept
{
    if (input != output) {
        std::copy_n(input, count, output);
    }
}

/// Equalises a frame in one piece, silent or not, also in place. It is copied when memory is short.
template <class Equaliser, class Sample = typename Equaliser::Sample>
kz_status equalise_one_piece(const Sample* input, Sample* output, uint32_t count,
                             uint32_t* histogram, uint32_t levels) noexcept
{
    if (input == nullptr || output == nullptr || histogram == nullptr || levels == 0) {
        return KZ_OK;
    }
    const FramePieces<Sample> whole{{input, count}, {}};
    const auto ranks = make_array<typename Equaliser::Rank>(levels);
    if (!ranks) {
        copy_unless_in_place(input, output, count);
        return KZ_OK;
    }
    std::fill_n(histogram, levels, 0U);
    typename Equaliser::Extremes extremes;
    extremes.take(whole.older);
    Equaliser::run(whole, extremes, output, std::span(histogram, levels),
                   std::span(ranks.get(), levels));
    return KZ_OK;
}

} // namespace kz::qv
