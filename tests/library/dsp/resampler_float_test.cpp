#include <algorithm>
#include <bit>
#include <cmath>
#include <complex>
#include <limits>
#include <numeric>
#include <span>

#include "kzsdk/dsp/filter_design.hpp"
#include "kzsdk/kernels/tables.hpp"
#include "library/dsp/resampler_twins.hpp"

namespace kz::test {

namespace {

using Samples = std::vector<float>;
using Resampler = OwnedResampler<FloatTwin>;

Resampler make(float input_rate, float output_rate = 11025)
{
    return Resampler(KZDSP_CreateResampler(input_rate, output_rate));
}

Samples resample_whole(float rate, const Samples& input, float output_rate = 11025)
{
    const auto r = make(rate, output_rate);
    return resample_in_pieces<FloatTwin>(*r, input, unbounded, unbounded);
}

// Output n of a stream: the window begins floor(n M / L) samples after the zeros, its phase is one
// step ahead.
Samples expected_outputs_of(const KZDSP_resampler& fresh, const Samples& input)
{
    Samples padded(fresh.history_end, 0.0F);
    padded.insert(padded.end(), input.begin(), input.end());
    Samples outputs;
    for (uint64_t n = 0;; ++n) {
        const auto oldest = static_cast<size_t>(n * fresh.down / fresh.up);
        const auto phase = static_cast<size_t>((n + 1) * fresh.down % fresh.up);
        if (oldest + fresh.taps_per_phase > padded.size()) {
            return outputs;
        }
        float sum = 0;
        for (size_t k = 0; k < fresh.taps_per_phase; ++k) {
            sum += padded[oldest + fresh.taps_per_phase - 1 - k] * fresh.taps[phase + k * fresh.up];
        }
        outputs.push_back(sum);
    }
}

bool same_bits(const Samples& a, const Samples& b)
{
    return a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin(), [](float x, float y) {
               return std::bit_cast<uint32_t>(x) == std::bit_cast<uint32_t>(y);
           });
}

constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();

class ResamplerFloat : public MemoryOn {};

} // namespace

TEST_F(ResamplerFloat, DecimationByTwoAndFourUsesStoredFilters)
{
    const float rates[][2] = {{22050, 11025}, {44100, 22050}, {2, 1}, {1e-3F, 5e-4F}};
    for (const auto& [in, out] : rates) {
        const auto half = make(in, out);
        EXPECT_EQ(kernels::coefficients_2to1, half->taps);
        EXPECT_EQ(42U, half->length);
        EXPECT_EQ(0U, half->owns_taps);
        const auto quarter = make(in * 2, out);
        EXPECT_EQ(kernels::coefficients_4to1, quarter->taps);
        EXPECT_EQ(84U, quarter->length);
        EXPECT_EQ(0U, quarter->owns_taps);
    }
}

TEST_F(ResamplerFloat, EveryOtherRatioHasAFilterOfItsOwn)
{
    struct Row {
        float in, out;
        uint32_t up, down, length, leading;
    };
    const Row rows[] = {
        {48000, 11025, 147, 640, 13377, 493},
        {8000, 11025, 441, 320, 9261, 269},
        {33075, 11025, 1, 3, 64, 2},
        {11025, 44100, 4, 1, 84, 0},
        {96000, 11025, 147, 1280, 26754, 1133},
        {11025, 11024, 11022, 11023, 231462, 1},
    };
    for (const Row& row : rows) {
        const auto r = make(row.in, row.out);
        ASSERT_TRUE(r) << row.in;
        EXPECT_EQ(row.up, r->up) << row.in;
        EXPECT_EQ(row.down, r->down) << row.in;
        EXPECT_EQ(row.length, r->length) << row.in;
        EXPECT_EQ(row.length / row.up, r->taps_per_phase) << row.in;
        EXPECT_EQ(1U, r->owns_taps) << row.in;
        for (uint32_t i = 0; i < row.leading; ++i) {
            ASSERT_EQ(0.0F, r->taps[i]) << row.in;
        }
        EXPECT_EQ(static_cast<float>(row.up) / static_cast<float>(row.down),
                  r->taps[row.leading + 10 * std::max(row.up, row.down)])
            << row.in;
    }
}

