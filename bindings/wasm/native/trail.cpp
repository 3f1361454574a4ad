// Trails: samples in, the bytes of a .kzt file out, and what such bytes say.

#include <cstdint>

#include "exported.hpp"
#include "kzcat.h"

using kzwasm::take_catalogue_status;

/// Null on failure.
KZ_EXPORTED(builder_create) kzcat_builder* builder_create(uint32_t rate, uint32_t channels)
{
    const kzcat_format format = {KZ_STREAM_FORMAT_FLOAT32, rate, channels, 0};
    kzcat_builder* builder = nullptr;
    take_catalogue_status(kzcat_builder_create(&format, nullptr, &builder));
    return builder;
}

KZ_EXPORTED(builder_feed)
uint32_t builder_feed(kzcat_builder* builder, const float* samples, uint32_t count)
{
    const uint64_t bytes = uint64_t{count} * sizeof *samples;
    return take_catalogue_status(kzcat_builder_feed(builder, samples, bytes)) ? 1 : 0;
}

/// The trail so far; null on failure.
KZ_EXPORTED(builder_trail) kzcat_trail* builder_trail(kzcat_builder* builder)
{
    kzcat_trail* trail = nullptr;
    take_catalogue_status(kzcat_builder_get_trail(builder, &trail));
    return trail;
}

/// The whole trail; null on failure.
KZ_EXPORTED(builder_finish) kzcat_trail* builder_finish(kzcat_builder* builder)
{
    kzcat_trail* trail = nullptr;
    take_catalogue_status(kzcat_builder_finish(builder, &trail));
    return trail;
}

KZ_EXPORTED(builder_free) void builder_free(kzcat_builder* builder)
{
    kzcat_builder_free(&builder);
}

/// Null on failure.
KZ_EXPORTED(trail_read) kzcat_trail* trail_read(const void* bytes, uint32_t count)
{
    kzcat_trail* trail = nullptr;
    take_catalogue_status(kzcat_trail_read(bytes, count, &trail));
    return trail;
}

/// The size of the trail's bytes, of which `capacity` must be enough; with null and 0 it is only
/// asked for. 0 on failure.
KZ_EXPORTED(trail_write)
uint32_t trail_write(const kzcat_trail* trail, void* bytes, uint32_t capacity)
{
    uint64_t size = 0;
    const bool ok = take_catalogue_status(kzcat_trail_write(trail, bytes, capacity, &size));
    return ok ? static_cast<uint32_t>(size) : 0;
}

/// Leaves samples, the count of codes, their rate and the profile.
KZ_EXPORTED(trail_facts) uint32_t trail_facts(const kzcat_trail* trail)
{
    kzcat_trail_facts facts;
    if (!take_catalogue_status(kzcat_trail_get_facts(trail, &facts))) {
        return 0;
    }
    kzwasm::numbers() = {{static_cast<double>(facts.samples), static_cast<double>(facts.code_count),
                          static_cast<double>(facts.sample_rate),
                          static_cast<double>(facts.profile)}};
    return 1;
}

/// Writes all codes into room for `capacity`.
KZ_EXPORTED(trail_codes)
uint32_t trail_codes(const kzcat_trail* trail, uint64_t* codes, uint32_t capacity)
{
    uint64_t count = 0;
    return take_catalogue_status(kzcat_trail_get_codes(trail, codes, capacity, &count)) ? 1 : 0;
}

KZ_EXPORTED(trail_free) void trail_free(kzcat_trail* trail) { kzcat_trail_free(&trail); }
