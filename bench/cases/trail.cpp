// Trails and queries of the catalogue, from sound.

#include <memory>
#include <span>

#include "cases/cases.hpp"
#include "catalogue/model/extractor.hpp"
#include "library.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"
#include "support/melody.hpp"

namespace kz::bench {

namespace {

constexpr double kTrackSeconds = 30;
constexpr double kClipSeconds = 14.3;

using Sound = std::vector<int16_t>;
using SharedSound = std::shared_ptr<const Sound>;

SharedSound sound_of(uint32_t rate, uint32_t channels, double seconds)
{
    return std::make_shared<const Sound>(kz::test::melody(rate, channels, seconds));
}

kzcat::Trail trail_of(const kzcat::SoundFormat& format, const Sound& sound)
{
    kzcat::TrailExtractor extractor(format);
    extractor.feed(std::as_bytes(std::span(sound)));
    return extractor.finish();
}

kzcat::QueryBands query_of(const kzcat::SoundFormat& format, const Sound& sound)
{
    kzcat::QueryExtractor extractor(format);
    extractor.feed(std::as_bytes(std::span(sound)));
    return extractor.finish();
}

std::string digest_of(const std::vector<kzcat::Code>& codes)
{
    kz::test::Digest digest;
    for (const kzcat::Code code : codes) {
        for (int shift = 0; shift < 64; shift += 8) {
            digest.take(static_cast<uint8_t>(code >> shift));
        }
    }
    return digest.text();
}

/// Made, fed everything at once, and finished, beside libchromaprint with the same samples.
Case trail(const std::string& name, uint32_t rate, uint32_t channels, double must, double goal)
{
    const kzcat::SoundFormat format{KZ_STREAM_FORMAT_PCM16, rate, channels};
    const auto prepare = [format] {
        const auto sound = sound_of(format.rate, format.channels, kTrackSeconds);
        Prepared prepared;
        prepared.run = [=] { keep(trail_of(format, *sound).codes.data()); };
        prepared.digest = [=] { return digest_of(trail_of(format, *sound).codes); };
        prepared.peers = [=] {
            return Peers{chromaprint_fingerprint(*sound, format.rate, format.channels)};
        };
        return prepared;
    };
    return {name,
            "a trail of " + std::to_string(rate) + " Hz " + (channels == 2 ? "stereo" : "mono") +
                ", for a second of it",
            {"µs", 1e-6 * kTrackSeconds},
            share_of(kChromaprint, must),
            share_of(kChromaprint, goal),
            prepare};
}

Case query()
{
    const auto prepare = [] {
        const kzcat::SoundFormat format{KZ_STREAM_FORMAT_PCM16, 44100, 2};
        const auto sound = sound_of(format.rate, format.channels, kClipSeconds);
        Prepared prepared;
        prepared.run = [=] { keep(query_of(format, *sound).energies.data()); };
        prepared.digest = [=] {
            const auto bands = query_of(format, *sound);
            kz::test::Digest digest;
            digest.take(std::span(bands.energies));
            digest.take(std::span(bands.levels));
            return digest.text();
        };
        return prepared;
    };
    return {"query_44100s", "a query of 14.3 s of 44100 Hz stereo",
            milliseconds(), at_most(10),
            at_most(5),     prepare};
}

} // namespace

std::vector<Case> trail_cases()
{
    return {
        trail("trail_44100s", 44100, 2, 0.35, 0.2), trail("trail_48000s", 48000, 2, 0.35, 0.25),
        trail("trail_44056s", 44056, 2, 1, 0.6),    trail("trail_22050m", 22050, 1, 0.5, 0.3),
        trail("trail_11025m", 11025, 1, 1.2, 0.9),  query(),
    };
}

} // namespace kz::bench
