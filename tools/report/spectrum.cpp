// Hann windows of about 0.1 s and the library's cosine transform, whose bin k of length L lies at
// k * rate / (2 L). Power is summed over the rows of a scale on which all critical bands are
// equally high. However long the sound is, no more windows are transformed than there are columns.

#include "report/spectrum.hpp"

#include <algorithm>
#include <cmath>
#include <memory>
#include <new>
#include <numbers>
#include <span>

#include "kzsdk/abs/startup.h"
#include "kzsdk/dsp/dct.h"

namespace report {

namespace {

constexpr double kWindowSeconds = 0.093;
constexpr int kRows = kDrawnBands * kRowsOfBand;
constexpr double kLeastPower = 1e-20;

/// The library allocates only while it is held.
struct LibraryHold {
    LibraryHold()
    {
        if (kzinit_acquire() != KZ_OK) {
            throw std::bad_alloc();
        }
    }
    LibraryHold(const LibraryHold&) = delete;
    LibraryHold& operator=(const LibraryHold&) = delete;
    ~LibraryHold() { static_cast<void>(kzinit_release()); }
};

struct DestroyTransform {
    void operator()(KZDSP_DCT* transform) const { KZDSP_DestroyDCT(transform); }
};

/// The bins whose power a row has, as fractions of bins.
struct Row {
    double first;
    double last;
};

class Analyser {
public:
    explicit Analyser(uint32_t rate)
        : order_(
              std::clamp(static_cast<int>(std::lround(std::log2(rate * kWindowSeconds))), 6, 18)),
          transform_(KZDSP_CreateDCT(order_)), length_(size_t{1} << order_), data_(length_)
    {
        if (!transform_) {
            throw std::bad_alloc();
        }
        make_window();
        make_rows(rate);
    }

    size_t length() const { return length_; }

    /// Power in each row, lowest first; `samples` are length() of them.
    void analyse(std::span<const float> samples, std::span<float> power)
    {
        for (size_t i = 0; i < length_; ++i) {
            data_[i] = std::isfinite(samples[i]) ? samples[i] * window_[i] : 0;
        }
        KZDSP_ComputeDCT(transform_.get(), data_.data(), 1);
        for (size_t row = 0; row < power.size(); ++row) {
            power[row] = static_cast<float>(power_between(rows_[row]));
        }
    }

private:
    void make_window()
    {
        for (size_t i = 0; i < length_; ++i) {
            const double phase = 2 * std::numbers::pi * (static_cast<double>(i) + 0.5) /
                                 static_cast<double>(length_);
            window_.push_back(static_cast<float>(0.5 - 0.5 * std::cos(phase)));
        }
    }

    void make_rows(uint32_t rate)
    {
        const double bins_per_hertz = 2 * static_cast<double>(length_) / rate;
        for (int row = 0; row < kRows; ++row) {
            const int band = row / kRowsOfBand;
            const double step = (kBandEdges[band + 1] - kBandEdges[band]) / kRowsOfBand;
            const double low = kBandEdges[band] + step * (row % kRowsOfBand);
            rows_.push_back({low * bins_per_hertz, (low + step) * bins_per_hertz});
        }
    }

    /// Bin k covers k to k + 1 here; the outermost ones count with the share that lies inside.
    double power_between(const Row& row) const
    {
        double power = 0;
        const double end = std::min(row.last, static_cast<double>(length_));
        for (auto k = static_cast<size_t>(row.first); static_cast<double>(k) < end; ++k) {
            const auto bin = static_cast<double>(k);
            const double share = std::min(end, bin + 1) - std::max(row.first, bin);
            power += share * data_[k] * data_[k];
        }
        return power;
    }

    LibraryHold hold_;
    int order_;
    std::unique_ptr<KZDSP_DCT, DestroyTransform> transform_;
    size_t length_;
    std::vector<float> window_;
    std::vector<Row> rows_;
    std::vector<float> data_;
};

double decibels(double power) { return 10 * std::log10(std::max(power, kLeastPower)); }

/// Columns of kRows powers each, evenly spread over the sound.
std::vector<float> powers_of(const Sound& sound, size_t columns, Analyser& analyser)
{
    std::vector<float> powers(columns * kRows);
    const size_t room = sound.samples.size() - analyser.length();
    for (size_t column = 0; column < columns; ++column) {
        const size_t begin = columns == 1 ? 0 : room * column / (columns - 1);
        analyser.analyse(std::span(sound.samples).subspan(begin, analyser.length()),
                         std::span(powers).subspan(column * kRows, kRows));
    }
    return powers;
}

Pixels to_pixels(const std::vector<float>& powers, uint32_t columns)
{
    const float top = *std::max_element(powers.begin(), powers.end());
    const double highest = decibels(top);
    Pixels pixels = {.width = columns, .height = kRows, .ink = {}};
    pixels.ink.resize(powers.size());
    for (size_t column = 0; column < columns; ++column) {
        for (size_t row = 0; row < kRows; ++row) {
            const double below = highest - decibels(powers[column * kRows + row]);
            const double amount = top > 0 ? 255 * (1 - below / kDrawnRange) : 0;
            pixels.ink[(kRows - 1 - row) * columns + column] =
                static_cast<uint8_t>(std::clamp(amount, 0.0, 255.0));
        }
    }
    return pixels;
}

} // namespace

Spectrum spectrum_of(const Sound& sound, uint32_t columns)
{
    if (sound.rate == 0 || columns == 0) {
        return {};
    }
    Analyser analyser(sound.rate);
    if (sound.samples.size() < analyser.length()) {
        return {};
    }
    const size_t steps = (sound.samples.size() - analyser.length()) / (analyser.length() / 8) + 1;
    const auto used = static_cast<uint32_t>(std::min<size_t>(columns, steps));
    const std::vector<float> powers = powers_of(sound, used, analyser);
    Spectrum spectrum = {.pixels = to_pixels(powers, used)};
    for (size_t i = 0; i < powers.size(); ++i) {
        spectrum.mean[i % kRows / kRowsOfBand] += double{powers[i]} / used;
    }
    for (double& level : spectrum.mean) {
        level = decibels(level);
    }
    return spectrum;
}

} // namespace report
