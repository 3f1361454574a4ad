/// @file
/// The fixed-point cosine transform, type II, of 16384 or 32768 words in place.
///
/// The stages are a kernel; here are the object and the last scaling. Factors are Q30 words,
/// divided by the powers of two that the shifts of the stages undo. The first group of each stage
/// halves its sums, so word 0 ends up as the average of the input before it is scaled.
#include "kzsdk/dsp/dct.h"

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace {

constexpr int32_t kSmallestOrder = 14;
constexpr int32_t kLargestOrder = 15;

// 2^18 / sqrt(2), truncated: the factor of the average in word 0. That is 4.3e-5, so next to
// nothing is left of it; the lowest band of every fingerprint depends on exactly this.
constexpr int32_t kDcScaleQ32 = 185363;

} // namespace

KZDSP_DCT_fixed* KZDSP_DCT_fixed_create(int32_t order) noexcept
{
    if (order < kSmallestOrder || order > kLargestOrder) {
        return nullptr;
    }
    auto dct = kz::make_record<KZDSP_DCT_fixed>();
    if (!dct) {
        return nullptr;
    }
    // The factors of a shorter transform are the first ones of a longer transform.
    *dct = {.order = order,
            .length = 1U << order,
            .coefficients = kz::kernels::kDctCoefficients,
            .owns_coefficients = 0};
    return dct.release();
}

void KZDSP_DCT_fixed_destroy(KZDSP_DCT_fixed* dct) noexcept
{
    if (dct != nullptr) {
        const kz::owned<int32_t[]> coefficients(
            dct->owns_coefficients != 0 ? const_cast<int32_t*>(dct->coefficients) : nullptr);
        const kz::owned<KZDSP_DCT_fixed> record(dct);
    }
}

void KZDSP_DCT_fixed_compute(const KZDSP_DCT_fixed* dct, int32_t* data, int32_t /*mode*/) noexcept
{
    if (dct == nullptr || data == nullptr) {
        return;
    }
    kz::kernels::active().dct_fixed(data, dct->coefficients, dct->order);
    data[0] = kz::fxp::smul_high(data[0], kDcScaleQ32);
}
