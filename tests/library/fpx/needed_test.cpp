// How much sound a fingerprint takes: one figure for every rate, both algorithms and any cuts.

#include <algorithm>

#include <gtest/gtest.h>

#include "kzsdk/abs/startup.h"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFixedRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};
constexpr uint32_t kOtherRates[] = {2000, 11024, 37800, 96000, 192000};

class Needed : public testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(KZ_OK, kzinit_acquire()); }
    void TearDown() override { EXPECT_EQ(KZ_OK, kzinit_release()); }

    /// Whether so much sound, added in pieces of so many frames, completes a fingerprint.
    static bool completes(Algorithm algorithm, uint32_t rate, uint32_t milliseconds, size_t piece)
    {
        const auto sound = noise(size_t{rate} * milliseconds / 1000, 0.5, rate);
        const Handle handle = create(algorithm, pcm16, rate, mono);
        bool complete = false;
        for (size_t at = 0; at < sound.size(); at += piece) {
            complete = add(handle.get(), sound.data() + at, 2 * std::min(piece, sound.size() - at));
        }
        return complete;
    }
};

TEST_F(Needed, IsEnoughAtEveryRateInPiecesOfAnySize)
{
    const auto expect_enough = [](Algorithm algorithm, uint32_t rate) {
        for (const size_t piece : {size_t{1}, size_t{rate} / 100, size_t{15} * rate}) {
            EXPECT_TRUE(completes(algorithm, rate, KZ_FPX_MILLISECONDS_NEEDED, piece))
                << rate << " Hz in pieces of " << piece;
        }
    };
    for (const uint32_t rate : kFixedRates) {
        expect_enough(fixed, rate);
        expect_enough(floating, rate);
    }
    for (const uint32_t rate : kOtherRates) {
        expect_enough(floating, rate);
    }
}

// The figure is not generous: with a hundredth of a second less there is no fingerprint.
TEST_F(Needed, IsTheLeastInHundredthsOfASecond)
{
    for (const uint32_t rate : kFixedRates) {
        for (const Algorithm algorithm : kAlgorithms) {
            EXPECT_FALSE(
                completes(algorithm, rate, KZ_FPX_MILLISECONDS_NEEDED - 10, size_t{15} * rate))
                << rate << " Hz";
        }
    }
}

} // namespace

} // namespace kz::test
