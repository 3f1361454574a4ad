/// @file
/// The way to the working rate. High rates are brought down by the library's stored 4:1 and 2:1
/// filters first, which cost a few products a sample; one more filter, also stored for the usual
/// rates, reaches the working rate.

#include "catalogue/model/rate_converter.hpp"

#include <algorithm>
#include <iterator>
#include <new>

#include "catalogue/model/profile.hpp"

namespace kzcat {

namespace {

// Rates of which the library has the filter to the working rate stored.
constexpr uint32_t kStoredRates[] = {8000, 16000, 22050, 24000, 32000, 44100, 48000};

constexpr uint32_t kMostHalvings = 8;

bool is_stored(uint64_t rate)
{
    return std::find(std::begin(kStoredRates), std::end(kStoredRates), rate) !=
           std::end(kStoredRates);
}

// How often a rate is halved before the last filter: until it has a stored one, or else as long as
// it stays at or above four times the working rate.
uint32_t halvings_of(uint32_t rate)
{
    for (uint32_t halvings = 0; halvings <= kMostHalvings; ++halvings) {
        if (rate % (1U << halvings) == 0 && is_stored(rate >> halvings)) {
            return halvings;
        }
    }
    uint32_t halvings = 0;
    while ((rate >> (halvings + 1)) >= 4 * kWorkingRate) {
        ++halvings;
    }
    return halvings;
}

// Raising the rate raises the level alike in the library's filters.
double level_after(uint32_t rate)
{
    return is_stored(rate) && rate < kWorkingRate ? static_cast<double>(kWorkingRate) / rate : 1;
}

} // namespace

RateConverter::RateConverter(uint32_t rate, double gain)
    : gain_(static_cast<float>(gain / level_after(rate)))
{
    const uint32_t halvings = halvings_of(rate);
    for (uint32_t i = 0; i < halvings / 2; ++i) {
        add_stage(4, 1);
    }
    if (halvings % 2 != 0) {
        add_stage(2, 1);
    }
    const uint32_t target = kWorkingRate << halvings;
    if (rate == target) {
        return;
    }
    if (is_stored(rate >> halvings) && rate % (1U << halvings) == 0) {
        add_stage(rate >> halvings, kWorkingRate);
    } else {
        last_.emplace(rate, target);
    }
}

void RateConverter::add_stage(uint32_t from, uint32_t to)
{
    Stage stage;
    stage.resampler.reset(KZDSP_CreateResampler(static_cast<float>(from), static_cast<float>(to)));
    if (!stage.resampler) {
        throw std::bad_alloc();
    }
    stages_.push_back(std::move(stage));
}

std::span<const float> RateConverter::run(Stage& stage, std::span<const float> samples)
{
    size_t made = 0;
    uint32_t consumed = 0;
    uint32_t produced = 0;
    do {
        const auto count = static_cast<uint32_t>(samples.size());
        const size_t room = size_t{KZDSP_ComputeResampledLength(stage.resampler.get(), count)} + 2;
        stage.output.resize(std::max(stage.output.size(), made + room));
        KZDSP_Resample(stage.resampler.get(), samples.data(), count, stage.output.data() + made,
                       static_cast<uint32_t>(room), &consumed, &produced);
        samples = samples.subspan(consumed);
        made += produced;
    } while (consumed != 0 || produced != 0);
    return std::span(stage.output).first(made);
}

void RateConverter::convert(std::span<const float> samples, std::vector<float>& output)
{
    for (Stage& stage : stages_) {
        samples = run(stage, samples);
    }
    if (last_) {
        last_output_.clear();
        last_->convert(samples, last_output_);
        samples = last_output_;
    }
    const size_t before = output.size();
    output.resize(before + samples.size());
    std::transform(samples.begin(), samples.end(), output.data() + before,
                   [gain = gain_](float sample) { return sample * gain; });
}

} // namespace kzcat
