// Handles are independent of each other: jobs on several threads neither disturb each other's
// documents nor race for anything that they share. The thread sanitizer watches these tests in CI.

#include <algorithm>
#include <cstdint>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/kzsdk.h"
#include "support/signals.hpp"

namespace {

/// The document of a piece of music fed in pieces; what failed, when something did.
std::string document_of(const std::vector<int16_t>& music, uint32_t rate)
{
    kz_fpx_handle* handle = nullptr;
    if (kz_fpx_fingerprint_create(KZ_FPX_ALGORITHM_FIXED, KZ_FPX_FORMAT_PCM16, rate, 1, &handle) !=
        KZ_OK) {
        return "not created";
    }
    uint8_t complete = 0;
    for (size_t done = 0; done < music.size() && complete == 0; done += 4096) {
        const auto count = static_cast<uint32_t>(std::min<size_t>(4096, music.size() - done));
        kz_fpx_fingerprint_add_audio(handle, music.data() + done, 2 * count, &complete);
    }
    char* text = nullptr;
    std::string document = "not complete";
    if (kz_fpx_fingerprint_serialize(handle, &text) == KZ_OK) {
        document = text;
        kz_fpx_fingerprint_serialize_free(&text);
    }
    kz_fpx_fingerprint_free(&handle);
    return document;
}

template <class Job>
void run_beside_each_other(size_t count, Job job)
{
    std::vector<std::jthread> threads;
    for (size_t i = 0; i < count; ++i) {
        threads.emplace_back([job, i] { job(i); });
    }
}

class Threads : public ::testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0)); }
    void TearDown() override { EXPECT_EQ(KZ_OK, kzmem_shutdown()); }
};

TEST_F(Threads, HaveTheirOwnHandlesAndTheDocumentsOfOneThread)
{
    const std::vector<uint32_t> rates = {8000, 11025, 22050, 44100, 48000};
    std::vector<std::vector<int16_t>> music;
    std::vector<std::string> alone;
    for (const auto rate : rates) {
        music.push_back(kz::test::tune(rate, 1, 15.0, 0.5, rate));
        alone.push_back(document_of(music.back(), rate));
        ASSERT_TRUE(alone.back().starts_with("<?xml")) << alone.back();
    }
    std::vector<std::string> beside(2 * rates.size());
    run_beside_each_other(beside.size(), [&](size_t i) {
        beside[i] = document_of(music[i % rates.size()], rates[i % rates.size()]);
    });
    for (size_t i = 0; i < beside.size(); ++i) {
        EXPECT_EQ(alone[i % rates.size()], beside[i]) << rates[i % rates.size()] << " Hz";
    }
}

// Whoever switches memory off under another thread makes its allocations fail, but breaks nothing.
TEST_F(Threads, MaySeeTheMemoryManagerSwitchedOffAndOn)
{
    run_beside_each_other(4, [](size_t i) {
        for (int round = 0; round < 20000; ++round) {
            if (i == 0) {
                kzmem_shutdown();
                kzmem_initialize(0, 0);
                continue;
            }
            void* block = _kzmem_malloc(16);
            while (_kzmem_free(block) == KZ_MEM_NOT_ON) {
            }
        }
    });
    EXPECT_EQ(KZ_MEM_ALREADY_ON, kzmem_query_availability());
}

} // namespace
