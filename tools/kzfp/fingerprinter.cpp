// Feeds the library what a source gives, in pieces that leave no trace in the result.

#include "kzfp/fingerprinter.hpp"

#include <cmath>
#include <cstdio>
#include <memory>

#include "kzsdk/fpx/fpx.h"

namespace kzfp {

namespace {

struct Free {
    void operator()(kz_fpx_handle* handle) const { kz_fpx_fingerprint_free(&handle); }
    void operator()(char* text) const { kz_fpx_fingerprint_serialize_free(&text); }
};
using Handle = std::unique_ptr<kz_fpx_handle, Free>;

std::string printed(const char* format, double number)
{
    char text[64];
    std::snprintf(text, sizeof text, format, number);
    return text;
}

std::string tenths(double seconds) { return printed("%.1f s", std::floor(seconds * 10) / 10); }

/// Rounded down, so that what is too short never looks long enough.
std::string hundredths(double seconds)
{
    return printed("%.2f s", std::floor(seconds * 100 + 1e-6) / 100);
}

std::string needed() { return hundredths(KZ_FPX_MILLISECONDS_NEEDED / 1000.0); }

uint32_t to_library_format(audio::Encoding encoding)
{
    switch (encoding) {
    case audio::Encoding::u8:
        return KZ_FPX_FORMAT_PCM8;
    case audio::Encoding::alaw:
        return KZ_FPX_FORMAT_ALAW;
    case audio::Encoding::ulaw:
        return KZ_FPX_FORMAT_ULAW;
    case audio::Encoding::s16:
        break;
    }
    return KZ_FPX_FORMAT_PCM16;
}

Handle create(const audio::StreamFormat& format, Algorithm algorithm)
{
    kz_fpx_handle* handle = nullptr;
    const kz_status status = kz_fpx_fingerprint_create(static_cast<uint32_t>(algorithm),
                                                       to_library_format(format.encoding),
                                                       format.rate, format.channels, &handle);
    if (status != KZ_OK) {
        fail("making a fingerprint", status);
    }
    return Handle(handle);
}

/// Leading silence, skipped so far.
struct Silence {
    uint32_t samples = 0; ///< at kWorkingRate
    double seconds = 0;
    uint8_t has_ended = 0;
};

Silence silence_of(const kz_fpx_handle& handle)
{
    Silence silence;
    kz_fpx_fingerprint_get_signal_offset(&handle, &silence.samples, &silence.seconds,
                                         &silence.has_ended);
    return silence;
}

uint32_t next_frames(const kz_fpx_handle& handle)
{
    uint32_t frames = 0;
    kz_fpx_fingerprint_get_next_frames(&handle, &frames);
    return frames;
}

/// Why `frames` of a stream that has ended made no fingerprint.
std::string too_little(const kz_fpx_handle& handle, const audio::Source& source, uint64_t frames)
{
    const double seconds = static_cast<double>(frames) / source.format().rate;
    const Silence silence = silence_of(handle);
    std::string text;
    if (frames == 0) {
        text = "no sound";
    } else if (silence.has_ended == 0) {
        text = "nothing but silence in " + tenths(seconds);
    } else {
        text = hundredths(std::max(0.0, seconds - silence.seconds)) + " of sound";
        if (silence.seconds >= 0.1) {
            text += " after " + tenths(silence.seconds) + " of silence";
        }
    }
    if (const std::string trouble = source.trouble(); !trouble.empty()) {
        text += ", then the file is damaged (" + trouble + ")";
    }
    return text + ", " + needed() + " needed";
}

/// Feeds a stream until the fingerprint is complete, in the pieces that the library would cut for
/// itself out of one large buffer: leading silence is judged piece by piece, and at most rates a
/// cut shows in the last bits of the resampled signal.
void feed(kz_fpx_handle& handle, audio::Source& source)
{
    const size_t frame_bytes = source.format().frame_bytes();
    std::vector<std::byte> block;
    uint64_t fed = 0;
    uint8_t complete = 0;
    while (complete == 0) {
        const size_t wanted = next_frames(handle);
        block.resize(wanted * frame_bytes);
        const size_t got = source.read(block);
        if (got > 0) {
            const kz_status status = kz_fpx_fingerprint_add_audio(
                &handle, block.data(), static_cast<uint32_t>(got * frame_bytes), &complete);
            if (status != KZ_OK) {
                fail("adding audio", status);
            }
            fed += got;
        }
        if (complete == 0 && got < wanted) {
            throw audio::FileError(too_little(handle, source, fed));
        }
    }
}

std::string to_document(kz_fpx_handle& handle)
{
    char* rendered = nullptr;
    const kz_status status = kz_fpx_fingerprint_serialize(&handle, &rendered);
    if (status != KZ_OK) {
        fail("writing the document", status);
    }
    const std::unique_ptr<char, Free> text(rendered);
    std::string document(text.get());
    while (document.ends_with('\n') || document.ends_with('\r')) {
        document.pop_back();
    }
    return document;
}

std::vector<int16_t> values_of(kz_fpx_handle& handle)
{
    uint32_t count = 0;
    kz_fpx_fingerprint_get_values(&handle, nullptr, 0, &count);
    std::vector<int16_t> values(count);
    const kz_status status = kz_fpx_fingerprint_get_values(&handle, values.data(), count, &count);
    if (status != KZ_OK) {
        fail("reading the values", status);
    }
    return values;
}

} // namespace

Fingerprint take_fingerprint(audio::Source& source, Algorithm algorithm)
{
    const Handle handle = create(source.format(), algorithm);
    feed(*handle, source);
    Fingerprint fingerprint;
    fingerprint.document = to_document(*handle);
    fingerprint.values = values_of(*handle);
    fingerprint.signal_offset = silence_of(*handle).samples;
    return fingerprint;
}

} // namespace kzfp
