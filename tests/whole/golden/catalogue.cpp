// Prints one line for each piece of sound, rate and format: what it is, and digests of its trail
// and of its bands as a query. Given a file of such lines, prints the lines that differ instead, and
// fails if there are any.
//
// The sound is made with integers only, so a difference comes from the catalogue or the library.

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "catalogue/model/extractor.hpp"
#include "kzsdk/kzsdk.h"
#include "support/digest.hpp"
#include "support/melody.hpp"
#include "whole/golden/lines.hpp"

namespace {

using kz::golden::Lines;
using kz::test::Digest;
using Bytes = std::vector<std::byte>;
using Sound = std::vector<int16_t>;

// ---- sound

template <class Sample>
void append(Bytes& bytes, Sample sample)
{
    const auto held = std::bit_cast<std::array<std::byte, sizeof(Sample)>>(sample);
    bytes.insert(bytes.end(), held.begin(), held.end());
}

Bytes encode(uint32_t format, const Sound& sound)
{
    Bytes bytes;
    for (const int16_t sample : sound) {
        switch (format) {
        case KZ_STREAM_FORMAT_FLOAT32:
            append(bytes, static_cast<float>(sample) / 32768.0F);
            break;
        case KZ_STREAM_FORMAT_PCM16:
            append(bytes, sample);
            break;
        default: // any byte is a sample
            append(bytes, static_cast<uint8_t>(static_cast<uint16_t>(sample) >> 8));
        }
    }
    return bytes;
}

Sound noise(uint32_t rate, uint32_t channels, double seconds, int shift)
{
    kz::test::Congruential random(rate + channels);
    Sound sound(static_cast<size_t>(rate * seconds) * channels);
    for (int16_t& sample : sound) {
        sample = static_cast<int16_t>(static_cast<int32_t>(random.next()) >> (16 + shift));
    }
    return sound;
}

// ---- trails and bands

void take(Digest& digest, std::span<const kzcat::Code> codes)
{
    for (const kzcat::Code code : codes) {
        digest.take(std::array{static_cast<int32_t>(static_cast<uint32_t>(code)),
                               static_cast<int32_t>(static_cast<uint32_t>(code >> 32))});
    }
}

kzcat::Trail trail_of(const kzcat::SoundFormat& format, const Bytes& bytes)
{
    kzcat::TrailExtractor extractor(format);
    extractor.feed(bytes);
    return extractor.finish();
}

kzcat::QueryBands query_of(const kzcat::SoundFormat& format, const Bytes& bytes)
{
    kzcat::QueryExtractor extractor(format);
    extractor.feed(bytes);
    return extractor.finish();
}

std::string features_of(const kzcat::SoundFormat& format, const Bytes& bytes)
{
    const auto trail = trail_of(format, bytes);
    const auto query = query_of(format, bytes);
    Digest codes;
    take(codes, trail.codes);
    Digest bands;
    bands.take(query.energies);
    bands.take(query.levels);
    return std::to_string(trail.codes.size()) + ' ' + codes.text() + ' ' +
           std::to_string(query.frames()) + ' ' + bands.text();
}

void add_features(Lines& lines, const char* piece, const char* encoding,
                  const kzcat::SoundFormat& format, const Sound& sound)
{
    lines.push_back("features " + std::to_string(format.rate) + ' ' +
                    std::to_string(format.channels) + ' ' + encoding + ' ' + piece + ' ' +
                    features_of(format, encode(format.encoding, sound)));
}

void add_features(Lines& lines)
{
    constexpr uint32_t kShort = KZ_STREAM_FORMAT_PCM16;
    constexpr double kSeconds = 4;
    for (const uint32_t rate : {8000U, 11025U, 16000U, 22050U, 32000U, 44100U, 48000U, 96000U}) {
        add_features(lines, "music", "s16", {kShort, rate, 2}, kz::test::melody(rate, 2, kSeconds));
    }
    for (const uint32_t rate : {6000U, 12345U, 44056U}) {
        add_features(lines, "music", "s16", {kShort, rate, 1}, kz::test::melody(rate, 1, kSeconds));
    }
    add_features(lines, "quiet", "s16", {kShort, 22050, 1},
                 kz::test::melody(22050, 1, kSeconds, 4));
    add_features(lines, "noise", "s16", {kShort, 22050, 1}, noise(22050, 1, kSeconds, 1));
    add_features(lines, "silence", "s16", {kShort, 22050, 1}, Sound(88200, 0));
    add_features(lines, "music", "f32", {KZ_STREAM_FORMAT_FLOAT32, 44100, 3},
                 kz::test::melody(44100, 3, kSeconds));
    add_features(lines, "music", "ulaw", {KZ_STREAM_FORMAT_ULAW, 8000, 1},
                 kz::test::melody(8000, 1, kSeconds));
}

} // namespace

int main(int argc, char** argv)
{
    Lines lines;
    add_features(lines);
    return kz::golden::report(lines, argc > 1 ? argv[1] : nullptr);
}
