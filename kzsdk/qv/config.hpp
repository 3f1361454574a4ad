/// @file
/// Making, freeing and changing a configuration; its band table holds bins or hertz.
#pragma once

#include <cstdint>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/abs/status.h"

namespace kz::qv {

/// Hands out a copy of a table that belongs to the caller. Does nothing when a pointer is null.
/// When memory is short the copy is null and its count 0; nothing is reported.
template <class Entry>
void copy_table(const Entry* source, uint32_t count, Entry** out_table,
                uint32_t* out_count) noexcept
{
    if (source == nullptr || out_table == nullptr || out_count == nullptr) {
        return;
    }
    auto copy = copy_array(source, count);
    *out_count = copy ? count : 0;
    *out_table = copy.release();
}

/// Frees a configuration with its table; null is ignored.
template <class Config>
kz_status destroy_config(Config* config) noexcept
{
    if (config != nullptr) {
        static_cast<void>(_kzmem_free(config->freq_table));
        static_cast<void>(_kzmem_free(config));
    }
    return KZ_OK;
}

/// Makes a configuration from its defaults, which name no table, and a copy of `table`.
template <class Config, class Entry>
kz_status create_config(const Config& defaults, std::span<const Entry> table, Config** out) noexcept
{
    if (out == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    auto config = make_record<Config>();
    if (!config) {
        return KZ_QV_ERROR_MEMORY;
    }
    *config = defaults;
    copy_table(table.data(), static_cast<uint32_t>(table.size()), &config->freq_table,
               &config->freq_table_count);
    if (config->freq_table == nullptr) {
        return KZ_QV_ERROR_MEMORY;
    }
    *out = config.release();
    return KZ_OK;
}

/// Hands out a copy of the table. Reports success, and touches nothing, when there is no table.
template <class Config, class Entry>
kz_status copy_freq_table(const Config* config, Entry** out_table, uint32_t* out_count) noexcept
{
    if (config != nullptr) {
        copy_table<Entry>(config->freq_table, config->freq_table_count, out_table, out_count);
    }
    return KZ_OK;
}

/// Replaces the table by a copy of `table`, which may be the configuration's own. When memory is
/// short there is none afterwards, and success is reported: the next frame manager is then refused.
template <class Config, class Entry>
kz_status set_freq_table(Config* config, const Entry* table, uint32_t count) noexcept
{
    if (config != nullptr) {
        const owned<Entry[]> old(config->freq_table);
        config->freq_table = nullptr;
        config->freq_table_count = 0;
        copy_table(table, count, &config->freq_table, &config->freq_table_count);
    }
    return KZ_OK;
}

} // namespace kz::qv
