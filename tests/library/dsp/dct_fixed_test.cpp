#include "kzsdk/dsp/dct.h"

#include <algorithm>
#include <cmath>
#include <memory>
#include <numbers>
#include <numeric>
#include <vector>

#include "kzsdk/dsp/fxp.h"
#include "kzsdk/kernels/butterfly.hpp"
#include "support/allocation.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

struct Destroy {
    void operator()(KZDSP_DCT_fixed* dct) const { KZDSP_DCT_fixed_destroy(dct); }
};
using Dct = std::unique_ptr<KZDSP_DCT_fixed, Destroy>;

using Words = std::vector<int32_t>;

Words transform(int32_t order, Words data)
{
    const Dct dct(KZDSP_DCT_fixed_create(order));
    KZDSP_DCT_fixed_compute(dct.get(), data.data(), 0);
    return data;
}

class DctFixed : public MemoryOn {};

} // namespace

TEST_F(DctFixed, ExistsFor16384And32768PointsOnly)
{
    for (int32_t order = -2; order < 40; ++order) {
        const Dct dct(KZDSP_DCT_fixed_create(order));
        EXPECT_EQ(order == 14 || order == 15, dct != nullptr) << order;
        if (dct) {
            EXPECT_EQ(order, dct->order);
            EXPECT_EQ(1U << order, dct->length);
            EXPECT_EQ(0U, dct->owns_coefficients);
        }
    }
}

TEST_F(DctFixed, ConstantInputLeavesOnlyTheScaledDcTerm)
{
    for (const int32_t order : {14, 15}) {
        for (const int32_t c : {1, -1, 1 << 20, -(1 << 20), 0x3fffffff}) {
            const Words x = transform(order, Words(size_t{1} << order, c));
            EXPECT_EQ(KZDSP_SMUL_HIGH_FxpType(c, 185363), x[0]);
            for (size_t k = 1; k < x.size(); ++k) {
                ASSERT_EQ(0, x[k]) << "bin " << k << " of " << c;
            }
        }
    }
}

TEST_F(DctFixed, AnImpulseBecomesACosine)
{
    for (const int32_t order : {14, 15}) {
        const size_t length = size_t{1} << order;
        Words impulse(length, 0);
        impulse[0] = 1 << 20;
        const Words x = transform(order, impulse);
        for (size_t k = 1; k < length; ++k) {
            const double angle =
                std::numbers::pi * static_cast<double>(k) / (2.0 * static_cast<double>(length));
            const double expected = 4.0 / static_cast<double>(length) * 0x1p20 * std::cos(angle);
            // Products are rounded down and their errors add up: never above, 192 below at most.
            ASSERT_LE(x[k], expected + 1) << "bin " << k;
            ASSERT_GE(x[k], expected - 200) << "bin " << k;
        }
    }
}

// A cosine at the centre of a bin must come out in that bin at 2 times its amplitude.
TEST_F(DctFixed, ACosineComesOutInItsBin)
{
    const size_t length = 16384;
    for (const size_t bin : {100U, 593U, 4096U, 16000U}) {
        Words tone(length);
        for (size_t n = 0; n < length; ++n) {
            const double angle =
                std::numbers::pi * static_cast<double>((2 * n + 1) * bin) / (2.0 * length);
            tone[n] = static_cast<int32_t>(std::lround(65536 * 10 * std::cos(angle)));
        }
        const Words x = transform(14, tone);
        EXPECT_LE(x[bin], 2 * 65536 * 10) << bin;
        EXPECT_GE(x[bin], 2 * 65536 * 10 - 1000) << bin;
        const auto peak = std::max_element(x.begin() + 64, x.end());
        EXPECT_EQ(static_cast<std::ptrdiff_t>(bin), peak - x.begin());
    }
}

TEST_F(DctFixed, TheModeIsIgnored)
{
    Words a(16384);
    Random random(3);
    std::generate(a.begin(), a.end(), [&] { return static_cast<int32_t>(random.next()) >> 16; });
    Words b = a;
    const Dct dct(KZDSP_DCT_fixed_create(14));
    KZDSP_DCT_fixed_compute(dct.get(), a.data(), 0);
    KZDSP_DCT_fixed_compute(dct.get(), b.data(), -7);
    EXPECT_EQ(a, b);
}

TEST_F(DctFixed, NullsDoNothing)
{
    KZDSP_DCT_fixed_destroy(nullptr);
    const Dct dct(KZDSP_DCT_fixed_create(14));
    Words data(16384, 3);
    KZDSP_DCT_fixed_compute(dct.get(), nullptr, 0);
    KZDSP_DCT_fixed_compute(nullptr, data.data(), 0);
    EXPECT_EQ(Words(16384, 3), data);
}

