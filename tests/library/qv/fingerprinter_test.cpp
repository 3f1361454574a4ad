/// A fingerprinter's life from creation to result, for both twins.

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "support/signals.hpp"
#include "support/twins.hpp"

namespace kz::test {

namespace {

template <class Twin>
kz_status construct(Format format, uint32_t rate, Channels channels)
{
    typename Twin::Object* object = nullptr;
    const kz_status status = Twin::construct(0, rate, number(format), number(channels), &object);
    EXPECT_EQ(status == KZ_OK, object != nullptr);
    const OwnedObject<Twin> owner(object);
    return status;
}

template <class Twin>
bool feed(const OwnedObject<Twin>& object, const std::vector<int16_t>& samples, size_t from = 0,
          size_t count = SIZE_MAX)
{
    uint8_t complete = 9;
    count = std::min(count, samples.size() - from);
    EXPECT_EQ(KZ_OK, Twin::add_samples(object.get(), samples.data() + from,
                                       static_cast<uint32_t>(count * 2), &complete));
    EXPECT_LE(complete, 1);
    return complete == 1;
}

template <class Object>
std::string image(const Object& object)
{
    return {reinterpret_cast<const char*>(&object), sizeof object};
}

} // namespace

template <class T>
class Fingerprinter : public TwinTest<T> {
};
TYPED_TEST_SUITE(Fingerprinter, Twins, TwinNames);

TYPED_TEST(Fingerprinter, AcceptsEightRatesFourFormatsOneOrTwoChannels)
{
    for (const uint32_t rate : {8000U, 11025U, 16000U, 22050U, 24000U, 32000U, 44100U, 48000U}) {
        for (const Format format : {pcm8, pcm16, alaw, ulaw}) {
            EXPECT_EQ(KZ_OK, construct<TypeParam>(format, rate, mono));
            EXPECT_EQ(KZ_OK, construct<TypeParam>(format, rate, stereo));
        }
    }
}

TYPED_TEST(Fingerprinter, RefusesBadArguments)
{
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct<TypeParam>(pcm16, 0, mono));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct<TypeParam>(Format{0}, 44100, mono));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct<TypeParam>(Format{5}, 44100, mono));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct<TypeParam>(pcm16, 44100, Channels{0}));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, construct<TypeParam>(pcm16, 44100, Channels{3}));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              construct<TypeParam>(pcm16, 44100, Channels{0xFFFFFFFF}));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              TypeParam::construct(1, 44100, number(pcm16), number(mono), nullptr));
}

TYPED_TEST(Fingerprinter, StartsInAKnownState)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 44100, stereo);
    EXPECT_EQ(2U, object->channel_count);
    EXPECT_EQ(44100U, object->input_rate);
    EXPECT_EQ(number(pcm16), object->input_format);
    EXPECT_EQ(4U, object->frame_bytes);
    EXPECT_EQ(make_config<TypeParam>()->sample_rate, object->working_rate);
    EXPECT_EQ(12U, object->frame_limit);
    EXPECT_EQ(1, object->searching_for_signal);
    EXPECT_EQ(1U, object->signal_search_enabled);
    EXPECT_EQ(0U, object->signal_offset);
    EXPECT_EQ(32768U, object->frame_length);
    EXPECT_EQ(11264U, object->hop);
    EXPECT_EQ(0U, object->frame_start);
    EXPECT_EQ(0U, object->write_position);
    EXPECT_EQ(1U, make_fingerprinter<TypeParam>(alaw, 8000, mono)->frame_bytes);
    EXPECT_EQ(2U, make_fingerprinter<TypeParam>(pcm8, 8000, stereo)->frame_bytes);
}

TYPED_TEST(Fingerprinter, RefusesPartsOfFramesAndConsumesNothing)
{
    const auto one = make_fingerprinter<TypeParam>(pcm16, 44100, mono);
    const auto two = make_fingerprinter<TypeParam>(pcm16, 44100, stereo);
    const uint32_t fresh = one->resampler->history_end;
    const uint8_t bytes[8] = {};
    const auto add = [&](auto* object, const void* data, uint32_t count) {
        uint8_t complete = 7;
        const kz_status status = TypeParam::add_samples(object, data, count, &complete);
        EXPECT_EQ(object == nullptr || data == nullptr ? 7 : 0, complete);
        return status;
    };
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, add(one.get(), bytes, 3));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, add(one.get(), bytes, 0));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, add(two.get(), bytes, 6));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, add(decltype(one.get())(nullptr), bytes, 2));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, add(one.get(), nullptr, 2));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, TypeParam::add_samples(one.get(), bytes, 2, nullptr));
    EXPECT_EQ(fresh, one->resampler->history_end);
    EXPECT_EQ(0U, one->signal_offset);
}

TYPED_TEST(Fingerprinter, SilenceOnlyGrowsTheOffset)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    const std::vector<int16_t> silence(11025 * 60, 0);
    EXPECT_FALSE(feed<TypeParam>(object, silence));
    EXPECT_EQ(silence.size(), object->signal_offset);
    EXPECT_EQ(1, object->searching_for_signal);
    EXPECT_EQ(0U, object->write_position);
    EXPECT_EQ(0U, object->frame_manager->frame_count);
    EXPECT_FALSE(feed<TypeParam>(object, silence));
    EXPECT_EQ(2 * silence.size(), object->signal_offset);
}

