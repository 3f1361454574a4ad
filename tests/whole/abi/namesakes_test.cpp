// A program may have functions whose names the library exports too: the library goes on calling its
// own.

#include <atomic>
#include <cstdint>
#include <vector>

#include <dlfcn.h>

#include <gtest/gtest.h>

#include "kzsdk/kzsdk.h"
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

/// Takes a fingerprint of the music, and reports whether it became complete.
bool completes(uint32_t algorithm, const std::vector<int16_t>& music)
{
    kz_fpx_handle* handle = nullptr;
    uint8_t complete = 0;
    if (kz_fpx_fingerprint_create(algorithm, KZ_FPX_FORMAT_PCM16, 11025, 1, &handle) == KZ_OK) {
        const auto bytes = static_cast<uint32_t>(2 * music.size());
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(handle, music.data(), bytes, &complete));
    }
    kz_fpx_fingerprint_free(&handle);
    return complete != 0;
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
    const auto music = kz::test::tune(11025, 1, 16);
    calls = 0;
    EXPECT_TRUE(completes(KZ_FPX_ALGORITHM_FIXED, music));
    EXPECT_TRUE(completes(KZ_FPX_ALGORITHM_FLOAT, music));
    EXPECT_EQ(0u, calls);
}

} // namespace
