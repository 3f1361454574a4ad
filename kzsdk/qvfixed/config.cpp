/// @file
/// The fixed-point twin's configuration: its defaults, and the exported calls.
///
/// The working rate is in hertz with 12 fraction bits and band edges are bins; the other values are
/// those of the floating-point twin.
#include "kzsdk/qv/config.hpp"

#include "kzsdk/qvfixed/band_tables.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

namespace {

// 12 frames of 32768 samples, one every 11264: 14.21 s at 11025 Hz. The table is copied in later.
constexpr kzqvfixed_config kDefaults = {.detect_signal = 1,
                                        .detector_window = 128,
                                        .detector_threshold = 100,
                                        .detector_max_deviation = 1000,
                                        .histogram_levels = 256,
                                        .sample_rate = 11025U << 12,
                                        .frame_length_log2 = 15,
                                        .frame_hop = 11264,
                                        .freq_table_count = 0,
                                        .freq_table = nullptr,
                                        .frame_limit = 12,
                                        .skip_frames = 0,
                                        .fingerprint_scale = 32768};

} // namespace

kz_status kzqvfixed_config_create(kzqvfixed_config** out) noexcept
{
    return kz::qv::create_config(kDefaults, std::span<const int32_t>(kz::qvfixed::kFrequencyTable),
                                 out);
}

kz_status kzqvfixed_config_destroy(kzqvfixed_config* config) noexcept
{
    return kz::qv::destroy_config(config);
}

kz_status kzqvfixed_config_copy_freq_table(const kzqvfixed_config* config, int32_t** out_table,
                                           uint32_t* out_count) noexcept
{
    return kz::qv::copy_freq_table(config, out_table, out_count);
}

kz_status kzqvfixed_config_set_freq_table(kzqvfixed_config* config, const int32_t* table,
                                          uint32_t count) noexcept
{
    return kz::qv::set_freq_table(config, table, count);
}
