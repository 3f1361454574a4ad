/// @file
/// The floating-point twin's configuration: its defaults, and the exported calls.
///
/// The working rate and the band edges are in hertz; the other values are those of the fixed-point
/// twin.
#include "kzsdk/qv/config.hpp"

#include <array>

#include "kzsdk/qvfloat/qvfloat.h"

namespace {

// 12 frames of 32768 samples, one every 11264: 14.21 s at 11025 Hz. The table is copied in later.
constexpr QVConfig kDefaults = {.detect_signal = 1,
                                .detector_window = 128,
                                .detector_threshold = 100,
                                .detector_max_deviation = 1000,
                                .histogram_levels = 256,
                                .sample_rate = 11025.0F,
                                .frame_length_log2 = 15,
                                .frame_hop = 11264,
                                .freq_table_count = 0,
                                .freq_table = nullptr,
                                .frame_limit = 12,
                                .skip_frames = 0,
                                .fingerprint_scale = 32768};

// Band edges in hertz, in pairs; the fixed-point twin keeps the same edges as bins.
constexpr std::array<float, 30> kFrequencyTable = {
    0.0F,    99.8F,   99.8F,   200.0F,  200.0F,  299.8F,  299.8F,  400.0F,  400.0F,  510.0F,
    510.0F,  630.0F,  630.0F,  769.9F,  769.9F,  920.0F,  920.0F,  1080.0F, 1080.0F, 1269.8F,
    1269.8F, 1480.0F, 1480.0F, 1719.8F, 1719.8F, 2000.0F, 2000.0F, 2320.0F, 2320.0F, 2700.0F,
};

} // namespace

kz_status QVConfig_Create(QVConfig** out) noexcept
{
    return kz::qv::create_config(kDefaults, std::span<const float>(kFrequencyTable), out);
}

kz_status QVConfig_Destroy(QVConfig* config) noexcept { return kz::qv::destroy_config(config); }

kz_status QVConfig_CopyFreqTable(const QVConfig* config, float** out_table,
                                 uint32_t* out_count) noexcept
{
    return kz::qv::copy_freq_table(config, out_table, out_count);
}

kz_status QVConfig_SetFreqTable(QVConfig* config, const float* table, uint32_t count) noexcept
{
    return kz::qv::set_freq_table(config, table, count);
}
