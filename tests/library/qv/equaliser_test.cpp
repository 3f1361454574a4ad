/// The rules of the histogram equalisers, for both twins. Samples are given as 16-bit values; ranks
/// are returned as fractions of the frame's samples.

#include <algorithm>
#include <numeric>
#include <vector>

#include "support/signals.hpp"
#include "support/twins.hpp"

namespace kz::test {

namespace {

using Values = std::vector<int32_t>;

Values random_frame(size_t count, uint64_t seed)
{
    Random random(seed);
    Values frame(count);
    for (int32_t& sample : frame) {
        sample = static_cast<int32_t>(random.next()) >> 16;
    }
    return frame;
}

Values slice(const Values& values, size_t from, size_t to)
{
    return {values.begin() + static_cast<std::ptrdiff_t>(from),
            values.begin() + static_cast<std::ptrdiff_t>(to)};
}

} // namespace

template <class Twin>
class Equaliser : public TwinTest<Twin> {
protected:
    using Sample = typename Twin::Sample;
    using Samples = std::vector<Sample>;

    static constexpr Sample kUntouched = -12345;

    static Samples samples(const Values& values)
    {
        Samples made(values.size());
        std::transform(values.begin(), values.end(), made.begin(), Twin::from_16_bits);
        return made;
    }

    static Samples dual(const Samples& first, const Samples& second, size_t length,
                        uint32_t levels = 256)
    {
        Samples output(length, kUntouched);
        std::vector<uint32_t> histogram(levels + Twin::kSpareCounters);
        EXPECT_EQ(KZ_OK, Twin::hist_eq_dual(first.data(), static_cast<uint32_t>(first.size()),
                                            second.data(), static_cast<uint32_t>(second.size()),
                                            output.data(), static_cast<uint32_t>(length),
                                            histogram.data(), levels));
        return output;
    }

