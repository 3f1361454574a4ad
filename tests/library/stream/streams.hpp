/// @file
/// Streams for tests: sound in any format, fed in any cuts.
#pragma once

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/abs/startup.h"
#include "kzsdk/fpx/fpx.h"
#include "kzsdk/stream/stream.h"
#include "support/signals.hpp"

namespace kz::test {

using Bytes = std::vector<uint8_t>;

struct FreeStream {
    void operator()(kz_stream* stream) const { kz_stream_free(&stream); }
};
using Stream = std::unique_ptr<kz_stream, FreeStream>;

inline kz_stream_settings settings_of(uint32_t algorithm, uint32_t format, uint32_t rate,
                                      uint32_t channels)
{
    kz_stream_settings settings;
    EXPECT_EQ(KZ_OK, kz_stream_initialize_settings(&settings));
    settings.algorithm = algorithm;
    settings.format = format;
    settings.sample_rate = rate;
    settings.channels = channels;
    return settings;
}

inline Stream create(const kz_stream_settings& settings)
{
    kz_stream* stream = nullptr;
    EXPECT_EQ(KZ_OK, kz_stream_create(&settings, &stream));
    return Stream(stream);
}

/// What a stream takes of one call.
struct Taken {
    uint64_t used = 0;
    bool complete = false;
};

inline Taken feed(kz_stream* stream, const uint8_t* bytes, size_t count)
{
    Taken taken;
    uint8_t complete = 9;
    EXPECT_EQ(KZ_OK, kz_stream_feed(stream, bytes, count, &taken.used, &complete));
    EXPECT_TRUE(taken.used == count || complete == 1) << "bytes were left without need";
    taken.complete = complete == 1;
    return taken;
}

inline kz_stream_state state_of(const kz_stream* stream)
{
    kz_stream_state state;
    std::memset(&state, 0xa5, sizeof state);
    EXPECT_EQ(KZ_OK, kz_stream_get_state(stream, &state));
    return state;
}

inline bool finish(kz_stream* stream)
{
    uint8_t complete = 9;
    EXPECT_EQ(KZ_OK, kz_stream_finish(stream, &complete));
    return complete == 1;
}

/// The document, or "" when the fingerprint is not complete.
inline std::string document_of(kz_stream* stream)
{
    const char* text = nullptr;
    const kz_status status = kz_stream_get_document(stream, &text);
    EXPECT_TRUE(status == KZ_OK || status == KZ_QV_ERROR_INCOMPLETE) << std::hex << status;
    EXPECT_EQ(status == KZ_OK, text != nullptr);
    return text != nullptr ? text : "";
}

/// The document of all the sound in one call of the extraction interface; the library is held.
inline std::string document_of_one_call(uint32_t algorithm, uint32_t format, uint32_t rate,
                                        uint32_t channels, const void* sound, size_t byte_count)
{
    kz_fpx_handle* handle = nullptr;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_create(algorithm, format, rate, channels, &handle));
    uint8_t complete = 0;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(handle, sound, static_cast<uint32_t>(byte_count),
                                                  &complete));
    char* text = nullptr;
    std::string document;
    if (kz_fpx_fingerprint_serialize(handle, &text) == KZ_OK) {
        document = text;
        kz_fpx_fingerprint_serialize_free(&text);
    }
    kz_fpx_fingerprint_free(&handle);
    return document;
}

template <class Sample>
Bytes bytes_of(const std::vector<Sample>& samples)
{
    Bytes bytes(samples.size() * sizeof(Sample));
    std::memcpy(bytes.data(), samples.data(), bytes.size());
    return bytes;
}

/// Silence, then music. Every channel has sound of its own.
inline std::vector<int16_t> music(uint32_t rate, uint32_t channels, double silence, double sound,
                                  uint64_t seed)
{
    const auto frames = static_cast<size_t>((silence + sound) * rate);
    auto samples = noise(frames * channels, 0.9, seed);
    std::fill_n(samples.begin(), static_cast<size_t>(silence * rate) * channels, int16_t{0});
    return samples;
}

} // namespace kz::test
