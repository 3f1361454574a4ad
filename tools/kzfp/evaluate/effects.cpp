// The numbers are those of evaluation/degrade.py, so that results can be compared.

#include "kzfp/evaluate/effects.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <numbers>
#include <utility>

#include <soxr.h>

#include "audio/source.hpp"
#include "kzsdk/dsp/convert.h"

namespace kzfp::evaluate {

namespace {

constexpr uint32_t kTelephoneRate = 8000;

double factor_of(double decibels) { return std::pow(10, decibels / 20); }

/// 1 between two frequencies, with edges of 100 Hz.
Gain band(double low, double high)
{
    return [low, high](double hertz) {
        constexpr double kEdge = 100;
        const double inside = std::min(hertz - low, high - hertz) / kEdge + 0.5;
        return 0.5 - 0.5 * std::cos(std::numbers::pi * std::clamp(inside, 0.0, 1.0));
    };
}

/// 1 between two frequencies, falling by 48 dB an octave outside.
Gain soft_band(double low, double high)
{
    return [low, high](double hertz) {
        return 1 / (1 + std::pow(low / std::max(hertz, 1.0), 8)) / (1 + std::pow(hertz / high, 8));
    };
}

std::vector<float> room(Random& random, double rate, double seconds)
{
    std::vector<float> response(static_cast<size_t>(seconds * rate));
    double energy = 0;
    for (size_t i = 1; i < response.size(); ++i) {
        const double part = static_cast<double>(i) / static_cast<double>(response.size());
        const double value = random.normal() * std::pow(10, -3 * part);
        response[i] = static_cast<float>(value);
        energy += value * value;
    }
    for (float& value : response) {
        value = static_cast<float>(value / std::sqrt(energy));
    }
    response.at(0) = 1;
    return response;
}

Clip with_samples(const Clip& clip, std::vector<float> samples)
{
    return {.rate = clip.rate, .channels = 1, .samples = std::move(samples)};
}

void add(Clip& clip, const std::vector<float>& other, double factor)
{
    for (size_t i = 0; i < clip.samples.size(); ++i) {
        clip.samples[i] += static_cast<float>(other[i % other.size()] * factor);
    }
}

/// Through mu-law and back: the nearest of its 255 values.
int16_t companded(int16_t sample)
{
    static const std::array<int16_t, 256> kValues = [] {
        std::array<int16_t, 256> values = {};
        std::copy_n(KZDSP_GetuLawTable(), values.size(), values.begin());
        std::ranges::sort(values);
        return values;
    }();
    const auto* const above = std::ranges::lower_bound(kValues, sample);
    if (above == kValues.begin()) {
        return *above;
    }
    if (above == kValues.end()) {
        return kValues.back();
    }
    return *above - sample < sample - *(above - 1) ? *above : *(above - 1);
}

} // namespace

Clip with_noise(const Clip& mono, Random& random, NoiseColour colour, double decibels)
{
    Clip noisy = mono;
    add(noisy, noise(random, mono.samples.size(), mono.rate, colour),
        level_of(mono) * factor_of(-decibels));
    return noisy;
}

Pcm over_telephone(const Clip& mono)
{
    constexpr double kRoom = 0.9; // a filter's overshoot is not clipped
    const Clip narrow = with_samples(mono, filtered(mono.samples, mono.rate, band(300, 3400)));
    Pcm pcm = to_pcm(scaled(converted(narrow, mono.rate, kTelephoneRate), kRoom));
    std::ranges::transform(pcm.samples, pcm.samples.begin(), companded);
    return pcm;
}

Clip in_room(const Clip& mono, Random& random, double seconds)
{
    return with_samples(mono, convolved(mono.samples, room(random, mono.rate, seconds), mono.rate,
                                        [](double) { return 1.0; }));
}

Clip by_microphone(const Clip& mono, Random& random)
{
    constexpr double kReverberation = 0.45;
    constexpr double kLevel = 0.35; // where the limiter begins to work
    Clip clip = with_samples(mono, convolved(mono.samples, room(random, mono.rate, kReverberation),
                                             mono.rate, soft_band(250, 5000)));
    clip = with_noise(clip, random, NoiseColour::pink, 10);
    const double level = level_of(clip);
    for (float& sample : clip.samples) {
        sample = static_cast<float>(std::tanh(sample * (kLevel / level)));
    }
    return clip;
}

Clip low_passed(const Clip& mono, double hertz)
{
    return with_samples(mono, filtered(mono.samples, mono.rate, band(-1000, hertz)));
}

/// A low shelf with slope 1/2 (Bristow-Johnson: Cookbook formulae for audio EQ biquad filter
/// coefficients).
Clip with_bass(const Clip& mono, double decibels)
{
    const double a = factor_of(decibels / 2);
    const double w = 2 * std::numbers::pi * 100 / mono.rate;
    const double alpha = std::sin(w) / 2 * std::sqrt((a + 1 / a) * (1 / 0.5 - 1) + 2);
    const double c = std::cos(w);
    const double r = 2 * std::sqrt(a) * alpha;
    const double b0 = a * ((a + 1) - (a - 1) * c + r);
    const double b1 = 2 * a * ((a - 1) - (a + 1) * c);
    const double b2 = a * ((a + 1) - (a - 1) * c - r);
    const double a0 = (a + 1) + (a - 1) * c + r;
    const double a1 = -2 * ((a - 1) + (a + 1) * c);
    const double a2 = (a + 1) + (a - 1) * c - r;
    Clip clip = mono;
    double x1 = 0;
    double x2 = 0;
    double y1 = 0;
    double y2 = 0;
    for (float& sample : clip.samples) {
        const double x = sample;
        const double y = (b0 * x + b1 * x1 + b2 * x2 - a1 * y1 - a2 * y2) / a0;
        x2 = std::exchange(x1, x);
        y2 = std::exchange(y1, y);
        sample = static_cast<float>(y);
    }
    return clip;
}

Clip clipped(const Clip& mono, double decibels)
{
    const double peak = peak_of(mono);
    Clip clip = scaled(mono, peak > 0 ? factor_of(decibels) / peak : 1);
    for (float& sample : clip.samples) {
        sample = std::clamp(sample, -1.0F, 1.0F);
    }
    return clip;
}

Clip sped_up(const Clip& mono, double factor)
{
    return converted(mono, mono.rate * factor, mono.rate);
}

Clip converted(const Clip& mono, double from, uint32_t to)
{
    if (from == to) {
        return mono;
    }
    const soxr_io_spec_t words = soxr_io_spec(SOXR_FLOAT32_I, SOXR_FLOAT32_I);
    const soxr_quality_spec_t quality = soxr_quality_spec(SOXR_HQ, 0);
    Clip clip = {.rate = to, .channels = 1, .samples = {}};
    clip.samples.resize(static_cast<size_t>(static_cast<double>(mono.samples.size()) * to / from));
    size_t done = 0;
    const soxr_error_t error =
        soxr_oneshot(from, to, 1, mono.samples.data(), mono.samples.size(), nullptr,
                     clip.samples.data(), clip.samples.size(), &done, &words, &quality, nullptr);
    if (error != nullptr) {
        throw audio::FileError(std::string("the rate cannot be converted (") + error + ")");
    }
    clip.samples.resize(done);
    return clip;
}

Clip with_sound(const Clip& mono, const Clip& other, double decibels)
{
    Clip mixed = mono;
    const Clip fitting = converted(to_mono(other), other.rate, mono.rate);
    const double level = level_of(fitting);
    if (level > 0) {
        add(mixed, fitting.samples, level_of(mono) * factor_of(decibels) / level);
    }
    return mixed;
}

} // namespace kzfp::evaluate
