/// @file
/// The extraction interface: creating, feeding and freeing a fingerprint context.
///
/// A handle is a row of the table of algorithms and the fingerprinter that this row created.
/// Nothing is kept here; every status of a fingerprinter is passed on unchanged.
#include "kzsdk/fpx/fpx.h"

#include <array>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/qvfixed/qvfixed.h"
#include "kzsdk/qvfloat/qvfloat.h"

namespace {

using kz::fpx::Algorithm;

// Searched in this order; a new algorithm is one more row.
constexpr std::array kAlgorithms = {
    kz::fpx::algorithm_row<kzqvfixed_fingerprinter, kzqvfixed_constructor, kzqvfixed_destructor,
                           kzqvfixed_add_samples, kzqvfixed_get_result>(KZ_FPX_ALGORITHM_FIXED),
    kz::fpx::algorithm_row<QVFP, QVFP_Constructor, QVFP_Destructor, QVFP_AddSamples,
                           QVFP_GetResult>(KZ_FPX_ALGORITHM_FLOAT),
};

const Algorithm* find_algorithm(uint32_t id) noexcept
{
    for (const Algorithm& algorithm : kAlgorithms) {
        if (algorithm.id == id) {
            return &algorithm;
        }
    }
    return nullptr;
}

} // namespace

kz_status kz_fpx_fingerprint_create(uint32_t algorithm, uint32_t format, uint32_t sample_rate,
                                    uint32_t channels, kz_fpx_handle** out_handle) noexcept
{
    const Algorithm* row = find_algorithm(algorithm);
    if (row == nullptr) {
        return KZ_FPX_ERROR_NO_ALGORITHM;
    }
    auto handle = kz::make_record<kz_fpx_handle>();
    if (!handle) {
        return KZ_FPX_ERROR_MEMORY;
    }
    handle->algorithm = row;
    // The interface takes the format before the rate, the fingerprinters the rate before the
    // format.
    const kz_status status =
        row->create(algorithm, sample_rate, format, channels, &handle->instance);
    if (status == KZ_OK) {
        *out_handle = handle.release();
    }
    return status;
}

kz_status kz_fpx_fingerprint_add_audio(kz_fpx_handle* handle, const void* audio,
                                       uint32_t byte_count, uint8_t* out_complete) noexcept
{
    if (handle == nullptr || audio == nullptr || out_complete == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    return handle->algorithm->add_audio(handle->instance, audio, byte_count, out_complete);
}

kz_status kz_fpx_fingerprint_free(kz_fpx_handle** handle_ref) noexcept
{
    if (handle_ref == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    kz_fpx_handle* const handle = *handle_ref;
    *handle_ref = nullptr;
    // Deliberate: a handle without an instance, which create never returns, is forgotten.
    if (handle == nullptr || handle->algorithm == nullptr || handle->instance == nullptr) {
        return KZ_OK;
    }
    const kz::owned<kz_fpx_handle> record(handle);
    return handle->algorithm->free(handle->instance);
}
