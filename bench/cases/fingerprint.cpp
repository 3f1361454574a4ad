// The whole path: what an application pays for a fingerprint and for the life of a handle.

#include <cstdlib>
#include <iterator>

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"

namespace kz::bench {

namespace {

constexpr char kSame[] = "16 bits through us";
constexpr char kOlaf[] = "Olaf, recorded";

using Bytes = std::vector<uint8_t>;
using SharedBytes = std::shared_ptr<const Bytes>;

/// A complete fingerprint.
Fingerprint listen(const Job& job, const Bytes& bytes)
{
    Fingerprint fingerprint(job);
    require(fingerprint.feed(bytes.data(), bytes.size()), "the fingerprint is not complete");
    return fingerprint;
}

/// Creates, feeds everything at once, renders and frees.
std::function<void()> fingerprinting(const Job& job, const SharedBytes& bytes)
{
    return [job, bytes] { listen(job, *bytes).render([](const char* text) { keep(text); }); };
}

Prepared fingerprinter(const Job& job, const SharedBytes& bytes)
{
    Prepared prepared;
    prepared.run = fingerprinting(job, bytes);
    prepared.digest = [job, bytes] { return kz::test::digest_of(listen(job, *bytes).document()); };
    return prepared;
}

// ---- the sound in its formats

std::vector<int16_t> sound_of(const Job& job)
{
    return kz::test::melody(job.rate, number(job.channels), kOffered);
}

SharedBytes as_pcm16(const std::vector<int16_t>& sound)
{
    Bytes bytes(sound.size() * sizeof(int16_t));
    std::memcpy(bytes.data(), sound.data(), bytes.size());
    return std::make_shared<const Bytes>(std::move(bytes));
}

SharedBytes as_pcm8(const std::vector<int16_t>& sound)
{
    Bytes bytes;
    std::transform(sound.begin(), sound.end(), std::back_inserter(bytes),
                   [](int16_t sample) { return static_cast<uint8_t>((sample >> 8) + 128); });
    return std::make_shared<const Bytes>(std::move(bytes));
}

// The code whose sample is nearest, in steps of sixteen.
std::vector<uint8_t> alaw_codes()
{
    const int16_t* const table = KZDSP_GetALawTable();
    std::vector<uint8_t> codes;
    for (int level = INT16_MIN; level <= INT16_MAX; level += 16) {
        const auto* const nearest = std::min_element(table, table + 256, [level](int a, int b) {
            return std::abs(a - level) < std::abs(b - level);
        });
        codes.push_back(static_cast<uint8_t>(nearest - table));
    }
    return codes;
}

SharedBytes as_alaw(const std::vector<int16_t>& sound)
{
    const auto codes = alaw_codes();
    Bytes bytes;
    for (const int16_t sample : sound) {
        const int step = (sample - INT16_MIN) / 16;
        bytes.push_back(codes[static_cast<size_t>(step)]);
    }
    return std::make_shared<const Bytes>(std::move(bytes));
}

// ---- the cases

/// 16-bit samples beside libchromaprint, which receives the same samples.
Case beside_chromaprint(const std::string& name, Algorithm algorithm, uint32_t rate,
                        Channels channels, double must, double goal)
{
    const auto prepare = [=] {
        const Job job{algorithm, pcm16, rate, channels};
        const auto sound = sound_of(job);
        Prepared prepared = fingerprinter(job, as_pcm16(sound));
        prepared.peers = [=] {
            return Peers{chromaprint_fingerprint(sound, rate, number(channels))};
        };
        return prepared;
    };
    return {name,
            "a fingerprint of " + std::to_string(rate) + " Hz " +
                (channels == stereo ? "stereo" : "mono"),
            milliseconds(),
            share_of(kChromaprint, must),
            share_of(kChromaprint, goal),
            prepare};
}

/// Another format beside 16-bit samples of the same sound, both through us.
Case beside_pcm16(const std::string& name, Format format, uint32_t rate, Channels channels,
                  SharedBytes (*encode)(const std::vector<int16_t>&))
{
    const auto prepare = [=] {
        const auto sound = sound_of({fixed, format, rate, channels});
        Prepared prepared = fingerprinter({fixed, format, rate, channels}, encode(sound));
        const Job same{fixed, pcm16, rate, channels};
        prepared.peers = [=] { return Peers{{kSame, fingerprinting(same, as_pcm16(sound))}}; };
        return prepared;
    };
    return {name,
            "the same of " + std::string(format == alaw ? "A-law" : "8-bit") + " at " +
                std::to_string(rate) + " Hz",
            milliseconds(),
            share_of(kSame, 1.1),
            share_of(kSame, 1.05),
            prepare};
}

/// Beside a figure from elsewhere: Olaf's extraction alone, built from its sources and run on
/// another machine (3.6 GHz), took 565 microseconds for a second of audio.
Case beside_olaf()
{
    const auto prepare = [] {
        const Job job{fixed, pcm16, 16000, mono};
        Prepared prepared = fingerprinter(job, as_pcm16(sound_of(job)));
        prepared.peers = [] { return Peers{{kOlaf, {}, {}, 565e-6 * kListened}}; };
        return prepared;
    };
    return {"olaf_ratio",
            "a second of audio at 16000 Hz mono",
            {"µs", 1e-6 * kListened},
            {},
            share_of(kOlaf, 0.2),
            prepare};
}

Case handle_life(const std::string& name, Algorithm algorithm, double goal)
{
    const auto prepare = [algorithm] {
        const Job job{algorithm, pcm16, 44100, stereo};
        return Prepared{[job] { const Fingerprint fingerprint(job); },
                        [] { return std::string("nothing"); },
                        [] { return Peers{chromaprint_life(44100, 2)}; }};
    };
    return {name,           "a handle made and freed",
            microseconds(), share_of(kChromaprint, 0.5),
            at_most(goal),  prepare};
}

} // namespace

std::vector<Case> fingerprint_cases()
{
    return {
        beside_chromaprint("fp1_44100s", fixed, 44100, stereo, 0.33, 0.17),
        beside_chromaprint("fp1_48000s", fixed, 48000, stereo, 0.45, 0.23),
        beside_chromaprint("fp1_22050m", fixed, 22050, mono, 0.45, 0.22),
        beside_chromaprint("fp1_8000m", fixed, 8000, mono, 0.75, 0.45),
        beside_chromaprint("fp1_11025m", fixed, 11025, mono, 1.0, 0.6),
        beside_pcm16("fp1_alaw8000", alaw, 8000, mono, as_alaw),
        beside_pcm16("fp1_pcm8", pcm8, 44100, stereo, as_pcm8),
        beside_chromaprint("fp2_44100s", floating, 44100, stereo, 0.45, 0.25),
        beside_chromaprint("fp2_48000s", floating, 48000, stereo, 0.45, 0.25),
        beside_olaf(),
        handle_life("create_free_1", fixed, 30),
        handle_life("create_free_2", floating, 60),
    };
}

} // namespace kz::bench
