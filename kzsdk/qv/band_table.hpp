/// @file
/// Copying and setting of a configuration's band table, whose entries are bins or hertz.
#pragma once

#include <cstdint>

#include "kzsdk/abs/owned.hpp"

namespace kz::qv {

/// Hands out a copy of a table that belongs to the caller. Does nothing when a pointer is null. When
/// memory is short the copy is null and its count 0; nothing is reported.
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

/// Replaces a configuration's table by a copy of `table`, which may be the configuration's own.
template <class Config, class Entry>
void set_table(Config& config, const Entry* table, uint32_t count) noexcept
{
    const owned<Entry[]> old(config.freq_table);
    config.freq_table = nullptr;
    config.freq_table_count = 0;
    copy_table(table, count, &config.freq_table, &config.freq_table_count);
}

} // namespace kz::qv
