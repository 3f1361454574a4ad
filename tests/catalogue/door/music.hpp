/// @file
/// Handles of the C interface with owners, and music to put into them.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "kzcat.h"

namespace kz::test {

template <auto free>
struct FreeHandle {
    template <class Handle>
    void operator()(Handle* handle) const
    {
        free(&handle);
    }
};

using Catalogue = std::unique_ptr<kzcat_catalogue, FreeHandle<kzcat_close>>;
using Builder = std::unique_ptr<kzcat_builder, FreeHandle<kzcat_builder_free>>;
using Trail = std::unique_ptr<kzcat_trail, FreeHandle<kzcat_trail_free>>;
using Track = std::unique_ptr<kzcat_track, FreeHandle<kzcat_track_free>>;
using Query = std::unique_ptr<kzcat_query, FreeHandle<kzcat_query_free>>;
using Monitor = std::unique_ptr<kzcat_monitor, FreeHandle<kzcat_monitor_free>>;
using Result = std::unique_ptr<kzcat_result, FreeHandle<kzcat_result_free>>;

/// What a call that makes a handle gave: the handle, or its status.
template <class Owner>
struct Made {
    kzcat_status status = KZCAT_OK;
    Owner handle;
};

template <class Owner, class Call, class... Arguments>
Made<Owner> make(Call call, Arguments... arguments)
{
    typename Owner::pointer handle = nullptr;
    const kzcat_status status = call(arguments..., &handle);
    return {status, Owner(handle)};
}

constexpr uint32_t kRate = 16000;
constexpr kzcat_format kFormat = {KZ_STREAM_FORMAT_PCM16, kRate, 1, 0};

/// A piece of music of its own for each seed.
std::vector<int16_t> piece(uint64_t seed, double seconds);

/// The trail of samples; null when memory was short.
Trail trail_of(const std::vector<int16_t>& samples, bool documents = false);

/// A finished query of samples; null when memory was short.
Query query_of(const std::vector<int16_t>& samples);

/// An empty catalogue in memory, or a file.
Catalogue open_memory();
Catalogue open_file(const std::string& path, uint32_t access = KZCAT_ACCESS_CREATE);

/// Adds a trail with a title; gives its id, 0 on failure.
int64_t add(kzcat_catalogue* catalogue, const kzcat_trail* trail, const std::string& uri,
            const std::string& title = "A title");

} // namespace kz::test