// 8000 Hz is resampled upwards, so an output may need no new input. With this much silence the
// signal starts one sample into the ring; its last place is then filled without consuming a byte,
// and the rest of the buffer must still be used.
TYPED_TEST(Fingerprinter, AStepThatOnlyProducesIsNotTheEnd)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 8000, mono);
    std::vector<int16_t> music(95139, 0);
    const auto sound = noise(8000 * 15, 0.5, 1);
    music.insert(music.end(), sound.begin(), sound.end());
    EXPECT_TRUE(feed<TypeParam>(object, music));
}

TYPED_TEST(Fingerprinter, FramesAreCutEveryHopFromTheSignalsStart)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    auto music = noise(11025 * 16, 0.5, 1);
    std::fill(music.begin(), music.begin() + 5000, int16_t{0});
    // One sample at a time around each border, to see the frames appear exactly there.
    feed<TypeParam>(object, music, 0, 32768);
    const uint32_t start = object->signal_offset;
    EXPECT_NEAR(5000 - 64.0, start, 40);
    EXPECT_EQ(0, object->searching_for_signal);
    EXPECT_EQ(32768 - start, object->write_position);
    size_t fed = 32768;
    for (uint32_t frame = 0; frame < 12; ++frame) {
        const size_t border = start + 32768 + size_t{frame} * 11264;
        feed<TypeParam>(object, music, fed, border - 1 - fed);
        EXPECT_EQ(frame, object->frame_manager->frame_count);
        EXPECT_EQ(frame == 11, feed<TypeParam>(object, music, border - 1, 1));
        EXPECT_EQ(frame + 1, object->frame_manager->frame_count);
        fed = border;
    }
}

TYPED_TEST(Fingerprinter, FeedingAfterCompletionChangesNothing)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    const auto music = noise(11025 * 20, 0.5, 2);
    EXPECT_TRUE(feed<TypeParam>(object, music));
    const std::string before = image(*object);
    EXPECT_TRUE(feed<TypeParam>(object, music));
    EXPECT_EQ(before, image(*object));
}

TYPED_TEST(Fingerprinter, ReadsSamplesAtOddAddresses)
{
    const auto music = tune(22050, 2, 16);
    const auto even = make_fingerprinter<TypeParam>(pcm16, 22050, stereo);
    const auto odd = make_fingerprinter<TypeParam>(pcm16, 22050, stereo);
    std::vector<uint8_t> bytes(music.size() * 2 + 1);
    std::memcpy(bytes.data() + 1, music.data(), music.size() * 2);
    uint8_t complete = 0;
    EXPECT_TRUE(feed<TypeParam>(even, music));
    EXPECT_EQ(KZ_OK, TypeParam::add_samples(odd.get(), bytes.data() + 1,
                                            static_cast<uint32_t>(music.size() * 2), &complete));
    EXPECT_EQ(1, complete);
    EXPECT_TRUE(std::equal(even->ring, even->ring + 32768, odd->ring));
}

// At 11025 Hz nothing but leading silence depends on how a stream is cut.
TYPED_TEST(Fingerprinter, CutsDoNotShowAt11025Hertz)
{
    const auto music = tune(11025, 2, 16);
    const auto whole = make_fingerprinter<TypeParam>(pcm16, 11025, stereo);
    EXPECT_TRUE(feed<TypeParam>(whole, music));
    for (uint64_t seed = 0; seed < 4; ++seed) {
        Random random(seed);
        const auto pieces = make_fingerprinter<TypeParam>(pcm16, 11025, stereo);
        // The signal starts with the first piece, which must be as long as a ring for its search.
        bool complete = feed<TypeParam>(pieces, music, 0, 65536);
        for (size_t at = 65536; !complete && at < music.size();) {
            const size_t count = 2 * (1 + random.below(seed % 2 == 0 ? 5000 : 77));
            complete = feed<TypeParam>(pieces, music, at, count);
            at += count;
        }
        EXPECT_TRUE(complete);
        EXPECT_TRUE(std::equal(whole->ring, whole->ring + 32768, pieces->ring));
        EXPECT_EQ(whole->frame_start, pieces->frame_start);
        int16_t a[30], b[30];
        TypeParam::get_fingerprint(whole->frame_manager, a, 60);
        TypeParam::get_fingerprint(pieces->frame_manager, b, 60);
        EXPECT_TRUE(std::equal(a, a + 30, b));
    }
}

TYPED_TEST(Fingerprinter, ProgressCountsFrames)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    uint32_t percent = 77;
    const auto progress = [&] {
        EXPECT_EQ(KZ_OK, TypeParam::get_object_progress(object.get(), &percent));
        return percent;
    };
    EXPECT_EQ(0U, progress());
    const auto music = noise(11025 * 20, 0.5, 2);
    feed<TypeParam>(object, music, 0, 32768 + 11264 * 2 + 100);
    EXPECT_EQ(25U, progress());
    feed<TypeParam>(object, music);
    EXPECT_EQ(100U, progress());
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, TypeParam::get_object_progress(nullptr, &percent));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, TypeParam::get_object_progress(object.get(), nullptr));
}

