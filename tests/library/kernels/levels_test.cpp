// Every variant of the loops over a frame - extremes, levels, ramp, squares - against the plain
// one.

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
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
using LevelsOf = void (*)(const Rule& rule, const Sample* samples, uint8_t* levels, uint32_t count,
                          uint32_t* histogram) noexcept;

/// Levels with one beyond the last that must stay untouched, and how often each was counted.
struct Counted {
    std::vector<uint8_t> levels;
    std::vector<uint32_t> histogram;

    bool operator==(const Counted&) const = default;
};

template <class Rule, class Sample>
Counted counted(LevelsOf<Rule, Sample> levels_of, const Rule& rule,
                const std::vector<Sample>& samples, uint32_t count)
{
    Counted made{std::vector<uint8_t>(samples.size() + 1, 99),
                 std::vector<uint32_t>(static_cast<size_t>(rule.top) + 1, 7)};
    levels_of(rule, samples.data(), made.levels.data(), count, made.histogram.data());
    return made;
}

template <class Rule, class Sample>
void expect_levels(LevelsOf<Rule, Sample> actual, LevelsOf<Rule, Sample> plain, const Rule& rule,
                   const std::vector<Sample>& samples)
{
    for (uint32_t count = 0; count <= samples.size(); ++count) {
        const Counted expected = counted(plain, rule, samples, count);
        ASSERT_EQ(expected, counted(actual, rule, samples, count)) << count << " samples";
        auto histogram = expected.histogram;
        std::for_each_n(expected.levels.begin(), count, [&](uint8_t level) { --histogram[level]; });
        ASSERT_EQ(std::vector<uint32_t>(histogram.size(), 7), histogram) << count << " samples";
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

std::vector<uint8_t> noise_of_levels(size_t count)
{
    Random random(8);
    std::vector<uint8_t> levels(count);
    std::generate(levels.begin(), levels.end(),
                  [&] { return static_cast<uint8_t>(random.next() >> 24); });
    return levels;
}

// The levels lie in the first quarter of the words that replace them.
TEST_P(FrameVariants, ReplaceLevelsWhereTheyLie)
{
    const Words values = noise_of(256, 0, 7);
    const std::vector<uint8_t> levels = noise_of_levels(kMax);
    for (uint32_t count = 0; count <= kMax; ++count) {
        Words words(count + 1, 77);
        std::memcpy(words.data(), levels.data(), count);
        const int32_t beyond = words.back();
        variant().replace_levels(values.data(), reinterpret_cast<const uint8_t*>(words.data()),
                                 words.data(), count);
        ASSERT_EQ(beyond, words.back()) << count << " levels";
        for (uint32_t i = 0; i < count; ++i) {
            ASSERT_EQ(values[levels[i]], words[i]) << i << " of " << count;
        }
    }
}

// An equaliser writes levels over the samples that they are made of.
TEST_P(FrameVariants, WriteLevelsOverTheirSamples)
{
    const Words samples = noise_of(kMax, 6, 3);
    const WordLevels rule{*std::ranges::min_element(samples) >> 1, 255 << 22, 21, 255};
    const Counted expected = counted(plain().word_levels, rule, samples, kMax);
    Words words = samples;
    std::vector<uint32_t> histogram(256, 7);
    variant().word_levels(rule, words.data(), reinterpret_cast<uint8_t*>(words.data()), kMax,
                          histogram.data());
    EXPECT_EQ(expected.histogram, histogram);
    EXPECT_EQ(0, std::memcmp(expected.levels.data(), words.data(), kMax));
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
