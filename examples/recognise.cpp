// Recognises a piece of music: makes a catalogue of three tunes that the program plays to itself,
// takes a clip out of the middle of one of them, adds noise, and looks it up.
//
//     c++ -std=c++17 recognise.cpp $(pkg-config --cflags --libs kzcat) -o recognise
//     ./recognise

#include <array>
#include <cstdint>
#include <cstdio>
#include <exception>
#include <vector>

#include "kzcat.hpp"

namespace {

constexpr uint32_t kRate = 22050;

/// A note of the scale, scattered so that no tune repeats itself: a clip then has one place only.
uint32_t pitch_of(uint32_t tune, uint32_t note)
{
    constexpr std::array<uint32_t, 12> kHertz = {262, 330, 392, 523, 440, 349,
                                                 294, 392, 330, 247, 494, 587};
    const auto scatter = [](uint64_t one, uint64_t other) {
        return static_cast<uint32_t>(one * other & UINT32_MAX);
    };
    uint32_t scattered = scatter(note + 1000 * tune + 1, 2654435761U);
    scattered = scatter(scattered ^ scattered >> 15, 2246822519U);
    return kHertz[(scattered ^ scattered >> 13) % kHertz.size()];
}

/// One note every fifth of a second; a sawtooth, so that it has overtones.
int32_t tune_sample(uint32_t tune, uint32_t frame)
{
    const uint32_t pitch = pitch_of(tune, frame / (kRate / 5));
    const uint32_t fading = kRate / 5 - frame % (kRate / 5);
    const auto saw = static_cast<int32_t>(frame * pitch % kRate * 16384 / kRate) - 8192;
    return saw * static_cast<int32_t>(fading / 4) / static_cast<int32_t>(kRate / 20);
}

/// The same numbers everywhere; about 12 dB below the music.
int32_t noise_sample()
{
    static uint64_t state = 1;
    state = (state * 1664525U + 1013904223U) & UINT32_MAX;
    return static_cast<int32_t>(state >> 20) - 2048;
}

std::vector<int16_t> play(uint32_t tune, uint32_t start, uint32_t seconds, bool noisy)
{
    std::vector<int16_t> samples;
    for (uint32_t i = 0; i < seconds * kRate; ++i) {
        const int32_t noise = noisy ? noise_sample() : 0;
        samples.push_back(static_cast<int16_t>(tune_sample(tune, start * kRate + i) + noise));
    }
    return samples;
}

} // namespace

int main()
{
    try {
        auto catalogue = kz::catalogue::in_memory().value();
        uint32_t tune = 0;
        for (const char* name : {"First tune", "Second tune", "Third tune"}) {
            const auto trail = kz::trail::of(play(tune++, 0, 40, false), kRate, 1).value();
            catalogue.add(trail, {name}, {{"title", name}}).value();
        }
        const auto clip = kz::query::of(play(1, 17, 8, true), kRate, 1).value();
        for (const kz::match& match : catalogue.recognise(clip).value().matches) {
            std::printf("%s, from second %.1f on\n", match.title.c_str(), match.offset);
        }
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "not recognised: %s\n", failure.what());
        return 1;
    }
}