TEST_F(ResamplerFloat, RatesThatAreNoneAreRefused)
{
    const uint64_t before = allocation_count();
    for (const float rate : {0.0F, -0.0F, -1.0F, -44100.0F, kNaN, -kNaN, kInfinity, -kInfinity}) {
        EXPECT_FALSE(make(rate, 11025)) << rate;
        EXPECT_FALSE(make(11025, rate)) << rate;
        EXPECT_FALSE(make(rate, rate)) << rate;
    }
    EXPECT_EQ(before, allocation_count());
}

// The quotient leaves single precision, or the fraction leaves what a filter may be designed for.
TEST_F(ResamplerFloat, QuotientsBeyondAllFiltersAreRefused)
{
    const float extremes[] = {1e-45F, 1e-30F, 1.0F, 4e9F, 1e30F, 3e38F};
    for (const float in : extremes) {
        for (const float out : extremes) {
            EXPECT_EQ(in == out, make(in, out) != nullptr) << in << ' ' << out;
        }
    }
}

TEST_F(ResamplerFloat, AnOversizedFilterCountsAsShortOfMemory)
{
    const auto largest = static_cast<float>(KZDSP_LARGEST_FACTOR);
    // The record is made, the filter is not tried.
    const uint64_t before = allocation_count();
    EXPECT_FALSE(make(1, largest * 2));
    EXPECT_FALSE(make(largest * 2, 1));
    EXPECT_EQ(before + 2, allocation_count());
    // Here the filter is tried: the second allocation.
    const AllocationFault fault(2);
    EXPECT_FALSE(make(1, largest));
    EXPECT_TRUE(fault.fired());
}

TEST_F(ResamplerFloat, RatesAMillionthApartArePassedThrough)
{
    const auto copy = make(11025.005F);
    ASSERT_TRUE(copy);
    EXPECT_EQ(0U, copy->length);
    const auto quarter = make(44100.02F);
    ASSERT_TRUE(quarter);
    EXPECT_EQ(kernels::coefficients_4to1, quarter->taps);
    const auto other = make(44101);
    ASSERT_TRUE(other);
    EXPECT_NE(1U, other->up);
}

namespace {

// What the stored filters must satisfy.
void expect_short_filter(std::span<const float> taps, size_t down, size_t zeros, double sum)
{
    const size_t centre = 11 * down - 1;
    EXPECT_EQ(1.0F / static_cast<float>(down), taps[centre]);
    EXPECT_NEAR(sum, std::accumulate(taps.begin(), taps.end(), 0.0), 1e-7);
    for (size_t i = 0; i < taps.size(); ++i) {
        const bool zero = i < zeros || (i % down == down - 1 && i != centre) || i > 21 * down - 2;
        EXPECT_EQ(zero, taps[i] == 0) << i;
        if (2 * centre - i < taps.size()) {
            EXPECT_EQ(taps[2 * centre - i], taps[i]) << i;
        }
    }
    const auto layout = dsp::filter_layout(1, static_cast<uint32_t>(down));
    Samples sinc(static_cast<size_t>(layout.length));
    dsp::design_windowed_sinc(layout, sinc);
    ASSERT_EQ(taps.size() + 1, sinc.size());
    EXPECT_EQ(0.0F, sinc.back());
    for (size_t i = 0; i < taps.size(); ++i) {
        EXPECT_NEAR(sinc[i], taps[i], 5e-4) << i;
    }
}

} // namespace

TEST_F(ResamplerFloat, TheHalfBandFilterIsAsItIsSaidToBe)
{
    expect_short_filter(kernels::coefficients_2to1, 2, 1, 0.99948);
}

TEST_F(ResamplerFloat, TheQuarterBandFilterIsAsItIsSaidToBe)
{
    expect_short_filter(kernels::coefficients_4to1, 4, 4, 0.99936);
}

TEST_F(ResamplerFloat, TheFixedTablesAreTheseFiltersInQ31)
{
    for (const uint32_t rate : {16000U, 22050U, 24000U, 32000U, 44100U, 48000U, 8000U}) {
        const auto fixed = make_resampler<FixedTwin>(rate);
        const auto floating = make_resampler<FloatTwin>(rate);
        const double gain = rate == 8000 ? 0.5 : 1.0;
        ASSERT_EQ(fixed->length, floating->length);
        for (uint32_t i = 0; i < fixed->length; ++i) {
            const int64_t word = fixed->msb[i] * 65536LL + fixed->lsb[i];
            ASSERT_EQ(std::llround(double{floating->taps[i]} * gain * 0x1p31), word)
                << rate << " tap " << i;
        }
    }
}

