/// @file
/// Dot products of single-precision samples and taps, with a stride between the taps.
///
/// Samples are walked backwards from the newest, taps forwards. Every product is rounded and then
/// added, one after another in that order: the order is part of the result.
#include "kzsdk/dsp/convolve.h"

#include "kzsdk/kernels/kernels.hpp"

namespace {

using kz::kernels::add_products;

/// A null array is fine as long as nothing is read from it.
bool missing(const float* samples, uint32_t count) noexcept
{
    return samples == nullptr && count != 0;
}

} // namespace

float KZDSP_Convolve(const float* samples, const float* taps, uint32_t count,
                     uint32_t stride) noexcept
{
    return KZDSP_ConvolveMore(samples, taps, count, stride, 0.0F);
}

float KZDSP_ConvolveSimple(const float* samples, const float* taps, uint32_t count) noexcept
{
    return KZDSP_Convolve(samples, taps, count, 1);
}

float KZDSP_ConvolveMore(const float* samples, const float* taps, uint32_t count, uint32_t stride,
                         float sum) noexcept
{
    if (taps == nullptr || missing(samples, count)) {
        return sum;
    }
    return add_products(sum, samples, taps, count, stride);
}

float KZDSP_DualConvolve(const float* first, uint32_t first_count, const float* second,
                         uint32_t second_count, const float* taps, uint32_t stride) noexcept
{
    if (taps == nullptr || missing(first, first_count) || missing(second, second_count)) {
        return 0.0F;
    }
    const float sum = add_products(0.0F, first, taps, first_count, stride);
    return add_products(sum, second, taps + size_t{first_count} * stride, second_count, stride);
}
