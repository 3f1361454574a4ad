// Streams from creation to end: what is refused, what is reported, who holds the library.

#include <cmath>
#include <thread>

#include "kzsdk/abs/memory.h"
#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/qvfixed/qvfixed.h"
#include "kzsdk/stream/stream_record.hpp"
#include "library/stream/streams.hpp"
#include "support/allocation.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFixed = KZ_FPX_ALGORITHM_FIXED;
constexpr uint32_t kFloat = KZ_FPX_ALGORITHM_FLOAT;
constexpr uint32_t kPcm16 = KZ_STREAM_FORMAT_PCM16;

bool is_on() { return kzmem_query_availability() == KZ_MEM_ALREADY_ON; }

// Nothing is on before and after a test, and nothing is left over.
class Streams : public ::testing::Test {
protected:
    void SetUp() override
    {
        ASSERT_FALSE(is_on());
        before_ = live_blocks();
    }
    void TearDown() override
    {
        EXPECT_EQ(before_, live_blocks()) << "blocks were leaked";
        EXPECT_FALSE(is_on()) << "the library is still held";
        kzmem_shutdown();
    }

private:
    int64_t before_ = 0;
};

kz_status creation(const kz_stream_settings& settings)
{
    auto* stream = reinterpret_cast<kz_stream*>(&is_on);
    const kz_status status = kz_stream_create(&settings, &stream);
    EXPECT_EQ(status == KZ_OK, stream != nullptr);
    kz_stream_free(&stream);
    return status;
}

kz_status creation(uint32_t algorithm, uint32_t format, uint32_t rate, uint32_t channels)
{
    return creation(settings_of(algorithm, format, rate, channels));
}

Stream stream_of_44100_hz() { return create(settings_of(kFixed, kPcm16, 44100, 1)); }

Taken feed_music(const Stream& stream, double silence, double sound, uint32_t rate = 44100)
{
    const Bytes bytes = bytes_of(music(rate, 1, silence, sound, 4));
    return feed(stream.get(), bytes.data(), bytes.size());
}

} // namespace

// ---- Creation

TEST_F(Streams, SettingsStartAsCdSound)
{
    kz_stream_settings settings;
    std::memset(&settings, 0xa5, sizeof settings);
    ASSERT_EQ(KZ_OK, kz_stream_initialize_settings(&settings));
    EXPECT_EQ(kFixed, settings.algorithm);
    EXPECT_EQ(kPcm16, settings.format);
    EXPECT_EQ(44100U, settings.sample_rate);
    EXPECT_EQ(2U, settings.channels);
    for (const uint32_t word : settings.reserved) {
        EXPECT_EQ(0U, word);
    }
    EXPECT_EQ(KZ_OK, creation(settings));
    EXPECT_EQ(KZ_STREAM_ERROR_INVALID_ARGUMENT, kz_stream_initialize_settings(nullptr));
}

TEST_F(Streams, RefuseSettingsFieldByField)
{
    EXPECT_EQ(KZ_STREAM_ERROR_ALGORITHM, creation(0, kPcm16, 44100, 2));
    EXPECT_EQ(KZ_STREAM_ERROR_ALGORITHM, creation(3, kPcm16, 44100, 2));
    EXPECT_EQ(KZ_STREAM_ERROR_FORMAT, creation(kFixed, 0, 44100, 2));
    EXPECT_EQ(KZ_STREAM_ERROR_FORMAT, creation(kFixed, 10, 44100, 2));
    EXPECT_EQ(KZ_STREAM_ERROR_ALGORITHM, creation(0, 0, 0, 0)) << "in the order of the record";
    EXPECT_EQ(KZ_STREAM_ERROR_FORMAT, creation(kFixed, 0, 0, 0));
    EXPECT_EQ(KZ_STREAM_ERROR_RATE, creation(kFixed, kPcm16, 0, 0));
    EXPECT_EQ(KZ_STREAM_ERROR_CHANNELS, creation(kFixed, kPcm16, 44100, 0));
    EXPECT_EQ(KZ_STREAM_ERROR_CHANNELS, creation(kFixed, kPcm16, 44100, 65536));
    EXPECT_EQ(KZ_STREAM_ERROR_CHANNELS, creation(kFixed, KZ_STREAM_FORMAT_PCM8, 44100, 3));
    kz_stream_settings settings = settings_of(kFixed, kPcm16, 44100, 2);
    settings.reserved[11] = 1;
    EXPECT_EQ(KZ_STREAM_ERROR_INVALID_ARGUMENT, creation(settings));
}

