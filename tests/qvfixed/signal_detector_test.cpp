#include <algorithm>
#include <cstdlib>
#include <deque>
#include <numeric>
#include <vector>

#include "support/allocation.hpp"
#include "support/qvfixed_objects.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

using Words = std::vector<int32_t>;

Qvfixed<kzqvfixed_signal_detector> make(uint32_t window = 128, uint32_t threshold = 100,
                                        int32_t max_deviation = 1000)
{
    return Qvfixed<kzqvfixed_signal_detector>(
        kzqvfixed_signal_detector_create(window, threshold, max_deviation));
}

uint32_t offset(kzqvfixed_signal_detector& detector, const Words& block, int32_t shift = 13)
{
    return kzqvfixed_signal_detector_get_signal_offset(&detector, block.data(),
                                                       static_cast<uint32_t>(block.size()), shift);
}

// A moving mean and a moving mean of the clamped deviation, with the sums taken anew each time.
class Model {
public:
    Model(uint32_t window, uint32_t threshold, int32_t max_deviation)
        : window_(window), threshold_(threshold), max_deviation_(max_deviation)
    {
    }

    uint32_t offset(const Words& block, int32_t shift)
    {
        if (!primed_) {
            levels_.assign(slots(), 0);
            deviations_.assign(slots(), 0);
            for (size_t i = 0; i < std::min(slots(), block.size()); ++i) {
                levels_[i] = block[i] / (1 << shift);
            }
            primed_ = true;
        }
        auto found = static_cast<uint32_t>(block.size());
        for (uint32_t i = 0; i < block.size(); ++i) {
            const int64_t level = block[i] / (1 << shift); // division truncates towards zero
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

class SignalDetector : public MemoryOn {};

} // namespace

TEST_F(SignalDetector, SilenceHasNoSignal)
{
    const auto detector = make();
    EXPECT_EQ(5000U, offset(*detector, Words(5000, 0)));
    EXPECT_EQ(0U, offset(*detector, {}));
    EXPECT_EQ(1U, offset(*detector, {0}));
}

TEST_F(SignalDetector, AStepToALoudToneIsFoundHalfAWindowAhead)
{
    for (const uint32_t at : {500U, 2000U, 4000U}) {
        const auto detector = make();
        Words block(5000, 0);
        for (size_t i = at; i < block.size(); ++i) {
            block[i] = (i % 16 < 8 ? 1 : -1) * (8000 << 14);
        }
        const uint32_t found = offset(*detector, block);
        EXPECT_NEAR(at - 64.0, found, 20);
    }
}

TEST_F(SignalDetector, ACrossingInTheFirstHalfWindowGivesZero)
{
    const auto detector = make();
    Words block(1000);
    for (size_t i = 0; i < block.size(); ++i) {
        block[i] = (i % 16 < 8 ? 1 : -1) * (8000 << 14);
    }
    EXPECT_EQ(0U, offset(*detector, block));
}

TEST_F(SignalDetector, AShortBlockPrimesTheRestWithZeros)
{
    const auto detector = make(8);
    offset(*detector, {1 << 13, 2 << 13, 3 << 13});
    // The three samples primed slots 0 to 2, were scanned into them again, and left 5 zeros.
    EXPECT_EQ((Words{1, 2, 3, 0, 0, 0, 0, 0}), Words(detector->levels, detector->levels + 8));
    EXPECT_EQ(6, detector->level_sum);
    EXPECT_EQ(3U, detector->position);
    EXPECT_EQ(1U, detector->primed);
}

TEST_F(SignalDetector, ABlockWithoutSamplesPrimesAllZeros)
{
    const auto detector = make(4);
    EXPECT_EQ(0U, offset(*detector, {}));
    EXPECT_EQ(1U, detector->primed);
    offset(*detector, {5 << 13});
    EXPECT_EQ((Words{5, 0, 0, 0}), Words(detector->levels, detector->levels + 4));
}

TEST_F(SignalDetector, SamplesAreShiftedTowardsZero)
{
    const auto detector = make(4);
    offset(*detector, {-1, -8191, -8192, 8191});
    EXPECT_EQ((Words{0, 0, -1, 0}), Words(detector->levels, detector->levels + 4));
    for (const int32_t shift : {32, 40, 255, -1}) {
        kzqvfixed_signal_detector_reset(detector.get());
        offset(*detector, {INT32_MAX, INT32_MIN, -5, 5}, shift);
        EXPECT_EQ(Words(4, 0), Words(detector->levels, detector->levels + 4)) << shift;
    }
}

TEST_F(SignalDetector, ResetMakesTheNextBlockPrimeAgain)
{
    const auto detector = make();
    Words loud(1000);
    Random random(1);
    std::generate(loud.begin(), loud.end(),
                  [&] { return static_cast<int32_t>(random.next()) >> 3; });
    offset(*detector, loud);
    EXPECT_EQ(KZ_OK, kzqvfixed_signal_detector_reset(detector.get()));
    EXPECT_EQ(0U, detector->primed);
    EXPECT_EQ(3000U, offset(*detector, Words(3000, 0)));
}

TEST_F(SignalDetector, AgreesWithSumsTakenAnewForAnyBlocks)
{
    Random random(2);
    for (int round = 0; round < 60; ++round) {
        const uint32_t window = 1 + random.below(200);
        const uint32_t threshold = random.below(150);
        const auto max_deviation = static_cast<int32_t>(random.below(1500));
        const auto detector = make(window, threshold, max_deviation);
        Model model(window, threshold, max_deviation);
        for (int block_number = 0; block_number < 12; ++block_number) {
            Words block(random.below(700));
            const uint32_t quiet = random.below(14);
            for (int32_t& sample : block) {
                sample = static_cast<int32_t>(random.next()) >> (3 + quiet);
            }
            ASSERT_EQ(model.offset(block, 13), offset(*detector, block));
        }
    }
}

TEST_F(SignalDetector, ExtremeWordsWrapAndReturn)
{
    const auto detector = make(3, 0, INT32_MAX);
    Words block(1000);
    Random random(3);
    std::generate(block.begin(), block.end(),
                  [&] { return random.below(2) == 0 ? INT32_MIN : INT32_MAX; });
    EXPECT_LE(offset(*detector, block, 0), 1000U);
}

TEST_F(SignalDetector, AnImpossibleWindowMakesNoDetector)
{
    EXPECT_FALSE(make(0));
    EXPECT_FALSE(make(1U << 30));
    EXPECT_FALSE(make(0xFFFFFFFF));
}

TEST_F(SignalDetector, NullsFindNothing)
{
    const auto detector = make();
    const int32_t sample = 1;
    kzqvfixed_signal_detector_destroy(nullptr);
    EXPECT_EQ(KZ_OK, kzqvfixed_signal_detector_reset(nullptr));
    EXPECT_EQ(17U, kzqvfixed_signal_detector_get_signal_offset(nullptr, &sample, 17, 13));
    EXPECT_EQ(17U, kzqvfixed_signal_detector_get_signal_offset(detector.get(), nullptr, 17, 13));
}

TEST_F(SignalDetector, FailedAllocationsMakeNoDetector)
{
    for_every_failed_allocation([](auto fired) {
        const auto detector = make();
        EXPECT_EQ(fired(), detector == nullptr);
    });
}

} // namespace kz::test
