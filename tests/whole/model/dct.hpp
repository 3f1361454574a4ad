/// @file
/// The fast cosine transform in its integer steps, and in single precision.
#pragma once

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <numbers>
#include <span>
#include <vector>

#include "whole/model/words.hpp"

namespace kz::model {

inline constexpr int32_t kDcFactor = 185363; ///< of 2^32

/// Factors of all butterflies for 2^order points: entry h + j is 1 / (2 cos((4j + 1) pi / (4h))),
/// rounded to single precision.
inline std::vector<float> float_butterfly_factors(int order)
{
    std::vector<float> factors(size_t{1} << order, 0);
    for (size_t h = 1; h < factors.size(); h *= 2) {
        for (size_t j = 0; j < h; ++j) {
            const double angle =
                static_cast<double>(4 * j + 1) * std::numbers::pi / static_cast<double>(4 * h);
            factors[h + j] = static_cast<float>(1 / (2 * std::cos(angle)));
        }
    }
    return factors;
}

/// The same times 2^31 / h, cut to an integer.
inline std::vector<int32_t> butterfly_factors(int order)
{
    const std::vector<float> exact = float_butterfly_factors(order);
    std::vector<int32_t> factors(exact.size(), 0);
    for (size_t i = 1; i < factors.size(); ++i) {
        const auto half_width = static_cast<double>(std::bit_floor(i));
        factors[i] = static_cast<int32_t>(double{exact[i]} * 0x1p31 / half_width);
    }
    return factors;
}

template <class T>
void bit_reverse(std::span<T> x)
{
    const int bits = std::countr_zero(x.size());
    for (size_t i = 0; i < x.size(); ++i) {
        size_t reversed = 0;
        for (int bit = 0; bit < bits; ++bit) {
            reversed |= (i >> bit & 1) << (bits - 1 - bit);
        }
        if (i < reversed) {
            std::swap(x[i], x[reversed]);
        }
    }
}

/// The structure of both transforms. `stage(number)` runs the butterflies of a stage, `add(a, b)`
/// adds two values.
template <class T, class Stage, class Add>
void cosine_steps(std::span<T> x, Stage stage, Add add)
{
    const size_t half = x.size() / 2;
    bit_reverse(x);
    bit_reverse(x.first(half));
    bit_reverse(x.last(half));
    std::reverse(x.begin() + static_cast<ptrdiff_t>(half), x.end());
    for (int number = std::countr_zero(x.size()); number >= 1; --number) {
        stage(number);
    }
    bit_reverse(x);
    size_t chains = x.size() / 4;
    size_t links = 1;
    for (size_t stride = half; chains > 0; stride /= 2, chains /= 2, links = 2 * links + 1) {
        for (size_t chain = 0; chain < chains; ++chain) {
            size_t at = chains + chain;
            for (size_t link = 0; link < links; ++link, at += stride) {
                x[at] = add(x[at], x[at + stride]);
            }
        }
    }
}

class Dct {
public:
    explicit Dct(int order) : factors_(butterfly_factors(order)) {}

    /// Transforms 2^order words in place.
    void operator()(std::span<int32_t> x) const
    {
        cosine_steps(
            x, [&](int stage) { butterflies(x, stage); },
            [](int32_t a, int32_t b) { return word(int64_t{a} + b); });
        x[0] = high_product(x[0], kDcFactor);
    }

private:
    /// The first group halves its sums; the others do not, and keep more bits of the products.
    void butterflies(std::span<int32_t> x, int stage) const
    {
        const size_t h = size_t{1} << (stage - 1);
        for (size_t start = 0; start < x.size(); start += 2 * h) {
            const int sum_shift = start == 0 ? 1 : 0;
            const int product_shift = start == 0 ? 30 : 32 - stage;
            for (size_t j = 0; j < h; ++j) {
                const int64_t a = x[start + j];
                const int64_t b = x[start + j + h];
                x[start + j] = word(a + b) >> sum_shift;
                x[start + j + h] = word((int64_t{word(a - b)} * factors_[h + j]) >> product_shift);
            }
        }
    }

    std::vector<int32_t> factors_;
};

/// In single precision: nothing is halved or shifted.
class FloatDct {
public:
    explicit FloatDct(int order) : factors_(float_butterfly_factors(order)) {}

    void operator()(std::span<float> x) const
    {
        cosine_steps(
            x, [&](int stage) { butterflies(x, size_t{1} << (stage - 1)); }, std::plus<float>());
        x[0] *= static_cast<float>(1 / std::numbers::sqrt2);
    }

private:
    void butterflies(std::span<float> x, size_t h) const
    {
        for (size_t start = 0; start < x.size(); start += 2 * h) {
            for (size_t upper = start; upper < start + h; ++upper) {
                const float difference = x[upper] - x[upper + h];
                x[upper] += x[upper + h];
                x[upper + h] = difference * factors_[h + upper - start];
            }
        }
    }

    std::vector<float> factors_;
};

} // namespace kz::model
