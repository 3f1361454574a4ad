#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>
#include <vector>

#include "support/allocation.hpp"
#include "support/float_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

using Samples = std::vector<float>;

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr float kUntouched = -12345.0F;

uint32_t size_of(const Samples& samples) { return static_cast<uint32_t>(samples.size()); }

Samples random_frame(size_t count, uint64_t seed)
{
    Random random(seed);
    Samples frame(count);
    std::generate(frame.begin(), frame.end(),
                  [&] { return static_cast<float>(random.unit() * 32768); });
    return frame;
}

struct Equalised {
    Samples output;
    std::vector<uint32_t> histogram;
};

// The guard counter behind the histogram shows a level that left it.
Equalised one_piece(const Samples& input, uint32_t levels = 256)
{
    Equalised made{Samples(input.size(), kUntouched), std::vector<uint32_t>(levels + 1, 99)};
    EXPECT_EQ(KZ_OK, hist_eq2(input.data(), made.output.data(), size_of(input),
                              made.histogram.data(), levels));
    EXPECT_EQ(99U, made.histogram.back());
    made.histogram.pop_back();
    return made;
}

Samples dual(const Samples& frame, uint32_t levels = 256)
{
    Samples output(frame.size(), kUntouched);
    std::vector<uint32_t> histogram(levels);
    EXPECT_EQ(KZ_OK, hist_eq_dual(frame.data(), size_of(frame), nullptr, 0, output.data(),
                                  size_of(frame), histogram.data(), levels));
    return output;
}

class FloatEqualiser : public MemoryOn {};

} // namespace

TEST_F(FloatEqualiser, ARangeOfOneIsCopiedAndAnythingMoreIsEqualised)
{
    Samples frame(1000, 5.0F);
    frame[10] = 6.0F;
    EXPECT_EQ(frame, dual(frame));
    frame[10] = std::nextafter(6.0F, 7.0F);
    EXPECT_NE(frame, dual(frame));
}

TEST_F(FloatEqualiser, OnePieceHasNoTestForSilence)
{
    const auto made = one_piece({0.0F, 0.25F, 0.5F, 0.25F});
    EXPECT_EQ(1U, made.histogram[0]);
    EXPECT_EQ(2U, made.histogram[127]); // (K - 1) / 2, truncated
    EXPECT_EQ(1U, made.histogram[255]);
    // Shares 1/4, 3/4 and 1; their mean (1/4 + 2 * 3/4 + 1) / 4 = 11/16.
    EXPECT_EQ((Samples{-0.4375F, 0.0625F, 0.3125F, 0.0625F}), made.output);
}

TEST_F(FloatEqualiser, AnInfiniteScaleMakesAConstantFrameLevelZero)
{
    for (const float value : {0.0F, -0.0F, 7.5F, -32768.0F, 999999.0F}) {
        const auto made = one_piece(Samples(64, value));
        EXPECT_EQ(64U, made.histogram[0]) << value;
        EXPECT_EQ(Samples(64, 0.0F), made.output) << value;
    }
}

TEST_F(FloatEqualiser, TheSearchForTheEndsStartsAtAMillion)
{
    // All above: the least stays at 10^6, so the lowest sample is half-way up.
    const auto above = one_piece({1e6F + 0x1p20F, 1e6F + 0x1p21F});
    EXPECT_EQ(1U, above.histogram[127]);
    EXPECT_EQ(1U, above.histogram[255]);
    const auto below = one_piece({-1e6F - 0x1p20F, -1e6F - 0x1p21F});
    EXPECT_EQ(1U, below.histogram[127]);
    EXPECT_EQ(1U, below.histogram[0]);
    // Anywhere else samples beyond are ends like all others.
    const auto across = one_piece({-0x1p22F, 0.0F, 0x1p22F});
    EXPECT_EQ(1U, across.histogram[0]);
    EXPECT_EQ(1U, across.histogram[127]);
    EXPECT_EQ(1U, across.histogram[255]);
}

TEST_F(FloatEqualiser, WhatIsNoNumberIsLevelZero)
{
    const auto made = one_piece({kNaN, 0.0F, 100.0F, -kNaN, 50.0F});
    EXPECT_EQ(3U, made.histogram[0]);
    EXPECT_EQ(1U, made.histogram[255]);
    EXPECT_EQ(made.output[1], made.output[0]);
    const auto nothing_else = one_piece(Samples(10, kNaN));
    EXPECT_EQ(10U, nothing_else.histogram[0]);
    // In two pieces a frame without a range is silent.
    const Samples copied = dual(Samples(10, kNaN));
    EXPECT_TRUE(std::all_of(copied.begin(), copied.end(), [](float v) { return std::isnan(v); }));
}

