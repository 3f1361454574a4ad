#include <algorithm>
#include <cmath>
#include <map>
#include <numeric>
#include <vector>

#include "support/allocation.hpp"
#include "support/qvfixed_objects.hpp"
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

class Equaliser : public MemoryOn {};

} // namespace

TEST_F(Equaliser, AHalvedRangeOf8192IsCopiedAndOneMoreIsEqualised)
{
    Words frame(1000, 0);
    frame[10] = 2 * 8192;
    EXPECT_EQ(frame, equalise_dual(frame, {}, 1000));
    frame[10] = 2 * 8193;
    EXPECT_NE(frame, equalise_dual(frame, {}, 1000));
}

TEST_F(Equaliser, TwoEquallyFrequentValuesComeOutSymmetric)
{
    Words frame(32768);
    for (size_t i = 0; i < frame.size(); ++i) {
        frame[i] = i % 2 == 0 ? -(1 << 20) : 1 << 20;
    }
    for (const Words& output : {equalise_dual(frame, {}, frame.size()), equalise_one(frame)}) {
        // Ranks 16384 and 32768, less their mean 24576, in units of 1/32768.
        for (size_t i = 0; i < output.size(); ++i) {
            ASSERT_EQ((i % 2 == 0 ? -8192 : 8192) * 32768, output[i]);
        }
    }
}

TEST_F(Equaliser, RanksReplaceLevelsAndSumToZeroOverAFullFrame)
{
    const Words frame = random_frame(32768, 28, 1);
    const Words output = equalise_one(frame);
    int64_t sum = 0;
    for (const int32_t value : output) {
        sum += value;
        ASSERT_LE(std::abs(value), (1 << 29) + (1 << 23));
    }
    EXPECT_EQ(0, sum / 32768);
    // Order is kept: a louder sample never ranks lower.
    std::vector<size_t> order(frame.size());
    std::iota(order.begin(), order.end(), size_t{0});
    std::sort(order.begin(), order.end(), [&](size_t a, size_t b) { return frame[a] < frame[b]; });
    for (size_t i = 1; i < order.size(); ++i) {
        ASSERT_LE(output[order[i - 1]], output[order[i]]);
    }
}

TEST_F(Equaliser, LoudnessDoesNotMatter)
{
    const Words loud = random_frame(32768, 30, 2);
    Words quiet = loud;
    std::transform(quiet.begin(), quiet.end(), quiet.begin(), [](int32_t v) { return v / 64; });
    const Words a = equalise_one(loud);
    const Words b = equalise_one(quiet);
    for (size_t i = 0; i < a.size(); ++i) {
        ASSERT_NEAR(a[i], b[i], 0x1p24); // a level or two at its edge
    }
}

TEST_F(Equaliser, WhereTheRingIsCutDoesNotShow)
{
    const Words frame = random_frame(4096, 29, 3);
    const Words whole = equalise_dual(frame, {}, 4096);
    for (const size_t cut : {0U, 1U, 1000U, 4095U, 4096U}) {
        const Words first(frame.begin(), frame.begin() + static_cast<std::ptrdiff_t>(cut));
        const Words second(frame.begin() + static_cast<std::ptrdiff_t>(cut), frame.end());
        EXPECT_EQ(whole, equalise_dual(first, second, 4096)) << cut;
    }
    EXPECT_EQ(whole, equalise_one(frame));
}

// Levels 0 to K - 1 for every K: nothing may be counted or looked up outside the tables. (The
// sanitizers watch; the histogram's spare counter stays 0.)
TEST_F(Equaliser, NoLevelFallsOutsideForAnyNumberOfLevels)
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

TEST_F(Equaliser, ASpreadOf256LevelsTouchesBothEnds)
{
    Words frame = random_frame(32768, 29, 4);
    std::vector<uint32_t> histogram(257);
    Words output(frame.size());
    kzqvfixed_hist_eq2(frame.data(), output.data(), 32768, histogram.data(), 256);
    EXPECT_GT(histogram[0], 0U);
    EXPECT_GT(histogram[254] + histogram[255], 0U);
    EXPECT_EQ(0U, histogram[256]);
}

