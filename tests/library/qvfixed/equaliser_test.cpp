#include <algorithm>
#include <cmath>
#include <numeric>
#include <vector>

#include "support/allocation.hpp"
#include "support/fixed_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

using Words = std::vector<int32_t>;

Words equalise_dual(const Words& first, const Words& second, size_t length, uint32_t levels = 256)
{
    Words output(length, -1);
    std::vector<uint32_t> histogram(levels + 1);
    kzqvfixed_hist_eq_dual(first.data(), static_cast<uint32_t>(first.size()), second.data(),
                           static_cast<uint32_t>(second.size()), output.data(),
                           static_cast<uint32_t>(length), histogram.data(), levels);
    return output;
}

Words equalise_one(const Words& input, uint32_t levels = 256)
{
    Words output(input.size(), -1);
    std::vector<uint32_t> histogram(levels + 1);
    kzqvfixed_hist_eq2(input.data(), output.data(), static_cast<uint32_t>(input.size()),
                       histogram.data(), levels);
    return output;
}

Words random_frame(size_t count, int bits, uint64_t seed)
{
    Random random(seed);
    Words frame(count);
    for (int32_t& sample : frame) {
        sample = static_cast<int32_t>(random.next()) >> (32 - bits);
    }
    return frame;
}

class FixedEqualiser : public MemoryOn {};

} // namespace

TEST_F(FixedEqualiser, AHalvedRangeOf8192IsCopiedOneMoreEqualised)
{
    Words frame(1000, 0);
    frame[10] = 2 * 8192;
    EXPECT_EQ(frame, equalise_dual(frame, {}, 1000));
    frame[10] = 2 * 8193;
    EXPECT_NE(frame, equalise_dual(frame, {}, 1000));
}

TEST_F(FixedEqualiser, RanksReplaceLevelsAndSumToZeroOverAFullFrame)
{
    const Words frame = random_frame(32768, 28, 1);
    const Words output = equalise_one(frame);
    int64_t sum = 0;
    for (const int32_t value : output) {
        sum += value;
        ASSERT_LE(std::abs(value), (1 << 29) + (1 << 23));
    }
    EXPECT_EQ(0, sum / 32768);
}

// Levels 0 to K - 1 for every K: nothing may be counted or looked up outside the tables. (The
// sanitizers watch; the histogram's spare counter stays 0.)
TEST_F(FixedEqualiser, NoLevelFallsOutsideForAnyNumberOfLevels)
{
    std::vector<uint32_t> counts;
    for (uint32_t levels = 1; levels <= 300; ++levels) {
        counts.push_back(levels);
    }
    counts.insert(counts.end(), {1000, 4096, 65535, 65536, 100000, 1U << 20});
    for (const uint32_t levels : counts) {
        for (const int bits : {15, 16, 20, 29, 32}) {
            Words frame = random_frame(700, bits, levels);
            frame[3] = bits == 32 ? INT32_MAX : (1 << (bits - 1)) - 1;
            frame[5] = bits == 32 ? INT32_MIN : -(1 << (bits - 1));
            Words output(frame.size());
            std::vector<uint32_t> histogram(levels + 1, 0);
            kzqvfixed_hist_eq2(frame.data(), output.data(), 700, histogram.data(), levels);
            ASSERT_EQ(700U, std::accumulate(histogram.begin(), histogram.end(), 0U));
            ASSERT_EQ(0U, histogram[levels]) << levels;
        }
    }
}

// The levels of the first piece are written over the second before that one is read.
TEST_F(FixedEqualiser, PiecesThatOverlapTheOutputStayInsideTheTables)
{
    constexpr uint32_t kLevels = 16;
    Words words(47);
    for (int32_t i = 0; i < 47; ++i) {
        words[static_cast<size_t>(i)] = (1 << 30) + (i % 2) * (1 << 29) + 1000 * i;
    }
    std::vector<uint32_t> histogram(kLevels);
    kzqvfixed_hist_eq_dual(words.data() + 37, 10, words.data(), 27, words.data(), 37,
                           histogram.data(), kLevels);
    EXPECT_EQ(37U, std::accumulate(histogram.begin(), histogram.end(), 0U));
}

TEST_F(FixedEqualiser, ASpreadOf256LevelsTouchesBothEnds)
{
    Words frame = random_frame(32768, 29, 4);
    std::vector<uint32_t> histogram(257);
    Words output(frame.size());
    kzqvfixed_hist_eq2(frame.data(), output.data(), 32768, histogram.data(), 256);
    EXPECT_GT(histogram[0], 0U);
    EXPECT_GT(histogram[254] + histogram[255], 0U);
    EXPECT_EQ(0U, histogram[256]);
}

// The scale is right where 33 - the leading zeros of K - 1 is 9, and off by powers of two
// elsewhere.
TEST_F(FixedEqualiser, Only129To256LevelsAreSpreadEvenly)
{
    const Words frame = random_frame(32768, 29, 6);
    const auto highest = [&](uint32_t levels, uint32_t& count) {
        std::vector<uint32_t> histogram(levels + 1);
        Words output(frame.size());
        kzqvfixed_hist_eq2(frame.data(), output.data(), 32768, histogram.data(), levels);
        while (histogram[--levels] == 0) {
        }
        count = histogram[levels];
        return levels;
    };
    uint32_t count = 0;
    for (const uint32_t levels : {129U, 200U, 256U}) {
        EXPECT_GE(highest(levels, count), levels - 2);
        EXPECT_LE(count, 2 * 32768 / levels);
    }
    EXPECT_EQ(127U, highest(128, count));
    EXPECT_NEAR(16384, count, 500) << "half of all samples on the last of 128 levels";
    EXPECT_EQ(127U, highest(257, count)) << "half of the levels are not used";
}

TEST_F(FixedEqualiser, AConstantFrameInOnePieceIsAllLevelZero)
{
    for (const int32_t value : {0, 5, -5, INT32_MAX, INT32_MIN}) {
        Words frame(100, value);
        Words output(100);
        std::vector<uint32_t> histogram(257, 9);
        kzqvfixed_hist_eq2(frame.data(), output.data(), 100, histogram.data(), 256);
        EXPECT_EQ(100U, histogram[0]);
        EXPECT_EQ(Words(100, (100 << 15) - 100 * 100), output);
    }
}

} // namespace kz::test
