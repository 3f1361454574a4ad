// Streams of any format without memory.

#include <memory>
#include <vector>

#include "kzsdk/stream/stream.h"
#include "support/signals.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

struct FreeStream {
    void operator()(kz_stream* stream) const { kz_stream_free(&stream); }
};
using Stream = std::unique_ptr<kz_stream, FreeStream>;

/// At a rate that is decimated, or at one that is not.
Stream make_stream(uint32_t rate)
{
    kz_stream_settings settings;
    EXPECT_EQ(KZ_OK, kz_stream_initialize_settings(&settings));
    settings.sample_rate = rate;
    kz_stream* stream = nullptr;
    const kz_status status = kz_stream_create(&settings, &stream);
    EXPECT_EQ(status == KZ_OK, stream != nullptr);
    return Stream(stream);
}

kz_status feed_stream(kz_stream* stream, const std::vector<int16_t>& music)
{
    uint8_t complete = 0;
    return kz_stream_feed(stream, music.data(), 2 * music.size(), nullptr, &complete);
}

Attempt feeds_stream()
{
    return [music = noise(size_t{22050} * 15, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK;
    };
}

/// The last piece, which has the second frame's end in it, is analysed at the end.
Attempt finishes_stream()
{
    return [music = noise(size_t{22050} * 4, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        uint8_t complete = 0;
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK &&
               kz_stream_finish(stream.get(), &complete) == KZ_OK;
    };
}

Attempt copies_values_of_stream()
{
    return [music = noise(size_t{22050} * 15, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        int16_t values[30];
        uint32_t count = 0;
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK &&
               kz_stream_get_values(stream.get(), values, 30, &count) == KZ_OK;
    };
}

Attempt writes_document_of_stream()
{
    return [music = noise(size_t{22050} * 15, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        const char* text = nullptr;
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK &&
               kz_stream_get_document(stream.get(), &text) == KZ_OK;
    };
}

} // namespace

std::vector<Case> stream_cases()
{
    return {
        {"kz_stream_create", Reports, [] { return [] { return make_stream(44100) != nullptr; }; }},
        {"kz_stream_create", Reports, [] { return [] { return make_stream(192000) != nullptr; }; }},
        {"kz_stream_feed", Reports, feeds_stream},
        {"kz_stream_finish", Reports, finishes_stream},
        {"kz_stream_get_values", Reports, copies_values_of_stream},
        {"kz_stream_get_document", Reports, writes_document_of_stream},
    };
}

} // namespace kz::test::failures
