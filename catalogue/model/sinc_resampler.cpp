/// @file
/// The resampler for any rate. With c the cut-off as a share of the input's Nyquist frequency, the
/// output at place t is the sum over k of x[k] h(t - k), and
///
///     h(u) = sinc(c u) (0.54 + 0.46 cos(pi c u / 10))      for |c u| < 10
///
/// Sums are taken in eight lanes, each of which adds up every eighth product.

#include "catalogue/model/sinc_resampler.hpp"

#include <algorithm>
#include <array>
#include <cmath>

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

float dot(const float* samples, const float* taps, size_t count)
{
    std::array<float, kLanes> lanes{};
    for (size_t i = 0; i < count; i += kLanes) {
        for (size_t lane = 0; lane < kLanes; ++lane) {
            lanes[lane] += samples[i + lane] * taps[i + lane];
        }
    }
    return sum_of_lanes(lanes);
}

} // namespace

// The first output lies at the first sample: it is preceded by as many zeros as it reaches back.
SincResampler::SincResampler(uint64_t from, uint64_t to) : from_(from), to_(to)
{
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
    const uint64_t scaled = rest_ * kPlaces;
    const float* row = &taps_[static_cast<size_t>(scaled / to_) * row_];
    const float share =
        static_cast<float>(static_cast<double>(scaled % to_) / static_cast<double>(to_));
    const float before = dot(samples, row, row_);
    const float after = dot(samples, row + row_, row_);
    return before + share * (after - before);
}

void SincResampler::advance()
{
    rest_ += from_;
    skip_ += rest_ / to_;
    rest_ %= to_;
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