namespace {

constexpr float kManyRates[][2] = {
    {8000, 11025},
    {16000, 11025},
    {24000, 11025},
    {32000, 11025},
    {48000, 11025},
    {96000, 11025},
    {192000, 11025},
    {1000, 11025},
    {300, 11025},
    {33075, 11025},
    {55125, 11025},
    {3675, 11025},
    {11025, 11000},
    {11000, 11025},
    {11025, 48000},
    {44100, 48000},
    {48000, 44100},
    {7, 5},
    {5, 7},
    {2, 3},
    {1, 2},
    {12345, 11025},
    {11025.5F, 11025},
};

// Counted afresh from the header's description: zeros so that the centre of the filter falls on a
// sample of the output, or as many as there are steps too many.
uint64_t expected_leading(uint64_t up, uint64_t down)
{
    if (down > up) {
        return down - up;
    }
    const uint64_t half = 10 * up;
    constexpr uint64_t kWord = uint64_t{1} << 32;
    const uint64_t overlap = (kWord + 2 * down - up) % kWord;
    return (overlap + down - half % down) % kWord % down;
}

} // namespace

TEST_F(ResamplerFloat, TheLayoutWrapsWhenUpIsMoreThanTwiceDown)
{
    // 2 * 40 - 441 is 4294966935, 15 modulo 40; the lag is 40 - 4410 % 40 = 30.
    EXPECT_EQ(5U, dsp::filter_layout(441, 40).leading);
    // 2 * 7 - 100 is 4294967210, 2 modulo 7 (without the wrap it would be 5); the lag is 1.
    EXPECT_EQ(3U, dsp::filter_layout(100, 7).leading);
    int wrapped = 0;
    for (uint32_t up = 1; up < 200; ++up) {
        for (uint32_t down = 1; down < 200; ++down) {
            const auto layout = dsp::filter_layout(up, down);
            ASSERT_EQ(expected_leading(up, down), layout.leading) << up << '/' << down;
            ASSERT_EQ(20 * std::max(up, down) + 1, layout.taps);
            ASSERT_EQ(0U, layout.length % up);
            // A whole phase more when the taps fill their last one.
            const uint64_t padding = layout.length - layout.leading - layout.taps;
            ASSERT_TRUE(padding >= 1 && padding <= up) << up << '/' << down;
            const int64_t unwrapped =
                ((2 * int64_t{down} - up + down - 10 * int64_t{up} % down) % down + down) % down;
            wrapped += up > 2 * down && layout.leading != static_cast<uint64_t>(unwrapped);
        }
    }
    EXPECT_GT(wrapped, 1000) << "the wrap shows for most of them";
}

// The filters tap by tap against a design in long double: once with the two steps that are kept in
// single precision rounded as they are there, once without any rounding.
TEST_F(ResamplerFloat, EveryTapIsTheWindowedSinc)
{
    for (const auto& [in, out] : kManyRates) {
        const auto r = make(in, out);
        ASSERT_TRUE(r) << in;
        if (r->owns_taps == 0) {
            continue;
        }
        const uint64_t longest = std::max(r->up, r->down);
        const auto half = static_cast<int64_t>(10 * longest);
        const auto leading = static_cast<int64_t>(expected_leading(r->up, r->down));
        const long double gain = static_cast<float>(r->up) / static_cast<float>(r->down);
        const float step = 3.1415927F / static_cast<float>(longest);
        const float window_step = 6.2831855F / static_cast<float>(2 * half);
        for (int64_t i = 0; i < static_cast<int64_t>(r->length); ++i) {
            const int64_t n = i - leading - half;
            const auto tap = static_cast<long double>(r->taps[i]);
            if (n < -half || n > half) {
                ASSERT_EQ(0.0L, tap) << in << " tap " << i;
                continue;
            }
            const int64_t from_edge = half - std::abs(n);
            const auto sinc = [&](long double x) { return n == 0 ? 1.0L : std::sin(x) / x; };
            const auto window = [&](long double angle) {
                return n == 0 ? 1.0L : 0.54L - 0.46L * std::cos(angle);
            };
            const auto distance = static_cast<long double>(std::abs(n));
            const long double close =
                sinc(distance * step) * gain * window(static_cast<float>(from_edge) * window_step);
            // sinc, its product with the gain and the tap are rounded.
            ASSERT_NEAR(0.0, static_cast<double>(tap - close),
                        static_cast<double>(std::abs(close)) * 3.2 * 0x1p-24 + 1e-15)
                << in << " tap " << i;
            constexpr long double kPi = std::numbers::pi_v<long double>;
            const long double exact =
                sinc(distance * kPi / static_cast<long double>(longest)) * gain *
                window(static_cast<long double>(from_edge) * kPi / static_cast<long double>(half));
            ASSERT_NEAR(0.0, static_cast<double>((tap - exact) / gain), 3e-7) << in << " tap " << i;
        }
    }
}

