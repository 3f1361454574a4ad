/// The search for the end of leading silence, for both twins. Blocks are given in levels, which are
/// what the detector makes of samples.

#include <algorithm>
#include <cstdlib>
#include <deque>
#include <numeric>
#include <vector>

#include "support/signals.hpp"
#include "support/twins.hpp"

namespace kz::test {

namespace {

using Levels = std::vector<int32_t>;

template <class Twin>
OwnedDetector<Twin> make(uint32_t window = 128, uint32_t threshold = 100,
                         int32_t max_deviation = 1000)
{
    return OwnedDetector<Twin>(Twin::create_detector(window, threshold, max_deviation));
}

template <class Twin>
uint32_t offset(const OwnedDetector<Twin>& detector, const Levels& block)
{
    std::vector<typename Twin::Sample> samples(block.size());
    std::transform(block.begin(), block.end(), samples.begin(), Twin::with_level);
    return Twin::find_signal(detector.get(), samples.data(), static_cast<uint32_t>(samples.size()));
}

Levels square_wave(size_t from, size_t count)
{
    Levels block(count, 0);
    for (size_t i = from; i < count; ++i) {
        block[i] = i % 16 < 8 ? 16000 : -16000;
    }
    return block;
}

// A moving mean and a moving mean of the clamped deviation, with the sums computed afresh each
// time.
class Model {
public:
    Model(uint32_t window, uint32_t threshold, int32_t max_deviation)
        : window_(window), threshold_(threshold), max_deviation_(max_deviation)
    {
    }

    uint32_t offset(const Levels& block)
    {
        if (!primed_) {
            levels_.assign(slots(), 0);
            deviations_.assign(slots(), 0);
            std::copy_n(block.begin(), std::min(slots(), block.size()), levels_.begin());
            primed_ = true;
        }
        auto found = static_cast<uint32_t>(block.size());
        for (uint32_t i = 0; i < block.size(); ++i) {
            const int64_t level = block[i];
            levels_.pop_front();
            levels_.push_back(level);
            deviations_.pop_front();
            deviations_.push_back(
                std::min<int64_t>(std::llabs(level - sum(levels_) / window_), max_deviation_));
            if (found == block.size() && sum(deviations_) / window_ > threshold_) {
                found = i > window_ / 2 ? i - static_cast<uint32_t>(window_ / 2) : 0;
            }
        }
        return found;
    }

    /// The rings, oldest entry first, and their sums: also after a signal was found.
    template <class Detector>
    void expect_state_of(const Detector& detector) const
    {
        EXPECT_EQ(sum(levels_), detector.level_sum);
        EXPECT_EQ(sum(deviations_), detector.deviation_sum);
        for (size_t i = 0; i < slots(); ++i) {
            const size_t slot = (detector.position + i) % slots();
            ASSERT_EQ(levels_[i], detector.levels[slot]);
            ASSERT_EQ(deviations_[i], detector.deviations[slot]);
        }
    }

private:
    size_t slots() const { return static_cast<size_t>(window_); }
    static int64_t sum(const std::deque<int64_t>& ring)
    {
        return std::accumulate(ring.begin(), ring.end(), int64_t{0});
    }

