/// The arithmetic of the ring, on a small one.

#include "kzsdk/qv/frame_pump.hpp"

#include <gtest/gtest.h>

namespace kz::test {

TEST(RingPosition, AFrameIsFullWhenTheWriterReachesItsStart)
{
    constexpr uint32_t kLength = 32;
    constexpr uint32_t kHop = 11;
    for (uint32_t step = 1; step <= kLength; ++step) {
        qv::RingPosition at{0, 0};
        uint32_t stored = 0;
        uint32_t frames = 0;
        while (frames < 200) {
            const uint32_t room = qv::ring_room(at, kLength);
            ASSERT_GE(room, 1U);
            ASSERT_LE(at.write + room, kLength);
            const uint32_t count = std::min(step, room);
            stored += count;
            if (qv::advance_writer(at, count, kLength)) {
                // Frame n is complete when its last sample is stored, no earlier and no later.
                ASSERT_EQ(kLength + frames * kHop, stored);
                ASSERT_EQ(frames * kHop % kLength, at.frame_start);
                at.frame_start = qv::next_frame_start(at.frame_start, kHop, kLength);
                ++frames;
            }
        }
    }
}

TEST(RingPosition, NothingStoredIsNoFrame)
{
    qv::RingPosition at{0, 0};
    EXPECT_FALSE(qv::advance_writer(at, 0, 32));
    EXPECT_EQ(0U, at.write);
}

} // namespace kz::test