// Amplitude at a share of the cutoff, relative to that at 0 Hz.
TEST_F(ResamplerFloat, FiltersPassBelowTheLowerNyquistFrequencyOnly)
{
    for (const auto& [in, out] : kManyRates) {
        const auto r = make(in, out);
        const std::span<const float> taps(r->taps, r->length);
        const double cutoff = 0.5 / std::max(r->up, r->down);
        const auto response = [&](double share) {
            std::complex<double> sum = 0;
            for (size_t i = 0; i < taps.size(); ++i) {
                sum += double{taps[i]} * std::polar(1.0, -2 * std::numbers::pi * share * cutoff *
                                                             static_cast<double>(i));
            }
            return std::abs(sum);
        };
        const double dc = response(0);
        const double gain = r->up > r->down ? static_cast<double>(r->up) / r->down : 1.0;
        EXPECT_NEAR(1.0, dc / (r->up * gain), 0.0017) << in;
        EXPECT_NEAR(0.5, response(1) / dc, 0.001) << in;
        for (const double share : {0.25, 0.5, 0.75, 0.81}) {
            EXPECT_NEAR(1, response(share) / dc, 0.0035) << in << " at " << share;
        }
        for (const double share : {1.27, 1.5, 1.73}) {
            EXPECT_LE(20 * std::log10(response(share) / dc), -57.0) << in << " at " << share;
        }
    }
}

TEST_F(ResamplerFloat, TonesLeaveAtFullLevelAnd8000HertzAbove)
{
    const std::pair<uint32_t, double> levels[] = {
        {22050, 1.0}, {44100, 1.0},  {16000, 1.0}, {24000, 1.0}, {32000, 1.0},
        {48000, 1.0}, {8000, 1.376}, {11025, 1.0}, {96000, 1.0},
    };
    for (const auto& [rate, level] : levels) {
        const auto input = sine_stream<FloatTwin>(rate, 500, rate);
        const auto outputs = resample_whole(static_cast<float>(rate), input);
        EXPECT_NEAR(level, sine_level<FloatTwin>(outputs, 500), level * 0.003) << rate;
    }
}

TEST_F(ResamplerFloat, OutputsAreTheStatedSumsToTheBit)
{
    for (const auto& [in, out] : kManyRates) {
        const auto input = random_stream<FloatTwin>(3000, 1);
        EXPECT_TRUE(
            same_bits(expected_outputs_of(*make(in, out), input), resample_whole(in, input, out)))
            << in << ' ' << out;
    }
}

TEST_F(ResamplerFloat, CutsDoNotShowAtAll)
{
    for (const auto& [in, out] : kManyRates) {
        const auto input = random_stream<FloatTwin>(3000, 2);
        const auto whole = resample_whole(in, input, out);
        for (const size_t block : {1U, 2U, 3U, 63U, 441U, 2999U}) {
            const auto r = make(in, out);
            EXPECT_TRUE(same_bits(whole, resample_in_pieces<FloatTwin>(
                                             *r, input, [block] { return block; }, unbounded)))
                << in << ' ' << out << " in blocks of " << block;
        }
        for (const uint64_t seed : {1U, 2U, 3U, 4U}) {
            Random random(seed);
            const uint32_t largest = seed % 2 == 0 ? 300 : 7;
            const auto r = make(in, out);
            EXPECT_TRUE(same_bits(whole, resample_in_pieces<FloatTwin>(
                                             *r, input, [&] { return 1 + random.below(largest); },
                                             [&] { return random.below(largest); })))
                << in << ' ' << out << " at random";
        }
    }
}

