// Every variant of the loops of the signal search against the plain ones.

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

class MovingMeansVariants : public KernelVariants {};

constexpr auto kLowest = std::numeric_limits<int32_t>::min();
constexpr auto kHighest = std::numeric_limits<int32_t>::max();

std::vector<int32_t> words(size_t count, int shift, uint64_t seed)
{
    Random random(seed);
    std::vector<int32_t> values(count);
    for (int32_t& x : values) {
        x = static_cast<int32_t>(random.next()) >> shift;
    }
    return values;
}

TEST_P(MovingMeansVariants, ShiftTowardsZeroAlike)
{
    auto input = words(77, 0, 1);
    input[3] = kLowest;
    input[4] = kHighest;
    input[5] = -1;
    input[6] = 0;
    for (uint32_t count = 0; count <= 77; ++count) {
        for (const int32_t shift : {0, 1, 13, 30, 31}) {
            std::vector<int32_t> expected(78, 5);
            auto actual = expected;
            plain().shift_towards_zero(input.data(), expected.data(), count, shift);
            variant().shift_towards_zero(input.data(), actual.data(), count, shift);
            ASSERT_EQ(actual, expected) << count << " words, shift " << shift;
        }
    }
}

TEST_P(MovingMeansVariants, TruncateAlikeBeyondTheRangeAndWhatIsNoNumber)
{
    using Limits = std::numeric_limits<float>;
    const std::vector<float> input = {0.0F,
                                      -0.0F,
                                      0.9F,
                                      -0.9F,
                                      1.5F,
                                      -1.5F,
                                      0x1.fffffep30F,
                                      0x1p31F,
                                      0x1.000002p31F,
                                      -0x1p31F,
                                      -0x1.000002p31F,
                                      1e30F,
                                      -1e30F,
                                      Limits::max(),
                                      Limits::lowest(),
                                      Limits::infinity(),
                                      -Limits::infinity(),
                                      Limits::quiet_NaN(),
                                      -Limits::quiet_NaN(),
                                      Limits::denorm_min(),
                                      16777217.0F};
    for (uint32_t count = 0; count <= input.size(); ++count) {
        std::vector<int32_t> expected(input.size() + 1, 5);
        auto actual = expected;
        plain().truncate(input.data(), expected.data(), count);
        variant().truncate(input.data(), actual.data(), count);
        ASSERT_EQ(actual, expected) << count << " values";
    }
}

// The means with their rings.
struct State {
    std::vector<int32_t> levels;
    std::vector<int32_t> deviations;
    MovingMeans means{};

    uint32_t pass(const Variant& kernels, const std::vector<int32_t>& samples, uint32_t count)
    {
        means.levels = levels.data();
        means.deviations = deviations.data();
        return kernels.pass_quiet(means, samples.data(), count);
    }

    auto sums() const { return std::pair(means.level_sum, means.deviation_sum); }
};

// After as many samples, a variant's state must equal the plain loop's; it may stop before the
// plain loop does, but by less than a vector.
void expect_alike(const Variant& variant, const Variant& plain, const State& start,
                  const std::vector<int32_t>& samples)
{
    constexpr uint32_t kWidest = 8;
    for (uint32_t count = 0; count <= samples.size(); ++count) {
        State furthest = start;
        const uint32_t most = furthest.pass(plain, samples, count);
        State actual = start;
        const uint32_t taken = actual.pass(variant, samples, count);
        ASSERT_LE(taken, most);
        ASSERT_LT(most - taken, kWidest);
        State expected = start;
        ASSERT_EQ(expected.pass(plain, samples, taken), taken);
        ASSERT_EQ(actual.levels, expected.levels);
        ASSERT_EQ(actual.deviations, expected.deviations);
        ASSERT_EQ(actual.sums(), expected.sums());
    }
}

TEST_P(MovingMeansVariants, PassQuietSamplesAlike)
{
    for (const int shift : {0, 4, 16, 24, 28}) {
        for (const int32_t log2 : {0, 1, 5, 7}) {
            for (const int32_t most : {0, 1000, kHighest, -3, kLowest}) {
                for (const uint32_t limit : {0U, 1U, 12928U, 0x7fffffffU, 0x80000000U}) {
                    State start{words(64, shift, 2), words(64, 20, 3), {}};
                    start.means = {.levels = nullptr,
                                   .deviations = nullptr,
                                   .level_sum = start.levels[0],
                                   .deviation_sum = 100,
                                   .window_log2 = log2,
                                   .max_deviation = most,
                                   .limit = limit};
                    expect_alike(variant(), plain(), start, words(64, shift, 4));
                }
            }
        }
    }
}

TEST_P(MovingMeansVariants, StopBeforeTheFirstSampleThatIsNotQuiet)
{
    std::vector<int32_t> samples(64, 0);
    samples[37] = 5000;
    State start{std::vector<int32_t>(64, 0), std::vector<int32_t>(64, 0), {}};
    start.means.window_log2 = 6;
    start.means.max_deviation = 1000;
    start.means.limit = 1000;
    const uint32_t taken = start.pass(variant(), samples, 64);
    EXPECT_LE(taken, 37U);
    EXPECT_GT(taken, 37U - 8U);
}

KZ_FOR_KERNEL_VARIANTS(MovingMeansVariants);

} // namespace
