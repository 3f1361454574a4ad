#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/butterfly.hpp"
#include "kzsdk/dsp/dct.h"

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

// `stage` counts down from the transform's order; a stage's factors start at its half-width.
void run_stage(std::span<float> x, const float* coefficients, int32_t stage) noexcept
{
    const size_t half = size_t{1} << (stage - 1);
    const float* factors = coefficients + half;
    for (size_t start = 0; start < x.size(); start += 2 * half) {
        for (size_t j = 0; j < half; ++j) {
            float& upper = x[start + j];
            float& lower = x[start + j + half];
            const float a = upper;
            const float b = lower;
            upper = a + b;
            lower = (a - b) * factors[j];
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
    const std::span<float> x(data, dct->length);
    kz::dsp::transform(
        x, dct->order, [&](int32_t stage) { run_stage(x, dct->coefficients, stage); },
        [](float a, float b) { return a + b; });
    if (normalise != 0) {
        scale(x, 2.0F / static_cast<float>(dct->length));
    }
    x[0] *= kDcScale;
}
