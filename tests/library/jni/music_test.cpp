// The worker over the library itself: audio in, query document out.

#include <array>
#include <atomic>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/abs/memory.h"
#include "kzsdk/abs/startup.h"
#include "kzsdk/jni/fingerprint_thread.hpp"
#include "platform_probe.hpp"
#include "support/allocation.hpp"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"
#include "worker.hpp"

namespace {

using namespace kz::test;
using android::Fingerprint;
using android::FingerprintThread;

std::vector<uint8_t> bytes_of(const std::vector<int16_t>& samples)
{
    std::vector<uint8_t> bytes(samples.size() * sizeof(int16_t));
    std::memcpy(bytes.data(), samples.data(), bytes.size());
    return bytes;
}

const std::vector<uint8_t>& music()
{
    static const std::vector<uint8_t> bytes = bytes_of(tune(11025, 1, 16));
    return bytes;
}

/// What the extraction interface makes of it.
std::string expected_document(Format format, uint32_t rate, Channels channels,
                              const std::vector<uint8_t>& audio)
{
    const kzconf_configuration configuration = {};
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&configuration));
    const Handle handle = create(fixed, format, rate, channels);
    EXPECT_TRUE(add(handle.get(), audio));
    return document_of(handle.get());
}

/// How a WAVE header describes samples.
struct Wave {
    int32_t code;
    int32_t bits;
};
constexpr Wave kPcm8 = {1, 8};
constexpr Wave kPcm16 = {1, 16};
constexpr Wave kPcm24 = {1, 24};
constexpr Wave kPcmOfNoBits = {1, 0};
constexpr Wave kALaw = {6, 8};
constexpr Wave kULaw = {7, 8};

/// The code that a job returns, and what it wrote.
std::pair<int32_t, std::string> run(uint32_t rate, Channels channels, const Wave& wave,
                                    const std::vector<uint8_t>& audio)
{
    Fingerprint job;
    job.setGenerateConfig(rate, static_cast<int32_t>(channels), wave.code, wave.bits, audio.data(),
                          static_cast<uint32_t>(audio.size()));
    std::array<char, 601> buffer = {};
    char* start = buffer.data();
    const int32_t result = job.generate(&start);
    return {result, buffer.data()};
}

using Outcome = std::pair<int32_t, std::string>;

class Music : public ::testing::Test {
protected:
    void TearDown() override { Fingerprint().do_kill_vesk(); }
};

TEST_F(Music, GivesTheDocumentOfTheExtractionInterface)
{
    const std::string document = expected_document(pcm16, 11025, mono, music());
    EXPECT_EQ((Outcome{0, document}), run(11025, mono, kPcm16, music()));
    EXPECT_LT(document.size(), 600U);
}

TEST_F(Music, RunsEveryEncodingThatHasAnInputFormat)
{
    EXPECT_EQ((Outcome{0, expected_document(pcm8, 11025, mono, music())}),
              run(11025, mono, kPcm8, music()));
    EXPECT_EQ((Outcome{0, expected_document(alaw, 11025, mono, music())}),
              run(11025, mono, kALaw, music()));
    EXPECT_EQ((Outcome{0, expected_document(ulaw, 11025, mono, music())}),
              run(11025, mono, kULaw, music()));
}

// A wrong but well-formed fingerprint: three bytes of a sample are not two.
TEST_F(Music, ReadsTwentyFourBitAudioAsSixteenBit)
{
    EXPECT_EQ((Outcome{0, expected_document(pcm16, 11025, mono, music())}),
              run(11025, mono, kPcm24, music()));
    EXPECT_EQ((Outcome{0, expected_document(pcm8, 11025, mono, music())}),
              run(11025, mono, kPcmOfNoBits, music()));
}

