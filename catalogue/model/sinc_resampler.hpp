/// @file
/// Resampling between any two rates, with the same bits everywhere.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace kzcat {

/// For the rates of which the library has no filter stored: one that it designs takes its sines from
/// the C library, whose last bits differ from system to system.
///
/// An output is the sum of the samples around its place, each times a sinc under a Hamming window of
/// ten crossings on either side, which cuts off at the lower of the two Nyquist frequencies. Taps
/// are kept for 512 places between two samples, and an output between two of those is interpolated:
/// the error is below -100 dB. The gain at 0 Hz is 1 at every place.
class SincResampler {
public:
    /// Rates in the same unit, both above 0.
    SincResampler(uint64_t from, uint64_t to);

    /// Appends the outputs that `samples` complete. How a stream is cut does not show.
    void convert(std::span<const float> samples, std::vector<float>& output);

private:
    static constexpr size_t kPlaces = 512;

    void write_taps(size_t place, double cutoff);
    float output_at(const float* samples) const;
    void advance();

    uint64_t from_;
    uint64_t to_;
    size_t reach_; ///< samples on either side of an output's place
    size_t row_;   ///< taps of one place, a multiple of the lanes
    std::vector<float> taps_;
    std::vector<float> pending_; ///< samples that later outputs need, the next one's first
    uint64_t skip_ = 0;          ///< samples before those, which no output needs any more
    uint64_t rest_ = 0;          ///< place of the next output beyond a sample, in 1 / to_ of one
};

} // namespace kzcat
