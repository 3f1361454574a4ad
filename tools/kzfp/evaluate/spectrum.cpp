// A plain transform of powers of two: clips are short, and nothing here is looked up in a hurry.

#include "kzfp/evaluate/spectrum.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <complex>
#include <numbers>
#include <utility>

namespace kzfp::evaluate {

namespace {

using Spectrum = std::vector<std::complex<double>>;

constexpr double kNoiseFrom = 20;
constexpr double kNoiseTo = 11025;

/// Without the care for infinities that the operator takes.
std::complex<double> product(std::complex<double> a, std::complex<double> b)
{
    return {a.real() * b.real() - a.imag() * b.imag(), a.real() * b.imag() + a.imag() * b.real()};
}

void reverse_bits(Spectrum& values)
{
    for (size_t i = 1, j = 0; i < values.size(); ++i) {
        size_t bit = values.size() / 2;
        for (; (j & bit) != 0; bit /= 2) {
            j ^= bit;
        }
        j ^= bit;
        if (i < j) {
            std::swap(values[i], values[j]);
        }
    }
}

/// The transform of Cooley and Tukey (1965) in place, without a factor. The inverse has a positive
/// sign.
void transform(Spectrum& values, double sign)
{
    reverse_bits(values);
    Spectrum roots(values.size() / 2);
    for (size_t i = 0; i < roots.size(); ++i) {
        const double angle =
            2 * std::numbers::pi * static_cast<double>(i) / static_cast<double>(values.size());
        roots[i] = {std::cos(angle), sign * std::sin(angle)};
    }
    for (size_t half = 1; half < values.size(); half *= 2) {
        const size_t step = values.size() / (2 * half);
        for (size_t begin = 0; begin < values.size(); begin += 2 * half) {
            for (size_t i = 0; i < half; ++i) {
                const auto other = product(roots[i * step], values[begin + half + i]);
                values[begin + half + i] = values[begin + i] - other;
                values[begin + i] += other;
            }
        }
    }
}

Spectrum spectrum_of(const std::vector<float>& samples, size_t size)
{
    Spectrum values(size);
    for (size_t i = 0; i < samples.size(); ++i) {
        values[i] = samples[i];
    }
    transform(values, -1);
    return values;
}

double hertz_of(size_t i, size_t size, double rate)
{
    return rate * static_cast<double>(std::min(i, size - i)) / static_cast<double>(size);
}

std::vector<float> sound_of(Spectrum& values, size_t count)
{
    transform(values, 1);
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