// The table is freed with the transform only when it exists and the transform owns it.
TEST_F(DctFixed, DestroyFreesATableThatItOwns)
{
    const int64_t before = live_blocks();
    auto* dct = KZDSP_DCT_fixed_create(14);
    dct->coefficients = static_cast<const int32_t*>(_kzmem_malloc(16));
    dct->owns_coefficients = 1;
    KZDSP_DCT_fixed_destroy(dct);
    EXPECT_EQ(before, live_blocks());

    dct = KZDSP_DCT_fixed_create(14);
    dct->coefficients = nullptr;
    dct->owns_coefficients = 1;
    KZDSP_DCT_fixed_destroy(dct);
    EXPECT_EQ(before, live_blocks());

    dct = KZDSP_DCT_fixed_create(14);
    void* const table = _kzmem_malloc(16);
    dct->coefficients = static_cast<const int32_t*>(table);
    dct->owns_coefficients = 0;
    KZDSP_DCT_fixed_destroy(dct);
    EXPECT_EQ(before + 1, live_blocks());
    _kzmem_free(table);
}

TEST_F(DctFixed, FailedAllocationsMakeNoTransform)
{
    for_every_failed_allocation([](auto fired) {
        const Dct dct(KZDSP_DCT_fixed_create(14));
        EXPECT_EQ(fired(), dct == nullptr);
    });
}

// Words at the ends of the range wrap; nothing else may happen.
TEST_F(DctFixed, ExtremeInputWraps)
{
    Random random(4);
    Words data(32768);
    std::generate(data.begin(), data.end(),
                  [&] { return random.below(2) == 0 ? INT32_MIN : INT32_MAX; });
    EXPECT_EQ(data.size(), transform(15, data).size());
}

TEST(Butterfly, BitReversalSwapsMirroredIndexes)
{
    for (size_t bits = 0; bits < 8; ++bits) {
        std::vector<int> x(size_t{1} << bits);
        std::iota(x.begin(), x.end(), 0);
        kernels::bit_reverse(std::span(x));
        for (size_t i = 0; i < x.size(); ++i) {
            size_t mirrored = 0;
            for (size_t bit = 0; bit < bits; ++bit) {
                mirrored |= ((i >> bit) & 1) << (bits - 1 - bit);
            }
            EXPECT_EQ(static_cast<int>(mirrored), x[i]);
        }
    }
}

TEST(Butterfly, InputOrderIsEvenForwardsOddBackwards)
{
    for (const size_t length : {4U, 8U, 64U, 16384U}) {
        std::vector<size_t> x(length);
        std::iota(x.begin(), x.end(), size_t{0});
        kernels::reorder_input(std::span(x));
        for (size_t i = 0; i < length / 2; ++i) {
            ASSERT_EQ(2 * i, x[i]);
            ASSERT_EQ(2 * i + 1, x[length - 1 - i]);
        }
    }
}

// The structure that both transforms share, run in long double, is a DCT-II: the twins add only
// their arithmetic.
TEST(Butterfly, TheFrameOfTheTransformIsExactInRealNumbers)
{
    constexpr size_t kLength = 64;
    constexpr int32_t kOrder = 6;
    Random random(5);
    std::vector<long double> input(kLength);
    std::generate(input.begin(), input.end(), [&] { return random.unit(); });
    std::vector<long double> x = input;
    kernels::reorder_input(std::span(x));
    for (size_t width = kLength; width >= 2; width /= 2) {
        const size_t half = width / 2;
        for (size_t start = 0; start < kLength; start += width) {
            for (size_t j = 0; j < half; ++j) {
                const long double a = x[start + j];
                const long double b = x[start + j + half];
                const long double angle = (4.0L * static_cast<long double>(j) + 1) *
                                          std::numbers::pi_v<long double> /
                                          (4.0L * static_cast<long double>(half));
                x[start + j] = a + b;
                x[start + j + half] = (a - b) / (2 * std::cos(angle));
            }
        }
    }
    kernels::bit_reverse(std::span(x));
    kernels::add_recursively(std::span(x), kOrder, [](auto a, auto b) { return a + b; });
    for (size_t k = 0; k < kLength; ++k) {
        long double sum = 0;
        for (size_t n = 0; n < kLength; ++n) {
            sum +=
                input[n] * std::cos(std::numbers::pi_v<long double> *
                                    static_cast<long double>((2 * n + 1) * k) / (2.0L * kLength));
        }
        // The shared structure yields sums in which bin 0 is unscaled and the others are as
        // defined.
        EXPECT_NEAR(static_cast<double>(sum), static_cast<double>(x[k]), 1e-12) << k;
    }
}

} // namespace kz::test
