#include "reference_features.hpp"

#include <algorithm>
#include <cmath>
#include <complex>
#include <numbers>

namespace kz::test {

namespace {

using kzcat::kFrameLength;
using std::numbers::pi;

// The rank of a sample's level among those of the frame, less the mean rank.
std::vector<double> equalised(std::span<const float> frame)
{
    const auto [low, high] = std::minmax_element(frame.begin(), frame.end());
    const float scale = 255.0F / (*high - *low);
    std::vector<int> levels;
    for (const float sample : frame) {
        levels.push_back(std::min(255, static_cast<int>((sample - *low) * scale)));
    }
    std::vector<double> ranks(256);
    for (const int level : levels) {
        for (int above = level; above < 256; ++above) {
            ranks[static_cast<size_t>(above)] += 1.0 / static_cast<double>(frame.size());
        }
    }
    std::vector<double> values;
    double mean = 0;
    for (const int level : levels) {
        values.push_back(ranks[static_cast<size_t>(level)]);
        mean += values.back() / static_cast<double>(frame.size());
    }
    for (double& value : values) {
        value -= mean;
    }
    return values;
}

// A Fourier transform by halving.
void transform(std::vector<std::complex<double>>& x)
{
    if (x.size() == 1) {
        return;
    }
    std::vector<std::complex<double>> even;
    std::vector<std::complex<double>> odd;
    for (size_t i = 0; i < x.size(); i += 2) {
        even.push_back(x[i]);
        odd.push_back(x[i + 1]);
    }
    transform(even);
    transform(odd);
    for (size_t k = 0; k < even.size(); ++k) {
        const double angle = -2 * pi * static_cast<double>(k) / static_cast<double>(x.size());
        const auto turned = std::polar(1.0, angle) * odd[k];
        x[k] = even[k] + turned;
        x[k + even.size()] = even[k] - turned;
    }
}

// X[k] = sum of x[n] cos(pi (2n + 1) k / 2N), from a Fourier transform of twice the length.
std::vector<double> cosine_transform(const std::vector<double>& x)
{
    std::vector<std::complex<double>> padded(x.begin(), x.end());
    padded.resize(2 * x.size());
    transform(padded);
    std::vector<double> bins;
    for (size_t k = 0; k < x.size(); ++k) {
        const double angle = -pi * static_cast<double>(k) / (2.0 * static_cast<double>(x.size()));
        bins.push_back((std::polar(1.0, angle) * padded[k]).real());
    }
    return bins;
}

// Energies summed up to a frequency.
double cumulative(const std::vector<double>& bins, double hertz)
{
    const double position = hertz / (11025.0 / 8192) + 0.5;
    const auto whole = static_cast<size_t>(position);
    double sum = 0;
    for (size_t k = 0; k < whole; ++k) {
        sum += bins[k] * bins[k];
    }
    return sum + (position - static_cast<double>(whole)) * bins[whole] * bins[whole];
}

double edge(double j) { return 160 * std::exp2(j / 36); }

} // namespace

std::vector<double> reference_differences(std::span<const float> frame, int steps)
{
    std::vector<double> x = equalised(frame);
    for (size_t n = 0; n < x.size(); ++n) {
        x[n] *= 16384 * (0.5 - 0.5 * std::cos(2 * pi * (static_cast<double>(n) + 0.5) / 4096));
    }
    const std::vector<double> bins = cosine_transform(x);
    std::vector<double> differences;
    for (int i = 0; i < 64; ++i) {
        const double width = i < 16 ? 6 : 4;
        const double start =
            steps + std::nearbyint(i < 16 ? -48 + 54 * i / 16.0 : 6 + 142 * (i - 16) / 47.0);
        const double middle = cumulative(bins, edge(start + width));
        const double lower = middle - cumulative(bins, edge(start));
        const double upper = cumulative(bins, edge(start + 2 * width)) - middle;
        differences.push_back(std::log2(lower + 1) - std::log2(upper + 1));
    }
    return differences;
}

std::vector<std::vector<double>> reference_differences_of(std::span<const float> samples,
                                                          size_t hop, int steps)
{
    std::vector<std::vector<double>> frames;
    for (; samples.size() >= kFrameLength;
         samples = samples.subspan(std::min(hop, samples.size()))) {
        frames.push_back(reference_differences(samples.first(kFrameLength), steps));
    }
    return frames;
}

} // namespace kz::test