// NaN reaches the outputs whose windows contain it, and no others.
TEST_F(ResamplerFloat, NansPassThroughWithTheirWindow)
{
    for (const float rate : {48000.0F, 44100.0F, 8000.0F}) {
        auto input = random_stream<FloatTwin>(4000, 3);
        const auto clean = resample_whole(rate, input);
        input[1000] = kNaN;
        input[1001] = kInfinity;
        const auto outputs = resample_whole(rate, input);
        const auto r = make(rate);
        ASSERT_EQ(clean.size(), outputs.size());
        for (size_t n = 0; n < outputs.size(); ++n) {
            const size_t newest = n * r->down / r->up + r->taps_per_phase - 1 - r->history_end;
            if (newest >= 1000 && newest < 1001 + r->taps_per_phase) {
                ASSERT_FALSE(std::isfinite(outputs[n])) << rate << ' ' << n;
            } else {
                ASSERT_EQ(clean[n], outputs[n]) << rate << ' ' << n;
            }
        }
    }
}

// Half a filter in whole outputs is half a window at most, so a history of one window always holds
// it.
TEST_F(ResamplerFloat, TheZerosAtTheStartFitTheHistoryAtAnyRatio)
{
    for (uint32_t up = 1; up < 130; ++up) {
        for (uint32_t down = 1; down < 130; ++down) {
            const auto r = make(static_cast<float>(down), static_cast<float>(up));
            ASSERT_TRUE(r) << up << '/' << down;
            const double half = (r->length - 1) / 2.0 + 0.5;
            const uint32_t outputs = static_cast<uint32_t>(half) / r->down;
            if (r->length != 0) {
                ASSERT_EQ(KZDSP_ComputeRawLength(r.get(), outputs), r->history_end);
                ASSERT_LE(r->history_end, r->taps_per_phase / 2 + 1) << up << '/' << down;
            }
        }
    }
}

// Any two rates, in any blocks: nothing is read or written beyond its array (the sanitizers look
// on), and every output is the stated sum.
TEST_F(ResamplerFloat, RandomRatesAreSafeAndExact)
{
    Random random(5);
    int resampled = 0;
    for (int round = 0; round < 400; ++round) {
        const auto rate = [&random] {
            const double any = 1 + random.below(1U << (4 + random.below(16)));
            return static_cast<float>(random.below(3) == 0 ? any + random.unit() : any);
        };
        const float in = rate();
        const float out =
            random.below(4) == 0 ? in * static_cast<float>(1 + random.unit() / 99) : rate();
        const double quotient = out / in;
        int32_t up = 0, down = 0;
        KZDSP_Rationalize(quotient, &up, &down, quotient * 1e-6);
        if (std::max(up, down) > 20000) {
            continue; // safe too, but slow
        }
        const auto r = make(in, out);
        ASSERT_TRUE(r) << in << ' ' << out;
        const uint64_t cost = uint64_t{r->taps_per_phase} * r->up / r->down;
        const auto count = static_cast<size_t>(
            std::min<uint64_t>(r->taps_per_phase * 4 + 10, 200000 / (cost + 1) + 30));
        const auto input = random_stream<FloatTwin>(count, random.next64());
        const auto expected = expected_outputs_of(*r, input);
        const uint32_t largest = 1 + random.below(static_cast<uint32_t>(count));
        const auto outputs = resample_in_pieces<FloatTwin>(
            *r, input, [&] { return random.below(largest + 1) + random.below(2); },
            [&] { return random.below(300) + 1; });
        ASSERT_TRUE(same_bits(expected, outputs)) << in << ' ' << out;
        ++resampled;
    }
    EXPECT_GT(resampled, 200);
}

TEST_F(ResamplerFloat, FailedAllocationsMakeNoResampler)
{
    for (const float rate : {33075.0F, 22050.0F, 5512.5F}) { // by 3, by 2, up by 2
        for_every_failed_allocation([rate](auto fired) {
            const auto r = make(rate);
            EXPECT_EQ(fired(), r == nullptr);
        });
    }
}

} // namespace kz::test
