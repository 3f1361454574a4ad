/// @file
/// The fast cosine transform in its integer steps.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <numbers>
#include <span>
#include <vector>

#include "model/words.hpp"

namespace kz::model {

inline constexpr int32_t kDcFactor = 185363; ///< of 2^32

/// Factors of all butterflies for 2^order points: entry h + j is 1 / (2 cos((4j + 1) pi / (4h))),
/// rounded to single precision, times 2^31 / h, cut to an integer.
inline std::vector<int32_t> butterfly_factors(int order)
{
    std::vector<int32_t> factors(size_t{1} << order, 0);
    for (size_t h = 1; h < factors.size(); h *= 2) {
        for (size_t j = 0; j < h; ++j) {
            const double angle =
                static_cast<double>(4 * j + 1) * std::numbers::pi / static_cast<double>(4 * h);
            const auto factor = static_cast<float>(1 / (2 * std::cos(angle)));
            factors[h + j] = static_cast<int32_t>(double{factor} * 0x1p31 / static_cast<double>(h));
        }
    }
    return factors;
}

inline void bit_reverse(std::span<int32_t> x)
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

class Dct {
public:
    explicit Dct(int order) : order_(order), factors_(butterfly_factors(order)) {}

    /// Transforms 2^order words in place.
    void operator()(std::span<int32_t> x) const
    {
        const size_t half = x.size() / 2;
        bit_reverse(x);
        bit_reverse(x.first(half));
        bit_reverse(x.last(half));
        std::reverse(x.begin() + static_cast<ptrdiff_t>(half), x.end());
        for (int stage = order_; stage >= 1; --stage) {
            butterflies(x, stage);
        }
        bit_reverse(x);
        add_up(x);
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

    static void add_up(std::span<int32_t> x)
    {
        size_t chains = x.size() / 4;
        size_t links = 1;
        for (size_t stride = x.size() / 2; chains > 0;
             stride /= 2, chains /= 2, links = 2 * links + 1) {
            for (size_t chain = 0; chain < chains; ++chain) {
                size_t at = chains + chain;
                for (size_t link = 0; link < links; ++link, at += stride) {
                    x[at] = word(int64_t{x[at]} + x[at + stride]);
                }
            }
        }
    }

    int order_;
    std::vector<int32_t> factors_;
};

} // namespace kz::model