    int64_t window_;
    int64_t threshold_;
    int64_t max_deviation_;
    bool primed_ = false;
    std::deque<int64_t> levels_;
    std::deque<int64_t> deviations_;
};

} // namespace

template <class T>
class SignalDetector : public TwinTest<T> {
};
TYPED_TEST_SUITE(SignalDetector, Twins, TwinNames);

TYPED_TEST(SignalDetector, SilenceHasNoSignal)
{
    const auto detector = make<TypeParam>();
    EXPECT_EQ(5000U, offset<TypeParam>(detector, Levels(5000, 0)));
    EXPECT_EQ(0U, offset<TypeParam>(detector, {}));
    EXPECT_EQ(1U, offset<TypeParam>(detector, {0}));
}

TYPED_TEST(SignalDetector, AStepToALoudToneIsFoundHalfAWindowAhead)
{
    for (const uint32_t at : {500U, 2000U, 4000U}) {
        const auto detector = make<TypeParam>();
        EXPECT_NEAR(at - 64.0, offset<TypeParam>(detector, square_wave(at, 5000)), 20);
    }
}

TYPED_TEST(SignalDetector, ACrossingInTheFirstHalfWindowGivesZero)
{
    const auto detector = make<TypeParam>();
    EXPECT_EQ(0U, offset<TypeParam>(detector, square_wave(0, 1000)));
}

TYPED_TEST(SignalDetector, TheThresholdItselfIsNotSignal)
{
    Levels block(20, 0);
    block[12] = 16000;
    // From there each deviation is clamped to 80, so the mean of 8 of them climbs 10, 20, 30, ...
    const auto below = make<TypeParam>(8, 9, 80);
    const auto same = make<TypeParam>(8, 10, 80);
    EXPECT_EQ(12U - 4, offset<TypeParam>(below, block));
    EXPECT_EQ(13U - 4, offset<TypeParam>(same, block));
}

TYPED_TEST(SignalDetector, AShortBlockPrimesTheRestWithZeros)
{
    const auto detector = make<TypeParam>(8);
    offset<TypeParam>(detector, {1, 2, 3});
    // The three samples primed slots 0 to 2, were scanned into them again, and left 5 zeros.
    EXPECT_EQ((Levels{1, 2, 3, 0, 0, 0, 0, 0}), Levels(detector->levels, detector->levels + 8));
    EXPECT_EQ(6, detector->level_sum);
    EXPECT_EQ(3U, detector->position);
    EXPECT_EQ(1U, detector->primed);
}

TYPED_TEST(SignalDetector, ABlockWithoutSamplesPrimesAllZeros)
{
    const auto detector = make<TypeParam>(4);
    EXPECT_EQ(0U, offset<TypeParam>(detector, {}));
    EXPECT_EQ(1U, detector->primed);
    offset<TypeParam>(detector, {5});
    EXPECT_EQ((Levels{5, 0, 0, 0}), Levels(detector->levels, detector->levels + 4));
}

TYPED_TEST(SignalDetector, ResetMakesTheNextBlockPrimeAgain)
{
    const auto detector = make<TypeParam>();
    offset<TypeParam>(detector, square_wave(0, 1000));
    EXPECT_EQ(KZ_OK, TypeParam::reset_detector(detector.get()));
    EXPECT_EQ(0U, detector->primed);
    EXPECT_EQ(3000U, offset<TypeParam>(detector, Levels(3000, 0)));
}

TYPED_TEST(SignalDetector, AgreesWithSumsTakenAnewForAnyBlocks)
{
    Random random(2);
    for (int round = 0; round < 60; ++round) {
        // Powers of two have a loop of their own.
        const uint32_t window = round % 2 == 0 ? 1 + random.below(200) : 1U << random.below(9);
        const uint32_t threshold = random.below(150);
        const auto max_deviation = static_cast<int32_t>(random.below(1500));
        const auto detector = make<TypeParam>(window, threshold, max_deviation);
        Model model(window, threshold, max_deviation);
        for (int block_number = 0; block_number < 12; ++block_number) {
            Levels block(random.below(700));
            const uint32_t quiet = random.below(14);
            for (int32_t& level : block) {
                level = static_cast<int32_t>(random.next()) >> (16 + quiet);
            }
            ASSERT_EQ(model.offset(block), offset<TypeParam>(detector, block));
            model.expect_state_of(*detector);
        }
    }
}

TYPED_TEST(SignalDetector, AnImpossibleWindowMakesNoDetector)
{
    EXPECT_FALSE(make<TypeParam>(0));
    EXPECT_FALSE(make<TypeParam>(1U << 30));
    EXPECT_FALSE(make<TypeParam>(0xFFFFFFFF));
}

TYPED_TEST(SignalDetector, NullsFindNothing)
{
    const auto detector = make<TypeParam>();
    const typename TypeParam::Sample sample = 1;
    TypeParam::destroy_detector(nullptr);
    EXPECT_EQ(KZ_OK, TypeParam::reset_detector(nullptr));
    EXPECT_EQ(17U, TypeParam::find_signal(nullptr, &sample, 17));
    EXPECT_EQ(17U, TypeParam::find_signal(detector.get(), nullptr, 17));
}

TYPED_TEST(SignalDetector, FailedAllocationsMakeNoDetector)
{
    for_every_failed_allocation([](auto fired) {
        const auto detector = make<TypeParam>();
        EXPECT_EQ(fired(), detector == nullptr);
    });
}

} // namespace kz::test