TEST_F(FloatEqualiser, AnInfiniteRangeStaysInTheTable)
{
    // (x - low) * 0 is 0 for what is finite, and no number for what is not.
    const auto high = one_piece({0.0F, 1.0F, kInfinity});
    EXPECT_EQ(3U, high.histogram[0]);
    const auto low = one_piece({0.0F, 1.0F, -kInfinity});
    EXPECT_EQ(3U, low.histogram[0]);
    // A range that overflows is infinite as well.
    const auto wide = one_piece({-3e38F, 0.0F, 3e38F});
    EXPECT_EQ(3U, wide.histogram[0]);
}

// Levels 0 to K - 1 for every K and any samples: the sanitizers watch, and the guard counter.
TEST_F(FloatEqualiser, NoLevelFallsOutsideForAnySamples)
{
    constexpr float kEdges[] = {kNaN,  kInfinity, -kInfinity, 3.4e38F, -3.4e38F,    1e6F,
                                -1e6F, 0.0F,      1e-45F,     -1e-38F, 16777216.0F, 1.0F};
    std::vector<uint32_t> counts;
    for (uint32_t levels = 1; levels <= 300; ++levels) {
        counts.push_back(levels);
    }
    counts.insert(counts.end(), {1000, 65535, 65536, 1U << 20});
    Random random(1);
    for (const uint32_t levels : counts) {
        for (const uint32_t edges : {0U, 1U, 5U}) {
            Samples frame = random_frame(300, levels);
            for (float& sample : frame) {
                if (random.below(6) < edges) {
                    sample = kEdges[random.below(12)];
                }
            }
            const auto made = one_piece(frame, levels);
            ASSERT_EQ(300U,
                      std::accumulate(made.histogram.begin(), made.histogram.end(), uint64_t{0}));
        }
    }
}

// The scale and the product are rounded, so the greatest sample may come out one level lower; K - 1
// beyond 24 bits is rounded too, and then it would come out one level above the last.
TEST_F(FloatEqualiser, TheGreatestSampleIsOnTheLastLevelOrOneBelow)
{
    Random random(2);
    uint32_t lower = 0;
    for (int round = 0; round < 20000; ++round) {
        const auto high = static_cast<float>(2 + random.unit());
        const uint32_t levels = 3 + random.below(1000);
        const auto made = one_piece({0.0F, high}, levels);
        lower += made.histogram[levels - 2];
        ASSERT_EQ(1U, made.histogram[levels - 2] + made.histogram[levels - 1]);
    }
    EXPECT_GT(lower, 0U);
    constexpr uint32_t kMany = (1U << 24) + 4;
    static_assert(static_cast<float>(kMany - 1) == static_cast<float>(kMany));
    EXPECT_EQ(1U, one_piece({0.0F, 1.0F}, kMany).histogram[kMany - 1]);
}

TEST_F(FloatEqualiser, NoSamplesAreNoWork)
{
    std::vector<uint32_t> histogram(256, 7);
    float output = kUntouched;
    const float input = 1;
    EXPECT_EQ(KZ_OK, hist_eq2(&input, &output, 0, histogram.data(), 256));
    EXPECT_EQ(KZ_OK, hist_eq(&input, &output, 0, 256));
    EXPECT_EQ(KZ_OK, hist_eq_dual(&input, 1, &input, 1, &output, 0, histogram.data(), 256));
    EXPECT_EQ(kUntouched, output);
}

TEST_F(FloatEqualiser, TheFormWithItsOwnCountersGivesTheSame)
{
    for (const uint32_t levels : {1U, 2U, 256U, 4096U}) {
        const Samples frame = random_frame(5000, levels);
        Samples output(frame.size(), kUntouched);
        EXPECT_EQ(KZ_OK, hist_eq(frame.data(), output.data(), 5000, levels));
        EXPECT_EQ(one_piece(frame, levels).output, output);
    }
    Samples output(1, kUntouched);
    EXPECT_EQ(KZ_OK, hist_eq(nullptr, output.data(), 1, 256));
    EXPECT_EQ(KZ_OK, hist_eq(output.data(), nullptr, 1, 256));
    EXPECT_EQ(KZ_OK, hist_eq(output.data(), output.data(), 1, 0));
    EXPECT_EQ(kUntouched, output[0]);
}

TEST_F(FloatEqualiser, TheFormWithItsOwnCountersCopiesOutOfMemory)
{
    const Samples frame = random_frame(100, 3);
    const Samples equalised = one_piece(frame).output;
    for_every_failed_allocation([&](auto fired) {
        Samples output(100, kUntouched);
        EXPECT_EQ(KZ_OK, hist_eq(frame.data(), output.data(), 100, 256));
        EXPECT_EQ(fired() ? frame : equalised, output);
    });
    Samples output(100, kUntouched);
    EXPECT_EQ(KZ_OK, hist_eq(frame.data(), output.data(), 100, 0xFFFFFFFF)); // 17 GB
    EXPECT_EQ(frame, output);
}

} // namespace kz::test
