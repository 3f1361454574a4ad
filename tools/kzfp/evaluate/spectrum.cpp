#include "kzfp/evaluate/spectrum.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

#include "kzfp/fourier.hpp"

namespace kzfp::evaluate {

namespace {

constexpr double kNoiseFrom = 20;
constexpr double kNoiseTo = 11025;

Spectrum spectrum_of(const std::vector<float>& samples, size_t size)
{
    Spectrum values(size);
    for (size_t i = 0; i < samples.size(); ++i) {
        values[i] = samples[i];
    }
    FourierTransform(size, FourierTransform::Direction::forward)(values);
    return values;
}

double hertz_of(size_t i, size_t size, double rate)
{
    return rate * static_cast<double>(std::min(i, size - i)) / static_cast<double>(size);
}

std::vector<float> sound_of(Spectrum& values, size_t count)
{
    FourierTransform(values.size(), FourierTransform::Direction::inverse)(values);
    std::vector<float> samples(count);
    for (size_t i = 0; i < count; ++i) {
        samples[i] = static_cast<float>(values[i].real() / static_cast<double>(values.size()));
    }
    return samples;
}

void apply(const Gain& gain, double rate, Spectrum& values)
{
    for (size_t i = 0; i < values.size(); ++i) {
        values[i] *= gain(hertz_of(i, values.size(), rate));
    }
}

} // namespace

std::vector<float> filtered(const std::vector<float>& samples, double rate, const Gain& gain)
{
    return convolved(samples, {}, rate, gain);
}

std::vector<float> convolved(const std::vector<float>& samples, const std::vector<float>& response,
                             double rate, const Gain& gain)
{
    Spectrum values = spectrum_of(samples, std::bit_ceil(samples.size() + response.size() + 1));
    if (!response.empty()) {
        const Spectrum factors = spectrum_of(response, values.size());
        for (size_t i = 0; i < values.size(); ++i) {
            values[i] = product(values[i], factors[i]);
        }
    }
    apply(gain, rate, values);
    return sound_of(values, samples.size());
}

std::vector<float> noise(Random& random, size_t count, double rate, NoiseColour colour)
{
    Spectrum values(std::bit_ceil(count + 1));
    const double from = colour == NoiseColour::pink ? kNoiseFrom : 0;
    // The real part of what half a spectrum gives is noise of the same shape.
    for (size_t i = 0; i <= values.size() / 2; ++i) {
        const double hertz = hertz_of(i, values.size(), rate);
        if (hertz >= from && hertz <= kNoiseTo) {
            const double weight = colour == NoiseColour::pink ? 1 / std::sqrt(hertz) : 1;
            const double real = random.normal();
            values[i] = {weight * real, weight * random.normal()};
        }
    }
    std::vector<float> samples = sound_of(values, count);
    double sum = 0;
    for (const float sample : samples) {
        sum += double{sample} * sample;
    }
    const double factor = sum > 0 ? std::sqrt(static_cast<double>(count) / sum) : 0;
    for (float& sample : samples) {
        sample = static_cast<float>(sample * factor);
    }
    return samples;
}

} // namespace kzfp::evaluate
