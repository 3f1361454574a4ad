#include <cmath>
#include <limits>
#include <vector>

#include "support/allocation.hpp"
#include "support/float_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

using Samples = std::vector<float>;
using Levels = std::vector<int32_t>;

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();

class FloatSignalDetector : public MemoryOn {};

uint32_t offset(QVSD& detector, const Samples& block)
{
    return QVSD_GetSignalOffset(&detector, block.data(), static_cast<uint32_t>(block.size()));
}

Levels levels(const QVSD& detector) { return {detector.levels, detector.levels + detector.window}; }

} // namespace

TEST_F(FloatSignalDetector, SamplesAreTruncatedTowardsZero)
{
    const OwnedDetector<Float> detector(QVSD_Create(6, 100, 1000));
    offset(*detector, {0.99F, -0.99F, 1.5F, -1.5F, 32767.9F, -32768.9F});
    EXPECT_EQ((Levels{0, 0, 1, -1, 32767, -32768}), levels(*detector));
}

// Whether a recording is silent is judged at its own level: less than one step of 16 bits counts as
// nothing.
TEST_F(FloatSignalDetector, FractionsOfAStepAreSilence)
{
    const OwnedDetector<Float> detector(QVSD_Create(128, 0, 1000));
    Samples block(2000);
    for (size_t i = 0; i < block.size(); ++i) {
        block[i] = i % 2 == 0 ? 0.999F : -0.999F;
    }
    EXPECT_EQ(2000U, offset(*detector, block));
}

TEST_F(FloatSignalDetector, NaNCountsAsZeroAndTheRestIsClamped)
{
    const OwnedDetector<Float> detector(QVSD_Create(6, 100, 1000));
    offset(*detector, {kNaN, -kNaN, kInfinity, -kInfinity, 2147483648.0F, -3e38F});
    EXPECT_EQ((Levels{0, 0, INT32_MAX, INT32_MIN, INT32_MAX, INT32_MIN}), levels(*detector));
}

TEST_F(FloatSignalDetector, ExtremeSamplesWrapAndReturn)
{
    const OwnedDetector<Float> detector(QVSD_Create(3, 0, INT32_MAX));
    constexpr float kEdges[] = {kNaN, kInfinity, -kInfinity, 1e30F, -1e30F, 0.0F, 2147483520.0F};
    Random random(3);
    Samples block(3000);
    for (float& sample : block) {
        sample = kEdges[random.below(7)];
    }
    EXPECT_LE(offset(*detector, block), 3000U);
}

} // namespace kz::test
