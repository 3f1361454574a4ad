#include "kzsdk/dsp/convolve.h"

#include <bit>
#include <cmath>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

#include "support/signals.hpp"

namespace kz::test {

namespace {

using Floats = std::vector<float>;

Floats random_floats(size_t count, Random& random)
{
    Floats values(count);
    for (float& value : values) {
        value =
            static_cast<float>(std::ldexp(random.unit(), static_cast<int>(random.below(40)) - 20));
    }
    return values;
}

// One sum in the stated order. A product of two floats is exact in double, and a double sum of two
// floats that is then rounded again equals the sum rounded once.
float expected_sum(const Floats& samples, const Floats& taps, size_t stride, float sum = 0)
{
    for (size_t k = 0; k < samples.size(); ++k) {
        const double x = samples[samples.size() - 1 - k];
        const auto product = static_cast<float>(x * taps[k * stride]);
        sum = static_cast<float>(static_cast<double>(sum) + product);
    }
    return sum;
}

uint32_t bits(float x) { return std::bit_cast<uint32_t>(x); }

} // namespace

TEST(Convolve, AddsFloatProductsNewestSampleFirst)
{
    Random random(1);
    for (int round = 0; round < 3000; ++round) {
        const auto count = 1 + random.below(100);
        const auto stride = 1 + random.below(4);
        const Floats samples = random_floats(count, random);
        const Floats taps = random_floats((count - 1) * size_t{stride} + 1, random);
        const float* newest = &samples.back();
        EXPECT_EQ(bits(expected_sum(samples, taps, stride)),
                  bits(KZDSP_Convolve(newest, taps.data(), count, stride)));
        EXPECT_EQ(bits(expected_sum(samples, taps, stride, 3.5F)),
                  bits(KZDSP_ConvolveMore(newest, taps.data(), count, stride, 3.5F)));
        if (stride == 1) {
            EXPECT_EQ(bits(expected_sum(samples, taps, 1)),
                      bits(KZDSP_ConvolveSimple(newest, taps.data(), count)));
        }
    }
}

// 2^24 + 1 rounds back to 2^24: the order decides which of the ones count.
TEST(Convolve, TheOrderOfAdditionsShows)
{
    const Floats ones(4, 1.0F);
    const Floats newest_large = {1, 1, 1, 0x1p24F};
    const Floats oldest_large = {0x1p24F, 1, 1, 1};
    EXPECT_EQ(0x1p24F, KZDSP_ConvolveSimple(&newest_large.back(), ones.data(), 4));
    EXPECT_EQ(0x1p24F + 4, KZDSP_ConvolveSimple(&oldest_large.back(), ones.data(), 4));
    EXPECT_EQ(0x1p24F, KZDSP_ConvolveMore(&ones.back(), ones.data(), 4, 1, 0x1p24F))
        << "each product is added to the initial sum on its own";
}

TEST(Convolve, ProductsAreRoundedBeforeTheyAreAdded)
{
    const float x = 1.0F + 0x1p-12F;
    const Floats samples = {x, 1.0F};
    const Floats taps = {-(1.0F + 0x1p-11F), x};
    EXPECT_EQ(0.0F, KZDSP_ConvolveSimple(&samples.back(), taps.data(), 2));
}

TEST(Convolve, WhereTwoRunsMeetDoesNotShow)
{
    Random random(2);
    const Floats samples = random_floats(60, random);
    const Floats taps = random_floats(180, random);
    for (const uint32_t stride : {1U, 3U}) {
        const float whole = KZDSP_Convolve(&samples.back(), taps.data(), 60, stride);
        for (uint32_t newer = 0; newer <= 60; ++newer) {
            const uint32_t older = 60 - newer;
            const float* oldest_run = older == 0 ? nullptr : samples.data() + older - 1;
            const float* newest_run = newer == 0 ? nullptr : &samples.back();
            EXPECT_EQ(bits(whole), bits(KZDSP_DualConvolve(newest_run, newer, oldest_run, older,
                                                           taps.data(), stride)))
                << newer;
        }
    }
}

TEST(Convolve, EmptyRunsReadNothing)
{
    const float x = std::numeric_limits<float>::quiet_NaN();
    EXPECT_EQ(bits(0.0F), bits(KZDSP_Convolve(&x, &x, 0, 1)));
    EXPECT_EQ(bits(0.0F), bits(KZDSP_ConvolveSimple(nullptr, nullptr, 0)));
    EXPECT_EQ(7.0F, KZDSP_ConvolveMore(nullptr, &x, 0, 5, 7.0F));
    EXPECT_EQ(bits(0.0F), bits(KZDSP_DualConvolve(nullptr, 0, nullptr, 0, &x, 1)));
}

TEST(Convolve, NullsLeaveTheSumAsItBegan)
{
    const float x = 2;
    EXPECT_EQ(0.0F, KZDSP_Convolve(nullptr, &x, 1, 1));
    EXPECT_EQ(0.0F, KZDSP_Convolve(&x, nullptr, 1, 1));
    EXPECT_EQ(0.0F, KZDSP_ConvolveSimple(nullptr, &x, 1));
    EXPECT_EQ(9.0F, KZDSP_ConvolveMore(nullptr, &x, 1, 1, 9.0F));
    EXPECT_EQ(9.0F, KZDSP_ConvolveMore(&x, nullptr, 1, 1, 9.0F));
    EXPECT_EQ(0.0F, KZDSP_DualConvolve(&x, 1, nullptr, 1, &x, 0));
    EXPECT_EQ(0.0F, KZDSP_DualConvolve(nullptr, 1, &x, 1, &x, 0));
    EXPECT_EQ(0.0F, KZDSP_DualConvolve(&x, 1, &x, 1, nullptr, 0));
}

TEST(Convolve, AStrideOfZeroUsesTheFirstTapThroughout)
{
    const Floats samples = {1, 2, 3};
    const float tap = 10;
    EXPECT_EQ(60.0F, KZDSP_Convolve(&samples.back(), &tap, 3, 0));
}

} // namespace kz::test