TEST_F(Streams, FixedAlgorithmTakesEightRatesAndDoubles)
{
    for (const uint32_t rate : {8000U, 11025U, 16000U, 22050U, 24000U, 32000U, 44100U, 48000U}) {
        for (uint32_t factor = 1; factor <= 16; factor *= 2) {
            EXPECT_EQ(KZ_OK, creation(kFixed, kPcm16, rate * factor, 1)) << rate * factor;
        }
    }
    for (const uint32_t rate : {0U, 1U, 4000U, 11024U, 12000U, 44101U, 96001U, 144000U, 1411200U,
                                KZ_STREAM_MAX_RATE, UINT32_MAX}) {
        EXPECT_EQ(KZ_STREAM_ERROR_RATE, creation(kFixed, kPcm16, rate, 1)) << rate;
    }
    EXPECT_EQ(KZ_STREAM_ERROR_RATE, creation(kFixed, KZ_STREAM_FORMAT_PCM8, 96000, 1));
    EXPECT_EQ(KZ_OK, creation(kFixed, KZ_STREAM_FORMAT_LINEAR8, 96000, 1)) << "its cure";
    EXPECT_NE(nullptr,
              std::strstr(kz_status_text(KZ_STREAM_ERROR_RATE), "KZ_STREAM_FORMAT_LINEAR8"));
}

TEST_F(Streams, FloatAlgorithmTakesEveryRate)
{
    for (const uint32_t rate :
         {1U, 1000U, 11024U, 12000U, 44101U, 96001U, 192000U, 768000U, KZ_STREAM_MAX_RATE}) {
        EXPECT_EQ(KZ_OK, creation(kFloat, kPcm16, rate, 2)) << rate;
    }
    for (const uint32_t rate : {0U, KZ_STREAM_MAX_RATE + 1, UINT32_MAX}) {
        EXPECT_EQ(KZ_STREAM_ERROR_RATE, creation(kFloat, kPcm16, rate, 2)) << rate;
    }
}

TEST_F(Streams, TakeAnyNumberOfChannels)
{
    for (const uint32_t channels : {1U, 2U, 3U, 6U, 255U, KZ_STREAM_MAX_CHANNELS}) {
        const Stream stream = create(settings_of(kFixed, KZ_STREAM_FORMAT_FLOAT64, 8000, channels));
        const Bytes frames(size_t{channels} * 8 * 3 - 1);
        feed(stream.get(), frames.data(), frames.size());
        EXPECT_EQ(2U, state_of(stream.get()).frames);
        EXPECT_EQ(channels * 8 - 1, state_of(stream.get()).partial_frame_bytes);
    }
}

TEST_F(Streams, RefuseNullPointers)
{
    constexpr kz_status kRefused = KZ_STREAM_ERROR_INVALID_ARGUMENT;
    const auto settings = settings_of(kFixed, kPcm16, 44100, 1);
    const Stream stream = create(settings);
    kz_stream* none = nullptr;
    uint8_t flag = 0;
    uint32_t number = 0;
    int16_t value = 0;
    kz_stream_state state;
    const char* text = nullptr;
    EXPECT_EQ(kRefused, kz_stream_create(nullptr, &none));
    EXPECT_EQ(kRefused, kz_stream_create(&settings, nullptr));
    EXPECT_EQ(kRefused, kz_stream_feed(nullptr, &value, 2, nullptr, &flag));
    EXPECT_EQ(kRefused, kz_stream_feed(stream.get(), nullptr, 2, nullptr, &flag));
    EXPECT_EQ(kRefused, kz_stream_feed(stream.get(), &value, 2, nullptr, nullptr));
    EXPECT_EQ(kRefused, kz_stream_finish(nullptr, &flag));
    EXPECT_EQ(kRefused, kz_stream_finish(stream.get(), nullptr));
    EXPECT_EQ(kRefused, kz_stream_get_state(nullptr, &state));
    EXPECT_EQ(kRefused, kz_stream_get_state(stream.get(), nullptr));
    EXPECT_EQ(kRefused, kz_stream_get_values(nullptr, &value, 1, &number));
    EXPECT_EQ(kRefused, kz_stream_get_values(stream.get(), nullptr, 1, &number));
    EXPECT_EQ(kRefused, kz_stream_get_values(stream.get(), &value, 1, nullptr));
    EXPECT_EQ(kRefused, kz_stream_get_document(nullptr, &text));
    EXPECT_EQ(kRefused, kz_stream_get_document(stream.get(), nullptr));
    EXPECT_EQ(kRefused, kz_stream_get_signal_offset(nullptr, &number, nullptr, &flag));
    EXPECT_EQ(kRefused, kz_stream_get_times(nullptr, &number, &number));
    EXPECT_EQ(kRefused, kz_stream_free(nullptr));
    EXPECT_EQ(KZ_OK, kz_stream_free(&none));
    EXPECT_EQ(KZ_OK, kz_stream_feed(stream.get(), nullptr, 0, nullptr, &flag)) << "no bytes";
    EXPECT_EQ(0U, state_of(stream.get()).frames);
}

