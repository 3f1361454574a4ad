/// @file
/// Owners for what the benchmarks make, over the library's public functions.
#pragma once

#include <cstdint>
#include <cstdlib>
#include <memory>

#include "kzsdk/kzsdk.h"

namespace kz::bench {

/// Switches the library on; every benchmark calls it first, and it stays on.
inline void start_library()
{
    static const bool started = [] {
        kzconf_configuration configuration;
        kzconf_initialize_configuration(&configuration);
        return kzinit_initialize_vesk(&configuration) == KZ_OK;
    }();
    if (!started) {
        std::abort();
    }
}

/// Calls a family's own function to free a thing.
template <auto Free>
struct FreeWith {
    template <class T>
    void operator()(T* thing) const
    {
        static_cast<void>(Free(thing));
    }
};

using Resampler = std::unique_ptr<KZDSP_resampler_fixed, FreeWith<KZDSP_resampler_fixed_destroy>>;
using Transform = std::unique_ptr<KZDSP_DCT_fixed, FreeWith<KZDSP_DCT_fixed_destroy>>;
using Config = std::unique_ptr<kzqvfixed_config, FreeWith<kzqvfixed_config_destroy>>;
using FrameManager =
    std::unique_ptr<kzqvfixed_frame_manager, FreeWith<kzqvfixed_frame_manager_destroy>>;
using Detector =
    std::unique_ptr<kzqvfixed_signal_detector, FreeWith<kzqvfixed_signal_detector_destroy>>;

inline constexpr uint32_t working_rate = 11025;
inline constexpr uint32_t frame_samples = 32768;
inline constexpr uint32_t frame_hop = 11264;

} // namespace kz::bench
