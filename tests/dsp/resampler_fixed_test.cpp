#include "kzsdk/dsp/resampler.h"

#include <cmath>
#include <cstdlib>
#include <memory>
#include <numbers>
#include <tuple>
#include <vector>

#include "kzsdk/dsp/convert.h"
#include "kzsdk/dsp/fxp_ops.hpp"
#include "support/allocation.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kWorkingRate = 11025;
constexpr uint32_t kRates[] = {8000, 16000, 22050, 24000, 32000, 44100, 48000};

struct Destroy {
    void operator()(KZDSP_resampler_fixed* r) const { KZDSP_resampler_fixed_destroy(r); }
};
using Resampler = std::unique_ptr<KZDSP_resampler_fixed, Destroy>;

Resampler make(uint32_t input_rate, uint32_t output_rate = kWorkingRate)
{
    return Resampler(KZDSP_resampler_fixed_create(input_rate << 15, output_rate << 15));
}

using Words = std::vector<int32_t>;

struct Counts {
    uint32_t consumed = 0;
    uint32_t produced = 0;
};

Counts run(KZDSP_resampler_fixed& r, const int32_t* input, size_t count, int32_t* output,
           size_t capacity)
{
    Counts counts;
    KZDSP_resampler_fixed_resample(&r, input, static_cast<uint32_t>(count), output,
                                   static_cast<uint32_t>(capacity), &counts.consumed,
                                   &counts.produced);
    return counts;
}

// Resamples a stream in blocks and capacities that `next_block` and `next_capacity` choose.
template <class NextBlock, class NextCapacity>
Words resample_in_pieces(uint32_t rate, const Words& input, NextBlock next_block,
                         NextCapacity next_capacity)
{
    const auto r = make(rate);
    Words output(KZDSP_resampler_fixed_compute_resampled_length(
                     r.get(), static_cast<uint32_t>(input.size())) +
                 1000);
    size_t taken = 0;
    size_t made = 0;
    int idle = 0;
    while (idle < 3) {
        const size_t block = std::min<size_t>(next_block(), input.size() - taken);
        const size_t capacity = std::min<size_t>(next_capacity(), output.size() - made);
        const Counts counts = run(*r, input.data() + taken, block, output.data() + made, capacity);
        EXPECT_LE(counts.consumed, block);
        EXPECT_LE(counts.produced, capacity);
        EXPECT_LE(r->history_end, r->taps_per_phase);
        taken += counts.consumed;
        made += counts.produced;
        idle = counts.consumed == 0 && counts.produced == 0 ? idle + 1 : 0;
    }
    EXPECT_EQ(input.size(), taken);
    output.resize(made);
    return output;
}

Words resample_whole(uint32_t rate, const Words& input)
{
    return resample_in_pieces(
        rate, input, [] { return size_t{1} << 30; }, [] { return size_t{1} << 30; });
}

Words random_words(size_t count, int bits, uint64_t seed)
{
    Random random(seed);
    Words words(count);
    for (int32_t& word : words) {
        word = static_cast<int32_t>(random.next()) >> (32 - bits);
    }
    return words;
}

// Every output computed on its own from the whole stream, with exact products rounded one by one: the
// rule for windows that reach across a cut.
Words exact_outputs(uint32_t rate, const Words& input)
{
    const auto r = make(rate);
    Words padded(r->history_end, 0);
    padded.insert(padded.end(), input.begin(), input.end());
    const int shift = r->up > 1 ? 31 : 32;
    Words outputs;
    size_t oldest = 0;
    uint32_t phase = 0;
    while (oldest + r->taps_per_phase <= padded.size()) {
        const uint32_t t = phase + r->down;
        phase = t % r->up;
        uint32_t sum = 0;
        for (uint32_t k = 0; k < r->taps_per_phase; ++k) {
            const size_t tap = phase + size_t{k} * r->up;
            const int64_t c = r->msb[tap] * 65536LL + r->lsb[tap];
            const int64_t x = padded[oldest + r->taps_per_phase - 1 - k];
            sum += static_cast<uint32_t>(static_cast<uint64_t>((c * x) >> shift));
        }
        outputs.push_back(static_cast<int32_t>(sum));
        oldest += t / r->up;
    }
    return outputs;
}