TEST_F(Streams, ClearTheirResultsOnFailure)
{
    Stream stream = stream_of_44100_hz();
    uint8_t complete = 9;
    EXPECT_NE(KZ_OK, kz_stream_feed(nullptr, &complete, 1, nullptr, &complete));
    EXPECT_EQ(0, complete);
    complete = 9;
    EXPECT_NE(KZ_OK, kz_stream_finish(nullptr, &complete));
    EXPECT_EQ(0, complete);
    uint32_t count = 9;
    EXPECT_NE(KZ_OK, kz_stream_get_values(nullptr, nullptr, 0, &count));
    EXPECT_EQ(0U, count);
    EXPECT_TRUE(feed_music(stream, 0, 16).complete);
    ASSERT_EQ(KZ_OK, kzinit_shutdown_vesk());
    EXPECT_EQ(KZ_STREAM_ERROR_NOT_STARTED, kz_stream_finish(stream.get(), &complete));
    EXPECT_EQ(0, complete);
    count = 9;
    EXPECT_EQ(KZ_STREAM_ERROR_NOT_STARTED, kz_stream_get_values(stream.get(), nullptr, 0, &count));
    EXPECT_EQ(0U, count);
}

// ---- Reports

TEST_F(Streams, ReportNothingFed)
{
    const Stream stream = stream_of_44100_hz();
    for (const bool finished : {false, true}) {
        const auto state = state_of(stream.get());
        EXPECT_EQ(uint32_t{KZ_STREAM_NOTHING_FED}, state.phase) << finished;
        EXPECT_EQ(14220U, state.missing_milliseconds);
        EXPECT_EQ(0U, state.percent);
        EXPECT_FALSE(finish(stream.get()));
    }
}

TEST_F(Streams, ReportSilence)
{
    const Stream stream = stream_of_44100_hz();
    feed_music(stream, 10, 0);
    auto state = state_of(stream.get());
    EXPECT_EQ(uint32_t{KZ_STREAM_SILENT}, state.phase);
    EXPECT_EQ(10000U, state.silence_milliseconds + state.sound_milliseconds);
    EXPECT_LE(state.sound_milliseconds, 3000U) << "not yet analysed";
    EXPECT_FALSE(finish(stream.get()));
    state = state_of(stream.get());
    EXPECT_EQ(uint32_t{KZ_STREAM_SILENT}, state.phase);
    EXPECT_EQ(10000U, state.silence_milliseconds);
    EXPECT_EQ(0U, state.sound_milliseconds);
    EXPECT_EQ(14220U, state.missing_milliseconds);
}

TEST_F(Streams, ReportHowMuchIsMissing)
{
    const Stream stream = stream_of_44100_hz();
    feed_music(stream, 5, 8);
    EXPECT_FALSE(finish(stream.get()));
    const auto state = state_of(stream.get());
    EXPECT_EQ(uint32_t{KZ_STREAM_TOO_SHORT}, state.phase);
    EXPECT_EQ(13000U, state.silence_milliseconds + state.sound_milliseconds);
    EXPECT_NEAR(5000, static_cast<double>(state.silence_milliseconds), 10);
    EXPECT_EQ(14220 - state.sound_milliseconds, state.missing_milliseconds);
    EXPECT_EQ(41U, state.percent) << "five frames of twelve";
    uint32_t samples = 0;
    double seconds = 0;
    uint8_t found = 0;
    EXPECT_EQ(KZ_OK, kz_stream_get_signal_offset(stream.get(), &samples, &seconds, &found));
    EXPECT_EQ(1, found);
    EXPECT_EQ(samples / 11025.0, seconds);
    EXPECT_NEAR(5, seconds, 0.01);
}

