#include <algorithm>
#include <vector>

#include "support/allocation.hpp"
#include "support/fixed_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

using Words = std::vector<int32_t>;

uint32_t offset(kzqvfixed_signal_detector& detector, const Words& block, int32_t shift)
{
    return kzqvfixed_signal_detector_get_signal_offset(&detector, block.data(),
                                                       static_cast<uint32_t>(block.size()), shift);
}

OwnedDetector<Fixed> make(uint32_t window, uint32_t threshold, int32_t max_deviation)
{
    return OwnedDetector<Fixed>(kzqvfixed_signal_detector_create(window, threshold, max_deviation));
}

class FixedSignalDetector : public MemoryOn {};

} // namespace

TEST_F(FixedSignalDetector, SamplesAreShiftedTowardsZero)
{
    const auto detector = make(4, 100, 1000);
    offset(*detector, {-1, -8191, -8192, 8191}, 13);
    EXPECT_EQ((Words{0, 0, -1, 0}), Words(detector->levels, detector->levels + 4));
    for (const int32_t shift : {32, 40, 255, 256, 300, INT32_MAX, -1, -256}) {
        kzqvfixed_signal_detector_reset(detector.get());
        offset(*detector, {INT32_MAX, INT32_MIN, -5, 5}, shift);
        EXPECT_EQ(Words(4, 0), Words(detector->levels, detector->levels + 4)) << shift;
    }
}

TEST_F(FixedSignalDetector, ExtremeWordsWrapAndReturn)
{
    const auto detector = make(3, 0, INT32_MAX);
    Words block(1000);
    Random random(3);
    std::generate(block.begin(), block.end(),
                  [&] { return random.below(2) == 0 ? INT32_MIN : INT32_MAX; });
    EXPECT_LE(offset(*detector, block, 0), 1000U);
}

} // namespace kz::test
