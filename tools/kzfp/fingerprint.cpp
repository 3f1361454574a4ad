#include "fingerprint.hpp"

#include <charconv>
#include <cmath>
#include <cstdio>
#include <memory>
#include <string_view>

#include "kzsdk/abs/startup.h"
#include "kzsdk/fpx/fpx.h"
#include "kzsdk/fpx/inspect.hpp"

namespace kzfp {

namespace {

/// Twelve frames of 32768 samples, each 11264 after the one before.
constexpr double kSecondsNeeded = (11.0 * 11264 + 32768) / kWorkingRate;

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

/// Rounded so that what is too short never looks long enough.
std::string had(double seconds) { return printed("%.1f s", std::floor(seconds * 10) / 10); }
std::string needed() { return printed("%.1f s", std::ceil(kSecondsNeeded * 10) / 10); }

[[noreturn]] void fail(const char* step, kz_status status)
{
    char text[64];
    std::snprintf(text, sizeof text, "%s failed with status 0x%08X", step,
                  static_cast<unsigned>(status));
    throw FileError(text);
}

uint32_t to_library_format(Encoding encoding)
{
    switch (encoding) {
    case Encoding::u8:
        return KZ_FPX_FORMAT_PCM8;
    case Encoding::alaw:
        return KZ_FPX_FORMAT_ALAW;
    case Encoding::ulaw:
        return KZ_FPX_FORMAT_ULAW;
    case Encoding::s16:
        break;
    }
    return KZ_FPX_FORMAT_PCM16;
}

Handle create(const StreamFormat& format, Algorithm algorithm)
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

/// Why `frames` of a stream that has ended made no fingerprint.
std::string too_little(const kz_fpx_handle& handle, const AudioSource& source, uint64_t frames)
{
    const double seconds = static_cast<double>(frames) / source.format().rate;
    const double silence = static_cast<double>(kz::fpx::signal_offset(handle)) / kWorkingRate;
    std::string text;
    if (frames == 0) {
        text = "no sound";
    } else if (!kz::fpx::signal_found(handle)) {
        text = "nothing but silence in " + had(seconds);
    } else {
        text = had(std::max(0.0, seconds - silence)) + " of sound";
        if (silence >= 0.1) {
            text += " after " + had(silence) + " of silence";
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
void feed(kz_fpx_handle& handle, AudioSource& source)
{
    const size_t frame_bytes = source.format().frame_bytes();
    std::vector<std::byte> block;
    uint64_t fed = 0;
    uint8_t complete = 0;
    while (complete == 0) {
        const size_t wanted = kz::fpx::next_block_frames(handle);
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
            throw FileError(too_little(handle, source, fed));
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

/// The document writes the values unsigned, though it calls them signed, which they are.
std::vector<int16_t> values_of(std::string_view document)
{
    std::vector<int16_t> values;
    const size_t element = document.find("<FP_BLOCK ");
    const size_t start = document.find('>', element);
    const size_t end = document.find('<', start);
    if (element == std::string_view::npos || end == std::string_view::npos) {
        throw FileError("the library's document holds no values");
    }
    std::string_view text = document.substr(start + 1, end - start - 1);
    while (!text.empty()) {
        uint16_t word = 0;
        const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), word);
        if (error == std::errc{}) {
            values.push_back(static_cast<int16_t>(word));
            text.remove_prefix(static_cast<size_t>(stop - text.data()));
        } else {
            text.remove_prefix(1);
        }
    }
    return values;
}

} // namespace

Library::Library()
{
    kzconf_configuration configuration;
    kzconf_initialize_configuration(&configuration);
    if (const kz_status status = kzinit_initialize_vesk(&configuration); status != KZ_OK) {
        fail("starting the library", status);
    }
}

Library::~Library() { kzinit_shutdown_vesk(); }

Fingerprint take_fingerprint(AudioSource& source, Algorithm algorithm)
{
    const Handle handle = create(source.format(), algorithm);
    feed(*handle, source);
    Fingerprint fingerprint;
    fingerprint.document = to_document(*handle);
    fingerprint.values = values_of(fingerprint.document);
    fingerprint.signal_offset = kz::fpx::signal_offset(*handle);
    return fingerprint;
}

} // namespace kzfp
