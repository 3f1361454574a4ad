// The numbers of a fingerprint context: each is that of its object, and cutting a stream into
// pieces of the reported size does not show.

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "kzsdk/fpx/algorithm.hpp"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"
#include "support/twins.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};
// What only the floating-point algorithm takes: near-copies, rates with large terms, a multiple.
constexpr uint32_t kOddRates[] = {11024, 12345, 44056, 96000};

struct Signal {
    uint32_t samples = 0;
    double seconds = 0;
    uint8_t found = 0;
};

// A handle of one of the algorithms, its fingerprinter in view.
template <class Twin>
class Context {
public:
    Context(uint32_t rate, Channels channels) : channels_(number(channels))
    {
        EXPECT_EQ(KZ_OK, create(Algorithm{Twin::kAlgorithm}, pcm16, rate, channels, &handle_));
    }
    ~Context() { kz_fpx_fingerprint_free(&handle_); }
    Context(const Context&) = delete;
    Context& operator=(const Context&) = delete;

    bool feed(const std::vector<int16_t>& music, size_t frame, size_t frames)
    {
        uint8_t complete = 0;
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(handle_, music.data() + frame * channels_,
                                                      static_cast<uint32_t>(frames * channels_ * 2),
                                                      &complete));
        return complete == 1;
    }
    uint32_t next_frames() const
    {
        uint32_t frames = 0;
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_get_next_frames(handle_, &frames));
        return frames;
    }

    uint32_t progress() const
    {
        uint32_t percent = 200;
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_get_progress(handle_, &percent));
        return percent;
    }

    Signal signal() const
    {
        Signal signal;
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_get_signal_offset(handle_, &signal.samples,
                                                              &signal.seconds, &signal.found));
        return signal;
    }

    kz_fpx_handle* get() const { return handle_; }

    typename Twin::Object& object() const
    {
        return *static_cast<typename Twin::Object*>(handle_->instance);
    }

private:
    uint32_t channels_;
    kz_fpx_handle* handle_ = nullptr;
};

// Every working-rate sample and every feature is the same word.
template <class Object>
void expect_same_words(const Object& a, const Object& b, uint32_t rate)
{
    EXPECT_EQ(a.signal_offset, b.signal_offset) << rate;
    EXPECT_EQ(a.frame_start, b.frame_start) << rate;
    EXPECT_EQ(a.write_position, b.write_position) << rate;
    EXPECT_TRUE(std::equal(a.ring, a.ring + a.frame_length, b.ring)) << rate;
    const auto* ra = a.frame_manager->records;
    const auto* rb = b.frame_manager->records;
    for (; ra != nullptr && rb != nullptr; ra = ra->next, rb = rb->next) {
        EXPECT_TRUE(std::equal(ra->energy, ra->energy + 15, rb->energy)) << rate;
        EXPECT_TRUE(std::equal(ra->amplitude, ra->amplitude + 15, rb->amplitude)) << rate;
    }
    EXPECT_EQ(ra == nullptr, rb == nullptr) << rate;
}

// Feeds what the interface reports as the next block, block by block, up to the end of the music or
// of the fingerprint.
template <class Twin>
bool feed_blocks(Context<Twin>& handle, const std::vector<int16_t>& music, size_t from,
                 size_t frames)
{
    bool complete = false;
    for (size_t at = from; !complete && at < frames;) {
        const uint32_t next = handle.next_frames();
        EXPECT_GT(next, 0U);
        EXPECT_LT(next, handle.object().input_rate > 48000 ? 300000U : 150000U);
        if (next == 0) {
            break;
        }
        const size_t count = std::min<size_t>(next, frames - at);
        complete = handle.feed(music, at, count);
        at += count;
    }
    return complete;
}

template <class Twin>
std::vector<uint32_t> rates()
{
    std::vector<uint32_t> all(std::begin(kRates), std::end(kRates));
    if (Twin::kAlgorithm == KZ_FPX_ALGORITHM_FLOAT) {
        all.insert(all.end(), std::begin(kOddRates), std::end(kOddRates));
    }
    return all;
}

} // namespace

template <class T>
class Numbers : public TwinTest<T> {
};
TYPED_TEST_SUITE(Numbers, Twins, TwinNames);

// The promise that lets a file be streamed: not only the document, every working-rate sample and
// every feature must be the same word as from one call.
TYPED_TEST(Numbers, PiecesOfTheNextFramesNeverShow)
{
    for (const uint32_t rate : rates<TypeParam>()) {
        for (const double silence : {0.0, 0.01, 2.9, 7.3}) {
            const uint32_t channels = 1 + rate % 7 % 2;
            auto music = noise(static_cast<size_t>((16.0 + silence) * rate) * channels, 0.9, rate);
            std::fill_n(music.begin(), static_cast<size_t>(silence * rate) * channels, int16_t{0});
            const size_t frames = music.size() / channels;
            Context<TypeParam> whole(rate, Channels{channels});
            Context<TypeParam> pieces(rate, Channels{channels});
            EXPECT_TRUE(whole.feed(music, 0, frames));
            EXPECT_TRUE(feed_blocks(pieces, music, 0, frames));
            expect_same_words(whole.object(), pieces.object(), rate);
        }
    }
}

