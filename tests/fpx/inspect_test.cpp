#include "kzsdk/fpx/inspect.hpp"

#include <algorithm>
#include <vector>

#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/qvfixed/qvfixed.h"
#include "support/allocation.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

class Inspect : public MemoryOn {};

constexpr uint32_t kRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};

const kzqvfixed_fingerprinter& fixed(const kz_fpx_handle& handle)
{
    return *static_cast<const kzqvfixed_fingerprinter*>(handle.instance);
}

class Handle {
public:
    Handle(uint32_t rate, uint32_t channels) : channels_(channels)
    {
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_create(1, 2, rate, channels, &handle_));
    }
    ~Handle() { kz_fpx_fingerprint_free(&handle_); }
    Handle(const Handle&) = delete;
    Handle& operator=(const Handle&) = delete;

    bool feed(const std::vector<int16_t>& music, size_t frame, size_t frames)
    {
        uint8_t complete = 0;
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(handle_, music.data() + frame * channels_,
                                                      static_cast<uint32_t>(frames * channels_ * 2),
                                                      &complete));
        return complete == 1;
    }
    const kz_fpx_handle& operator*() const { return *handle_; }

private:
    uint32_t channels_;
    kz_fpx_handle* handle_ = nullptr;
};

} // namespace

// The promise that lets a file be streamed: not only the document, every working-rate sample and every
// feature must be the same word as from one call.
TEST_F(Inspect, FeedingBlockByBlockGivesTheSameWordsAsOneCall)
{
    for (const uint32_t rate : kRates) {
        for (const double silence : {0.0, 0.01, 2.9, 7.3}) {
            const uint32_t channels = 1 + rate % 7 % 2;
            auto music = noise(static_cast<size_t>((16.0 + silence) * rate) * channels, 0.9, rate);
            std::fill_n(music.begin(), static_cast<size_t>(silence * rate) * channels, int16_t{0});
            const size_t frames = music.size() / channels;

            Handle whole(rate, channels);
            EXPECT_TRUE(whole.feed(music, 0, frames));
            Handle pieces(rate, channels);
            bool complete = false;
            for (size_t at = 0; !complete && at < frames;) {
                const uint32_t next = fpx::next_block_frames(*pieces);
                ASSERT_GT(next, 0U);
                ASSERT_LT(next, 150000U);
                const size_t count = std::min<size_t>(next, frames - at);
                complete = pieces.feed(music, at, count);
                at += count;
            }
            EXPECT_TRUE(complete);

            const auto& a = fixed(*whole);
            const auto& b = fixed(*pieces);
            EXPECT_EQ(a.signal_offset, b.signal_offset);
            EXPECT_EQ(a.frame_start, b.frame_start);
            EXPECT_EQ(a.write_position, b.write_position);
            EXPECT_TRUE(std::equal(a.ring, a.ring + a.frame_length, b.ring)) << rate;
            const auto* ra = a.frame_manager->records;
            const auto* rb = b.frame_manager->records;
            for (; ra != nullptr && rb != nullptr; ra = ra->next, rb = rb->next) {
                EXPECT_TRUE(std::equal(ra->energy, ra->energy + 15, rb->energy)) << rate;
                EXPECT_TRUE(std::equal(ra->amplitude, ra->amplitude + 15, rb->amplitude)) << rate;
            }
            EXPECT_EQ(ra == nullptr, rb == nullptr);
        }
    }
}

// The same from any state that odd pieces leave behind, the states included in which the last sample of
// room needs no input of its own.
TEST_F(Inspect, TheNextBlockIsExactFromAnyState)
{
    for (const uint32_t rate : {8000U, 48000U, 22050U, 11025U}) {
        const auto music = noise(size_t{rate} * 14, 0.9, rate);
        for (uint64_t seed = 0; seed < 10; ++seed) {
            Random random(seed + rate);
            const size_t odd = 1 + random.below(static_cast<uint32_t>(rate * 3));
            Handle whole(rate, 1);
            Handle pieces(rate, 1);
            whole.feed(music, 0, odd);
            pieces.feed(music, 0, odd);
            whole.feed(music, odd, music.size() - odd);
            for (size_t at = odd; at < music.size();) {
                const size_t count =
                    std::min<size_t>(fpx::next_block_frames(*pieces), music.size() - at);
                pieces.feed(music, at, count);
                at += count;
            }
            EXPECT_EQ(fixed(*whole).write_position, fixed(*pieces).write_position);
            EXPECT_TRUE(
                std::equal(fixed(*whole).ring, fixed(*whole).ring + 32768, fixed(*pieces).ring))
                << rate << " Hz after " << odd;
        }
    }
}

// When upsampling, a step can make a sample without taking any input: when one sample of room is left just
// after the room before was filled. (A signal found one sample into a full ring gets there.) The feed
// must go on, not end, and the block to feed next is that of the step after.
TEST_F(Inspect, AStepThatOnlyProducesDoesNotEndTheFeed)
{
    const auto music = noise(8000 * 15, 0.5, 1);
    const std::vector<int16_t> silence(8000 * 30, 0);
    uint32_t met = 0;
    for (uint32_t blocks = 2; blocks < 8; ++blocks) {
        Handle whole(8000, 1);
        Handle pieces(8000, 1);
        for (Handle* handle : {&whole, &pieces}) {
            for (uint32_t i = 0; i < blocks; ++i) {
                handle->feed(silence, 0, fpx::next_block_frames(**handle));
            }
            auto& object = const_cast<kzqvfixed_fingerprinter&>(fixed(**handle));
            object.searching_for_signal = 0;
            object.write_position = 32767;
        }
        const auto& r = *fixed(*whole).resampler;
        met += r.history_end - r.history_start == r.taps_per_phase && r.phase + r.down < r.up;
        EXPECT_TRUE(whole.feed(music, 0, music.size())) << blocks;
        bool complete = false;
        for (size_t at = 0; !complete && at < music.size();) {
            const size_t count =
                std::min<size_t>(fpx::next_block_frames(*pieces), music.size() - at);
            ASSERT_GT(count, 0U);
            complete = pieces.feed(music, at, count);
            at += count;
        }
        EXPECT_TRUE(
            std::equal(fixed(*whole).ring, fixed(*whole).ring + 32768, fixed(*pieces).ring));
    }
    EXPECT_GT(met, 0U);
}

TEST_F(Inspect, TellsSilenceAndProgress)
{
    auto music = noise(11025 * 20, 0.5, 3);
    std::fill_n(music.begin(), 11025, int16_t{0});
    Handle handle(11025, 1);
    EXPECT_FALSE(fpx::signal_found(*handle));
    EXPECT_EQ(0U, fpx::percent_progress(*handle));
    handle.feed(music, 0, 5000);
    EXPECT_EQ(5000U, fpx::signal_offset(*handle));
    EXPECT_FALSE(fpx::signal_found(*handle));
    handle.feed(music, 5000, music.size() - 5000);
    EXPECT_TRUE(fpx::signal_found(*handle));
    EXPECT_NEAR(11025 - 64.0, fpx::signal_offset(*handle), 40);
    EXPECT_EQ(100U, fpx::percent_progress(*handle));
}

} // namespace kz::test
