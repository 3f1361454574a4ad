#include "whole/model/ideal.hpp"

#include <algorithm>
#include <cmath>
#include <complex>
#include <numbers>
#include <numeric>

#include "whole/model/filter_design.hpp"

namespace kz::model::ideal {

namespace {

constexpr double kFullRange = 16384; // twice 8192: the peak-to-peak range of a silent frame
constexpr size_t kDetectorWindow = 128;
constexpr double kMaxDeviation = 1000;
constexpr double kThreshold = 101; // an integer quotient passes 100 when it reaches 101

void fourier_transform(std::span<std::complex<double>> x)
{
    if (x.size() == 1) {
        return;
    }
    const size_t half = x.size() / 2;
    std::vector<std::complex<double>> even(half);
    std::vector<std::complex<double>> odd(half);
    for (size_t i = 0; i < half; ++i) {
        even[i] = x[2 * i];
        odd[i] = x[2 * i + 1];
    }
    fourier_transform(even);
    fourier_transform(odd);
    for (size_t k = 0; k < half; ++k) {
        const double angle = -std::numbers::pi * static_cast<double>(k) / static_cast<double>(half);
        const std::complex<double> turned = std::polar(1.0, angle) * odd[k];
        x[k] = even[k] + turned;
        x[k + half] = even[k] - turned;
    }
}

double square(double value) { return value * value; }

void store_shares(const std::array<double, kBands>& values, std::span<double, kBands> shares)
{
    const double total = std::accumulate(values.begin(), values.end(), 0.0);
    std::transform(values.begin(), values.end(), shares.begin(),
                   [total](double value) { return total == 0 ? 0 : 32768 * value / total; });
}

} // namespace

Signal resample(const Ratio& ratio, std::span<const double> signal)
{
    if (ratio.length == 0) {
        return Signal(signal.begin(), signal.end());
    }
    const std::vector<float> taps = design(ratio);
    const double gain = ratio.up == 1 ? 0.5 : storage_gain(ratio);
    Signal stream(preroll(ratio), 0.0);
    stream.insert(stream.end(), signal.begin(), signal.end());
    const size_t length = taps_per_phase(ratio);
    Signal result;
    for (size_t n = 0; window_start(ratio, n) + length <= stream.size(); ++n) {
        const size_t newest = window_start(ratio, n) + length - 1;
        const size_t phase = phase_of(ratio, n);
        double sum = 0;
        for (size_t k = 0; k < length; ++k) {
            sum += stream[newest - k] * double{taps[phase + k * ratio.up]};
        }
        result.push_back(gain * sum);
    }
    return result;
}

size_t signal_start(std::span<const double> signal, double unit)
{
    std::vector<double> levels(kDetectorWindow, 0.0);
    std::vector<double> deviations(kDetectorWindow, 0.0);
    std::transform(signal.begin(), signal.begin() + kDetectorWindow, levels.begin(),
                   [unit](double sample) { return sample / unit; });
    double level_sum = std::accumulate(levels.begin(), levels.end(), 0.0);
    double deviation_sum = 0;
    for (size_t i = 0; i < signal.size(); ++i) {
        const double level = signal[i] / unit;
        level_sum += level - std::exchange(levels[i % kDetectorWindow], level);
        const double deviation =
            std::min(std::abs(level - level_sum / kDetectorWindow), kMaxDeviation);
        deviation_sum += deviation - std::exchange(deviations[i % kDetectorWindow], deviation);
        if (deviation_sum / kDetectorWindow >= kThreshold) {
            return i > kDetectorWindow / 2 ? i - kDetectorWindow / 2 : 0;
        }
    }
    return signal.size();
}

Signal equalise(std::span<const double> frame)
{
    const auto [lowest, highest] = std::minmax_element(frame.begin(), frame.end());
    const double range = *highest - *lowest;
    if (range <= kFullRange) {
        return Signal(frame.begin(), frame.end());
    }
    std::vector<size_t> level(frame.size());
    std::vector<double> counts(kLevels, 0.0);
    for (size_t i = 0; i < frame.size(); ++i) {
        level[i] = static_cast<size_t>((frame[i] - *lowest) / range * (kLevels - 1));
        counts[level[i]] += 1;
    }
    std::vector<double> ranks(kLevels);
    std::partial_sum(counts.begin(), counts.end(), ranks.begin());
    const double total = std::inner_product(counts.begin(), counts.end(), ranks.begin(), 0.0);
    Signal result(frame.size());
    std::transform(level.begin(), level.end(), result.begin(),
                   [&](size_t each) { return 32768 * ranks[each] - total; });
    return result;
}

Signal decimate(std::span<const double> frame)
{
    Signal padded(frame.begin(), frame.end());
    padded.resize(frame.size() + 60, 0.0);
    Signal result = resample(kHalf, padded);
    result.resize(frame.size() / 2);
    return result;
}

Signal cosine_transform(std::span<const double> x)
{
    const size_t length = x.size();
    std::vector<std::complex<double>> folded(length);
    for (size_t n = 0; n < length / 2; ++n) {
        folded[n] = x[2 * n];
        folded[length - 1 - n] = x[2 * n + 1];
    }
    fourier_transform(folded);
    const double points = static_cast<double>(length);
    Signal result(length);
    for (size_t k = 0; k < length; ++k) {
        const double angle = -std::numbers::pi * static_cast<double>(k) / (2 * points);
        result[k] = 4 / points * (folded[k] * std::polar(1.0, angle)).real();
    }
    result[0] *= 0.25 * kDcFactor * 0x1p-32;
    return result;
}

namespace {

/// `weight(band)` is what an energy is multiplied by to become the square of an amplitude.
template <class Weight>
Features features_of(std::span<const double> spectrum, Weight weight)
{
    Features result{};
    for (size_t band = 0; band < kBands; ++band) {
        for (size_t bin = kBandEdges[band]; bin <= kBandEdges[band + 1]; ++bin) {
            result.energy[band] += square(spectrum[bin]);
        }
        result.amplitude[band] = std::sqrt(result.energy[band] * weight(band));
    }
    return result;
}

/// Without the decimator, whose loss the ramp compensates. Only ratios of features count in the
/// end, so the scale of the integer path serves.
Features analyse_whole(std::span<const double> frame)
{
    return features_of(cosine_transform(equalise(frame)), [](size_t band) {
        return 1.0 / static_cast<double>(kBandEdges[band + 1] - kBandEdges[band] + 1);
    });
}

template <class Analyse>
Shares fingerprint_of(std::span<const double> sounding, Analyse analyse_frame)
{
    std::vector<Features> frames;
    for (size_t frame = 0; frame < kFrameLimit; ++frame) {
        frames.push_back(analyse_frame(sounding.subspan(frame * kFrameHop, kFrameLength)));
    }
    return condense(frames);
}

} // namespace

Features analyse(std::span<const double> frame)
{
    Signal spectrum = cosine_transform(decimate(equalise(frame)));
    for (const GainSegment& segment : kGainRamp) {
        for (size_t bin = segment.first; bin < segment.end; ++bin) {
            const double steps = static_cast<double>(bin - segment.first);
            spectrum[bin] *= (segment.gain + steps * segment.step) * 0x1p-30;
        }
    }
    return features_of(spectrum,
                       [](size_t band) { return static_cast<double>(kBandWeights[band]); });
}

Shares condense(std::span<const Features> frames)
{
    const double count = static_cast<double>(frames.size());
    std::array<double, kBands> mean{};
    std::array<double, kBands> spread{};
    for (size_t band = 0; band < kBands; ++band) {
        double energy = 0;
        double amplitude = 0;
        for (const Features& frame : frames) {
            energy += frame.energy[band] / count;
            amplitude += frame.amplitude[band] / count;
        }
        double squares = 0;
        for (const Features& frame : frames) {
            squares += square(frame.amplitude[band] - amplitude);
        }
        mean[band] = std::sqrt(energy);
        spread[band] = std::sqrt(squares / (count - 1));
    }
    Shares shares{};
    store_shares(mean, std::span(shares).first<kBands>());
    store_shares(spread, std::span(shares).last<kBands>());
    return shares;
}

Shares fingerprint(const Ratio& ratio, std::span<const double> input)
{
    const Signal signal = resample(ratio, input);
    return fingerprint_of(std::span(signal).subspan(signal_start(signal)), analyse);
}

Shares float_fingerprint(const Ratio& ratio, std::span<const double> input)
{
    constexpr double kScale =
        0x1p14; // of the integer path, whose thresholds for silence are stated
    Signal signal = resample(ratio, input);
    const double lost = ratio.length == 0 ? 1 : ratio.up == 1 ? 0.5 : storage_gain(ratio);
    std::transform(signal.begin(), signal.end(), signal.begin(),
                   [lost](double sample) { return sample * kScale / lost; });
    return fingerprint_of(std::span(signal).subspan(signal_start(signal, kScale)), analyse_whole);
}

} // namespace kz::model::ideal