// The signal's offset is counted in 32 bits, which wrap after 4.5 days of silence.
TEST_F(Streams, CountDaysOfSilence)
{
    for (const uint64_t days : {4U, 5U, 9U, 40U}) {
        const Stream stream = create(settings_of(kFixed, kPcm16, 22050, 1));
        const uint64_t seconds = days * 24 * 3600;
        stream->frames = seconds * 22050; // as if so many had been fed
        stream->judged_frames = stream->frames;
        auto* const object = static_cast<kzqvfixed_fingerprinter*>(stream->handle->instance);
        object->signal_offset = static_cast<uint32_t>(seconds * 11025);
        EXPECT_EQ(seconds * 1000, state_of(stream.get()).silence_milliseconds) << days;
        feed_music(stream, 5, 8, 22050);
        const auto state = state_of(stream.get());
        EXPECT_EQ(uint32_t{KZ_STREAM_TOO_SHORT}, state.phase);
        EXPECT_NEAR(static_cast<double>(seconds * 1000 + 5000),
                    static_cast<double>(state.silence_milliseconds), 10)
            << days;
        EXPECT_EQ((seconds + 13) * 1000, state.silence_milliseconds + state.sound_milliseconds);
    }
}

// What it says is missing is enough, and little more than that.
TEST_F(Streams, MissingSoundCompletesTheFingerprint)
{
    for (const uint32_t rate : {8000U, 11025U, 44100U, 48000U, 96000U}) {
        const Stream stream = create(settings_of(kFixed, kPcm16, rate, 1));
        feed_music(stream, 0, 8, rate);
        const double rest = state_of(stream.get()).missing_milliseconds / 1000.0;
        feed_music(stream, 0, rest - 0.05, rate);
        EXPECT_EQ(uint32_t{KZ_STREAM_TOO_SHORT}, state_of(stream.get()).phase) << rate;
        feed_music(stream, 0, 0.05, rate);
        EXPECT_TRUE(finish(stream.get())) << rate;
        EXPECT_EQ(0U, state_of(stream.get()).missing_milliseconds);
    }
}

// At very low rates the resampler holds back more than the usual milliseconds cover.
TEST_F(Streams, MissSomethingUntilTheyAreComplete)
{
    const Stream stream = create(settings_of(kFloat, kPcm16, 100, 1));
    EXPECT_FALSE(feed_music(stream, 0, 14.25, 100).complete);
    EXPECT_FALSE(finish(stream.get()));
    EXPECT_GE(state_of(stream.get()).sound_milliseconds, KZ_FPX_MILLISECONDS_NEEDED);
    EXPECT_EQ(1U, state_of(stream.get()).missing_milliseconds);
}

TEST_F(Streams, ReportTheFingerprintOnceComplete)
{
    const Stream stream = stream_of_44100_hz();
    int16_t values[30];
    uint32_t count = 0;
    const char* text = nullptr;
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, kz_stream_get_values(stream.get(), values, 30, &count));
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, kz_stream_get_document(stream.get(), &text));
    EXPECT_EQ(nullptr, text);
    EXPECT_TRUE(feed_music(stream, 1, 16).complete);
    EXPECT_EQ(KZ_FPX_ERROR_ROOM, kz_stream_get_values(stream.get(), values, 29, &count));
    count = 0;
    EXPECT_EQ(KZ_OK, kz_stream_get_values(stream.get(), nullptr, 0, &count)) << "the count alone";
    EXPECT_EQ(30U, count);
    EXPECT_EQ(KZ_OK, kz_stream_get_values(stream.get(), values, 30, &count));
    EXPECT_EQ(30U, count);
    EXPECT_EQ(KZ_OK, kz_stream_get_document(stream.get(), &text));
    const char* again = nullptr;
    EXPECT_EQ(KZ_OK, kz_stream_get_document(stream.get(), &again));
    EXPECT_EQ(text, again) << "written once";
    EXPECT_NE(nullptr, std::strstr(text, (">" + std::to_string(values[0]) + " ").c_str()));
    uint32_t start = 0;
    uint32_t duration = 0;
    EXPECT_EQ(KZ_OK, kz_stream_get_times(stream.get(), &start, &duration));
    EXPECT_NEAR(1000, start, 10);
    EXPECT_EQ(14210U, duration);
}

