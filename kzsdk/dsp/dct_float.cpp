#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/butterfly.hpp"
#include "kzsdk/dsp/dct.h"
#include "kzsdk/dsp/kernels/kernels.hpp"

namespace {

constexpr int32_t kSmallestOrder = 1;
constexpr int32_t kLargestOrder = 29; // 2^30 factors of four bytes would be 0 in 32 bits

constexpr float kDcScale = 0.70710678F;

void fill_factors(std::span<float> factors) noexcept
{
    for (uint32_t half_width = 1; half_width < factors.size(); half_width *= 2) {
        for (uint32_t j = 0; j < half_width; ++j) {
            factors[half_width + j] = kz::dsp::butterfly_factor(half_width, j);
        }
    }
}

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
    const uint32_t length = 1U << order;
    auto dct = kz::make_record<KZDSP_DCT>();
    auto factors = kz::make_array<float>(length);
    if (!dct || !factors) {
        return nullptr;
    }
    fill_factors({factors.get(), length});
    *dct = {.order = order,
            .length = length,
            .coefficients = factors.release(),
            .owns_coefficients = 1};
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
    kz::dsp::kernels().dct_float(data, dct->coefficients, dct->order);
    if (normalise != 0) {
        scale({data, dct->length}, 2.0F / static_cast<float>(dct->length));
    }
    data[0] *= kDcScale;
}
