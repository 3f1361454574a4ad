/// @file
/// Both resamplers under one set of names, for tests of what they share.
#pragma once

#include <cmath>
#include <cstdint>
#include <limits>
#include <memory>
#include <numbers>
#include <vector>

#include "kzsdk/dsp/resampler.h"
#include "support/allocation.hpp"
#include "support/signals.hpp"

namespace kz::test {

constexpr uint32_t kWorkingRate = 11025;
constexpr uint32_t kRates[] = {8000, 16000, 22050, 24000, 32000, 44100, 48000};

struct FixedTwin {
    using Record = KZDSP_resampler_fixed;
    using Sample = int32_t;
    static Record* create(uint32_t in, uint32_t out)
    {
        return KZDSP_resampler_fixed_create(in << 15, out << 15);
    }
    static constexpr auto destroy = KZDSP_resampler_fixed_destroy;
    static constexpr auto reset = KZDSP_resampler_fixed_reset;
    static constexpr auto resample = KZDSP_resampler_fixed_resample;
    static constexpr auto resampled_length = KZDSP_resampler_fixed_compute_resampled_length;
    static constexpr auto raw_length = KZDSP_resampler_fixed_compute_raw_length;
    static Sample sample(double level) { return static_cast<Sample>(std::lround(level * 0x1p28)); }
};

struct FloatTwin {
    using Record = KZDSP_resampler;
    using Sample = float;
    static Record* create(uint32_t in, uint32_t out)
    {
        return KZDSP_CreateResampler(static_cast<float>(in), static_cast<float>(out));
    }
    static constexpr auto destroy = KZDSP_DestroyResampler;
    static constexpr auto reset = KZDSP_ResetResampler;
    static constexpr auto resample = KZDSP_Resample;
    static constexpr auto resampled_length = KZDSP_ComputeResampledLength;
    static constexpr auto raw_length = KZDSP_ComputeRawLength;
    static Sample sample(double level) { return static_cast<Sample>(level * 0x1p28); }
};

template <class Twin>
struct DestroyTwin {
    void operator()(typename Twin::Record* r) const { Twin::destroy(r); }
};

template <class Twin>
using OwnedResampler = std::unique_ptr<typename Twin::Record, DestroyTwin<Twin>>;

template <class Twin>
using Stream = std::vector<typename Twin::Sample>;

template <class Twin>
OwnedResampler<Twin> make_resampler(uint32_t input_rate, uint32_t output_rate = kWorkingRate)
{
    return OwnedResampler<Twin>(Twin::create(input_rate, output_rate));
}

struct Counts {
    uint32_t consumed = 0;
    uint32_t produced = 0;
    bool operator==(const Counts&) const = default;
};

template <class Twin>
Counts run(typename Twin::Record& r, const typename Twin::Sample* input, size_t count,
           typename Twin::Sample* output, size_t capacity)
{
    Counts counts;
    Twin::resample(&r, input, static_cast<uint32_t>(count), output, static_cast<uint32_t>(capacity),
                   &counts.consumed, &counts.produced);
    return counts;
}

template <class Twin>
size_t expected_outputs(const typename Twin::Record& r, size_t inputs)
{
    return Twin::resampled_length(&r, static_cast<uint32_t>(inputs));
}

/// Resamples a stream in blocks and capacities that `next_block` and `next_capacity` choose. Every
/// block is passed in arrays of its own of exactly the stated length, so that an access beyond them
/// is detected.
template <class Twin, class NextBlock, class NextCapacity>
Stream<Twin> resample_in_pieces(typename Twin::Record& r, const Stream<Twin>& input,
                                NextBlock next_block, NextCapacity next_capacity)
{
    const size_t most = expected_outputs<Twin>(r, input.size()) + 1000;
    Stream<Twin> output;
    size_t taken = 0;
    int idle = 0;
    while (idle < 30) {
        const size_t block = std::min<size_t>(next_block(), input.size() - taken);
        const size_t room = expected_outputs<Twin>(r, block) + 1000;
        const size_t capacity = std::min<size_t>(next_capacity(), room);
        const auto from = input.begin() + static_cast<ptrdiff_t>(taken);
        const Stream<Twin> in(from, from + static_cast<ptrdiff_t>(block));
        Stream<Twin> out(capacity);
        const Counts counts = run<Twin>(r, in.data(), in.size(), out.data(), out.size());
        EXPECT_LE(counts.consumed, block);
        EXPECT_LE(counts.produced, capacity);
        EXPECT_LE(r.history_end, r.taps_per_phase);
        EXPECT_LE(r.history_start, r.history_end);
        EXPECT_LT(r.phase, r.up);
        taken += counts.consumed;
        output.insert(output.end(), out.begin(),
                      out.begin() + static_cast<ptrdiff_t>(counts.produced));
        idle = counts == Counts{} ? idle + 1 : 0;
        if (output.size() > most || ::testing::Test::HasFailure()) {
            ADD_FAILURE() << "the stream does not end";
            break;
        }
    }
    EXPECT_EQ(input.size(), taken);
    return output;
}

/// Chooses an unlimited size, for whole blocks and unbounded outputs.
inline size_t unbounded() { return size_t{1} << 30; }

template <class Twin>
Stream<Twin> resample_whole(uint32_t rate, const Stream<Twin>& input)
{
    const auto r = make_resampler<Twin>(rate);
    return resample_in_pieces<Twin>(*r, input, unbounded, unbounded);
}

template <class Twin>
Stream<Twin> random_stream(size_t count, uint64_t seed)
{
    Random random(seed);
    Stream<Twin> stream(count);
    for (auto& sample : stream) {
        sample = Twin::sample(random.unit());
    }
    return stream;
}

template <class Twin>
Stream<Twin> sine_stream(uint32_t rate, double hertz, size_t count)
{
    Stream<Twin> stream(count);
    for (size_t i = 0; i < count; ++i) {
        stream[i] =
            Twin::sample(std::sin(2 * std::numbers::pi * hertz * static_cast<double>(i) / rate));
    }
    return stream;
}

/// Level of a sine that sine_stream() gave, behind the resampler: 1 is full level.
template <class Twin>
double sine_level(const Stream<Twin>& stream, size_t from)
{
    double sum = 0;
    for (size_t i = from; i < stream.size(); ++i) {
        sum += static_cast<double>(stream[i]) * static_cast<double>(stream[i]);
    }
    return std::sqrt(2 * sum / static_cast<double>(stream.size() - from)) / 0x1p28;
}

/// Power of the best fitting tone over the power of what is left, in dB.
template <class Twin>
double tone_to_residue(const Stream<Twin>& stream, double hertz, size_t from)
{
    double c = 0, s = 0, cc = 0, ss = 0, cs = 0, power = 0;
    for (size_t i = from; i < stream.size(); ++i) {
        const double angle = 2 * std::numbers::pi * hertz * static_cast<double>(i) / kWorkingRate;
        const auto x = static_cast<double>(stream[i]);
        c += x * std::cos(angle);
        s += x * std::sin(angle);
        cc += std::cos(angle) * std::cos(angle);
        ss += std::sin(angle) * std::sin(angle);
        cs += std::cos(angle) * std::sin(angle);
        power += x * x;
    }
    const double det = cc * ss - cs * cs;
    const double a = (c * ss - s * cs) / det;
    const double b = (s * cc - c * cs) / det;
    const double fitted = a * c + b * s;
    return 10 * std::log10(fitted / (power - fitted));
}

} // namespace kz::test
