// The extraction interface without memory, for both algorithms.

#include <memory>
#include <vector>

#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/fpx/fpx.h"
#include "kzsdk/qvfixed/qvfixed.h"
#include "kzsdk/qvfloat/qvfloat.h"
#include "support/signals.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

struct FreeHandle {
    void operator()(kz_fpx_handle* handle) const { kz_fpx_fingerprint_free(&handle); }
};
using Handle = std::unique_ptr<kz_fpx_handle, FreeHandle>;

Handle make_handle(uint32_t algorithm)
{
    kz_fpx_handle* handle = nullptr;
    const kz_status status =
        kz_fpx_fingerprint_create(algorithm, KZ_FPX_FORMAT_PCM16, 11025, 1, &handle);
    EXPECT_EQ(status == KZ_OK, handle != nullptr);
    return Handle(handle);
}

bool feed_handle(kz_fpx_handle* handle, const std::vector<int16_t>& music)
{
    uint8_t complete = 0;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(
                         handle, music.data(), static_cast<uint32_t>(2 * music.size()), &complete));
    return complete == 1;
}

bool serialize(kz_fpx_handle* handle)
{
    char* text = nullptr;
    const kz_status status = kz_fpx_fingerprint_serialize(handle, &text);
    EXPECT_EQ(status == KZ_OK, text != nullptr);
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&text));
    return status == KZ_OK;
}

template <uint32_t algorithm>
Attempt creates_handle()
{
    return [] { return make_handle(algorithm) != nullptr; };
}

template <uint32_t algorithm>
Attempt feeds_handle()
{
    return [music = noise(size_t{11025} * 15, 0.5, 5)] {
        const Handle handle = make_handle(algorithm);
        return handle != nullptr && feed_handle(handle.get(), music);
    };
}

template <uint32_t algorithm>
Attempt serializes()
{
    const std::shared_ptr handle(make_handle(algorithm));
    EXPECT_TRUE(feed_handle(handle.get(), noise(size_t{11025} * 15, 0.5, 5)));
    return [handle] { return serialize(handle.get()); };
}

template <uint32_t algorithm, class Object>
Attempt copies_values()
{
    const std::shared_ptr handle(make_handle(algorithm));
    EXPECT_TRUE(feed_handle(handle.get(), noise(size_t{11025} * 15, 0.5, 5)));
    return [handle] {
        static_cast<Object*>(handle->instance)->frame_manager->fingerprint_ready = 0;
        int16_t values[30];
        uint32_t count = 0;
        return kz_fpx_fingerprint_get_values(handle.get(), values, 30, &count) == KZ_OK;
    };
}

} // namespace

std::vector<Case> fpx_cases()
{
    return {
        {"kz_fpx_fingerprint_create", Reports, creates_handle<KZ_FPX_ALGORITHM_FIXED>},
        {"kz_fpx_fingerprint_create", Reports, creates_handle<KZ_FPX_ALGORITHM_FLOAT>},
        {"kz_fpx_fingerprint_add_audio", Conceals, feeds_handle<KZ_FPX_ALGORITHM_FIXED>},
        {"kz_fpx_fingerprint_add_audio", Conceals, feeds_handle<KZ_FPX_ALGORITHM_FLOAT>},
        {"kz_fpx_fingerprint_serialize", Conceals, serializes<KZ_FPX_ALGORITHM_FIXED>},
        {"kz_fpx_fingerprint_serialize", Conceals, serializes<KZ_FPX_ALGORITHM_FLOAT>},
        {"kz_fpx_fingerprint_get_values", Reports,
         copies_values<KZ_FPX_ALGORITHM_FIXED, kzqvfixed_fingerprinter>},
        {"kz_fpx_fingerprint_get_values", Reports, copies_values<KZ_FPX_ALGORITHM_FLOAT, QVFP>},
    };
}

} // namespace kz::test::failures
