/// @file
/// The handles of libkzcat with owners, and its failures as exceptions.
#pragma once

#include <memory>
#include <new>
#include <stdexcept>
#include <string>

#include "kzcat.h"
#include "kzfp/catalogue/addresses.hpp"

namespace kzfp {

/// What a catalogue could not do, in the library's sentence.
struct CatalogueError : std::runtime_error {
    CatalogueError(kzcat_status reason, const std::string& text)
        : std::runtime_error(text), status(reason)
    {
    }
    kzcat_status status;
};

/// Throws CatalogueError, or std::bad_alloc, unless a call has succeeded.
inline void check(kzcat_status status)
{
    if (status == KZCAT_ERROR_MEMORY) {
        throw std::bad_alloc();
    }
    if (status != KZCAT_OK) {
        throw CatalogueError(status, kzcat_get_error_text());
    }
}

/// Whether what a call was to work on was there. Throws as check() does for other failures.
inline bool was_found(kzcat_status status)
{
    if (status != KZCAT_ERROR_NOT_FOUND) {
        check(status);
    }
    return status != KZCAT_ERROR_NOT_FOUND;
}

/// A failure with the path of the catalogue before it, which many of the library's sentences begin
/// with already.
inline std::string message_about(const std::string& path, const CatalogueError& error)
{
    const std::string begin = path.empty() ? "" : path + ": ";
    const std::string text = error.what();
    return text.starts_with(begin) ? text : begin + text;
}

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
using Result = std::unique_ptr<kzcat_result, FreeHandle<kzcat_result_free>>;
using Monitor = std::unique_ptr<kzcat_monitor, FreeHandle<kzcat_monitor_free>>;
using Jobs = std::unique_ptr<kzcat_jobs, FreeHandle<kzcat_jobs_close>>;

/// Makes a handle by a call whose last argument is the place for it: made<Trail>(read, a, b).
template <class Owner, class Make, class... Arguments>
Owner made(Make make, Arguments... arguments)
{
    typename Owner::pointer handle = nullptr;
    check(make(arguments..., &handle));
    return Owner(handle);
}

/// The same for calls that look something up: empty when there is no such thing.
template <class Owner, class Find, class... Arguments>
Owner found(Find find, Arguments... arguments)
{
    typename Owner::pointer handle = nullptr;
    was_found(find(arguments..., &handle));
    return Owner(handle);
}

/// `path` is as the command line has it. `settings` are null for what is usual.
inline Catalogue open_catalogue(const std::string& path, uint32_t access,
                                const kzcat_settings* settings = nullptr)
{
    return made<Catalogue>(kzcat_open, address_of(path).c_str(), access, settings);
}

/// Opens the jobs at an address as the command line has it.
inline Jobs open_jobs(const std::string& address, uint32_t access)
{
    return made<Jobs>(kzcat_jobs_open, address_of(address).c_str(), access);
}

} // namespace kzfp
