/// @file
/// Fingerprint contexts of the extraction interface, owned, and the calls on them that most tests
/// make.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "support/input_formats.hpp"

namespace kz::test {

struct FreeHandle {
    void operator()(kz_fpx_handle* handle) const { kz_fpx_fingerprint_free(&handle); }
};
using Handle = std::unique_ptr<kz_fpx_handle, FreeHandle>;

/// The call itself, for tests of what it returns and of the pointer that it leaves.
inline kz_status create(Algorithm algorithm, Format format, uint32_t rate, Channels channels,
                        kz_fpx_handle** handle)
{
    return kz_fpx_fingerprint_create(number(algorithm), number(format), rate, number(channels),
                                     handle);
}

/// @return Null when there is no such fingerprint, or no memory for one.
inline Handle create(Algorithm algorithm, Format format, uint32_t rate, Channels channels)
{
    kz_fpx_handle* handle = nullptr;
    create(algorithm, format, rate, channels, &handle);
    return Handle(handle);
}

/// Adds audio in one call. @return Whether the fingerprint is complete; false when it is refused.
inline bool add(kz_fpx_handle* handle, const void* audio, size_t byte_count)
{
    uint8_t complete = 0;
    const kz_status status =
        kz_fpx_fingerprint_add_audio(handle, audio, static_cast<uint32_t>(byte_count), &complete);
    return status == KZ_OK && complete == 1;
}

/// The same for a span, vector or string of samples or bytes.
template <class Audio>
bool add(kz_fpx_handle* handle, const Audio& audio)
{
    return add(handle, audio.data(), audio.size() * sizeof *audio.data());
}

/// @return The document; empty when there is none.
inline std::string document_of(kz_fpx_handle* handle)
{
    char* text = nullptr;
    std::string document;
    if (kz_fpx_fingerprint_serialize(handle, &text) == KZ_OK) {
        document = text;
    }
    kz_fpx_fingerprint_serialize_free(&text);
    return document;
}

} // namespace kz::test
