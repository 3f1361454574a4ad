#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "kzsdk/qvfixed/twin.hpp"
#include "support/allocation.hpp"
#include "support/qvfixed_objects.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kPcm8 = 1, kPcm16 = 2, kALaw = 3, kULaw = 4;

class Fingerprinter : public MemoryOn {};

kz_status construct(uint32_t rate, uint32_t format, uint32_t channels)
{
    kzqvfixed_fingerprinter* object = nullptr;
    const kz_status status = kzqvfixed_constructor(1, rate, format, channels, &object);
    EXPECT_EQ(status == KZ_OK, object != nullptr);
    const Qvfixed<kzqvfixed_fingerprinter> owner(object);
    return status;
}

bool feed(kzqvfixed_fingerprinter& object, const std::vector<int16_t>& samples, size_t from = 0,
          size_t count = SIZE_MAX)
{
    uint8_t complete = 9;
    count = std::min(count, samples.size() - from);
    EXPECT_EQ(KZ_OK, kzqvfixed_add_samples(&object, samples.data() + from,
                                           static_cast<uint32_t>(count * 2), &complete));
    EXPECT_LE(complete, 1);
    return complete == 1;
}

} // namespace

TEST_F(Fingerprinter, AcceptsEightRatesFourFormatsAndOneOrTwoChannels)
{
    for (const uint32_t rate : {8000U, 11025U, 16000U, 22050U, 24000U, 32000U, 44100U, 48000U}) {
        for (const uint32_t format : {kPcm8, kPcm16, kALaw, kULaw}) {
            EXPECT_EQ(KZ_OK, construct(rate, format, 1));
            EXPECT_EQ(KZ_OK, construct(rate, format, 2));
        }
    }
}

TEST_F(Fingerprinter, RefusesBadArguments)
{
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct(0, kPcm16, 1));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct(44100, 0, 1));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct(44100, 5, 1));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct(44100, kPcm16, 0));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct(44100, kPcm16, 3));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct(44100, kPcm16, 0xFFFFFFFF));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_constructor(1, 44100, kPcm16, 1, nullptr));
}

// Hertz with 15 fraction bits wrap at 131072: a rate beyond must not pass for another one.
TEST_F(Fingerprinter, RefusesUnsupportedRatesAndRatesThatWouldAlias)
{
    for (const uint32_t rate : {1U, 2U, 12000U, 44101U, 96000U, 131072U, 131072U + 11025U,
                                131072U + 44100U, 0xFFFFFFFFU}) {
        EXPECT_EQ(KZ_QV_ERROR_MEMORY, construct(rate, kPcm16, 1)) << rate;
    }
}

TEST_F(Fingerprinter, StartsInAKnownState)
{
    const auto object = make_fingerprinter(44100, kPcm16, 2);
    EXPECT_EQ(4U, object->frame_bytes);
    EXPECT_EQ(45158400U, object->working_rate);
    EXPECT_EQ(12U, object->frame_limit);
    EXPECT_EQ(1, object->searching_for_signal);
    EXPECT_EQ(32768U, object->frame_length);
    EXPECT_EQ(11264U, object->hop);
    EXPECT_EQ(0U, object->frame_start);
    EXPECT_EQ(0U, object->write_position);
    EXPECT_EQ(1U, make_fingerprinter(8000, kALaw, 1)->frame_bytes);
    EXPECT_EQ(2U, make_fingerprinter(8000, kPcm8, 2)->frame_bytes);
}

TEST_F(Fingerprinter, RefusesPartsOfFramesAndConsumesNothing)
{
    const auto mono = make_fingerprinter(44100, kPcm16, 1);
    const auto stereo = make_fingerprinter(44100, kPcm16, 2);
    const uint8_t bytes[8] = {};
    uint8_t complete = 7;
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_add_samples(mono.get(), bytes, 3, &complete));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_add_samples(mono.get(), bytes, 0, &complete));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              kzqvfixed_add_samples(stereo.get(), bytes, 6, &complete));
    EXPECT_EQ(0, complete);
    EXPECT_EQ(40U, mono->resampler->history_end);
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_add_samples(nullptr, bytes, 2, &complete));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              kzqvfixed_add_samples(mono.get(), nullptr, 2, &complete));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_add_samples(mono.get(), bytes, 2, nullptr));
}

TEST_F(Fingerprinter, SilenceOnlyGrowsTheOffset)
{
    const auto object = make_fingerprinter(11025, kPcm16, 1);
    const std::vector<int16_t> silence(11025 * 60, 0);
    EXPECT_FALSE(feed(*object, silence));
    EXPECT_EQ(silence.size(), object->signal_offset);
    EXPECT_EQ(1, object->searching_for_signal);
    EXPECT_EQ(0U, object->write_position);
    EXPECT_EQ(0U, object->frame_manager->frame_count);
    EXPECT_FALSE(feed(*object, silence));
    EXPECT_EQ(2 * silence.size(), object->signal_offset);
}

