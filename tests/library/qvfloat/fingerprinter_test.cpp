#include <algorithm>
#include <array>
#include <vector>

#include "support/allocation.hpp"
#include "support/float_twin.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

class FloatFingerprinter : public MemoryOn {};

template <class Byte>
bool feed(QVFP& object, const std::vector<Byte>& samples, size_t from = 0, size_t count = SIZE_MAX)
{
    uint8_t complete = 9;
    count = std::min(count, samples.size() - from);
    EXPECT_EQ(KZ_OK, QVFP_AddSamples(&object, samples.data() + from,
                                     static_cast<uint32_t>(count * sizeof(Byte)), &complete));
    return complete == 1;
}

kz_status construct(uint32_t rate)
{
    QVFP* object = nullptr;
    const kz_status status = QVFP_Constructor(2, rate, number(pcm16), number(mono), &object);
    EXPECT_EQ(status == KZ_OK, object != nullptr) << rate;
    const OwnedObject<Float> owner(object);
    return status;
}

} // namespace

TEST_F(FloatFingerprinter, TakesAnyRate)
{
    for (const uint32_t rate : {1U, 2U, 100U, 4000U, 11024U, 11026U, 12000U, 12345U, 37800U, 44056U,
                                44101U, 96000U, 131072U + 11025U, 192000U, 1000000U}) {
        EXPECT_EQ(KZ_OK, construct(rate)) << rate;
    }
}

// A ratio of more than 2^20 parts would need a filter of more than 80 MB.
TEST_F(FloatFingerprinter, ARateThatNeedsAnAbsurdFilterIsShortOfMemory)
{
    EXPECT_EQ(KZ_QV_ERROR_MEMORY, construct(4294960622));
}

TEST_F(FloatFingerprinter, SamplesReachTheRingAtTheirOwnLevel)
{
    const auto object = make_fingerprinter<Float>(pcm16, 11025, mono);
    EXPECT_EQ(11025.0F, object->working_rate);
    object->searching_for_signal = 0;
    feed(*object, std::vector<int16_t>{1, -1, 32767, -32768, 0});
    EXPECT_EQ((std::vector<float>{1, -1, 32767, -32768, 0}),
              std::vector<float>(object->ring, object->ring + 5));
}

TEST_F(FloatFingerprinter, EveryFormatRunsThroughItsOwnConverter)
{
    std::vector<uint8_t> bytes(256);
    for (size_t i = 0; i < bytes.size(); ++i) {
        bytes[i] = static_cast<uint8_t>(i * 151);
    }
    struct Case {
        Format format;
        Channels channels;
        void (*convert)(const void*, float*, int32_t);
    };
    const Case cases[] = {
        {pcm8, mono, KZDSP_Offset128ToFloat}, {pcm8, stereo, KZDSP_StereoOffset128ToMonoFloat},
        {pcm16, mono, KZDSP_ShortToFloat},    {pcm16, stereo, KZDSP_StereoShortToMonoFloat},
        {alaw, mono, KZDSP_ALawToFloat},      {alaw, stereo, KZDSP_StereoALawToMonoFloat},
        {ulaw, mono, KZDSP_uLawToFloat},      {ulaw, stereo, KZDSP_StereouLawToMonoFloat},
    };
    for (const Case& each : cases) {
        const auto object = make_fingerprinter<Float>(each.format, 11025, each.channels);
        object->searching_for_signal = 0;
        feed(*object, bytes);
        std::vector<float> expected(bytes.size() / object->frame_bytes);
        each.convert(bytes.data(), expected.data(), static_cast<int32_t>(expected.size()));
        EXPECT_EQ(expected.size(), object->write_position);
        EXPECT_TRUE(std::equal(expected.begin(), expected.end(), object->ring))
            << number(each.format);
    }
}

// Beyond the search for the signal a stream may be cut anywhere at any rate: to the bit.
TEST_F(FloatFingerprinter, CutsDoNotShowAtAnyRate)
{
    for (const uint32_t rate : {8000U, 11024U, 12345U, 22050U, 44056U, 44100U, 48000U, 96000U}) {
        const auto music = noise(static_cast<size_t>(rate * 3.9), 0.4, rate);
        const auto whole = make_fingerprinter<Float>(pcm16, rate, mono);
        whole->searching_for_signal = 0;
        feed(*whole, music);
        for (uint64_t seed = 0; seed < 3; ++seed) {
            Random random(seed + rate);
            const auto pieces = make_fingerprinter<Float>(pcm16, rate, mono);
            pieces->searching_for_signal = 0;
            for (size_t at = 0; at < music.size();) {
                const size_t count = 1 + random.below(seed == 0 ? 7 : 6000);
                feed(*pieces, music, at, count);
                at += std::min(count, music.size() - at);
            }
            EXPECT_EQ(whole->write_position, pieces->write_position) << rate;
            EXPECT_EQ(whole->frame_start, pieces->frame_start) << rate;
            EXPECT_EQ(whole->frame_manager->frame_count, pieces->frame_manager->frame_count);
            EXPECT_TRUE(std::equal(whole->ring, whole->ring + 32768, pieces->ring)) << rate;
        }
    }
}

// The product that wraps in the fixed twin beyond 4.29 million samples is taken in single
// precision.
TEST_F(FloatFingerprinter, TimesStayRightBeyondTheWrapOfThirtyTwoBits)
{
    const auto object = make_fingerprinter<Float>(pcm16, 11025, mono);
    EXPECT_TRUE(feed(*object, noise(11025 * 20, 0.5, 2)));
    uint8_t bytes[60];
    qv::FingerprintTimes times{};
    const auto start = [&](uint32_t samples) {
        object->signal_offset = samples;
        EXPECT_EQ(KZ_OK, qvfloat::Fingerprinter::extract(object.get(), bytes, 60, times));
        return times.start;
    };
    EXPECT_EQ(600000U, start(11025 * 600));
    EXPECT_EQ(390000U, start(11025 * 390));
    EXPECT_NEAR(4294968000.0 / 11025, start(4294968), 0.5);
    // 24 bits: beyond that times are near, and at the end of the counter they do not wrap.
    EXPECT_NEAR(4294967295.0 * 1000 / 11025, start(0xFFFFFFFF), 32);
    EXPECT_EQ(0U, start(11)); // truncated
    EXPECT_EQ(1U, start(12));
}

TEST_F(FloatFingerprinter, NearSilenceIsNoSignal)
{
    const auto object = make_fingerprinter<Float>(pcm16, 11025, mono);
    std::vector<int16_t> hum(11025 * 4);
    for (size_t i = 0; i < hum.size(); ++i) {
        hum[i] = i % 2 == 0 ? 100 : -100; // a mean deviation of 100 does not exceed 100
    }
    feed(*object, hum);
    EXPECT_EQ(1, object->searching_for_signal);
    for (size_t i = 0; i < hum.size(); ++i) {
        hum[i] = i % 2 == 0 ? 102 : -102;
    }
    feed(*object, hum);
    EXPECT_EQ(0, object->searching_for_signal);
}

} // namespace kz::test
