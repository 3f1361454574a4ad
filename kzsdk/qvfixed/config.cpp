#include "kzsdk/abs/owned.hpp"
#include "kzsdk/qv/band_table.hpp"
#include "kzsdk/qvfixed/band_tables.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

kz_status kzqvfixed_config_create(kzqvfixed_config** out) noexcept
{
    if (out == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    auto config = kz::make_record<kzqvfixed_config>();
    if (!config) {
        return KZ_QV_ERROR_MEMORY;
    }
    *config = {.detect_signal = 1,
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
    kz::qv::copy_table(kz::qvfixed::kFrequencyTable.data(),
                       static_cast<uint32_t>(kz::qvfixed::kFrequencyTable.size()),
                       &config->freq_table, &config->freq_table_count);
    if (config->freq_table == nullptr) {
        return KZ_QV_ERROR_MEMORY;
    }
    *out = config.release();
    return KZ_OK;
}

kz_status kzqvfixed_config_destroy(kzqvfixed_config* config) noexcept
{
    if (config != nullptr) {
        const kz::owned<int32_t[]> table(config->freq_table);
        const kz::owned<kzqvfixed_config> record(config);
    }
    return KZ_OK;
}

kz_status kzqvfixed_config_copy_freq_table(const kzqvfixed_config* config, int32_t** out_table,
                                           uint32_t* out_count) noexcept
{
    if (config != nullptr) {
        kz::qv::copy_table<int32_t>(config->freq_table, config->freq_table_count, out_table,
                                    out_count);
    }
    return KZ_OK;
}

kz_status kzqvfixed_config_set_freq_table(kzqvfixed_config* config, const int32_t* table,
                                          uint32_t count) noexcept
{
    if (config != nullptr) {
        kz::qv::set_table(*config, table, count);
    }
    return KZ_OK;
}
