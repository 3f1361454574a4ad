// Fingerprints: a stream of floats in, 30 values and a query document out.

#include "exported.hpp"
#include "kzsdk/kzsdk.h"

using kzwasm::take_library_status;

/// Null on failure.
KZ_EXPORTED(stream_create)
kz_stream* stream_create(uint32_t algorithm, uint32_t rate, uint32_t channels)
{
    kz_stream_settings settings;
    kz_stream* stream = nullptr;
    kz_stream_initialize_settings(&settings);
    settings.algorithm = algorithm;
    settings.format = KZ_STREAM_FORMAT_FLOAT32;
    settings.sample_rate = rate;
    settings.channels = channels;
    take_library_status(kz_stream_create(&settings, &stream));
    return stream;
}

/// 1 once the fingerprint is complete, 0 before, -1 on failure.
KZ_EXPORTED(stream_feed)
int32_t stream_feed(kz_stream* stream, const float* samples, uint32_t count)
{
    uint8_t complete = 0;
    const uint64_t bytes = uint64_t{count} * sizeof *samples;
    const bool ok = take_library_status(kz_stream_feed(stream, samples, bytes, nullptr, &complete));
    return ok ? complete : -1;
}

/// As stream_feed().
KZ_EXPORTED(stream_finish) int32_t stream_finish(kz_stream* stream)
{
    uint8_t complete = 0;
    const bool ok = take_library_status(kz_stream_finish(stream, &complete));
    return ok ? complete : -1;
}

/// Leaves frames, silence and sound in ms, the phase, percent, what is missing in ms, and start and
/// duration of the fingerprint in ms.
KZ_EXPORTED(stream_state) uint32_t stream_state(kz_stream* stream)
{
    kz_stream_state state;
    uint32_t start = 0;
    uint32_t duration = 0;
    if (!take_library_status(kz_stream_get_state(stream, &state)) ||
        !take_library_status(kz_stream_get_times(stream, &start, &duration))) {
        return 0;
    }
    kzwasm::numbers() = {
        {static_cast<double>(state.frames), static_cast<double>(state.silence_milliseconds),
         static_cast<double>(state.sound_milliseconds), static_cast<double>(state.phase),
         static_cast<double>(state.percent), static_cast<double>(state.missing_milliseconds),
         static_cast<double>(start), static_cast<double>(duration)}};
    return 1;
}

/// The count of values written, of room for `capacity`; 0 on failure.
KZ_EXPORTED(stream_values)
uint32_t stream_values(kz_stream* stream, int16_t* values, uint32_t capacity)
{
    uint32_t count = 0;
    const bool ok = take_library_status(kz_stream_get_values(stream, values, capacity, &count));
    return ok ? count : 0;
}

/// The stream's text; null on failure.
KZ_EXPORTED(stream_document) const char* stream_document(kz_stream* stream)
{
    const char* text = nullptr;
    take_library_status(kz_stream_get_document(stream, &text));
    return text;
}

KZ_EXPORTED(stream_free) void stream_free(kz_stream* stream) { kz_stream_free(&stream); }
