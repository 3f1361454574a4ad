/// @file
/// The resampler for any rate. With c the cut-off as a share of the input's Nyquist frequency, the
/// output at place t is the sum over k of x[k] h(t - k), and
///
///     h(u) = sinc(c u) (0.54 + 0.46 cos(pi c u / 10))      for |c u| < 10
///

#include "catalogue/model/sinc_resampler.hpp"

#include <algorithm>
#include <cassert>
#include <cmath>

#include "catalogue/model/frame_kernels.hpp"
#include "catalogue/model/lanes.hpp"
#include "catalogue/model/series.hpp"

namespace kzcat {

namespace {

constexpr double kCrossings = 10;

// sin(pi x) / (pi x).
double sinc(double x)
{
    if (x == 0) {
        return 1;
    }
    double turned = x - 2 * std::floor(x / 2 + 0.5); // -1 .. 1
    if (std::fabs(turned) > 0.5) {
        turned = (turned > 0 ? 1 : -1) - turned;
    }
    return sine(kPi * turned) / (kPi * x);
}

// The window at x = -1 .. 1.
double hamming(double x)
{
    const double half = cosine(kPi / 2 * x);
    return 0.54 + 0.46 * (2 * half * half - 1);
}

} // namespace

// The first output lies at the first sample: it is preceded by as many zeros as it reaches back.
SincResampler::SincResampler(uint32_t from, uint32_t to) : from_(from), to_(to)
{
    assert(to <= kHighestOutput);
    const double cutoff = std::min(1.0, static_cast<double>(to) / static_cast<double>(from));
    reach_ = static_cast<size_t>(std::ceil(kCrossings / cutoff));
    row_ = (2 * reach_ + kLanes - 1) / kLanes * kLanes;
    taps_.resize(row_ * (kPlaces + 1));
    for (size_t place = 0; place <= kPlaces; ++place) {
        write_taps(place, cutoff);
    }
    pending_.resize(reach_ - 1);
}

// Of an output `place` / kPlaces beyond a sample: from reach - 1 samples before that one on.
void SincResampler::write_taps(size_t place, double cutoff)
{
    std::vector<double> row(2 * reach_);
    double sum = 0;
    for (size_t i = 0; i < row.size(); ++i) {
        const double distance = static_cast<double>(place) / kPlaces +
                                static_cast<double>(reach_ - 1) - static_cast<double>(i);
        const double x = distance * cutoff;
        row[i] = std::fabs(x) < kCrossings ? sinc(x) * hamming(x / kCrossings) : 0;
        sum += row[i];
    }
    std::transform(row.begin(), row.end(), &taps_[place * row_],
                   [sum](double tap) { return static_cast<float>(tap / sum); });
}

float SincResampler::output_at(const float* samples) const
{
    const uint32_t scaled = rest_ * kPlaces;
    const float* row = &taps_[scaled / to_ * row_];
    const auto share =
        static_cast<float>(static_cast<double>(scaled % to_) / static_cast<double>(to_));
    return frame_kernels().interpolated(samples, row, row_, share);
}

void SincResampler::advance()
{
    skip_ += from_ / to_;
    rest_ += from_ % to_;
    if (rest_ >= to_) {
        rest_ -= to_;
        ++skip_;
    }
}

void SincResampler::convert(std::span<const float> samples, std::vector<float>& output)
{
    pending_.insert(pending_.end(), samples.begin(), samples.end());
    for (; skip_ + row_ <= pending_.size(); advance()) {
        output.push_back(output_at(&pending_[static_cast<size_t>(skip_)]));
    }
    const uint64_t drop = std::min<uint64_t>(skip_, pending_.size());
    pending_.erase(pending_.begin(), pending_.begin() + static_cast<std::ptrdiff_t>(drop));
    skip_ -= drop;
}

} // namespace kzcat
