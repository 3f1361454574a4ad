// Every variant of the loops over a frame - extremes, levels, ramp, squares - against the plain
// one.

#include <algorithm>
#include <bit>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/kernels/kernels.hpp"
#include "support/kernel_variants.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::kernels;
using namespace kz::test;

class FrameVariants : public KernelVariants {};

using Words = std::vector<int32_t>;
using Floats = std::vector<float>;
using FloatLimits = std::numeric_limits<float>;

constexpr auto kLowest = std::numeric_limits<int32_t>::min();
constexpr auto kHighest = std::numeric_limits<int32_t>::max();
constexpr uint32_t kMax = 150;

Words noise_of(size_t count, int shift, uint64_t seed)
{
    Random random(seed);
    Words words(count);
    for (int32_t& x : words) {
        x = static_cast<int32_t>(random.next()) >> shift;
    }
    return words;
}

Words with_extremes(int shift, uint64_t seed)
{
    auto words = noise_of(kMax, shift, seed);
    words[0] = kLowest;
    words[9] = kHighest;
    words[10] = kLowest + 1;
    words[40] = 0;
    words[41] = -1;
    return words;
}

Floats odd_floats(uint64_t seed)
{
    Random random(seed);
    Floats values(kMax);
    for (float& x : values) {
        x = static_cast<float>(random.unit()) * 40000.0F;
    }
    const float odd[] = {FloatLimits::quiet_NaN(),
                         FloatLimits::infinity(),
                         -FloatLimits::infinity(),
                         0.0F,
                         -0.0F,
                         FloatLimits::max(),
                         FloatLimits::lowest(),
                         1e-40F};
    std::copy(std::begin(odd), std::end(odd), values.begin() + 3);
    values[77] = FloatLimits::quiet_NaN();
    return values;
}

TEST_P(FrameVariants, FindTheSameExtremesOfWords)
{
    for (const int shift : {0, 2, 20}) {
        const auto words = noise_of(kMax, shift, 1);
        for (uint32_t count = 0; count <= kMax; ++count) {
            for (const Extremes<int32_t> start :
                 {Extremes<int32_t>{kHighest, kLowest}, Extremes<int32_t>{-5, 5}}) {
                auto expected = start;
                plain().track_word_extremes(expected, words.data(), count);
                auto actual = start;
                variant().track_word_extremes(actual, words.data(), count);
                ASSERT_EQ(expected.low, actual.low);
                ASSERT_EQ(expected.high, actual.high);
            }
        }
    }
}

TEST_P(FrameVariants, FindTheSameFloatExtremesAndPassOverNaN)
{
    const auto values = odd_floats(2);
    for (uint32_t first = 0; first < 12; ++first) {
        for (uint32_t count = 0; count + first <= kMax; ++count) {
            Extremes<float> expected{1e6F, -1e6F};
            plain().track_float_extremes(expected, values.data() + first, count);
            Extremes<float> actual{1e6F, -1e6F};
            variant().track_float_extremes(actual, values.data() + first, count);
            ASSERT_EQ(expected.low, actual.low);
            ASSERT_EQ(expected.high, actual.high);
        }
    }
}

template <class Rule, class Sample>
void expect_levels(void (*actual)(const Rule&, const Sample*, uint8_t*, uint32_t) noexcept,
                   void (*plain)(const Rule&, const Sample*, uint8_t*, uint32_t) noexcept,
                   const Rule& rule, const std::vector<Sample>& samples)
{
    for (uint32_t count = 0; count <= samples.size(); ++count) {
        std::vector<uint8_t> expected(samples.size() + 1, 99);
        auto levels = expected;
        plain(rule, samples.data(), expected.data(), count);
        actual(rule, samples.data(), levels.data(), count);
        ASSERT_EQ(expected, levels) << count << " samples";
    }
}

TEST_P(FrameVariants, GiveWordsTheSameLevels)
{
    for (const int shift : {0, 1, 6, 24}) {
        const auto samples = noise_of(kMax, shift, 3);
        const int32_t lowest = *std::ranges::min_element(samples) >> 1;
        for (const int32_t scale : {0, 1, 255 << 22, 0x55555555, kHighest}) {
            for (const int32_t down : {0, 3, 21, 31}) {
                for (const int32_t top : {0, 1, 200, 255}) {
                    for (const int32_t bottom : {lowest, lowest / 2, 1 << 20}) {
                        expect_levels(variant().word_levels, plain().word_levels,
                                      {bottom, scale, down, top}, samples);
                    }
                }
            }
        }
    }
}

TEST_P(FrameVariants, GiveFloatsTheSameLevels)
{
    const auto samples = odd_floats(4);
    for (const float bottom : {0.0F, -20000.0F, 1e6F}) {
        for (const float scale : {0.0F, 0.003F, 1.0F, 1e30F, FloatLimits::infinity()}) {
            for (const int32_t top : {0, 1, 255}) {
                expect_levels(variant().float_levels, plain().float_levels, {bottom, scale, top},
                              samples);
            }
        }
    }
}

TEST_P(FrameVariants, ApplyTheSameRamp)
{
    for (const int shift : {0, 8, 30}) {
        const auto start = with_extremes(shift, 5);
        for (const int32_t gain : {0, 1, -1, 1 << 30, kHighest, kLowest}) {
            for (const int32_t step : {0, 1, -194898, 992760, kLowest}) {
                for (uint32_t count = 0; count <= kMax; count += 7) {
                    auto expected = start;
                    plain().apply_ramp(expected.data(), count, gain, step);
                    auto actual = start;
                    variant().apply_ramp(actual.data(), count, gain, step);
                    ASSERT_EQ(expected, actual) << count << " words, gain " << gain;
                }
            }
        }
    }
}

TEST_P(FrameVariants, SumTheSameSquares)
{
    for (const int shift : {0, 8, 30}) {
        const auto words = with_extremes(shift, 6);
        for (uint32_t first = 0; first < 12; ++first) {
            for (uint32_t count = 0; count + first <= kMax; ++count) {
                ASSERT_EQ(plain().sum_squares(words.data() + first, count),
                          variant().sum_squares(words.data() + first, count));
            }
        }
    }
}

TEST_P(FrameVariants, SumSquaresModulo64Bits)
{
    const Words lowest(1 << 18, kLowest); // 2^62 / 2^16 each: 2^64 in all
    EXPECT_EQ(0U, variant().sum_squares(lowest.data(), 1U << 18));
    EXPECT_EQ(~uint64_t{0} - (uint64_t{1} << 46) + 1,
              variant().sum_squares(lowest.data(), (1U << 18) - 1));
}

KZ_FOR_KERNEL_VARIANTS(FrameVariants);

} // namespace