TYPED_TEST(Fingerprinter, TheResultIsRefusedUntilComplete)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    XMLTag* tree = nullptr;
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, TypeParam::get_result(object.get(), &tree));
    const auto music = noise(32768 + 10 * 11264, 0.5, 3);
    EXPECT_FALSE(feed<TypeParam>(object, music));
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, TypeParam::get_result(object.get(), &tree));
    EXPECT_EQ(nullptr, tree);
    EXPECT_TRUE(feed<TypeParam>(object, music));
    EXPECT_EQ(KZ_OK, TypeParam::get_result(object.get(), &tree));
    ASSERT_NE(nullptr, tree);
    EXPECT_STREQ("Quenvar", XMLGetDataAtPath(tree, "KZFPX_FP_QUERY/ALGORITHM/NAME"));
    EXPECT_STREQ("1.1", XMLGetDataAtPath(tree, "KZFPX_FP_QUERY/ALGORITHM/VERSION"));
    SmartDisposeXMLTag(&tree);
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, TypeParam::get_result(nullptr, &tree));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, TypeParam::get_result(object.get(), nullptr));
}

TYPED_TEST(Fingerprinter, TimesAreMillisecondsOfWorkingRateSamples)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    EXPECT_TRUE(feed<TypeParam>(object, noise(11025 * 20, 0.5, 2)));
    uint8_t bytes[60];
    qv::FingerprintTimes times{};
    object->signal_offset = 22050;
    EXPECT_EQ(KZ_OK, TypeParam::Fingerprinter::extract(object.get(), bytes, 60, times));
    EXPECT_EQ(2000U, times.start);
    EXPECT_EQ(14210U, times.duration); // 32768 + 11 * 11264 samples
    object->frame_limit = 0;
    TypeParam::reset_frame_manager(object->frame_manager);
    EXPECT_EQ(KZ_OK, TypeParam::Fingerprinter::extract(object.get(), bytes, 60, times));
    EXPECT_EQ(0U, times.duration); // no frames
}

TYPED_TEST(Fingerprinter, ExtractionRefusesNullsAndSmallBuffers)
{
    using Extract = typename TypeParam::Fingerprinter;
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    uint8_t bytes[60];
    qv::FingerprintTimes times{};
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, Extract::extract(object.get(), bytes, 60, times));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, Extract::extract(object.get(), bytes, 59, times));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, Extract::extract(nullptr, bytes, 60, times));
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, Extract::extract(object.get(), nullptr, 60, times));
}

TYPED_TEST(Fingerprinter, OnlyEqualiserAndRecordsAllocateWhileFeeding)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 48000, stereo);
    const auto music = tune(48000, 2, 15);
    const uint64_t before = allocation_count();
    EXPECT_TRUE(feed<TypeParam>(object, music));
    EXPECT_EQ(before + 2 * 12, allocation_count());
}

// Short of memory a frame can be lost and the fingerprint come late: never anything worse.
TYPED_TEST(Fingerprinter, FeedingSurvivesEveryFailedAllocation)
{
    const auto music = tune(11025, 1, 16);
    for (uint64_t nth = 1; nth <= 24; ++nth) {
        const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
        const AllocationFault fault(nth);
        EXPECT_TRUE(feed<TypeParam>(object, music));
        EXPECT_TRUE(fault.fired());
    }
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    {
        const AllocationFault fault(1, AllocationFault::FromThenOn);
        EXPECT_FALSE(feed<TypeParam>(object, music));
    }
    EXPECT_EQ(0U, object->frame_manager->frame_count);
    EXPECT_TRUE(feed<TypeParam>(object, music));
}

TYPED_TEST(Fingerprinter, CreateSurvivesEveryFailedAllocation)
{
    for_every_failed_allocation([](auto fired) {
        typename TypeParam::Object* made = nullptr;
        const kz_status status =
            TypeParam::construct(0, 48000, number(pcm16), number(stereo), &made);
        const OwnedObject<TypeParam> object(made);
        EXPECT_EQ(fired() ? KZ_QV_ERROR_MEMORY : KZ_OK, status);
        EXPECT_EQ(fired(), made == nullptr);
    });
}

TYPED_TEST(Fingerprinter, ResultSurvivesEveryFailedAllocation)
{
    const auto object = make_fingerprinter<TypeParam>(pcm16, 11025, mono);
    EXPECT_TRUE(feed<TypeParam>(object, noise(11025 * 16, 0.5, 3)));
    for_every_failed_allocation([&](auto /*fired*/) {
        object->frame_manager->fingerprint_ready = 0;
        XMLTag* tree = nullptr;
        const kz_status status = TypeParam::get_result(object.get(), &tree);
        EXPECT_EQ(status == KZ_OK, tree != nullptr);
        SmartDisposeXMLTag(&tree);
    });
}

TYPED_TEST(Fingerprinter, DestructorRefusesNull)
{
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, TypeParam::destruct(nullptr));
}

} // namespace kz::test
