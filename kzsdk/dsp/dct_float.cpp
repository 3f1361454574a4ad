/// @file
/// The floating-point cosine transform, type II, of any power of two of values in place.
///
/// The stages are a kernel; here are the object and the scalings. Factors up to 2^15 points are
/// constants, the first ones of one table; longer transforms compute their own. Unscaled, a tone of
/// amplitude 1 gives L / 2 in its bin.
#include <iterator>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/dct.h"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace {

constexpr int32_t kSmallestOrder = 1;
constexpr int32_t kLargestOrder = 29; // 2^30 factors of four bytes would be 0 in 32 bits

// 1 / sqrt(2).
constexpr float kDcScale = 0.70710678F;

void scale(std::span<float> x, float factor) noexcept
{
    for (float& value : x) {
        value *= factor;
    }
}

} // namespace

KZDSP_DCT* KZDSP_CreateDCT(int32_t order) noexcept
{
    if (order < kSmallestOrder || order > kLargestOrder) {
        return nullptr;
    }
    auto dct = kz::make_record<KZDSP_DCT>();
    if (!dct) {
        return nullptr;
    }
    dct->order = order;
    dct->length = 1U << order;
    if (dct->length <= std::size(kz::kernels::kDctFactors)) {
        dct->coefficients = kz::kernels::kDctFactors;
        return dct.release();
    }
    auto factors = kz::make_array<float>(dct->length);
    if (!factors) {
        return nullptr;
    }
    kz::kernels::fill_dct_factors({factors.get(), dct->length});
    dct->coefficients = factors.release();
    dct->owns_coefficients = 1;
    return dct.release();
}

void KZDSP_DestroyDCT(KZDSP_DCT* dct) noexcept
{
    if (dct != nullptr) {
        const kz::owned<float[]> factors(
            dct->owns_coefficients != 0 ? const_cast<float*>(dct->coefficients) : nullptr);
        const kz::owned<KZDSP_DCT> record(dct);
    }
}

void KZDSP_ComputeDCT(const KZDSP_DCT* dct, float* data, int32_t normalise) noexcept
{
    if (dct == nullptr || data == nullptr) {
        return;
    }
    kz::kernels::active().dct_float(data, dct->coefficients, dct->order);
    if (normalise != 0) {
        scale({data, dct->length}, 2.0F / static_cast<float>(dct->length));
    }
    data[0] *= kDcScale;
}