// How far below and above the exact outputs the split products may come out.
std::pair<int64_t, int64_t> bounds(const KZDSP_resampler_fixed& r)
{
    if (r.up > 1) {
        return {2 * int64_t{r.taps_per_phase}, 0};
    }
    return r.down == 4 ? std::pair<int64_t, int64_t>{62, 62} : std::pair<int64_t, int64_t>{22, 22};
}

void expect_within_bounds(uint32_t rate, const Words& exact, const Words& outputs)
{
    ASSERT_EQ(exact.size(), outputs.size()) << rate;
    const auto [below, above] = bounds(*make(rate));
    for (size_t i = 0; i < exact.size(); ++i) {
        ASSERT_GE(outputs[i], exact[i] - below) << rate << " Hz, output " << i;
        ASSERT_LE(outputs[i], exact[i] + above) << rate << " Hz, output " << i;
    }
}

class ResamplerFixed : public MemoryOn {};

} // namespace

TEST_F(ResamplerFixed, KnowsSevenRatesWithTheirFilters)
{
    using Row = std::tuple<uint32_t, uint32_t, uint32_t, uint32_t, uint32_t>;
    const Row rows[] = {
        {48000, 147, 640, 13377, 91}, {44100, 1, 4, 84, 84}, {32000, 441, 1280, 26460, 60},
        {24000, 147, 320, 6615, 45},  {22050, 1, 2, 42, 42}, {16000, 441, 640, 13230, 30},
        {8000, 441, 320, 9261, 21},
    };
    for (const auto& [rate, up, down, length, taps] : rows) {
        const auto r = make(rate);
        ASSERT_TRUE(r) << rate;
        EXPECT_EQ(up, r->up) << rate;
        EXPECT_EQ(down, r->down) << rate;
        EXPECT_EQ(length, r->length) << rate;
        EXPECT_EQ(taps, r->taps_per_phase) << rate;
    }
}

TEST_F(ResamplerFixed, HalvesAnyRateUnderTheRatesTwoAndOne)
{
    const auto r = make(2, 1);
    ASSERT_TRUE(r);
    EXPECT_EQ(1U, r->up);
    EXPECT_EQ(2U, r->down);
    EXPECT_EQ(kzdsp_get_22050_11025_fixed_coeff_msb(), r->msb);
    EXPECT_EQ(kzdsp_get_22050_11025_fixed_coeff_lsb(), r->lsb);
    EXPECT_EQ(42U, r->length);
}

TEST_F(ResamplerFixed, CopiesBetweenEqualRates)
{
    for (const uint32_t rate : {1U, kWorkingRate, 48000U, 7U}) {
        const auto r = make(rate, rate);
        ASSERT_TRUE(r) << rate;
        EXPECT_EQ(1U, r->up);
        EXPECT_EQ(1U, r->down);
        EXPECT_EQ(0U, r->length);
        const Words input = {1, -2, 3, -4};
        Words output(3);
        const Counts counts = run(*r, input.data(), 4, output.data(), 3);
        EXPECT_EQ(3U, counts.consumed);
        EXPECT_EQ(3U, counts.produced);
        EXPECT_EQ((Words{1, -2, 3}), output);
    }
}

TEST_F(ResamplerFixed, RefusesZeroAndUnknownPairs)
{
    EXPECT_FALSE(make(0, kWorkingRate));
    EXPECT_FALSE(make(kWorkingRate, 0));
    EXPECT_FALSE(make(kWorkingRate, 8000));
    EXPECT_FALSE(make(44101));
    EXPECT_FALSE(make(44100, 22050));
}

TEST_F(ResamplerFixed, LengthsAreRoundedDownForOutputsAndUpForInputs)
{
    const auto r = make(48000);
    EXPECT_EQ(147U, KZDSP_resampler_fixed_compute_resampled_length(r.get(), 640));
    EXPECT_EQ(146U, KZDSP_resampler_fixed_compute_resampled_length(r.get(), 639));
    EXPECT_EQ(640U, KZDSP_resampler_fixed_compute_raw_length(r.get(), 147));
    EXPECT_EQ(5U, KZDSP_resampler_fixed_compute_raw_length(r.get(), 1));
    EXPECT_EQ(0U, KZDSP_resampler_fixed_compute_raw_length(r.get(), 0));
    EXPECT_EQ(0U, KZDSP_resampler_fixed_compute_raw_length(nullptr, 5));
    EXPECT_EQ(0U, KZDSP_resampler_fixed_compute_resampled_length(nullptr, 5));
    EXPECT_EQ(0xFFFFFFFFU, KZDSP_resampler_fixed_compute_raw_length(r.get(), 0xFFFFFFFF));
}

