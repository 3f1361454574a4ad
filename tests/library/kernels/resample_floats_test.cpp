// Every variant of the floating-point polyphase filters against the plain one, to the bit.

#include <algorithm>
#include <bit>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/dsp/filter_design.hpp"
#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"
#include "support/kernel_variants.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::kernels;
using namespace kz::test;

class FloatResampleVariants : public KernelVariants {};

using Samples = std::vector<float>;

constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr float kSmallest = std::numeric_limits<float>::denorm_min();
constexpr float kLargest = std::numeric_limits<float>::max();

struct Filter {
    FloatPhases phases;
    std::string name;
};

std::vector<Filter> shared_filters()
{
    std::vector<Filter> filters;
    for (const DesignedFilter& filter : designed_filters) {
        filters.push_back(
            {{filter.taps, filter.taps_per_phase, 1, filter.taps_per_phase, filter.up, filter.down},
             std::to_string(filter.up) + '/' + std::to_string(filter.down)});
    }
    filters.push_back({{coefficients_2to1, 1, 1, 42, 1, 2}, "1/2"});
    filters.push_back({{coefficients_4to1, 1, 1, 84, 1, 4}, "1/4"});
    return filters;
}

// Filters of other ratios, phases and taps interleaved: 3 to 1, 2 to 3, upsampling, and one whose
// window is longer than what is laid out at a time.
class OwnFilters {
public:
    OwnFilters()
    {
        for (const auto& [up, down] : {std::pair<uint32_t, uint32_t>{1, 3},
                                       {2, 3},
                                       {4, 1},
                                       {147, 1280},
                                       {11, 10},
                                       {1, 40},
                                       {3, 400}}) {
            const kz::dsp::FilterLayout layout = kz::dsp::filter_layout(up, down);
            taps_.emplace_back(layout.length);
            kz::dsp::design_windowed_sinc(layout, taps_.back());
            filters_.push_back(
                {{taps_.back().data(), 1, up, static_cast<uint32_t>(layout.length / up), up, down},
                 std::to_string(up) + '/' + std::to_string(down)});
        }
    }

    const std::vector<Filter>& all() const { return filters_; }

private:
    std::vector<Samples> taps_;
    std::vector<Filter> filters_;
};

std::vector<Filter> all_filters()
{
    static const OwnFilters own;
    auto filters = shared_filters();
    filters.insert(filters.end(), own.all().begin(), own.all().end());
    return filters;
}

/// Exactly the samples that the windows hold: more must not be read.
size_t samples_for(const FloatPhases& phases, uint32_t phase, uint32_t outputs)
{
    const uint64_t first = (phase + uint64_t{outputs - 1} * phases.down) / phases.up;
    return static_cast<size_t>(first) + phases.taps_per_phase;
}

// A level at which everything that single precision rounds away shows.
Samples noise_of(size_t count, uint64_t seed)
{
    Random random(seed);
    Samples samples(count);
    for (float& x : samples) {
        x = static_cast<float>(static_cast<int32_t>(random.next()) >> 7);
    }
    return samples;
}

Samples sprinkled(Samples samples, std::initializer_list<float> specials, size_t step)
{
    size_t at = step / 2;
    while (at < samples.size()) {
        for (const float special : specials) {
            if (at < samples.size()) {
                samples[at] = special;
            }
            at += step;
        }
    }
    return samples;
}

std::vector<Samples> signals(size_t count)
{
    const Samples noise = noise_of(count, 40);
    Samples clipped = noise;
    for (float& x : clipped) {
        x = x < 0 ? -32768.0F : 32767.0F;
    }
    Samples spread = noise;
    for (size_t i = 0; i < count; ++i) {
        spread[i] *= std::bit_cast<float>(static_cast<uint32_t>(i % 180 + 30) << 23);
    }
    return {noise,
            clipped,
            spread,
            Samples(count, -0.0F),
            Samples(count, kLargest),
            Samples(count, kSmallest),
            sprinkled(noise, {kInfinity}, 97),
            sprinkled(noise, {kNaN, -kInfinity, kInfinity, -0.0F, kSmallest}, 331)};
}

// The outputs as bits, and one word beyond them that must stay untouched. A NaN is a NaN: which of
// two operands leaves its sign and payload is the processor's choice.
std::vector<uint32_t> outputs_of(decltype(Variant::polyphase_floats) kernel,
                                 const FloatPhases& phases, const Samples& samples, uint32_t phase,
                                 uint32_t count)
{
    Samples output(count + 1, 77.0F);
    kernel(phases, samples.data(), phase, output.data(), count);
    std::vector<uint32_t> bits;
    for (const float x : output) {
        bits.push_back(std::bit_cast<uint32_t>(x == x ? x : kNaN));
    }
    return bits;
}

TEST_P(FloatResampleVariants, FiltersGiveThePlainBitsForAnySamples)
{
    for (const auto& [phases, name] : all_filters()) {
        for (const uint32_t count : {100U, 1500U}) {
            for (const Samples& samples : signals(samples_for(phases, 0, count))) {
                ASSERT_EQ(outputs_of(variant().polyphase_floats, phases, samples, 0, count),
                          outputs_of(plain().polyphase_floats, phases, samples, 0, count))
                    << name;
            }
        }
    }
}

TEST_P(FloatResampleVariants, FiltersGiveThePlainBitsForAnyCount)
{
    for (const auto& [phases, name] : all_filters()) {
        for (const uint32_t count :
             {0U,   1U,   2U,   3U,   4U,   5U,   7U,   8U,   9U,    15U,   16U,   17U,  31U,
              32U,  33U,  47U,  63U,  64U,  65U,  146U, 147U, 148U,  149U,  150U,  293U, 295U,
              440U, 441U, 442U, 443U, 511U, 512U, 513U, 881U, 1175U, 1177U, 2700U, 9000U}) {
            const uint32_t phase = count % phases.up;
            const auto samples = noise_of(samples_for(phases, phase, std::max(count, 1U)), count);
            ASSERT_EQ(outputs_of(variant().polyphase_floats, phases, samples, phase, count),
                      outputs_of(plain().polyphase_floats, phases, samples, phase, count))
                << count << " outputs, " << name;
        }
    }
}

TEST_P(FloatResampleVariants, FiltersGiveThePlainBitsFromEveryPhase)
{
    for (const auto& [phases, name] : all_filters()) {
        for (uint32_t phase = 0; phase < phases.up; ++phase) {
            // Beside one another, and one period apart.
            for (const uint32_t count : {11U, phases.up + 5}) {
                const auto samples = noise_of(samples_for(phases, phase, count), 41);
                ASSERT_EQ(outputs_of(variant().polyphase_floats, phases, samples, phase, count),
                          outputs_of(plain().polyphase_floats, phases, samples, phase, count))
                    << count << " outputs from phase " << phase << ", " << name;
            }
        }
    }
}

KZ_FOR_KERNEL_VARIANTS(FloatResampleVariants);

} // namespace
