#include "kzsdk/dsp/dct.h"

#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/butterfly.hpp"
#include "kzsdk/dsp/fxp_ops.hpp"
#include "kzsdk/dsp/tables.hpp"

namespace {

using namespace kz::fxp;

constexpr int32_t kSmallestOrder = 14;
constexpr int32_t kLargestOrder = 15;

// 2^18 / sqrt(2): the factor of the DC term, a plain average until then, in units of 2^-32.
constexpr int32_t kDcScale = 185363;

struct Pair {
    int32_t sum;
    int32_t product;
};

// The product keeps 32 of its 64 bits, from bit `shift` up.
Pair butterfly(int32_t a, int32_t b, int32_t factor, int32_t shift) noexcept
{
    return {wrap_add(a, b), low_word(smul(wrap_sub(a, b), factor) >> shift)};
}

// The first group of each stage carries the average towards bin 0: it halves its sums, and its
// products keep the factor's 30 fraction bits.
void first_group(std::span<int32_t> group, const int32_t* factors) noexcept
{
    const size_t half = group.size() / 2;
    for (size_t j = 0; j < half; ++j) {
        const Pair pair = butterfly(group[j], group[j + half], factors[j], 30);
        group[j] = pair.sum >> 1;
        group[j + half] = pair.product;
    }
}

void other_group(std::span<int32_t> group, const int32_t* factors, int32_t shift) noexcept
{
    const size_t half = group.size() / 2;
    for (size_t j = 0; j < half; ++j) {
        const Pair pair = butterfly(group[j], group[j + half], factors[j], shift);
        group[j] = pair.sum;
        group[j + half] = pair.product;
    }
}

// `stage` counts down from the transform's order; a stage's factors start at its half-width.
void run_stage(std::span<int32_t> x, const int32_t* coefficients, int32_t stage) noexcept
{
    const size_t width = size_t{1} << stage;
    const int32_t* factors = coefficients + width / 2;
    first_group(x.first(width), factors);
    for (size_t start = width; start < x.size(); start += width) {
        other_group(x.subspan(start, width), factors, 32 - stage);
    }
}

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
            .coefficients = kz::dsp::kDctCoefficients,
            .owns_coefficients = 0};
    return dct.release();
}

void KZDSP_DCT_fixed_destroy(KZDSP_DCT_fixed* dct) noexcept
{
    const kz::owned<KZDSP_DCT_fixed> owned(dct);
}

void KZDSP_DCT_fixed_compute(const KZDSP_DCT_fixed* dct, int32_t* data, int32_t /*mode*/) noexcept
{
    if (dct == nullptr || data == nullptr) {
        return;
    }
    const std::span<int32_t> x(data, dct->length);
    kz::dsp::transform(
        x, dct->order, [&](int32_t stage) { run_stage(x, dct->coefficients, stage); }, wrap_add);
    x[0] = smul_high(x[0], kDcScale);
}
