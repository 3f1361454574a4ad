// Prints one line for each piece of sound, rate, format and algorithm: what it is, and a digest of
// its document. Given a file of such lines, prints the lines that differ instead, and fails if
// there are any.
//
// The sound is made with integers only and the digests are of text, so a difference comes from the
// library. Two kinds of lines cover what depends on the C library's sine and cosine: the factors
// of the floating-point transform and the taps of designed filters.

#include <algorithm>
#include <array>
#include <bit>
#include <cinttypes>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <functional>
#include <span>
#include <string>
#include <vector>

#include "kzsdk/kzsdk.h"
#include "support/digest.hpp"
#include "support/fingerprints.hpp"
#include "support/melody.hpp"
#include "whole/golden/lines.hpp"

namespace {

using kz::test::Algorithm;
using kz::test::Channels;
using kz::test::Digest;
using kz::test::Format;

constexpr uint32_t kSeconds = 15; // 12 frames take 14.21 s

// ---- sound

using Sound = std::vector<int16_t>;

Sound melody(uint32_t rate, uint32_t channels, int64_t gain)
{
    return kz::test::melody(rate, channels, kSeconds, gain);
}

Sound noise(uint32_t rate, uint32_t channels, int32_t shift)
{
    kz::test::Congruential random(rate + channels);
    Sound sound(size_t{rate} * kSeconds * channels);
    for (int16_t& sample : sound) {
        sample = static_cast<int16_t>(static_cast<int32_t>(random.next()) >> (16 + shift));
    }
    return sound;
}

Sound late(uint32_t rate, uint32_t channels)
{
    Sound sound(size_t{rate} * channels * 4, 0);
    const Sound music = melody(rate, channels, 256);
    sound.insert(sound.end(), music.begin(), music.end());
    return sound;
}

struct Piece {
    const char* name;
    std::function<Sound(uint32_t rate, uint32_t channels)> make;
};

const Piece kMusic{"music", [](uint32_t r, uint32_t c) { return melody(r, c, 256); }};
const Piece kClipped{"clipped", [](uint32_t r, uint32_t c) { return melody(r, c, 8192); }};
const Piece kQuiet{"quiet", [](uint32_t r, uint32_t c) { return melody(r, c, 8); }};
const Piece kNoise{"noise", [](uint32_t r, uint32_t c) { return noise(r, c, 1); }};
const Piece kLate{"late", late};
const Piece kSilence{"silence",
                     [](uint32_t r, uint32_t c) { return Sound(size_t{r} * c * kSeconds, 0); }};

// ---- documents

constexpr const char* kFormatNames[] = {"", "u8", "s16", "alaw", "ulaw"};

// Samples of 16 bits go in as the processor holds them. Of formats of one byte, any byte is a
// sample: the high bytes serve.
std::vector<uint8_t> encode(uint32_t format, const Sound& sound)
{
    std::vector<uint8_t> bytes;
    for (const int16_t sample : sound) {
        const auto bits = static_cast<uint16_t>(sample);
        if (format == KZ_FPX_FORMAT_PCM16) {
            const auto held = std::bit_cast<std::array<uint8_t, sizeof bits>>(bits);
            bytes.insert(bytes.end(), held.begin(), held.end());
        } else {
            bytes.push_back(static_cast<uint8_t>(bits >> 8));
        }
    }
    return bytes;
}

std::string status_text(kz_status status)
{
    std::array<char, 9> digits{};
    std::snprintf(digits.data(), digits.size(), "%08" PRIx32, status);
    return digits.data();
}

std::string outcome(Algorithm algorithm, Format format, uint32_t rate, Channels channels,
                    const std::vector<uint8_t>& bytes)
{
    kz_fpx_handle* handle = nullptr;
    kz_status status = kz::test::create(algorithm, format, rate, channels, &handle);
    if (status != KZ_OK) {
        return status_text(status);
    }
    uint8_t complete = 0;
    status = kz_fpx_fingerprint_add_audio(handle, bytes.data(), static_cast<uint32_t>(bytes.size()),
                                          &complete);
    char* text = nullptr;
    if (status == KZ_OK) {
        status = kz_fpx_fingerprint_serialize(handle, &text);
    }
    Digest digest;
    if (status == KZ_OK) {
        digest.take(text);
    }
    kz_fpx_fingerprint_serialize_free(&text);
    kz_fpx_fingerprint_free(&handle);
    return status == KZ_OK ? digest.text() : status_text(status);
}

using kz::golden::Lines;

void add_document(Lines& lines, const Piece& piece, Format format, uint32_t rate, Channels channels)
{
    const auto bytes = encode(number(format), piece.make(rate, number(channels)));
    for (const Algorithm algorithm : kz::test::kAlgorithms) {
        lines.push_back(std::string(algorithm == Algorithm::fixed ? "fixed " : "float ") +
                        std::to_string(rate) + ' ' + std::to_string(number(channels)) + ' ' +
                        kFormatNames[number(format)] + ' ' + piece.name + ' ' +
                        outcome(algorithm, format, rate, channels, bytes));
    }
}

void add_documents(Lines& lines)
{
    for (const uint32_t rate : {8000U, 11025U, 16000U, 22050U, 24000U, 32000U, 44100U, 48000U}) {
        add_document(lines, kMusic, Format::pcm16, rate, Channels::stereo);
        add_document(lines, kNoise, Format::pcm16, rate, Channels::mono);
    }
    for (const uint32_t rate : {12345U, 11024U, 44056U, 96000U}) { // only one algorithm takes these
        add_document(lines, kMusic, Format::pcm16, rate, Channels::mono);
    }
    for (const Piece& piece : {kClipped, kQuiet, kLate, kSilence}) {
        add_document(lines, piece, Format::pcm16, 16000, Channels::mono);
        add_document(lines, piece, Format::pcm16, 22050, Channels::mono);
    }
    for (const Format format : {Format::pcm8, Format::alaw, Format::ulaw}) {
        add_document(lines, kMusic, format, 8000, Channels::mono);
        add_document(lines, kMusic, format, 22050, Channels::stereo);
    }
}

// ---- streams

struct StreamKind {
    const char* name;
    uint32_t format;
    uint32_t rate;
    uint32_t channels;
};

// What only a stream takes: wide samples, many channels, high rates.
constexpr StreamKind kStreams[] = {
    {"s24", KZ_STREAM_FORMAT_PCM24, 88200, 1},      {"s32", KZ_STREAM_FORMAT_PCM32, 22050, 2},
    {"f32", KZ_STREAM_FORMAT_FLOAT32, 96000, 2},    {"f64", KZ_STREAM_FORMAT_FLOAT64, 11025, 3},
    {"linear8", KZ_STREAM_FORMAT_LINEAR8, 8000, 2}, {"alaw", KZ_STREAM_FORMAT_ALAW, 16000, 5},
    {"ulaw", KZ_STREAM_FORMAT_ULAW, 64000, 1},      {"s16", KZ_STREAM_FORMAT_PCM16, 192000, 1},
};

template <class Sample>
void append(std::vector<uint8_t>& bytes, Sample sample)
{
    const auto held = std::bit_cast<std::array<uint8_t, sizeof(Sample)>>(sample);
    bytes.insert(bytes.end(), held.begin(), held.end());
}

// With bits below the 16 that are kept, so that these are rounded too.
void append_wide(std::vector<uint8_t>& bytes, uint32_t format, int16_t sample)
{
    const int32_t wide = sample * 65536 + (sample & 0xff) * 251;
    switch (format) {
    case KZ_STREAM_FORMAT_PCM24: {
        const auto held = std::bit_cast<std::array<uint8_t, 4>>(wide);
        const auto* const first =
            held.begin() + (std::endian::native == std::endian::little ? 1 : 0);
        bytes.insert(bytes.end(), first, first + 3);
        break;
    }
    case KZ_STREAM_FORMAT_PCM32:
        append(bytes, wide);
        break;
    case KZ_STREAM_FORMAT_FLOAT32:
        append(bytes, static_cast<float>(wide) / 0x1p31F);
        break;
    case KZ_STREAM_FORMAT_FLOAT64:
        append(bytes, wide / 0x1p31);
        break;
    case KZ_STREAM_FORMAT_PCM16:
        append(bytes, sample);
        break;
    default:
        bytes.push_back(static_cast<uint8_t>(static_cast<uint16_t>(sample) >> 8));
    }
}

std::string outcome_of_stream(const StreamKind& kind, const std::vector<uint8_t>& bytes)
{
    kz_stream_settings settings;
    kz_stream* stream = nullptr;
    kz_stream_initialize_settings(&settings);
    settings.format = kind.format;
    settings.sample_rate = kind.rate;
    settings.channels = kind.channels;
    kz_status status = kz_stream_create(&settings, &stream);
    uint8_t complete = 0;
    if (status == KZ_OK) {
        status = kz_stream_feed(stream, bytes.data(), bytes.size(), nullptr, &complete);
    }
    const char* text = nullptr;
    if (status == KZ_OK) {
        status = kz_stream_get_document(stream, &text);
    }
    Digest digest;
    if (status == KZ_OK) {
        digest.take(text);
    }
    kz_stream_free(&stream);
    return status == KZ_OK ? digest.text() : status_text(status);
}

void add_streams(Lines& lines)
{
    for (const StreamKind& kind : kStreams) {
        std::vector<uint8_t> bytes;
        for (const int16_t sample : kMusic.make(kind.rate, kind.channels)) {
            append_wide(bytes, kind.format, sample);
        }
        lines.push_back("stream fixed " + std::to_string(kind.rate) + ' ' +
                        std::to_string(kind.channels) + ' ' + kind.name + " music " +
                        outcome_of_stream(kind, bytes));
    }
}

// ---- what rests on sine and cosine

void add_factors(Lines& lines)
{
    for (const int32_t order : {5, 15}) {
        KZDSP_DCT* const dct = KZDSP_CreateDCT(order);
        Digest digest;
        digest.take({dct->coefficients, dct->length});
        lines.push_back("factors " + std::to_string(order) + ' ' + digest.text());
        KZDSP_DestroyDCT(dct);
    }
}

void add_filters(Lines& lines)
{
    for (const float rate : {8000.0F, 12345.0F, 16000.0F, 44056.0F, 48000.0F, 96000.0F}) {
        KZDSP_resampler* const resampler = KZDSP_CreateResampler(rate, 11025.0F);
        Digest digest;
        digest.take({resampler->taps, resampler->length});
        lines.push_back("filter " + std::to_string(static_cast<int>(rate)) + ' ' + digest.text());
        KZDSP_DestroyResampler(resampler);
    }
}

} // namespace

int main(int argc, char** argv)
{
    if (kzmem_initialize(0, 0) != KZ_OK) {
        return 2;
    }
    Lines lines;
    add_factors(lines);
    add_filters(lines);
    add_documents(lines);
    add_streams(lines);
    const int result = kz::golden::report(lines, argc > 1 ? argv[1] : nullptr);
    static_cast<void>(kzmem_shutdown());
    return result;
}
