// What a stream reports: its state, and its fingerprint once that is complete.

#include <algorithm>

#include "kzsdk/stream/stream_record.hpp"

namespace {

constexpr uint64_t kNeeded = KZ_FPX_MILLISECONDS_NEEDED;
constexpr uint32_t kWorkingRate = 11025;

// How many units of a rate the frames of another one last.
uint64_t units(uint64_t frames, uint32_t rate, uint32_t unit_rate) noexcept
{
    return frames / rate * unit_rate + frames % rate * unit_rate / rate;
}

uint64_t milliseconds(uint64_t frames, uint32_t rate) noexcept { return units(frames, rate, 1000); }

// Leading silence, as far as the stream was analysed.
struct Silence {
    uint64_t milliseconds;
    bool has_ended;
};

// The signal's offset is counted modulo 2^32. It lies near the end of what was analysed: from there
// on the fingerprint is complete within seconds.
uint64_t silent_samples(const kz_stream& stream, uint32_t offset) noexcept
{
    const uint64_t end = units(stream.judged_frames, stream.piece_rate, kWorkingRate);
    const uint64_t distance = (uint64_t{1} << 32) + offset - static_cast<uint32_t>(end);
    const auto signed_distance = static_cast<int32_t>(static_cast<uint32_t>(distance));
    return static_cast<uint64_t>(static_cast<int64_t>(end) + signed_distance);
}

Silence silence_of(const kz_stream& stream) noexcept
{
    uint32_t samples = 0;
    uint8_t found = 0;
    static_cast<void>(
        kz_fpx_fingerprint_get_signal_offset(stream.handle, &samples, nullptr, &found));
    if (found != 0) {
        return {milliseconds(silent_samples(stream, samples), kWorkingRate), true};
    }
    return {milliseconds(stream.judged_frames, stream.piece_rate), false};
}

uint32_t phase_of(const kz_stream& stream, bool is_silent) noexcept
{
    if (stream.failure != KZ_OK) {
        return KZ_STREAM_FAILED;
    }
    if (stream.is_complete != 0) {
        return KZ_STREAM_COMPLETE;
    }
    if (stream.frames == 0) {
        return KZ_STREAM_NOTHING_FED;
    }
    return is_silent ? KZ_STREAM_SILENT : KZ_STREAM_TOO_SHORT;
}

// About how much sound is missing to a fingerprint that is not complete: never 0.
uint32_t missing(uint64_t sound) noexcept
{
    return static_cast<uint32_t>(kNeeded - std::min(sound, kNeeded - 1));
}

kz_status write_document(kz_stream& stream) noexcept
{
    const kz::stream::AllocationWatch watch;
    char* text = nullptr;
    const kz_status status = kz_fpx_fingerprint_serialize(stream.handle, &text);
    // With too little memory a text may lack a part all the same.
    if (watch.saw_failure()) {
        static_cast<void>(kz_fpx_fingerprint_serialize_free(&text));
        return KZ_STREAM_ERROR_MEMORY;
    }
    stream.document = text;
    return status;
}

} // namespace

kz_status kz_stream_get_state(const kz_stream* stream, kz_stream_state* out_state) noexcept
{
    if (stream == nullptr || out_state == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    const Silence silence = silence_of(*stream);
    *out_state = {};
    kz_stream_state& state = *out_state;
    state.frames = stream->frames;
    const uint64_t taken = milliseconds(stream->frames, stream->rate);
    state.silence_milliseconds = std::min(silence.milliseconds, taken);
    state.sound_milliseconds = taken - state.silence_milliseconds;
    state.phase = phase_of(*stream, !silence.has_ended && stream->judged_frames != 0);
    if (state.phase != KZ_STREAM_COMPLETE) {
        state.missing_milliseconds = missing(state.sound_milliseconds);
    }
    static_cast<void>(kz_fpx_fingerprint_get_progress(stream->handle, &state.percent));
    state.partial_frame_bytes = stream->unfinished_bytes;
    return KZ_OK;
}

kz_status kz_stream_get_values(kz_stream* stream, int16_t* values, uint32_t capacity,
                               uint32_t* out_count) noexcept
{
    if (out_count == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    *out_count = 0;
    if (stream == nullptr || (values == nullptr && capacity != 0)) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    if (!kz::stream::library_is_on()) {
        return KZ_STREAM_ERROR_NOT_STARTED;
    }
    if (stream->failure != KZ_OK) {
        return stream->failure;
    }
    const kz_status status =
        kz_fpx_fingerprint_get_values(stream->handle, values, capacity, out_count);
    return status == KZ_FPX_ERROR_MEMORY ? KZ_STREAM_ERROR_MEMORY : status;
}

kz_status kz_stream_get_document(kz_stream* stream, const char** out_text) noexcept
{
    if (stream == nullptr || out_text == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    *out_text = nullptr;
    if (!kz::stream::library_is_on()) {
        return KZ_STREAM_ERROR_NOT_STARTED;
    }
    kz_status status = stream->failure;
    if (status == KZ_OK && stream->document == nullptr) {
        status = write_document(*stream);
    }
    if (status == KZ_OK) {
        *out_text = stream->document;
    }
    return status;
}

kz_status kz_stream_get_signal_offset(const kz_stream* stream, uint32_t* out_samples,
                                      double* out_seconds, uint8_t* out_found) noexcept
{
    if (stream == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    return kz_fpx_fingerprint_get_signal_offset(stream->handle, out_samples, out_seconds,
                                                out_found);
}

kz_status kz_stream_get_times(const kz_stream* stream, uint32_t* out_start,
                              uint32_t* out_duration) noexcept
{
    if (stream == nullptr) {
        return KZ_STREAM_ERROR_INVALID_ARGUMENT;
    }
    return kz_fpx_fingerprint_get_times(stream->handle, out_start, out_duration);
}
