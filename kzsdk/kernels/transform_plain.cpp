/// @file
/// The cosine transforms without their scalings, butterfly by butterfly. The fixed-point transform
/// takes words of any format and keeps it; its factors have 30 fraction bits over 2^(stage - 2), so
/// the shift of a product depends on the stage.

#include <cstddef>
#include <span>

#include "kzsdk/kernels/butterfly.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/kernels/plain.hpp"
#include "kzsdk/kernels/tables.hpp"

namespace kz::kernels::plain {
namespace {

using namespace fxp;

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

} // namespace

void dct_fixed(int32_t* x, const int32_t* factors, int32_t order) noexcept
{
    const std::span<int32_t> words(x, size_t{1} << order);
    transform(
        words, order, [&](int32_t stage) { run_stage(words, factors, stage); },
        [](int32_t a, int32_t b) noexcept { return wrap_add(a, b); });
}

void dct_float(float* x, const float* factors, int32_t order) noexcept
{
    const std::span<float> values(x, size_t{1} << order);
    transform(
        values, order, [&](int32_t stage) { run_stage(values, factors, stage); },
        [](float a, float b) { return a + b; });
}

} // namespace kz::kernels::plain

namespace kz::kernels {

void fill_dct_factors(std::span<float> factors) noexcept { fill_butterfly_factors(factors); }

} // namespace kz::kernels