    static Samples one(const Samples& input, uint32_t levels = 256)
    {
        Samples output(input.size(), kUntouched);
        std::vector<uint32_t> histogram(levels + Twin::kSpareCounters);
        EXPECT_EQ(KZ_OK,
                  Twin::hist_eq2(input.data(), output.data(), static_cast<uint32_t>(input.size()),
                                 histogram.data(), levels));
        return output;
    }
};
TYPED_TEST_SUITE(Equaliser, Twins, TwinNames);

TYPED_TEST(Equaliser, TwoEquallyFrequentValuesComeOutSymmetric)
{
    Values values(32768);
    for (size_t i = 0; i < values.size(); ++i) {
        values[i] = i % 2 == 0 ? -64 : 64;
    }
    const auto frame = this->samples(values);
    for (const auto& output : {this->dual(frame, {}, frame.size()), this->one(frame)}) {
        // The lower half of the samples ranks 1/2, the upper 1, less their mean 3/4.
        for (size_t i = 0; i < output.size(); ++i) {
            ASSERT_EQ((i % 2 == 0 ? -0.25 : 0.25) * TypeParam::kRankScale, output[i]);
        }
    }
}

TYPED_TEST(Equaliser, RanksKeepTheOrderOfTheSamplesAndAverageToZero)
{
    const Values values = random_frame(32768, 1);
    const auto output = this->one(this->samples(values));
    const double sum = std::accumulate(output.begin(), output.end(), 0.0);
    EXPECT_NEAR(0, sum / 32768 / TypeParam::kRankScale, 1e-5);
    std::vector<size_t> order(values.size());
    std::iota(order.begin(), order.end(), size_t{0});
    std::sort(order.begin(), order.end(),
              [&](size_t a, size_t b) { return values[a] < values[b]; });
    for (size_t i = 1; i < order.size(); ++i) {
        ASSERT_LE(output[order[i - 1]], output[order[i]]);
    }
}

TYPED_TEST(Equaliser, LoudnessDoesNotMatter)
{
    const Values loud = random_frame(32768, 2);
    auto quiet = this->samples(loud);
    std::transform(quiet.begin(), quiet.end(), quiet.begin(), [](auto v) { return v / 8; });
    const auto a = this->one(this->samples(loud));
    const auto b = this->one(quiet);
    for (size_t i = 0; i < a.size(); ++i) {
        ASSERT_NEAR(a[i], b[i], TypeParam::kRankScale / 64); // a level or two at its edge
    }
}

TYPED_TEST(Equaliser, WhereTheRingIsCutDoesNotShow)
{
    const auto frame = this->samples(random_frame(4096, 3));
    const auto whole = this->dual(frame, {}, 4096);
    for (const std::ptrdiff_t cut : {0, 1, 1000, 4095, 4096}) {
        const decltype(frame) first(frame.begin(), frame.begin() + cut);
        const decltype(frame) second(frame.begin() + cut, frame.end());
        EXPECT_EQ(whole, this->dual(first, second, 4096)) << cut;
    }
    EXPECT_EQ(whole, this->one(frame));
}

TYPED_TEST(Equaliser, PiecesAreCutToTheOutput)
{
    const Values values = random_frame(1200, 5);
    const auto first = this->samples(slice(values, 0, 600));
    const auto second = this->samples(slice(values, 600, 1200));
    EXPECT_EQ(this->one(this->samples(slice(values, 0, 1000))), this->dual(first, second, 1000));
    EXPECT_EQ(this->one(this->samples(slice(values, 0, 500))), this->dual(first, second, 500));
}

// The copy of a silent frame takes what is missing from the second piece, whatever its count says.
TYPED_TEST(Equaliser, TheSilentCopyIgnoresTheSecondCount)
{
    using Frame = std::vector<typename TypeParam::Sample>;
    const Frame first(3, 7);
    const Frame second(5, 7);
    Frame output(8, this->kUntouched);
    std::vector<uint32_t> histogram(257);
    TypeParam::hist_eq_dual(first.data(), 3, second.data(), 1, output.data(), 8, histogram.data(),
                            256);
    EXPECT_EQ(Frame(8, 7), output);
}

// The counters of an earlier frame must not be taken for those of a silent one.
TYPED_TEST(Equaliser, ASilentFrameClearsTheHistogram)
{
    using Frame = std::vector<typename TypeParam::Sample>;
    for (const uint32_t levels : {1U, 256U, 300U}) {
        const Frame silence(8, 7);
        Frame output(8, this->kUntouched);
        std::vector<uint32_t> histogram(levels + 1, 9);
        TypeParam::hist_eq_dual(silence.data(), 8, nullptr, 0, output.data(), 8, histogram.data(),
                                levels);
        std::vector<uint32_t> expected(levels + 1, 0);
        expected[levels] = 9; // one counter per level is cleared, no more
        EXPECT_EQ(expected, histogram) << levels;
    }
}

TYPED_TEST(Equaliser, ShortOfMemoryTheHistogramIsLeftAlone)
{
    const auto frame = this->samples(random_frame(100, 11));
    auto output = frame;
    const std::vector<uint32_t> before(257, 9);
    auto histogram = before;
    const AllocationFault fault(1, AllocationFault::FromThenOn);
    TypeParam::hist_eq_dual(frame.data(), 100, nullptr, 0, output.data(), 100, histogram.data(),
                            256);
    TypeParam::hist_eq2(frame.data(), output.data(), 100, histogram.data(), 256);
    EXPECT_EQ(before, histogram);
}

TYPED_TEST(Equaliser, ANullPieceCountsAsNone)
{
    using Frame = std::vector<typename TypeParam::Sample>;
    const auto frame = this->samples(random_frame(100, 7));
    std::vector<uint32_t> histogram(257);
    Frame expected = this->one(frame);
    expected.resize(200, this->kUntouched);
    Frame output(200, this->kUntouched);
    TypeParam::hist_eq_dual(frame.data(), 100, nullptr, 100, output.data(), 200, histogram.data(),
                            256);
    EXPECT_EQ(expected, output);
    output.assign(200, this->kUntouched);
    TypeParam::hist_eq_dual(nullptr, 100, frame.data(), 100, output.data(), 100, histogram.data(),
                            256);
    EXPECT_EQ(expected, output);
    output.assign(200, this->kUntouched);
    TypeParam::hist_eq_dual(nullptr, 1, nullptr, 1, output.data(), 200, histogram.data(), 256);
    EXPECT_EQ(Frame(200, this->kUntouched), output);
}

TYPED_TEST(Equaliser, NoLevelsOrNoRoomDoesNothing)
{
    using Frame = std::vector<typename TypeParam::Sample>;
    const auto frame = this->samples(random_frame(100, 8));
    Frame output(100, this->kUntouched);
    std::vector<uint32_t> histogram(257, 7);
    EXPECT_EQ(KZ_OK, TypeParam::hist_eq2(frame.data(), output.data(), 100, histogram.data(), 0));
    EXPECT_EQ(KZ_OK, TypeParam::hist_eq2(nullptr, output.data(), 100, histogram.data(), 256));
    EXPECT_EQ(KZ_OK, TypeParam::hist_eq2(frame.data(), nullptr, 100, histogram.data(), 256));
    EXPECT_EQ(KZ_OK, TypeParam::hist_eq2(frame.data(), output.data(), 100, nullptr, 256));
    EXPECT_EQ(KZ_OK, TypeParam::hist_eq_dual(frame.data(), 100, nullptr, 0, output.data(), 100,
                                             histogram.data(), 0));
    EXPECT_EQ(KZ_OK, TypeParam::hist_eq_dual(frame.data(), 100, nullptr, 0, nullptr, 100,
                                             histogram.data(), 256));
    EXPECT_EQ(KZ_OK, TypeParam::hist_eq_dual(frame.data(), 100, nullptr, 0, output.data(), 100,
                                             nullptr, 256));
    EXPECT_EQ(Frame(100, this->kUntouched), output);
}

TYPED_TEST(Equaliser, ShortOfMemoryCopiesAFrame)
{
    const auto frame = this->samples(random_frame(100, 9));
    const decltype(frame) first(frame.begin(), frame.begin() + 40);
    const decltype(frame) second(frame.begin() + 40, frame.end());
    {
        const AllocationFault fault(1);
        EXPECT_EQ(frame, this->one(frame));
        EXPECT_TRUE(fault.fired());
    }
    const AllocationFault fault(1);
    EXPECT_EQ(frame, this->dual(first, second, 100));
    EXPECT_TRUE(fault.fired());
}

TYPED_TEST(Equaliser, AFrameMayBeEqualisedInPlace)
{
    for (const uint32_t levels : {1U, 2U, 255U, 256U, 257U, 3000U}) {
        for (const uint32_t count : {0U, 1U, 7U, 8U, 31U, 32U, 33U, 1000U, 32768U}) {
            auto frame = this->samples(random_frame(count, levels));
            const auto apart = this->one(frame, levels);
            std::vector<uint32_t> histogram(levels + 1);
            TypeParam::hist_eq2(frame.data(), frame.data(), count, histogram.data(), levels);
            ASSERT_EQ(apart, frame) << count << " samples, " << levels << " levels";
        }
    }
}

TYPED_TEST(Equaliser, ShortOfMemoryLeavesAFrameInPlaceAsItIs)
{
    const auto before = this->samples(random_frame(100, 10));
    auto frame = before;
    std::vector<uint32_t> histogram(257);
    const AllocationFault fault(1);
    TypeParam::hist_eq2(frame.data(), frame.data(), 100, histogram.data(), 256);
    EXPECT_TRUE(fault.fired());
    EXPECT_EQ(before, frame);
}

TYPED_TEST(Equaliser, AConstantFrameInOnePieceIsAllLevelZero)
{
    for (const int32_t value : {0, 5, -5, 32767, -32768}) {
        const auto frame = this->samples(Values(32768, value));
        decltype(this->samples({})) output(frame.size());
        std::vector<uint32_t> histogram(257, 9);
        TypeParam::hist_eq2(frame.data(), output.data(), 32768, histogram.data(), 256);
        EXPECT_EQ(32768U, histogram[0]);
        // Every sample ranks 1, which is the mean.
        EXPECT_TRUE(std::all_of(output.begin(), output.end(), [](auto v) { return v == 0; }));
    }
}

} // namespace kz::test
