/// @file
/// What a fingerprint context reports as numbers: the values, where the signal starts, the times
/// and the progress. Each call reads the algorithm's own object and converts nothing but units.

#include <algorithm>

#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/fpx/fpx.h"
#include "kzsdk/fpx/pieces.hpp"
#include "kzsdk/qv/frame_list.hpp"
#include "kzsdk/qv/frame_pump.hpp"
#include "kzsdk/qvfixed/twin.hpp"
#include "kzsdk/qvfloat/twin.hpp"

namespace {

// Calls `use(fingerprinter, object)` with the algorithm's operations and the handle's object.
template <class Use>
auto visit(const kz_fpx_handle& handle, Use use) noexcept
{
    if (handle.algorithm->id == KZ_FPX_ALGORITHM_FLOAT) {
        return use(kz::qvfloat::Fingerprinter{}, *static_cast<const QVFP*>(handle.instance));
    }
    return use(kz::qvfixed::Fingerprinter{},
               *static_cast<const kzqvfixed_fingerprinter*>(handle.instance));
}

// Stores a result unless the caller passed null for it.
template <class Number>
void store(Number* out, Number number) noexcept
{
    if (out != nullptr) {
        *out = number;
    }
}

} // namespace

kz_status kz_fpx_fingerprint_get_values(kz_fpx_handle* handle, int16_t* values, uint32_t capacity,
                                        uint32_t* out_count) noexcept
{
    if (out_count == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    *out_count = 0;
    if (handle == nullptr || (values == nullptr && capacity != 0)) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    return visit(*handle, [=](auto fingerprinter, const auto& object) {
        const uint32_t bytes = fingerprinter.result_size(object);
        *out_count = bytes / static_cast<uint32_t>(sizeof(int16_t));
        if (!fingerprinter.is_complete(object)) {
            return KZ_QV_ERROR_INCOMPLETE;
        }
        if (values == nullptr) {
            return KZ_OK; // only the count was asked for
        }
        if (capacity < *out_count) {
            return KZ_FPX_ERROR_ROOM;
        }
        kz::qv::FingerprintTimes times{};
        const kz_status status =
            fingerprinter.extract(&object, reinterpret_cast<uint8_t*>(values), bytes, times);
        // It is complete, so only memory can be missing.
        return status == KZ_OK ? KZ_OK : KZ_FPX_ERROR_MEMORY;
    });
}

kz_status kz_fpx_fingerprint_get_signal_offset(const kz_fpx_handle* handle, uint32_t* out_samples,
                                               double* out_seconds, uint8_t* out_found) noexcept
{
    if (handle == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    visit(*handle, [=](auto fingerprinter, const auto& object) {
        store(out_samples, object.signal_offset);
        store(out_seconds, fingerprinter.seconds(object, object.signal_offset));
        store(out_found, static_cast<uint8_t>(object.searching_for_signal == 0));
    });
    return KZ_OK;
}

kz_status kz_fpx_fingerprint_get_times(const kz_fpx_handle* handle, uint32_t* out_start,
                                       uint32_t* out_duration) noexcept
{
    if (handle == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    const auto times = visit(*handle, [](auto fingerprinter, const auto& object) {
        return fingerprinter.times(object);
    });
    store(out_start, times.start);
    store(out_duration, times.duration);
    return KZ_OK;
}

kz_status kz_fpx_fingerprint_get_progress(const kz_fpx_handle* handle,
                                          uint32_t* out_percent) noexcept
{
    if (handle == nullptr || out_percent == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    *out_percent = visit(*handle, [](auto, const auto& object) {
        return kz::qv::percent_progress(*object.frame_manager);
    });
    return KZ_OK;
}

kz_status kz_fpx_fingerprint_get_next_frames(const kz_fpx_handle* handle,
                                             uint32_t* out_frames) noexcept
{
    if (handle == nullptr || out_frames == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    *out_frames = visit(*handle, [](auto, const auto& object) {
        const uint32_t most = UINT32_MAX / object.frame_bytes; // that one call takes
        return std::min(kz::qv::next_step_frames(object), most);
    });
    return KZ_OK;
}

uint32_t kz::fpx::largest_piece_frames(const kz_fpx_handle& handle) noexcept
{
    return visit(handle,
                 [](auto, const auto& object) { return kz::qv::largest_step_frames(object); });
}
