// Prints one line for each piece of sound, rate and format: what it is, and digests of its trail
// and of its bands as a query; then one for each clip: what it was recognised as, to the last bit.
// Given a file of such lines, prints the lines that differ instead, and fails if there are any.
//
// The sound is made with integers only, so a difference comes from the catalogue or the library.

#include <array>
#include <bit>
#include <cinttypes>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <span>
#include <string>
#include <vector>

#include "catalogue/match/match.hpp"
#include "catalogue/match/scan.hpp"
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

Sound noise(uint32_t rate, double seconds, int shift, uint64_t seed)
{
    kz::test::Congruential random(seed);
    Sound sound(static_cast<size_t>(rate * seconds));
    for (int16_t& sample : sound) {
        sample = static_cast<int16_t>(static_cast<int32_t>(random.next()) >> (16 + shift));
    }
    return sound;
}

Sound sum(Sound one, const Sound& other)
{
    for (size_t i = 0; i < one.size() && i < other.size(); ++i) {
        one[i] = static_cast<int16_t>(one[i] / 2 + other[i] / 2);
    }
    return one;
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
    add_features(lines, "noise", "s16", {kShort, 22050, 1}, noise(22050, kSeconds, 1, 1));
    add_features(lines, "silence", "s16", {kShort, 22050, 1}, Sound(88200, 0));
    add_features(lines, "music", "f32", {KZ_STREAM_FORMAT_FLOAT32, 44100, 3},
                 kz::test::melody(44100, 3, kSeconds));
    add_features(lines, "music", "ulaw", {KZ_STREAM_FORMAT_ULAW, 8000, 1},
                 kz::test::melody(8000, 1, kSeconds));
}

// ---- answers

constexpr uint32_t kRate = 11025;
constexpr double kTrackSeconds = 40;
constexpr kzcat::SoundFormat kPlain{KZ_STREAM_FORMAT_PCM16, kRate, 1};

/// A catalogue in memory of one tune, as it is and a good deal faster and slower, and of noise.
struct Catalogue {
    Catalogue()
    {
        const auto tune = encode(KZ_STREAM_FORMAT_PCM16, kz::test::melody(kRate, 1, kTrackSeconds));
        for (const uint32_t rate : {kRate, 14000U, 8500U}) {
            add(trail_of({KZ_STREAM_FORMAT_PCM16, rate, 1}, tune));
        }
        add(trail_of(kPlain, encode(KZ_STREAM_FORMAT_PCM16, noise(kRate, kTrackSeconds, 2, 2))));
    }

    kzcat::Corpus corpus() const { return {{{codes, tracks}}}; }

    std::vector<kzcat::Code> codes;
    std::vector<kzcat::TrackSpan> tracks;

private:
    void add(const kzcat::Trail& trail)
    {
        tracks.push_back(
            {static_cast<int64_t>(tracks.size()) + 1, codes.size(), trail.codes.size()});
        codes.insert(codes.end(), trail.codes.begin(), trail.codes.end());
    }
};

std::string exact(double number)
{
    std::array<char, 17> digits{};
    std::snprintf(digits.data(), digits.size(), "%016" PRIx64, std::bit_cast<uint64_t>(number));
    return digits.data();
}

std::string text_of(const kzcat::TrackMatch& match)
{
    std::string text = std::to_string(match.track);
    for (const double number : {match.score, match.threshold, match.offset, match.speed,
                                match.tempo, match.pitch, match.clip_begin, match.clip_end}) {
        text += ' ' + exact(number);
    }
    return text;
}

std::string text_of(const kzcat::MatchAnswer& answer)
{
    std::string text = std::to_string(static_cast<int>(answer.verdict)) + ' ' +
                       std::to_string(answer.matches.size()) + ' ' + exact(answer.runner_up);
    for (const auto& candidate : answer.candidates) {
        text += " | " + text_of(candidate);
    }
    return text;
}

void add_answers(Lines& lines)
{
    const Catalogue catalogue;
    kzcat::ScanSearcher searcher(catalogue.corpus());
    const auto tune = kz::test::melody(kRate, 1, kTrackSeconds);
    const Sound clip(tune.begin() + kRate * 11, tune.begin() + kRate * 23);
    const auto add = [&](const char* name, uint32_t rate, const Sound& sound) {
        const auto query =
            query_of({KZ_STREAM_FORMAT_PCM16, rate, 1}, encode(KZ_STREAM_FORMAT_PCM16, sound));
        lines.push_back(std::string("answer ") + name + ' ' +
                        text_of(kzcat::recognise(query, searcher, {})));
    };
    add("clean", kRate, clip);
    add("noisy", kRate, sum(clip, noise(kRate, 12, 1, 3)));
    add("faster", kRate * 103 / 100, clip);
    add("stranger", kRate, noise(kRate, 12, 0, 4));
    add("silence", kRate, Sound(clip.size(), 0));
}

} // namespace

int main(int argc, char** argv)
{
    Lines lines;
    add_features(lines);
    add_answers(lines);
    return kz::golden::report(lines, argc > 1 ? argv[1] : nullptr);
}
