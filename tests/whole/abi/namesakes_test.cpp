// A program may have functions whose names the library exports too: the library goes on calling its
// own.

#include <atomic>
#include <cstdint>
#include <vector>

#include <dlfcn.h>

#include <gtest/gtest.h>

#include "kzsdk/kzsdk.h"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"

namespace {

std::atomic<unsigned> calls{0};

} // namespace

// The program's own, exported so that the loader would find them before the library's.
uint32_t sq_root(uint32_t) noexcept
{
    ++calls;
    return 0;
}

kz_status hist_eq2(const float*, float*, uint32_t, uint32_t*, uint32_t) noexcept
{
    ++calls;
    return KZ_OK;
}

kz_status hist_eq_dual(const float*, uint32_t, const float*, uint32_t, float*, uint32_t, uint32_t*,
                       uint32_t) noexcept
{
    ++calls;
    return KZ_OK;
}

namespace {

using namespace kz::test;

/// Takes a fingerprint of the music, and reports whether it became complete.
bool completes(Algorithm algorithm, const std::vector<int16_t>& music)
{
    return add(create(algorithm, pcm16, 11025, mono).get(), music);
}

class Namesakes : public ::testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0)); }
    void TearDown() override { EXPECT_EQ(KZ_OK, kzmem_shutdown()); }
};

// Otherwise the next test would prove nothing.
TEST_F(Namesakes, AreWhatTheLoaderFindsFirst)
{
    EXPECT_EQ(reinterpret_cast<void*>(&sq_root), dlsym(RTLD_DEFAULT, "sq_root"));
    EXPECT_EQ(reinterpret_cast<void*>(&hist_eq_dual), dlsym(RTLD_DEFAULT, "hist_eq_dual"));
}

TEST_F(Namesakes, AreNotCalledByTheLibrary)
{
    const auto music = tune(11025, 1, 16);
    calls = 0;
    EXPECT_TRUE(completes(fixed, music));
    EXPECT_TRUE(completes(floating, music));
    EXPECT_EQ(0u, calls);
}

} // namespace