TEST_F(Streams, TakeNothingOnceComplete)
{
    const Stream stream = stream_of_44100_hz();
    const Taken taken = feed_music(stream, 0, 20);
    EXPECT_TRUE(taken.complete);
    EXPECT_LT(taken.used, uint64_t{20} * 44100 * 2);
    EXPECT_EQ(100U, state_of(stream.get()).percent);
    EXPECT_EQ(0U, feed_music(stream, 0, 1).used);
    EXPECT_EQ(taken.used / 2, state_of(stream.get()).frames);
    EXPECT_TRUE(finish(stream.get()));
    EXPECT_EQ(0U, feed_music(stream, 0, 1).used) << "no failure after its end";
}

TEST_F(Streams, RefuseSoundOnceFinished)
{
    const Stream stream = stream_of_44100_hz();
    feed_music(stream, 0, 1);
    EXPECT_FALSE(finish(stream.get()));
    EXPECT_FALSE(finish(stream.get())) << "it may be repeated";
    const uint8_t bytes[2] = {};
    uint64_t used = 9;
    uint8_t complete = 9;
    EXPECT_EQ(KZ_STREAM_ERROR_FINISHED, kz_stream_feed(stream.get(), bytes, 2, &used, &complete));
    EXPECT_EQ(0U, used);
    EXPECT_EQ(0, complete);
}

// ---- Holding the library

TEST_F(Streams, HoldTheLibraryWhileTheyLive)
{
    {
        const Stream first = stream_of_44100_hz();
        EXPECT_TRUE(is_on());
        stream_of_44100_hz().reset();
        EXPECT_TRUE(is_on()) << "the other stream's end";
        EXPECT_TRUE(feed_music(first, 0, 16).complete);
    }
    EXPECT_FALSE(is_on());
    EXPECT_EQ(KZ_STREAM_ERROR_RATE, creation(kFixed, kPcm16, 12345, 1));
    EXPECT_FALSE(is_on()) << "after a refusal";
}

TEST_F(Streams, SurviveAPlainShutdown)
{
    const Bytes sound = bytes_of(music(44100, 1, 0, 16, 4));
    const size_t half = sound.size() / 2;
    Stream stream = stream_of_44100_hz();
    feed(stream.get(), sound.data(), half);
    ASSERT_EQ(KZ_OK, kzinit_shutdown_vesk());
    uint64_t used = 9;
    uint8_t complete = 9;
    EXPECT_EQ(KZ_STREAM_ERROR_NOT_STARTED,
              kz_stream_feed(stream.get(), sound.data() + half, half, &used, &complete));
    EXPECT_EQ(0U, used);
    EXPECT_EQ(KZ_STREAM_ERROR_NOT_STARTED, kz_stream_finish(stream.get(), &complete));
    const char* text = nullptr;
    EXPECT_EQ(KZ_STREAM_ERROR_NOT_STARTED, kz_stream_get_document(stream.get(), &text));
    int16_t values[30];
    uint32_t count = 0;
    EXPECT_EQ(KZ_STREAM_ERROR_NOT_STARTED, kz_stream_get_values(stream.get(), values, 30, &count));
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    feed(stream.get(), sound.data() + half, half);
    EXPECT_EQ(document_of_one_call(kFixed, kPcm16, 44100, 1, sound.data(), sound.size()),
              document_of(stream.get()))
        << "it goes on where it was";
    EXPECT_EQ(KZ_OK, kzinit_release());
    ASSERT_EQ(KZ_OK, kzinit_shutdown_vesk());
    stream.reset(); // leaks nothing, which TearDown sees
    EXPECT_FALSE(is_on());
}

// The library stays off for every user, also for a stream that is still alive.
TEST_F(Streams, FreeingDoesNotUndoAPlainShutdown)
{
    Stream first = stream_of_44100_hz();
    Stream second = stream_of_44100_hz();
    ASSERT_EQ(KZ_OK, kzinit_shutdown_vesk());
    first.reset();
    EXPECT_FALSE(is_on());
    const uint8_t bytes[2] = {};
    uint8_t complete = 9;
    EXPECT_EQ(KZ_STREAM_ERROR_NOT_STARTED,
              kz_stream_feed(second.get(), bytes, 2, nullptr, &complete));
    EXPECT_EQ(KZ_MEM_NOT_ON, _kzmem_free(nullptr)) << "only the stream's own blocks are freed";
    second.reset();
    EXPECT_EQ(KZ_INIT_ERROR_NOT_HELD, kzinit_release()) << "both holds were given back";
}