TEST_F(Equaliser, AConstantFrameInOnePieceIsAllLevelZero)
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

TEST_F(Equaliser, PiecesAreCutToTheOutput)
{
    const Words first = random_frame(600, 29, 5);
    const Words second = random_frame(600, 29, 6);
    Words joined = first;
    joined.insert(joined.end(), second.begin(), second.end());
    joined.resize(1000);
    EXPECT_EQ(equalise_one(joined), equalise_dual(first, second, 1000));
    const Words cut(first.begin(), first.begin() + 500);
    EXPECT_EQ(equalise_one(cut), equalise_dual(first, second, 500));
}

// The copy of a silent frame takes what is missing from the second piece, whatever its count says.
TEST_F(Equaliser, TheSilentCopyIgnoresTheSecondCount)
{
    const Words first = {1, 2, 3};
    const Words second = {4, 5, 6, 7, 8};
    Words output(8, -1);
    std::vector<uint32_t> histogram(257);
    kzqvfixed_hist_eq_dual(first.data(), 3, second.data(), 1, output.data(), 8, histogram.data(),
                           256);
    EXPECT_EQ((Words{1, 2, 3, 4, 5, 6, 7, 8}), output);
}

TEST_F(Equaliser, ANullPieceCountsAsNone)
{
    const Words frame = random_frame(100, 29, 7);
    std::vector<uint32_t> histogram(257);
    Words output(200, -1);
    kzqvfixed_hist_eq_dual(frame.data(), 100, nullptr, 100, output.data(), 200, histogram.data(),
                           256);
    Words expected = equalise_one(frame);
    expected.resize(200, -1);
    EXPECT_EQ(expected, output);
    output.assign(200, -1);
    kzqvfixed_hist_eq_dual(nullptr, 100, frame.data(), 100, output.data(), 100, histogram.data(),
                           256);
    EXPECT_EQ(expected, output);
    output.assign(200, -1);
    kzqvfixed_hist_eq_dual(nullptr, 1, nullptr, 1, output.data(), 200, histogram.data(), 256);
    EXPECT_EQ(Words(200, -1), output);
}

TEST_F(Equaliser, NoLevelsOrNoRoomDoesNothing)
{
    const Words frame = random_frame(100, 29, 8);
    Words output(100, -1);
    std::vector<uint32_t> histogram(257, 7);
    EXPECT_EQ(KZ_OK, kzqvfixed_hist_eq2(frame.data(), output.data(), 100, histogram.data(), 0));
    EXPECT_EQ(KZ_OK, kzqvfixed_hist_eq2(nullptr, output.data(), 100, histogram.data(), 256));
    EXPECT_EQ(KZ_OK, kzqvfixed_hist_eq2(frame.data(), nullptr, 100, histogram.data(), 256));
    EXPECT_EQ(KZ_OK, kzqvfixed_hist_eq2(frame.data(), output.data(), 100, nullptr, 256));
    EXPECT_EQ(KZ_OK, kzqvfixed_hist_eq_dual(frame.data(), 100, nullptr, 0, output.data(), 100,
                                            histogram.data(), 0));
    EXPECT_EQ(Words(100, -1), output);
}

TEST_F(Equaliser, ShortOfMemoryCopiesAFrame)
{
    const Words frame = random_frame(100, 29, 9);
    {
        const AllocationFault fault(1);
        EXPECT_EQ(frame, equalise_one(frame));
    }
    const Words first(frame.begin(), frame.begin() + 40);
    const Words second(frame.begin() + 40, frame.end());
    const AllocationFault fault(1);
    EXPECT_EQ(frame, equalise_dual(first, second, 100));
}

} // namespace kz::test