TEST_F(Fingerprinter, FramesAreCutEveryHopFromTheSignalsStart)
{
    const auto object = make_fingerprinter(11025, kPcm16, 1);
    auto music = noise(11025 * 16, 0.5, 1);
    std::fill(music.begin(), music.begin() + 5000, int16_t{0});
    // One sample at a time around each border, to see the frames appear exactly there.
    feed(*object, music, 0, 32768);
    const uint32_t start = object->signal_offset;
    EXPECT_NEAR(5000 - 64.0, start, 40);
    EXPECT_EQ(0, object->searching_for_signal);
    EXPECT_EQ(32768 - start, object->write_position);
    size_t fed = 32768;
    for (uint32_t frame = 0; frame < 12; ++frame) {
        const size_t border = start + 32768 + size_t{frame} * 11264;
        feed(*object, music, fed, border - 1 - fed);
        EXPECT_EQ(frame, object->frame_manager->frame_count);
        EXPECT_EQ(frame == 11, feed(*object, music, border - 1, 1));
        EXPECT_EQ(frame + 1, object->frame_manager->frame_count);
        fed = border;
    }
}

TEST_F(Fingerprinter, FeedingAfterCompletionChangesNothing)
{
    const auto object = make_fingerprinter(11025, kPcm16, 1);
    const auto music = noise(11025 * 20, 0.5, 2);
    EXPECT_TRUE(feed(*object, music));
    const auto before = std::string(reinterpret_cast<const char*>(object.get()), sizeof *object);
    EXPECT_TRUE(feed(*object, music));
    EXPECT_EQ(before, std::string(reinterpret_cast<const char*>(object.get()), sizeof *object));
}

TEST_F(Fingerprinter, ReadsSamplesAtOddAddresses)
{
    const auto music = tune(22050, 2, 16);
    const auto even = make_fingerprinter(22050, kPcm16, 2);
    const auto odd = make_fingerprinter(22050, kPcm16, 2);
    std::vector<uint8_t> bytes(music.size() * 2 + 1);
    std::memcpy(bytes.data() + 1, music.data(), music.size() * 2);
    uint8_t complete = 0;
    EXPECT_TRUE(feed(*even, music));
    EXPECT_EQ(KZ_OK, kzqvfixed_add_samples(odd.get(), bytes.data() + 1,
                                           static_cast<uint32_t>(music.size() * 2), &complete));
    EXPECT_EQ(1, complete);
    EXPECT_TRUE(std::equal(even->ring, even->ring + 32768, odd->ring));
}

// At 11025 Hz nothing but leading silence depends on how a stream is cut.
TEST_F(Fingerprinter, CutsDoNotShowAt11025Hertz)
{
    const auto music = tune(11025, 2, 16);
    const auto whole = make_fingerprinter(11025, kPcm16, 2);
    EXPECT_TRUE(feed(*whole, music));
    for (uint64_t seed = 0; seed < 4; ++seed) {
        Random random(seed);
        const auto pieces = make_fingerprinter(11025, kPcm16, 2);
        // The signal starts with the first piece, which must be as long as a ring for its search.
        bool complete = feed(*pieces, music, 0, 65536);
        for (size_t at = 65536; !complete && at < music.size();) {
            const size_t count = 2 * (1 + random.below(seed % 2 == 0 ? 5000 : 77));
            complete = feed(*pieces, music, at, count);
            at += count;
        }
        EXPECT_TRUE(complete);
        EXPECT_TRUE(std::equal(whole->ring, whole->ring + 32768, pieces->ring));
        EXPECT_EQ(whole->frame_start, pieces->frame_start);
        int16_t a[30], b[30];
        kzqvfixed_frame_manager_get_fingerprint(whole->frame_manager, a, 60);
        kzqvfixed_frame_manager_get_fingerprint(pieces->frame_manager, b, 60);
        EXPECT_TRUE(std::equal(a, a + 30, b));
    }
}