TEST_F(Streams, WorkBesideEachOtherOnThreads)
{
    std::vector<std::string> documents(4);
    std::vector<std::thread> threads;
    for (std::string& document : documents) {
        threads.emplace_back([&document] {
            const Stream stream = create(settings_of(kFixed, kPcm16, 8000, 1));
            feed_music(stream, 0, 16, 8000);
            document = document_of(stream.get());
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_NE("", documents[0]);
    EXPECT_EQ(std::vector<std::string>(4, documents[0]), documents);
}

// ---- Failing memory

TEST_F(Streams, CreationSurvivesEveryFailedAllocation)
{
    for (const uint32_t rate : {44100U, 192000U}) {
        for_every_failed_allocation([rate](auto fired) {
            const auto settings = settings_of(kFixed, KZ_STREAM_FORMAT_FLOAT32, rate, 2);
            kz_stream* stream = nullptr;
            const kz_status status = kz_stream_create(&settings, &stream);
            EXPECT_EQ(fired() ? KZ_STREAM_ERROR_MEMORY : KZ_OK, status);
            EXPECT_EQ(status == KZ_OK, stream != nullptr);
            EXPECT_EQ(KZ_OK, kz_stream_free(&stream));
        });
    }
}

// Frames that get lost would change the document: the stream says so and stays failed.
TEST_F(Streams, NeverConcealALostFrame)
{
    const Bytes sound = bytes_of(music(11025, 1, 0, 15, 4));
    std::string whole;
    for_every_failed_allocation([&](auto fired) {
        Stream stream;
        {
            const auto settings = settings_of(kFixed, kPcm16, 11025, 1);
            kz_stream* made = nullptr;
            if (kz_stream_create(&settings, &made) != KZ_OK) {
                return;
            }
            stream.reset(made);
        }
        uint8_t complete = 9;
        const kz_status status =
            kz_stream_feed(stream.get(), sound.data(), sound.size(), nullptr, &complete);
        EXPECT_EQ(fired() ? KZ_STREAM_ERROR_FAILED : KZ_OK, status);
        EXPECT_EQ(status == KZ_OK ? 1 : 0, complete);
        if (status != KZ_OK) {
            EXPECT_EQ(uint32_t{KZ_STREAM_FAILED}, state_of(stream.get()).phase);
            EXPECT_EQ(KZ_STREAM_ERROR_FAILED, kz_stream_finish(stream.get(), &complete));
            EXPECT_EQ(0, complete);
            const char* text = nullptr;
            EXPECT_EQ(KZ_STREAM_ERROR_FAILED, kz_stream_get_document(stream.get(), &text));
        }
    });
}

TEST_F(Streams, IgnoreFailuresOfOtherThreads)
{
    const Stream stream = stream_of_44100_hz();
    const stream::AllocationWatch watch;
    const AllocationFault fault(1);
    std::thread([] {
        const stream::AllocationWatch own;
        EXPECT_EQ(nullptr, _kzmem_malloc(1));
        EXPECT_TRUE(own.saw_failure());
    }).join();
    EXPECT_FALSE(watch.saw_failure());
}

TEST_F(Streams, ResultsMayBeAskedForAgain)
{
    const Stream stream = create(settings_of(kFloat, kPcm16, 11025, 1));
    EXPECT_TRUE(feed_music(stream, 0, 15, 11025).complete);
    const char* text = nullptr;
    uint64_t nth = 1;
    for (bool fired = true; fired; ++nth) {
        const AllocationFault fault(nth);
        const kz_status status = kz_stream_get_document(stream.get(), &text);
        fired = fault.fired();
        EXPECT_EQ(fired ? KZ_STREAM_ERROR_MEMORY : KZ_OK, status) << "allocation " << nth;
        EXPECT_EQ(fired, text == nullptr);
    }
    EXPECT_GT(nth, 10U);
    EXPECT_NE(nullptr, std::strstr(text, "<NAME>Quenvar</NAME>"));
}

} // namespace kz::test
