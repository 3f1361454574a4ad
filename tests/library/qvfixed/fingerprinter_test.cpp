#include <algorithm>
#include <vector>

#include "support/allocation.hpp"
#include "support/fixed_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

class FixedFingerprinter : public MemoryOn {};

bool feed(kzqvfixed_fingerprinter& object, const std::vector<int16_t>& samples, size_t from,
          size_t count)
{
    uint8_t complete = 9;
    EXPECT_EQ(KZ_OK, kzqvfixed_add_samples(&object, samples.data() + from,
                                           static_cast<uint32_t>(count * 2), &complete));
    return complete == 1;
}

} // namespace

// Hertz with 15 fraction bits wrap at 131072: a rate beyond must not pass for another one.
TEST_F(FixedFingerprinter, RefusesUnsupportedRatesAndRatesThatWouldAlias)
{
    for (const uint32_t rate : {1U, 2U, 12000U, 44101U, 96000U, 131072U, 131072U + 11025U,
                                131072U + 44100U, 0xFFFFFFFFU}) {
        kzqvfixed_fingerprinter* object = nullptr;
        EXPECT_EQ(KZ_QV_ERROR_MEMORY,
                  kzqvfixed_constructor(1, rate, number(pcm16), number(mono), &object))
            << rate;
        EXPECT_EQ(nullptr, object);
    }
}

TEST_F(FixedFingerprinter, KeepsTheWorkingRateWithTwelveFractionBits)
{
    EXPECT_EQ(45158400U, make_fingerprinter<Fixed>(pcm16, 44100, stereo)->working_rate);
}

// At rates other than 11025 Hz a cut may move a working-rate sample by the resampler's bound, never
// drop or repeat one: every rate reaches the same number of samples, and they stay that close.
TEST_F(FixedFingerprinter, CutsLoseNoSampleAtAnyRate)
{
    for (const uint32_t rate : {8000U, 16000U, 22050U, 24000U, 32000U, 44100U, 48000U}) {
        const auto music = noise(static_cast<size_t>(rate * 3.9), 0.4, rate);
        const auto whole = make_fingerprinter<Fixed>(pcm16, rate, mono);
        whole->searching_for_signal = 0;
        feed(*whole, music, 0, music.size());
        for (uint64_t seed = 0; seed < 3; ++seed) {
            Random random(seed + rate);
            const auto pieces = make_fingerprinter<Fixed>(pcm16, rate, mono);
            pieces->searching_for_signal = 0;
            for (size_t at = 0; at < music.size();) {
                const size_t count =
                    std::min<size_t>(1 + random.below(seed == 0 ? 3 : 6000), music.size() - at);
                feed(*pieces, music, at, count);
                at += count;
            }
            EXPECT_EQ(whole->write_position, pieces->write_position) << rate;
            EXPECT_EQ(whole->frame_start, pieces->frame_start) << rate;
            EXPECT_EQ(whole->frame_manager->frame_count, pieces->frame_manager->frame_count);
            for (size_t i = 0; i < 32768; ++i) {
                ASSERT_NEAR(whole->ring[i], pieces->ring[i], 182) << rate << " Hz, " << i;
            }
        }
    }
}

// The detector judges what conversion and resampling leave: the same tone is signal at one channel
// count or rate and silence at another.
TEST_F(FixedFingerprinter, TheStartOfTheSignalDependsOnChannelsAndRate)
{
    const auto hears = [](uint32_t rate, Channels count, int16_t level) {
        const uint32_t channels = number(count);
        std::vector<int16_t> square(size_t{rate} * channels);
        for (size_t i = 0; i < square.size(); ++i) {
            const bool high = i / channels * 200 / rate % 2 == 0; // 100 Hz
            square[i] = static_cast<int16_t>(high ? level : -level);
        }
        const auto object = make_fingerprinter<Fixed>(pcm16, rate, count);
        feed(*object, square, 0, square.size());
        return object->searching_for_signal == 0;
    };
    EXPECT_FALSE(hears(11025, mono, 40));
    EXPECT_TRUE(hears(11025, stereo, 40));
    EXPECT_TRUE(hears(11025, mono, 80));
    EXPECT_FALSE(hears(44100, mono, 80));
}

// Times are for callers; the document does not contain them.
TEST_F(FixedFingerprinter, TimesWrapAt32Bits)
{
    const auto object = make_fingerprinter<Fixed>(pcm16, 11025, mono);
    const auto music = noise(11025 * 20, 0.5, 2);
    EXPECT_TRUE(feed(*object, music, 0, music.size()));
    uint8_t bytes[60];
    qv::FingerprintTimes times{};
    object->signal_offset = 11025 * 600;
    EXPECT_EQ(KZ_OK, qvfixed::Fingerprinter::extract(object.get(), bytes, 60, times));
    EXPECT_EQ(11025U * 600 * 1000 / 11025, times.start);
    EXPECT_NE(600000U, times.start);
}

} // namespace kz::test