TEST_F(Music, FailsForWhatTheLibraryRefuses)
{
    for (const int32_t code : {2, 3, 17, 20, 49, 64, 80, 0}) {
        EXPECT_EQ((Outcome{-5, ""}), run(11025, mono, Wave{code, 16}, music())) << code;
    }
    const CapturedLog captured;
    EXPECT_EQ((Outcome{-5, ""}), run(12345, mono, kPcm16, music()));
    EXPECT_EQ((Outcome{-5, ""}), run(11025, Channels{UINT32_MAX}, kPcm16, music()));
    EXPECT_EQ((Outcome{-5, ""}), run(11025, mono, kPcm16, std::vector<uint8_t>(3, 1)));
    EXPECT_EQ(
        (LogLines{
            {6, "Fingerprint - Native", "kz_fpx_fingerprint_create() failed. error=900F0001"},
            {6, "Fingerprint - Native", "kz_fpx_fingerprint_create() failed. error=900F0004"},
            {6, "Fingerprint - Native", "kz_fpx_fingerprint_add_audio() failed error=900F0004"}}),
        captured.lines());
}

TEST_F(Music, ThatIsTooShortGivesNothing)
{
    const auto half = std::vector<uint8_t>(music().begin(), music().begin() + 100000);
    const CapturedLog captured;
    EXPECT_EQ((Outcome{-5, ""}), run(11025, mono, kPcm16, half));
    EXPECT_EQ(LogLines{}, captured.lines());
}

// One run takes milliseconds, and the resampler and the tree make many allocations: in steps.
TEST_F(Music, FailsOrGivesTheDocumentWhenAllocationFails)
{
    const std::string document = expected_document(pcm16, 11025, mono, music());
    const CapturedLog captured;
    for (const auto mode : {AllocationFault::Once, AllocationFault::FromThenOn}) {
        uint64_t failures = 0;
        for (uint64_t nth = 1;; nth += 7) {
            const int64_t before = live_blocks();
            bool fired = false;
            Outcome outcome;
            {
                Fingerprint job;
                job.setGenerateConfig(11025, 1, kPcm16.code, kPcm16.bits, music().data(),
                                      static_cast<uint32_t>(music().size()));
                std::array<char, 601> buffer = {};
                char* start = buffer.data();
                {
                    const AllocationFault fault(nth, mode);
                    outcome.first = job.generate(&start);
                    fired = fault.fired();
                }
                outcome.second = buffer.data();
            }
            EXPECT_TRUE(outcome.first == 0 || outcome == (Outcome{-5, ""})) << nth;
            failures += outcome.first != 0;
            EXPECT_EQ(before, live_blocks()) << nth;
            if (!fired) {
                EXPECT_EQ((Outcome{0, document}), outcome);
                break;
            }
        }
        EXPECT_GT(failures, 0U);
    }
}

// The first jobs of several workers may start the core at the same moment.
TEST_F(Music, OfSeveralFirstJobsAtOnceIsFingerprinted)
{
    const std::string document = expected_document(pcm16, 11025, mono, music());
    for (int round = 0; round < 5; ++round) {
        Fingerprint().do_kill_vesk();
        kzmem_shutdown();
        std::atomic<int> ready{0};
        std::vector<std::thread> threads;
        for (int i = 0; i < 4; ++i) {
            threads.emplace_back([&] {
                ++ready;
                while (ready < 4) {
                    std::this_thread::yield();
                }
                EXPECT_EQ((Outcome{0, document}), run(11025, mono, kPcm16, music()));
            });
        }
        for (auto& thread : threads) {
            thread.join();
        }
    }
}

TEST_F(Music, GoesThroughTheWorker)
{
    const std::string document = expected_document(pcm16, 11025, mono, music());
    Events::all().clear();
    FingerprintThread worker(nullptr);
    worker.setEventCallback(Events::post);
    ASSERT_EQ(0, worker.init());
    for (size_t made = 1; made <= 5; ++made) {
        ASSERT_EQ(0, worker.generate(11025, 1, 1, 16, music().data(),
                                     static_cast<uint32_t>(music().size())));
        EXPECT_EQ(0, Events::all().wait_for(made));
        EXPECT_EQ(document, worker.getFingerprint());
    }
}

} // namespace