// The same from any state that odd pieces leave behind, the states included in which the last
// sample of room needs no input of its own.
TYPED_TEST(Numbers, NextFramesAreExactFromAnyState)
{
    std::vector<uint32_t> some{8000, 48000, 22050, 11025};
    if (TypeParam::kAlgorithm == KZ_FPX_ALGORITHM_FLOAT) {
        some.insert(some.end(), {11024, 12345});
    }
    for (const uint32_t rate : some) {
        const auto music = noise(size_t{rate} * 14, 0.9, rate);
        for (uint64_t seed = 0; seed < 10; ++seed) {
            Random random(seed + rate);
            const size_t odd = 1 + random.below(rate * 3);
            Context<TypeParam> whole(rate, mono);
            Context<TypeParam> pieces(rate, mono);
            whole.feed(music, 0, odd);
            pieces.feed(music, 0, odd);
            whole.feed(music, odd, music.size() - odd);
            feed_blocks(pieces, music, odd, music.size());
            expect_same_words(whole.object(), pieces.object(), rate);
        }
    }
}

// When upsampling, a step can make a sample without taking any input: when one sample of room is
// left just after the room before was filled. (A signal found one sample into a full ring gets
// there.) The feed must go on, not end, and the block to feed next is that of the step after.
TYPED_TEST(Numbers, AStepThatOnlyProducesKeepsTheFeedGoing)
{
    const auto music = noise(8000 * 15, 0.5, 1);
    const std::vector<int16_t> silence(8000 * 30, 0);
    uint32_t met = 0;
    for (uint32_t blocks = 2; blocks < 8; ++blocks) {
        Context<TypeParam> whole(8000, mono);
        Context<TypeParam> pieces(8000, mono);
        for (Context<TypeParam>* handle : {&whole, &pieces}) {
            for (uint32_t i = 0; i < blocks; ++i) {
                handle->feed(silence, 0, handle->next_frames());
            }
            handle->object().searching_for_signal = 0;
            handle->object().write_position = 32767;
        }
        const auto& r = *whole.object().resampler;
        met += r.history_end - r.history_start == r.taps_per_phase && r.phase + r.down < r.up;
        EXPECT_TRUE(whole.feed(music, 0, music.size())) << blocks;
        EXPECT_TRUE(feed_blocks(pieces, music, 0, music.size())) << blocks;
        expect_same_words(whole.object(), pieces.object(), 8000);
    }
    EXPECT_GT(met, 0U);
}

TYPED_TEST(Numbers, ReportSilenceAndProgress)
{
    auto music = noise(11025 * 20, 0.5, 3);
    std::fill_n(music.begin(), 11025, int16_t{0});
    Context<TypeParam> handle(11025, mono);
    EXPECT_EQ(0, handle.signal().found);
    EXPECT_EQ(0U, handle.progress());
    handle.feed(music, 0, 5000);
    EXPECT_EQ(5000U, handle.signal().samples);
    EXPECT_EQ(5000.0 / 11025, handle.signal().seconds);
    EXPECT_EQ(0, handle.signal().found);
    handle.feed(music, 5000, music.size() - 5000);
    EXPECT_EQ(1, handle.signal().found);
    EXPECT_NEAR(11025 - 64.0, handle.signal().samples, 40);
    EXPECT_EQ(100U, handle.progress());
}

TYPED_TEST(Numbers, TimesFollowTheFrames)
{
    auto music = noise(11025 * 20, 0.5, 3);
    std::fill_n(music.begin(), 11025, int16_t{0});
    Context<TypeParam> handle(11025, mono);
    uint32_t start = 9;
    uint32_t duration = 9;
    ASSERT_EQ(KZ_OK, kz_fpx_fingerprint_get_times(handle.get(), &start, &duration));
    EXPECT_EQ(0U, start);
    EXPECT_EQ(0U, duration) << "before the first frame";
    handle.feed(music, 0, 11025 + 32768 + 11264);
    ASSERT_EQ(KZ_OK, kz_fpx_fingerprint_get_times(handle.get(), &start, &duration));
    const double offset = handle.signal().samples;
    EXPECT_EQ(static_cast<uint32_t>(offset * 1000 / 11025), start);
    EXPECT_EQ(3993U, duration) << "two frames: 44032 samples";
    handle.feed(music, 11025 + 32768 + 11264, 11025 * 12);
    ASSERT_EQ(KZ_OK, kz_fpx_fingerprint_get_times(handle.get(), nullptr, &duration));
    EXPECT_EQ(14210U, duration) << "twelve frames: 156672 samples";
}

