/// @file
/// High rates are brought down by the library's stored 4:1 and 2:1 filters first, which cost a few
/// products a sample; one resampler then reaches the working rate.

#include "catalogue/model/rate_converter.hpp"

#include <algorithm>
#include <new>

#include "catalogue/model/profile.hpp"

namespace kzcat {

namespace {

// Rates of which the library has the filter to the working rate stored.
constexpr uint32_t kStoredRates[] = {44100, 48000, 32000, 24000, 22050, 16000};

// Whether a rate, halved some times, is one of those with a stored filter.
uint32_t halvings_to_stored(uint32_t rate)
{
    for (const uint32_t stored : kStoredRates) {
        for (uint32_t halvings = 1; halvings < 8; ++halvings) {
            if (stored << halvings == rate) {
                return halvings;
            }
        }
    }
    return 0;
}

bool is_stored(uint32_t rate)
{
    return std::find(std::begin(kStoredRates), std::end(kStoredRates), rate) !=
           std::end(kStoredRates);
}

// How often a rate is halved before the last filter: until it has a stored one, or else as long as
// it stays at or above four times the working rate.
uint32_t halvings_of(uint32_t rate)
{
    if (is_stored(rate)) {
        return 0;
    }
    if (const uint32_t halvings = halvings_to_stored(rate)) {
        return halvings;
    }
    uint32_t halvings = 0;
    while ((rate >> (halvings + 1)) >= 4 * kWorkingRate) {
        ++halvings;
    }
    return halvings;
}

} // namespace

RateConverter::RateConverter(uint32_t rate, double gain)
{
    double now = rate;
    uint32_t halvings = halvings_of(rate);
    for (; halvings >= 2; halvings -= 2, now /= 4) {
        add_stage(4, 1);
    }
    for (; halvings >= 1; halvings -= 1, now /= 2) {
        add_stage(2, 1);
    }
    if (now != kWorkingRate) {
        add_stage(now, kWorkingRate);
    }
    // Raising the rate raises the level alike.
    const double raised = now < kWorkingRate ? kWorkingRate / now : 1;
    gain_ = static_cast<float>(gain / raised);
}

void RateConverter::add_stage(double from, double to)
{
    Stage stage;
    stage.resampler.reset(KZDSP_CreateResampler(static_cast<float>(from), static_cast<float>(to)));
    if (!stage.resampler) {
        throw std::bad_alloc();
    }
    stages_.push_back(std::move(stage));
}

void RateConverter::convert(std::span<const float> samples, std::vector<float>& output)
{
    for (Stage& stage : stages_) {
        size_t made = 0;
        uint32_t consumed = 0;
        uint32_t produced = 0;
        do {
            const auto count = static_cast<uint32_t>(samples.size());
            const size_t room =
                size_t{KZDSP_ComputeResampledLength(stage.resampler.get(), count)} + 2;
            stage.output.resize(std::max(stage.output.size(), made + room));
            KZDSP_Resample(stage.resampler.get(), samples.data(), count, stage.output.data() + made,
                           static_cast<uint32_t>(room), &consumed, &produced);
            samples = samples.subspan(consumed);
            made += produced;
        } while (consumed != 0 || produced != 0);
        samples = std::span(stage.output).first(made);
    }
    const size_t before = output.size();
    output.resize(before + samples.size());
    std::transform(samples.begin(), samples.end(),
                   output.begin() + static_cast<std::ptrdiff_t>(before),
                   [gain = gain_](float sample) { return sample * gain; });
}

} // namespace kzcat
