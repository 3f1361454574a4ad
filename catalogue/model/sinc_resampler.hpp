/// @file
/// Resampling between any two rates, with the same bits everywhere.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace kzcat {

/// For the rates of which the library has no filter stored: one that it designs takes its sines
/// from the C library, whose last bits differ from system to system.
///
/// An output is the sum of the samples around its place, each times a sinc under a Hamming window
/// of ten crossings on either side, which cuts off at the lower of the two Nyquist frequencies.
/// Taps are kept for 512 places between two samples, and an output between two of those is
/// interpolated: the error is below -100 dB. The gain at 0 Hz is 1 at every place.
class SincResampler {
public:
    /// The highest rate of the output, in whatever unit.
    static constexpr uint32_t kHighestOutput = UINT32_MAX / 512;

    /// Rates in the same unit, both above 0.
    SincResampler(uint32_t from, uint32_t to);

    /// Appends the outputs that `samples` complete. How a stream is cut does not show.
    void convert(std::span<const float> samples, std::vector<float>& output);

private:
    static constexpr uint32_t kPlaces = 512;

    void write_taps(size_t place, double cutoff);
    float output_at(const float* samples) const;
    void advance();

    uint32_t from_;
    uint32_t to_;
    size_t reach_; ///< samples on either side of an output's place
    size_t row_;   ///< taps of one place, a multiple of the lanes
    std::vector<float> taps_;
    std::vector<float> pending_; ///< samples that later outputs need, the next one's first
    uint64_t skip_ = 0;          ///< samples before those, which no output needs any more
    uint32_t rest_ = 0;          ///< place of the next output beyond a sample, in 1 / to_ of one
};

} // namespace kzcat