TEST_F(ResamplerFixed, StartsOverHalfAFilterOfZeros)
{
    for (const auto& [rate, delay] :
         {std::pair{48000U, 44U}, {44100U, 40U}, {32000U, 30U}, {22050U, 20U}, {8000U, 11U}}) {
        EXPECT_EQ(delay, make(rate)->history_end) << rate;
    }
}

TEST_F(ResamplerFixed, TooFewSamplesMakeNoOutputAndAreKept)
{
    for (const uint32_t rate : kRates) {
        const auto r = make(rate);
        const uint32_t need = r->taps_per_phase - r->history_end;
        const uint32_t stored = r->history_end;
        const Words input = random_words(need, 30, rate);
        Words output(8, 77);
        const Counts counts = run(*r, input.data(), need - 1, output.data(), output.size());
        EXPECT_EQ(need - 1, counts.consumed) << rate;
        EXPECT_EQ(0U, counts.produced) << rate;
        EXPECT_EQ(stored + need - 1, r->history_end) << rate;
        EXPECT_EQ(Words(8, 77), output);
        EXPECT_EQ(1U, run(*r, input.data() + need - 1, 1, output.data(), 1).produced) << rate;
    }
}

TEST_F(ResamplerFixed, SilenceComesOutAsExactZeros)
{
    for (const uint32_t rate : kRates) {
        const Words outputs = resample_whole(rate, Words(20000, 0));
        EXPECT_EQ(Words(outputs.size(), 0), outputs) << rate;
        EXPECT_GT(outputs.size(), 4000U);
    }
}

// Every output of a stream must be the one dot product that its place in the stream asks for,
// however the stream is cut and however little room the caller has: nothing lost, nothing twice.
TEST_F(ResamplerFixed, CutsShowInTheLastBitsOnly)
{
    for (const uint32_t rate : kRates) {
        const Words input = random_words(24000, 30, rate + 1);
        const Words exact = exact_outputs(rate, input);
        expect_within_bounds(rate, exact, resample_whole(rate, input));
        for (const size_t block : {1U, 2U, 3U, 63U, 441U, 4095U, 4096U}) {
            expect_within_bounds(
                rate, exact,
                resample_in_pieces(
                    rate, input, [block] { return block; }, [] { return size_t{1} << 20; }));
        }
    }
}

TEST_F(ResamplerFixed, RandomBlocksAndCapacitiesLoseNothing)
{
    for (const uint32_t rate : kRates) {
        const Words input = random_words(24000, 30, rate + 2);
        const Words exact = exact_outputs(rate, input);
        for (uint64_t seed = 0; seed < 12; ++seed) {
            Random random(seed * 1000 + rate);
            const uint32_t largest = seed % 2 == 0 ? 300 : 7;
            expect_within_bounds(rate, exact,
                                 resample_in_pieces(
                                     rate, input, [&] { return 1 + random.below(largest); },
                                     [&] { return 1 + random.below(largest); }));
        }
    }
}

// With one sample a block every window but those that start a block reaches into the history.
TEST_F(ResamplerFixed, AcrossCutsProductsAreExact)
{
    for (const uint32_t rate : kRates) {
        const Words input = random_words(3000, 31, rate + 3);
        EXPECT_EQ(exact_outputs(rate, input),
                  resample_in_pieces(
                      rate, input, [] { return size_t{1}; }, [] { return size_t{1} << 20; }))
            << rate;
    }
}

TEST_F(ResamplerFixed, EqualRatesDoNotShowCutsAtAll)
{
    const Words input = random_words(5000, 32, 4);
    Random random(5);
    EXPECT_EQ(input, resample_in_pieces(
                         kWorkingRate, input, [&] { return 1 + random.below(50); },
                         [&] { return 1 + random.below(50); }));
}