// The document writes the sixteen bits of each value without a sign.
TYPED_TEST(Numbers, ValuesAreThoseOfTheDocument)
{
    Context<TypeParam> handle(11025, mono);
    handle.feed(noise(11025 * 15, 0.5, 3), 0, 11025 * 15);
    std::vector<int16_t> values(31, 77);
    uint32_t count = 0;
    ASSERT_EQ(KZ_OK, kz_fpx_fingerprint_get_values(handle.get(), values.data(), 31, &count));
    EXPECT_EQ(30U, count);
    EXPECT_EQ(77, values[30]) << "written behind the values";
    std::string printed;
    for (uint32_t i = 0; i < count; ++i) {
        printed += i == 0 ? ">" : " ";
        printed += std::to_string(static_cast<uint16_t>(values[i]));
    }
    char* document = nullptr;
    ASSERT_EQ(KZ_OK, kz_fpx_fingerprint_serialize(handle.get(), &document));
    EXPECT_NE(nullptr, std::strstr(document, (printed + "<").c_str())) << document;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&document));
}

TYPED_TEST(Numbers, ValuesAreRefusedWithTheirCount)
{
    int16_t values[30] = {77};
    uint32_t count = 0;
    Context<TypeParam> handle(11025, mono);
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE,
              kz_fpx_fingerprint_get_values(handle.get(), values, 30, &count));
    EXPECT_EQ(30U, count);
    handle.feed(noise(11025 * 15, 0.5, 3), 0, 11025 * 15);
    count = 0;
    EXPECT_EQ(KZ_FPX_ERROR_ROOM, kz_fpx_fingerprint_get_values(handle.get(), values, 29, &count));
    EXPECT_EQ(30U, count);
    EXPECT_EQ(KZ_FPX_ERROR_ROOM, kz_fpx_fingerprint_get_values(handle.get(), values, 0, &count));
    EXPECT_EQ(77, values[0]) << "copied on failure";
    count = 9;
    EXPECT_NE(KZ_OK, kz_fpx_fingerprint_get_values(nullptr, nullptr, 0, &count));
    EXPECT_EQ(0U, count);
}

TYPED_TEST(Numbers, ValuesMayBeCountedAlone)
{
    uint32_t count = 0;
    Context<TypeParam> handle(11025, mono);
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE,
              kz_fpx_fingerprint_get_values(handle.get(), nullptr, 0, &count));
    EXPECT_EQ(30U, count);
    handle.feed(noise(11025 * 15, 0.5, 3), 0, 11025 * 15);
    count = 0;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_get_values(handle.get(), nullptr, 0, &count));
    EXPECT_EQ(30U, count);
}

// What is reported as the next piece can be handed over: its bytes are counted in 32 bits.
TYPED_TEST(Numbers, NextFramesFitOneCall)
{
    if (TypeParam::kAlgorithm == KZ_FPX_ALGORITHM_FLOAT) {
        for (const uint32_t rate : {361000000U, 400000000U, 1000000000U}) {
            const Context<TypeParam> handle(rate, stereo);
            EXPECT_GT(handle.next_frames(), 0U);
            EXPECT_LE(uint64_t{handle.next_frames()} * 4, UINT32_MAX) << rate;
        }
    }
}

TYPED_TEST(Numbers, RefuseNullPointers)
{
    const Context<TypeParam> handle(11025, mono);
    uint32_t number = 0;
    int16_t value = 0;
    constexpr kz_status kRefused = KZ_FPX_ERROR_INVALID_ARGUMENT;
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_values(nullptr, &value, 1, &number));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_values(handle.get(), nullptr, 1, &number));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_values(handle.get(), &value, 1, nullptr));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_signal_offset(nullptr, &number, nullptr, nullptr));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_times(nullptr, &number, &number));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_progress(nullptr, &number));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_progress(handle.get(), nullptr));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_next_frames(nullptr, &number));
    EXPECT_EQ(kRefused, kz_fpx_fingerprint_get_next_frames(handle.get(), nullptr));
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_get_signal_offset(handle.get(), nullptr, nullptr, nullptr));
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_get_times(handle.get(), nullptr, nullptr));
}

TYPED_TEST(Numbers, ValuesSurviveEveryFailedAllocation)
{
    Context<TypeParam> handle(11025, mono);
    handle.feed(noise(11025 * 15, 0.5, 3), 0, 11025 * 15);
    for_every_failed_allocation([&](auto fired) {
        handle.object().frame_manager->fingerprint_ready = 0;
        int16_t values[30];
        uint32_t count = 0;
        const kz_status status = kz_fpx_fingerprint_get_values(handle.get(), values, 30, &count);
        EXPECT_EQ(fired() ? KZ_FPX_ERROR_MEMORY : KZ_OK, status);
    });
}

} // namespace kz::test
