// Feeds what a source gives to a stream of the library, on which its pieces leave no trace.

#include "kzfp/fingerprinter.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <memory>

#include "kzsdk/stream/stream.h"

namespace kzfp {

namespace {

constexpr size_t kBlock = 1024; ///< frames read at a time: hardly more is taken than is needed

struct Free {
    void operator()(kz_stream* stream) const { kz_stream_free(&stream); }
};
using Stream = std::unique_ptr<kz_stream, Free>;

void check(const char* step, kz_status status)
{
    if (status != KZ_OK) {
        fail(step, status);
    }
}

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

/// The folded 8-bit format is that of the extraction interface; it cannot be mixed down.
uint32_t to_stream_format(const audio::StreamFormat& format)
{
    switch (format.encoding) {
    case audio::Encoding::u8:
        return format.channels <= 2 ? KZ_STREAM_FORMAT_PCM8 : KZ_STREAM_FORMAT_LINEAR8;
    case audio::Encoding::alaw:
        return KZ_STREAM_FORMAT_ALAW;
    case audio::Encoding::ulaw:
        return KZ_STREAM_FORMAT_ULAW;
    case audio::Encoding::f32:
        return KZ_STREAM_FORMAT_FLOAT32;
    case audio::Encoding::s16:
        break;
    }
    return KZ_STREAM_FORMAT_PCM16;
}

Stream create(const audio::StreamFormat& format, Algorithm algorithm)
{
    kz_stream_settings settings;
    kz_stream_initialize_settings(&settings);
    settings.algorithm = static_cast<uint32_t>(algorithm);
    settings.format = to_stream_format(format);
    settings.sample_rate = format.rate;
    settings.channels = format.channels;
    kz_stream* stream = nullptr;
    check("making a fingerprint", kz_stream_create(&settings, &stream));
    return Stream(stream);
}

/// Leading silence, skipped so far.
struct Silence {
    uint32_t samples = 0; ///< at kWorkingRate
    double seconds = 0;
};

Silence silence_of(const kz_stream& stream)
{
    Silence silence;
    kz_stream_get_signal_offset(&stream, &silence.samples, &silence.seconds, nullptr);
    return silence;
}

/// Why a stream that has ended made no fingerprint.
std::string too_little(const kz_stream& stream, const audio::Source& source)
{
    kz_stream_state state;
    kz_stream_get_state(&stream, &state);
    const double seconds = static_cast<double>(state.frames) / source.format().rate;
    std::string text;
    if (state.phase == KZ_STREAM_NOTHING_FED) {
        text = "no sound";
    } else if (state.phase == KZ_STREAM_SILENT) {
        text = "nothing but silence in " + tenths(seconds);
    } else {
        const double silence = silence_of(stream).seconds;
        text = hundredths(std::max(0.0, seconds - silence)) + " of sound";
        if (silence >= 0.1) {
            text += " after " + tenths(silence) + " of silence";
        }
    }
    if (const std::string trouble = source.trouble(); !trouble.empty()) {
        text += ", then the file is damaged (" + trouble + ")";
    }
    return text + ", " + sound_needed() + " needed";
}

/// Reads until the fingerprint is complete, or the source ends.
void feed(kz_stream& stream, audio::Source& source)
{
    std::vector<std::byte> block(kBlock * source.format().frame_bytes());
    uint8_t complete = 0;
    for (size_t got = kBlock; complete == 0 && got == kBlock;) {
        got = source.read(block);
        const size_t bytes = got * source.format().frame_bytes();
        check("adding audio", kz_stream_feed(&stream, block.data(), bytes, nullptr, &complete));
    }
    check("adding audio", kz_stream_finish(&stream, &complete));
    if (complete == 0) {
        throw audio::FileError(too_little(stream, source));
    }
}

std::string document_of(kz_stream& stream)
{
    const char* text = nullptr;
    check("writing the document", kz_stream_get_document(&stream, &text));
    std::string document(text);
    while (document.ends_with('\n') || document.ends_with('\r')) {
        document.pop_back();
    }
    return document;
}

std::vector<int16_t> values_of(kz_stream& stream)
{
    uint32_t count = 0;
    kz_stream_get_values(&stream, nullptr, 0, &count);
    std::vector<int16_t> values(count);
    check("reading the values", kz_stream_get_values(&stream, values.data(), count, &count));
    return values;
}

} // namespace

std::string sound_needed() { return hundredths(KZ_FPX_MILLISECONDS_NEEDED / 1000.0); }

Fingerprint take_fingerprint(audio::Source& source, Algorithm algorithm)
{
    const Stream stream = create(source.format(), algorithm);
    feed(*stream, source);
    return {.document = document_of(*stream),
            .values = values_of(*stream),
            .signal_offset = silence_of(*stream).samples};
}

} // namespace kzfp
