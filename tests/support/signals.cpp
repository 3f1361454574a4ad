#include "support/signals.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace kz::test {

namespace {

int16_t to_16_bits(double value)
{
    return static_cast<int16_t>(std::clamp(std::lround(value * 32767.0), -32768L, 32767L));
}

struct Note {
    double start;
    double hertz;
    double pan;
    double loudness;
};

std::vector<Note> compose(double seconds, uint64_t seed)
{
    constexpr int kScale[] = {0, 2, 4, 7, 9, 12, 14, 16};
    Random random(seed);
    std::vector<Note> notes;
    for (double at = 0; at < seconds; at += 0.22) {
        const int step = kScale[random.below(8)];
        notes.push_back({at, 220.0 * std::exp2(step / 12.0), random.unit() * 0.5, 1.0});
        if (random.below(3) == 0) {
            notes.push_back({at, 55.0 * std::exp2(kScale[random.below(4)] / 12.0), 0.0, 1.4});
        }
        if (random.below(2) == 0) {
            notes.push_back({at + 0.11, 880.0 * std::exp2(step / 12.0), random.unit(), 0.4});
        }
    }
    return notes;
}

} // namespace

uint64_t Random::next64()
{
    uint64_t z = (state_ += 0x9e3779b97f4a7c15u);
    z = (z ^ (z >> 30)) * 0xbf58476d1ce4e5b9u;
    z = (z ^ (z >> 27)) * 0x94d049bb133111ebu;
    return z ^ (z >> 31);
}

std::vector<int16_t> tune(uint32_t rate, uint32_t channels, double seconds, double level,
                          uint64_t seed)
{
    const auto frames = static_cast<size_t>(seconds * rate);
    std::vector<double> mix(frames * channels, 0.0);
    for (const Note& note : compose(seconds, seed)) {
        const auto first = static_cast<size_t>(note.start * rate);
        const size_t last = std::min(frames, first + rate); // a note sounds for a second
        for (size_t i = first; i < last; ++i) {
            const double t = static_cast<double>(i) / rate - note.start;
            double value = 0;
            for (int harmonic = 1; harmonic <= 5; ++harmonic) {
                const double hertz = note.hertz * harmonic;
                if (hertz < 3600) {
                    value += std::sin(2 * std::numbers::pi * hertz * t) / (harmonic * harmonic);
                }
            }
            value *= note.loudness * std::exp(-4.0 * t) * std::min(1.0, t * 200);
            for (uint32_t c = 0; c < channels; ++c) {
                mix[i * channels + c] += value * (c % 2 == 0 ? 1 - note.pan : 1 + note.pan) * 0.3;
            }
        }
    }
    std::vector<int16_t> samples(mix.size());
    std::transform(mix.begin(), mix.end(), samples.begin(),
                   [level](double value) { return to_16_bits(value * level); });
    return samples;
}

std::vector<int16_t> sine(uint32_t rate, double hertz, double seconds, double level)
{
    std::vector<int16_t> samples(static_cast<size_t>(seconds * rate));
    for (size_t i = 0; i < samples.size(); ++i) {
        const double angle = 2 * std::numbers::pi * hertz * static_cast<double>(i) / rate;
        samples[i] = to_16_bits(level * std::sin(angle));
    }
    return samples;
}

std::vector<int16_t> noise(size_t count, double level, uint64_t seed)
{
    Random random(seed);
    std::vector<int16_t> samples(count);
    std::generate(samples.begin(), samples.end(),
                  [&] { return to_16_bits(level * random.unit()); });
    return samples;
}

} // namespace kz::test
