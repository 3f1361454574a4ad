// Every variant of the inner loops over a frame gives the bits of the plain one.

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstring>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/model/band_edges.hpp"
#include "catalogue/model/fine_bands.hpp"
#include "catalogue/model/frame_kernels.hpp"
#include "catalogue/model/pair_bands.hpp"
#include "support/signals.hpp"

namespace {

using kz::test::Random;
using kzcat::Extremes;
using kzcat::FrameKernels;
using kzcat::Instructions;
using kzcat::kFineBands;
using kzcat::kFrameLength;

class FrameKernelVariants : public testing::TestWithParam<Instructions> {
protected:
    static const FrameKernels& variant() { return kzcat::frame_kernels(GetParam()); }
    static const FrameKernels& plain() { return kzcat::frame_kernels(Instructions::plain); }
};

std::vector<float> random_numbers(size_t count, float scale, uint64_t seed)
{
    Random random(seed);
    std::vector<float> numbers(count);
    for (float& number : numbers) {
        number = static_cast<float>(random.unit()) * scale;
    }
    return numbers;
}

std::vector<uint8_t> random_levels(uint64_t seed)
{
    Random random(seed);
    std::vector<uint8_t> levels(kFrameLength);
    for (uint8_t& level : levels) {
        level = static_cast<uint8_t>(random.below(256));
    }
    return levels;
}

std::vector<uint32_t> bits(const std::vector<float>& numbers)
{
    std::vector<uint32_t> words(numbers.size());
    std::memcpy(words.data(), numbers.data(), numbers.size() * sizeof numbers[0]);
    return words;
}

TEST_P(FrameKernelVariants, FindTheSameExtremes)
{
    for (size_t place = 0; place < kFrameLength; place += 5) {
        auto frame = random_numbers(kFrameLength, 100, place);
        frame[place] = 1e6F;
        frame[kFrameLength - 1 - place] = -1e6F;
        const Extremes ends = variant().extremes(frame.data());
        EXPECT_EQ(1e6F, ends.high) << place;
        EXPECT_EQ(-1e6F, ends.low) << place;
    }
    const std::vector<float> constant(kFrameLength, 3);
    EXPECT_EQ(3, variant().extremes(constant.data()).low);
    EXPECT_EQ(3, variant().extremes(constant.data()).high);
}

TEST_P(FrameKernelVariants, GiveTheSameLevels)
{
    for (const float scale : {2.0F, 1000.0F, 32768.0F, 1e6F}) {
        const auto frame = random_numbers(kFrameLength, scale, 1);
        const Extremes ends = plain().extremes(frame.data());
        const float steps = 255 / (ends.high - ends.low);
        std::vector<uint8_t> expected(kFrameLength);
        std::vector<uint8_t> actual(kFrameLength);
        // Rounding may raise a level above the highest one: the second scale makes sure of it.
        for (const float factor : {steps, steps * 1.01F}) {
            plain().write_levels(frame.data(), ends.low, factor, expected.data());
            variant().write_levels(frame.data(), ends.low, factor, actual.data());
            EXPECT_EQ(expected, actual) << scale;
            EXPECT_LE(254, *std::max_element(expected.begin(), expected.end()));
            EXPECT_EQ(0, *std::min_element(expected.begin(), expected.end()));
        }
    }
}

TEST_P(FrameKernelVariants, GiveTheSameWindowedRanks)
{
    const auto ranks = random_numbers(256, 0x1p24F, 2);
    const auto levels = random_levels(3);
    std::vector<float> expected(kFrameLength);
    std::vector<float> actual(kFrameLength);
    plain().write_windowed(levels.data(), ranks.data(), expected.data());
    variant().write_windowed(levels.data(), ranks.data(), actual.data());
    EXPECT_EQ(bits(expected), bits(actual));
}

TEST_P(FrameKernelVariants, GiveTheSameEnergies)
{
    for (const float scale : {1e-6F, 1.0F, 1e7F}) {
        const auto bins = random_numbers(kFrameLength, scale, 4);
        std::vector<float> expected(kFineBands);
        std::vector<float> actual(kFineBands);
        plain().band_energies(bins.data(), expected.data());
        variant().band_energies(bins.data(), actual.data());
        EXPECT_EQ(bits(expected), bits(actual)) << scale;
    }
}

TEST_P(FrameKernelVariants, GiveTheSameDifferences)
{
    Random random(5);
    for (int round = 0; round < 500; ++round) {
        std::vector<float> bands(kzcat::kPairFineBands);
        for (float& band : bands) {
            const bool silent = random.below(10) == 0;
            const auto exponent = static_cast<int>(random.below(70)) - 10;
            band = silent ? 0 : std::ldexp(static_cast<float>(random.unit()) + 1.0F, exponent);
        }
        std::vector<float> expected(kzcat::kPairs);
        std::vector<float> actual(kzcat::kPairs);
        plain().pair_differences(bands.data(), expected.data());
        variant().pair_differences(bands.data(), actual.data());
        ASSERT_EQ(bits(expected), bits(actual)) << round;
    }
}

TEST_P(FrameKernelVariants, InterpolateAlike)
{
    const auto samples = random_numbers(200, 1000, 6);
    const auto taps = random_numbers(400, 1, 7);
    for (size_t row = 8; row <= 200; row += 8) {
        for (const float share : {0.0F, 0.3F, 0.9999F}) {
            EXPECT_EQ(plain().interpolated(samples.data(), taps.data(), row, share),
                      variant().interpolated(samples.data(), taps.data(), row, share))
                << row;
        }
    }
}

INSTANTIATE_TEST_SUITE_P(All, FrameKernelVariants,
                         testing::ValuesIn(kzcat::runnable_instructions().begin(),
                                           kzcat::runnable_instructions().end()),
                         [](const auto& variant) { return std::string(name_of(variant.param)); });

} // namespace
