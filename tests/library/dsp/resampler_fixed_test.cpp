#include "kzsdk/dsp/resampler.h"

#include <cmath>
#include <cstdlib>
#include <vector>

#include "kzsdk/dsp/convert.h"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "library/dsp/resampler_twins.hpp"

namespace kz::test {

namespace {

using Words = std::vector<int32_t>;

OwnedResampler<FixedTwin> make(uint32_t input_rate, uint32_t output_rate = kWorkingRate)
{
    return make_resampler<FixedTwin>(input_rate, output_rate);
}

template <class NextBlock, class NextCapacity>
Words resample_pieces(uint32_t rate, const Words& input, NextBlock next_block,
                      NextCapacity next_capacity)
{
    const auto r = make(rate);
    return resample_in_pieces<FixedTwin>(*r, input, next_block, next_capacity);
}

Words resample_whole(uint32_t rate, const Words& input)
{
    return kz::test::resample_whole<FixedTwin>(rate, input);
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

// Every output computed on its own from the whole stream, with exact products rounded one by one:
// the rule for windows that reach across a cut.
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

TEST_F(ResamplerFixed, RefusesUnknownPairs)
{
    EXPECT_FALSE(make(kWorkingRate, 8000));
    EXPECT_FALSE(make(44101));
    EXPECT_FALSE(make(44100, 22050));
}

TEST_F(ResamplerFixed, FractionsOfAHertzAreDropped)
{
    KZDSP_resampler_fixed* const r =
        KZDSP_resampler_fixed_create((44100U << 15) + 32767, (kWorkingRate << 15) + 32767);
    ASSERT_NE(nullptr, r);
    EXPECT_EQ(4U, r->down);
    KZDSP_resampler_fixed_destroy(r);
    EXPECT_EQ(nullptr, KZDSP_resampler_fixed_create(32767, 32767)); // 0.99997 Hz counts as none
}

// Every output of a stream must be the one dot product that its position in the stream requires,
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
                resample_pieces(
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
                                 resample_pieces(
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
                  resample_pieces(
                      rate, input, [] { return size_t{1}; }, [] { return size_t{1} << 20; }))
            << rate;
    }
}

// Loud down-mixed stereo exceeds 32 bits in the sum of cross products. The wrap is part of the
// output.
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

TEST_F(ResamplerFixed, IntegerRatiosHalveTheLevelAnd8000HzDoesNot)
{
    for (const uint32_t rate : kRates) {
        const Words outputs = resample_whole(rate, sine_stream<FixedTwin>(rate, 500, rate));
        const double level = sine_level<FixedTwin>(outputs, 500);
        const double expected = rate == 22050 || rate == 44100 ? 0.5 : rate == 8000 ? 0.688 : 1.0;
        EXPECT_NEAR(expected, level, expected * 0.01) << rate;
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
                const int64_t product = tap * samples[samples.size() - 1 - k];
                expected += static_cast<uint32_t>(product >> (32 - shift));
            }
            EXPECT_EQ(static_cast<int32_t>(expected),
                      dual(samples, first_count, msb, lsb, stride, shift));
        }
    }
}

// The shift follows the rule of all fixed-point shifts: 32 exchanges high word for low word, more
// loses both, and counts are taken modulo 256.
TEST(DualConvolveFixed, ShiftsBeyond31FollowTheShiftRule)
{
    const Words samples = {0x12345678, 0x76543210};
    const std::vector<int16_t> msb = {0x1357, -0x2468};
    const std::vector<uint16_t> lsb = {0x9bdf, 0xace0};
    const auto at = [&](int32_t shift) { return dual(samples, 1, msb, lsb, 1, shift); };
    uint32_t low_words = 0;
    for (size_t k = 0; k < 2; ++k) {
        const int64_t tap = msb[k] * 65536LL + lsb[k];
        low_words += static_cast<uint32_t>(static_cast<uint64_t>(tap * samples[1 - k]));
    }
    EXPECT_EQ(static_cast<int32_t>(low_words), at(32));
    EXPECT_EQ(0, at(33));
    EXPECT_EQ(0, at(100));
    EXPECT_EQ(at(0), at(256));
    EXPECT_EQ(at(1), at(257));
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