// Loud down-mixed stereo leaves 32 bits in the sum of cross products. The wrap is part of the output.
TEST_F(ResamplerFixed, LoudStereoWrapsTheCrossProducts)
{
    const auto tone = sine(44100, 60, 1.0, 1.0);
    std::vector<int16_t> stereo;
    for (const int16_t sample : tone) {
        stereo.insert(stereo.end(), {sample, sample});
    }
    Words input(tone.size());
    KZDSP_StereoPCM16ToMonoQ30(stereo.data(), input.data(), static_cast<int32_t>(input.size()));
    const Words exact = exact_outputs(44100, input);
    const Words outputs = resample_whole(44100, input);
    int wrapped = 0;
    for (size_t i = 0; i < exact.size(); ++i) {
        const int64_t distance = int64_t{outputs[i]} - exact[i];
        const int64_t steps = std::lround(static_cast<double>(distance) / 65536);
        ASSERT_LE(std::llabs(distance - steps * 65536), 62) << i;
        wrapped += steps != 0;
    }
    EXPECT_GT(wrapped, 0);
}

namespace {

double rms(const Words& words, size_t from)
{
    double sum = 0;
    for (size_t i = from; i < words.size(); ++i) {
        sum += static_cast<double>(words[i]) * words[i];
    }
    return std::sqrt(sum / static_cast<double>(words.size() - from));
}

Words sine_words(uint32_t rate, double hertz, size_t count)
{
    Words words(count);
    for (size_t i = 0; i < count; ++i) {
        const double angle = 2 * std::numbers::pi * hertz * static_cast<double>(i) / rate;
        words[i] = static_cast<int32_t>(std::lround(0x1p28 * std::sin(angle)));
    }
    return words;
}

// Power of the best fitting tone over the power of what is left, in dB.
double tone_to_residue(const Words& words, double hertz, size_t from)
{
    double c = 0, s = 0, cc = 0, ss = 0, cs = 0, power = 0;
    for (size_t i = from; i < words.size(); ++i) {
        const double angle = 2 * std::numbers::pi * hertz * static_cast<double>(i) / kWorkingRate;
        const double x = words[i];
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

} // namespace

TEST_F(ResamplerFixed, IntegerRatiosLeaveAtHalfLevelAnd8000HertzAtItsOwn)
{
    for (const uint32_t rate : kRates) {
        const Words outputs = resample_whole(rate, sine_words(rate, 500, rate));
        const double level = rms(outputs, 500) / (0x1p28 / std::numbers::sqrt2);
        const double expected = rate == 22050 || rate == 44100 ? 0.5 : rate == 8000 ? 0.688 : 1.0;
        EXPECT_NEAR(expected, level, expected * 0.01) << rate;
    }
}

// The phase advances before the taps are read and the window moves after, which shakes the time of an
// output by up to one input sample. What that costs, at 1 kHz:
TEST_F(ResamplerFixed, PolyphaseOutputsAreUpToOneInputSampleOff)
{
    const auto residue = [](uint32_t rate) {
        return tone_to_residue(resample_whole(rate, sine_words(rate, 1000, 2 * rate)), 1000, 500);
    };
    EXPECT_NEAR(24, residue(48000), 1.5);
    EXPECT_NEAR(9, residue(8000), 1.5);
    EXPECT_GT(residue(44100), 90);
    EXPECT_GT(residue(22050), 90);
}

TEST_F(ResamplerFixed, ResetStartsTheStreamAnew)
{
    for (const uint32_t rate : kRates) {
        const auto r = make(rate);
        const Words input = random_words(2000, 30, rate);
        Words first(3000), second(3000);
        const Counts one = run(*r, input.data(), input.size(), first.data(), first.size());
        run(*r, input.data(), 333, second.data(), 5);
        KZDSP_resampler_fixed_reset(r.get());
        const Counts two = run(*r, input.data(), input.size(), second.data(), second.size());
        EXPECT_EQ(one.produced, two.produced);
        EXPECT_TRUE(std::equal(first.begin(), first.begin() + one.produced, second.begin()))
            << rate;
    }
}

TEST_F(ResamplerFixed, NullsDoNothing)
{
    KZDSP_resampler_fixed_destroy(nullptr);
    KZDSP_resampler_fixed_reset(nullptr);
    Words words(100, 5);
    Counts counts{9, 9};
    KZDSP_resampler_fixed_resample(nullptr, words.data(), 100, words.data(), 0, &counts.consumed,
                                   &counts.produced);
    EXPECT_EQ(0U, counts.consumed);
    EXPECT_EQ(0U, counts.produced);
    const auto r = make(44100);
    KZDSP_resampler_fixed_resample(r.get(), nullptr, 100, nullptr, 100, nullptr, nullptr);
    EXPECT_EQ(40U, r->history_end);
    KZDSP_resampler_fixed_resample(r.get(), words.data(), 10, nullptr, 100, nullptr, nullptr);
    EXPECT_EQ(50U, r->history_end);
}

TEST_F(ResamplerFixed, FailedAllocationsMakeNoResampler)
{
    for (const uint32_t rate : {48000U, 44100U, kWorkingRate}) {
        for_every_failed_allocation([rate](auto fired) {
            const auto r = make(rate);
            EXPECT_EQ(fired(), r == nullptr);
        });
    }
}

namespace {

int32_t dual(const Words& samples, size_t first_count, const std::vector<int16_t>& msb,
             const std::vector<uint16_t>& lsb, uint32_t stride, int32_t shift)
{
    // Newest first: the first run is the end of the array, the second the beginning.
    const auto second_count = static_cast<uint32_t>(samples.size() - first_count);
    return KZDSP_DualConvolveFixed(
        samples.data() + samples.size() - 1, static_cast<uint32_t>(first_count),
        samples.data() + second_count - 1, second_count, msb.data(), lsb.data(), stride, shift);
}

} // namespace

TEST(DualConvolveFixed, AddsBitsOfExactProducts)
{
    Random random(7);
    for (int round = 0; round < 2000; ++round) {
        const uint32_t stride = 1 + random.below(3);
        const Words samples = random_words(2 + random.below(20), 32, random.next64());
        std::vector<int16_t> msb(samples.size() * stride);
        std::vector<uint16_t> lsb(msb.size());
        for (size_t i = 0; i < msb.size(); ++i) {
            msb[i] = static_cast<int16_t>(random.next());
            lsb[i] = static_cast<uint16_t>(random.next());
        }
        const size_t first_count = 1 + random.below(static_cast<uint32_t>(samples.size() - 1));
        for (const int32_t shift : {0, 1, 7, 31}) {
            uint32_t expected = 0;
            for (size_t k = 0; k < samples.size(); ++k) {
                const int64_t tap = msb[k * stride] * 65536LL + lsb[k * stride];
                const auto product = static_cast<__int128>(tap) * samples[samples.size() - 1 - k];
                expected += static_cast<uint32_t>(product >> (32 - shift));
            }
            EXPECT_EQ(static_cast<int32_t>(expected),
                      dual(samples, first_count, msb, lsb, stride, shift));
        }
    }
}

TEST(DualConvolveFixed, WhereTheRunsMeetDoesNotShow)
{
    const Words samples = random_words(40, 32, 8);
    const std::vector<int16_t> msb(kzdsp_get_44100_11025_fixed_coeff_msb(),
                                   kzdsp_get_44100_11025_fixed_coeff_msb() + 84);
    const std::vector<uint16_t> lsb(kzdsp_get_44100_11025_fixed_coeff_lsb(),
                                    kzdsp_get_44100_11025_fixed_coeff_lsb() + 84);
    const int32_t whole =
        KZDSP_DualConvolveFixed(&samples.back(), 40, nullptr, 0, msb.data(), lsb.data(), 2, 1);
    for (size_t first_count = 1; first_count < 40; ++first_count) {
        EXPECT_EQ(whole, dual(samples, first_count, msb, lsb, 2, 1));
    }
}

TEST(DualConvolveFixed, NullsAndEmptyRunsGiveZero)
{
    const int32_t sample = 5;
    const int16_t msb = 1;
    const uint16_t lsb = 2;
    EXPECT_EQ(0, KZDSP_DualConvolveFixed(nullptr, 0, nullptr, 0, &msb, &lsb, 1, 1));
    EXPECT_EQ(0, KZDSP_DualConvolveFixed(nullptr, 1, nullptr, 0, &msb, &lsb, 1, 1));
    EXPECT_EQ(0, KZDSP_DualConvolveFixed(&sample, 1, nullptr, 1, &msb, &lsb, 1, 1));
    EXPECT_EQ(0, KZDSP_DualConvolveFixed(&sample, 1, nullptr, 0, nullptr, &lsb, 1, 1));
    EXPECT_EQ(0, KZDSP_DualConvolveFixed(&sample, 1, nullptr, 0, &msb, nullptr, 1, 1));
}

} // namespace kz::test
