/// @file
/// The algorithms behind the extraction interface, and the handle.
#pragma once

#include <cstdint>

#include "kzsdk/fpx/fpx.h"
#include "kzsdk/xml/xml.h"

namespace kz::fpx {

/// One algorithm: its number and the four operations of its fingerprinter.
struct Algorithm {
    uint32_t id;
    kz_status (*create)(uint32_t algorithm, uint32_t sample_rate, uint32_t format,
                        uint32_t channels, void** out_instance) noexcept;
    kz_status (*free)(void* instance) noexcept;
    kz_status (*add_audio)(void* instance, const void* audio, uint32_t byte_count,
                           uint8_t* out_complete) noexcept;
    kz_status (*get_result)(void* instance, XMLTag** out_tree) noexcept;
};

/// Makes a row from a fingerprinter's typed operations.
template <class Object, auto Create, auto Free, auto AddAudio, auto GetResult>
constexpr Algorithm algorithm_row(uint32_t id) noexcept
{
    return {
        .id = id,
        .create =
            [](uint32_t algorithm, uint32_t sample_rate, uint32_t format, uint32_t channels,
               void** out_instance) noexcept {
                Object* object = nullptr;
                const kz_status status = Create(algorithm, sample_rate, format, channels, &object);
                *out_instance = object;
                return status;
            },
        .free = [](void* instance) noexcept { return Free(static_cast<Object*>(instance)); },
        .add_audio =
            [](void* instance, const void* audio, uint32_t byte_count,
               uint8_t* out_complete) noexcept {
                return AddAudio(static_cast<Object*>(instance), audio, byte_count, out_complete);
            },
        .get_result =
            [](void* instance, XMLTag** out_tree) noexcept {
                return GetResult(static_cast<Object*>(instance), out_tree);
            }};
}

} // namespace kz::fpx

/// What a caller holds. The row outlives every handle; the instance belongs to it.
struct kz_fpx_handle {
    const kz::fpx::Algorithm* algorithm;
    void* instance;
};
