// The extraction interface without memory, for both algorithms.

#include <memory>

#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/qvfixed/qvfixed.h"
#include "kzsdk/qvfloat/qvfloat.h"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

Handle make_handle(Algorithm algorithm) { return create(algorithm, pcm16, 11025, mono); }

template <Algorithm algorithm>
Attempt creates_handle()
{
    return [] { return make_handle(algorithm) != nullptr; };
}

template <Algorithm algorithm>
Attempt feeds_handle()
{
    return [music = noise(size_t{11025} * 15, 0.5, 5)] {
        const Handle handle = make_handle(algorithm);
        return handle != nullptr && add(handle.get(), music);
    };
}

template <Algorithm algorithm>
Attempt serializes()
{
    const std::shared_ptr handle(make_handle(algorithm));
    EXPECT_TRUE(add(handle.get(), noise(size_t{11025} * 15, 0.5, 5)));
    return [handle] { return !document_of(handle.get()).empty(); };
}

template <Algorithm algorithm, class Object>
Attempt copies_values()
{
    const std::shared_ptr handle(make_handle(algorithm));
    EXPECT_TRUE(add(handle.get(), noise(size_t{11025} * 15, 0.5, 5)));
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
        {"kz_fpx_fingerprint_create", Reports, creates_handle<fixed>},
        {"kz_fpx_fingerprint_create", Reports, creates_handle<floating>},
        {"kz_fpx_fingerprint_add_audio", Conceals, feeds_handle<fixed>},
        {"kz_fpx_fingerprint_add_audio", Conceals, feeds_handle<floating>},
        {"kz_fpx_fingerprint_serialize", Conceals, serializes<fixed>},
        {"kz_fpx_fingerprint_serialize", Conceals, serializes<floating>},
        {"kz_fpx_fingerprint_get_values", Reports, copies_values<fixed, kzqvfixed_fingerprinter>},
        {"kz_fpx_fingerprint_get_values", Reports, copies_values<floating, QVFP>},
    };
}

} // namespace kz::test::failures