// At other rates a cut may move a working-rate sample by the resampler's bound, never drop or repeat
// one: every rate reaches the same number of samples, and they stay that close.
TEST_F(Fingerprinter, CutsLoseNoSampleAtAnyRate)
{
    for (const uint32_t rate : {8000U, 16000U, 22050U, 24000U, 32000U, 44100U, 48000U}) {
        const auto music = noise(static_cast<size_t>(rate * 3.9), 0.4, rate);
        const auto whole = make_fingerprinter(rate, kPcm16, 1);
        whole->searching_for_signal = 0;
        feed(*whole, music);
        for (uint64_t seed = 0; seed < 3; ++seed) {
            Random random(seed + rate);
            const auto pieces = make_fingerprinter(rate, kPcm16, 1);
            pieces->searching_for_signal = 0;
            for (size_t at = 0; at < music.size();) {
                const size_t count = 1 + random.below(seed == 0 ? 3 : 6000);
                feed(*pieces, music, at, count);
                at += std::min(count, music.size() - at);
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

TEST_F(Fingerprinter, ProgressCountsFrames)
{
    const auto object = make_fingerprinter(11025, kPcm16, 1);
    uint32_t percent = 77;
    EXPECT_EQ(KZ_OK, kzqvfixed_get_percent_progress(object.get(), &percent));
    EXPECT_EQ(0U, percent);
    const auto music = noise(11025 * 20, 0.5, 2);
    feed(*object, music, 0, 32768 + 11264 * 2 + 100);
    kzqvfixed_get_percent_progress(object.get(), &percent);
    EXPECT_EQ(25U, percent);
    feed(*object, music);
    kzqvfixed_get_percent_progress(object.get(), &percent);
    EXPECT_EQ(100U, percent);
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_get_percent_progress(nullptr, &percent));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_get_percent_progress(object.get(), nullptr));
}

TEST_F(Fingerprinter, TheResultIsRefusedUntilComplete)
{
    const auto object = make_fingerprinter(11025, kPcm16, 1);
    XMLTag* tree = nullptr;
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, kzqvfixed_get_result(object.get(), &tree));
    const auto music = noise(32768 + 10 * 11264, 0.5, 3);
    EXPECT_FALSE(feed(*object, music));
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, kzqvfixed_get_result(object.get(), &tree));
    EXPECT_EQ(nullptr, tree);
    EXPECT_TRUE(feed(*object, music));
    EXPECT_EQ(KZ_OK, kzqvfixed_get_result(object.get(), &tree));
    EXPECT_NE(nullptr, tree);
    SmartDisposeXMLTag(&tree);
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_get_result(nullptr, &tree));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_get_result(object.get(), nullptr));
}

// Times are for callers inside the library; the document does not hold them.
TEST_F(Fingerprinter, TimesAreMillisecondsThatWrapAt32Bits)
{
    const auto object = make_fingerprinter(11025, kPcm16, 1);
    EXPECT_TRUE(feed(*object, noise(11025 * 20, 0.5, 2)));
    uint8_t bytes[60];
    qv::FingerprintTimes times{};
    object->signal_offset = 22050;
    EXPECT_EQ(KZ_OK, qvfixed::Fingerprinter::extract(object.get(), bytes, 60, times));
    EXPECT_EQ(2000U, times.start);
    EXPECT_EQ(14210U, times.duration); // 32768 + 11 * 11264 samples
    object->signal_offset = 11025 * 600;
    EXPECT_EQ(KZ_OK, qvfixed::Fingerprinter::extract(object.get(), bytes, 60, times));
    EXPECT_EQ(11025U * 600 * 1000 / 11025, times.start);
    EXPECT_NE(600000U, times.start);
}

TEST_F(Fingerprinter, ExtractionRefusesNullsAndSmallBuffers)
{
    const auto object = make_fingerprinter(11025, kPcm16, 1);
    uint8_t bytes[60];
    qv::FingerprintTimes times{};
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE,
              qvfixed::Fingerprinter::extract(object.get(), bytes, 60, times));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              qvfixed::Fingerprinter::extract(object.get(), bytes, 59, times));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              qvfixed::Fingerprinter::extract(nullptr, bytes, 60, times));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              qvfixed::Fingerprinter::extract(object.get(), nullptr, 60, times));
}

TEST_F(Fingerprinter, NothingButTheEqualiserAndTheRecordsAllocatesWhileFeeding)
{
    const auto object = make_fingerprinter(48000, kPcm16, 2);
    const auto music = tune(48000, 2, 15);
    const uint64_t before = allocation_count();
    EXPECT_TRUE(feed(*object, music));
    EXPECT_EQ(before + 2 * 12, allocation_count());
}

TEST_F(Fingerprinter, CreateSurvivesEveryFailedAllocation)
{
    for_every_failed_allocation([](auto fired) {
        kzqvfixed_fingerprinter* made = nullptr;
        const kz_status status = kzqvfixed_constructor(1, 48000, kPcm16, 2, &made);
        const Qvfixed<kzqvfixed_fingerprinter> object(made);
        EXPECT_EQ(fired() ? KZ_QV_ERROR_MEMORY : KZ_OK, status);
        EXPECT_EQ(fired(), made == nullptr);
    });
}

TEST_F(Fingerprinter, DestructorRefusesNull)
{
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_destructor(nullptr));
}

} // namespace kz::test
