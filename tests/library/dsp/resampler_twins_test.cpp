/// What a resampler promises in either arithmetic: each test runs over both.

#include "library/dsp/resampler_twins.hpp"

#include <algorithm>
#include <tuple>

namespace kz::test {

namespace {

template <class Twin>
class Resampler : public MemoryOn {
};

using Twins = ::testing::Types<FixedTwin, FloatTwin>;
TYPED_TEST_SUITE(Resampler, Twins);

class ResamplerTwins : public MemoryOn {};

} // namespace

TYPED_TEST(Resampler, KnowsSevenRatesWithTheirFilters)
{
    using Row = std::tuple<uint32_t, uint32_t, uint32_t, uint32_t, uint32_t>;
    const Row rows[] = {
        {48000, 147, 640, 13377, 91}, {44100, 1, 4, 84, 84}, {32000, 441, 1280, 26460, 60},
        {24000, 147, 320, 6615, 45},  {22050, 1, 2, 42, 42}, {16000, 441, 640, 13230, 30},
        {8000, 441, 320, 9261, 21},
    };
    for (const auto& [rate, up, down, length, taps] : rows) {
        const auto r = make_resampler<TypeParam>(rate);
        ASSERT_TRUE(r) << rate;
        EXPECT_EQ(up, r->up) << rate;
        EXPECT_EQ(down, r->down) << rate;
        EXPECT_EQ(length, r->length) << rate;
        EXPECT_EQ(taps, r->taps_per_phase) << rate;
    }
}

TYPED_TEST(Resampler, CopiesBetweenEqualRates)
{
    for (const uint32_t rate : {1U, kWorkingRate, 48000U, 7U}) {
        const auto r = make_resampler<TypeParam>(rate, rate);
        ASSERT_TRUE(r) << rate;
        EXPECT_EQ(1U, r->up);
        EXPECT_EQ(1U, r->down);
        EXPECT_EQ(0U, r->length);
        EXPECT_EQ(0U, r->taps_per_phase);
        EXPECT_EQ(nullptr, r->history);
        const Stream<TypeParam> input = {1, -2, 3, -4};
        Stream<TypeParam> output(3);
        EXPECT_EQ((Counts{3, 3}), run<TypeParam>(*r, input.data(), 4, output.data(), 3));
        EXPECT_EQ((Stream<TypeParam>{1, -2, 3}), output);
    }
}

TYPED_TEST(Resampler, RefusesRatesOfZero)
{
    EXPECT_FALSE(make_resampler<TypeParam>(0, kWorkingRate));
    EXPECT_FALSE(make_resampler<TypeParam>(kWorkingRate, 0));
    EXPECT_FALSE(make_resampler<TypeParam>(0, 0));
}

TYPED_TEST(Resampler, LengthsAreRoundedDownForOutputsAndUpForInputs)
{
    const auto r = make_resampler<TypeParam>(48000);
    EXPECT_EQ(147U, TypeParam::resampled_length(r.get(), 640));
    EXPECT_EQ(146U, TypeParam::resampled_length(r.get(), 639));
    EXPECT_EQ(640U, TypeParam::raw_length(r.get(), 147));
    EXPECT_EQ(5U, TypeParam::raw_length(r.get(), 1));
    EXPECT_EQ(0U, TypeParam::raw_length(r.get(), 0));
    EXPECT_EQ(0U, TypeParam::raw_length(nullptr, 5));
    EXPECT_EQ(0U, TypeParam::resampled_length(nullptr, 5));
}

// The products pass 32 bits long before the lengths do.
TYPED_TEST(Resampler, LengthsBeyondAWordSaturate)
{
    const auto down = make_resampler<TypeParam>(48000);
    EXPECT_EQ(986500300U, TypeParam::resampled_length(down.get(), 0xFFFFFFFF));
    EXPECT_EQ(0xFFFFFFFFU, TypeParam::raw_length(down.get(), 0xFFFFFFFF));
    const auto up = make_resampler<TypeParam>(8000);
    EXPECT_EQ(0xFFFFFFFFU, TypeParam::resampled_length(up.get(), 0xFFFFFFFF));
    EXPECT_EQ(3116529557U, TypeParam::raw_length(up.get(), 0xFFFFFFFF));
}

TYPED_TEST(Resampler, StartsOverHalfAFilterOfZeros)
{
    for (const auto& [rate, delay] : {std::pair{48000U, 44U},
                                      {44100U, 40U},
                                      {32000U, 30U},
                                      {24000U, 22U},
                                      {22050U, 20U},
                                      {16000U, 15U},
                                      {8000U, 11U}}) {
        const auto r = make_resampler<TypeParam>(rate);
        EXPECT_EQ(delay, r->history_end) << rate;
        EXPECT_TRUE(std::all_of(r->history, r->history + delay, [](auto x) { return x == 0; }));
    }
}

TYPED_TEST(Resampler, TooFewSamplesMakeNoOutputAndAreKept)
{
    for (const uint32_t rate : kRates) {
        const auto r = make_resampler<TypeParam>(rate);
        const uint32_t need = r->taps_per_phase - r->history_end;
        const uint32_t stored = r->history_end;
        const auto input = random_stream<TypeParam>(need, 3);
        Stream<TypeParam> output(8, 77);
        EXPECT_EQ((Counts{need - 1, 0}),
                  run<TypeParam>(*r, input.data(), need - 1, output.data(), output.size()))
            << rate;
        EXPECT_EQ(stored + need - 1, r->history_end) << rate;
        EXPECT_EQ((Stream<TypeParam>(8, 77)), output);
        EXPECT_EQ((Counts{1, 1}), run<TypeParam>(*r, input.data() + need - 1, 1, output.data(), 1))
            << rate;
    }
}

TYPED_TEST(Resampler, SilenceComesOutAsExactZeros)
{
    for (const uint32_t rate : kRates) {
        const auto outputs = resample_whole<TypeParam>(rate, Stream<TypeParam>(20000, 0));
        EXPECT_EQ(Stream<TypeParam>(outputs.size(), 0), outputs) << rate;
        EXPECT_GT(outputs.size(), 4000U);
    }
}

TYPED_TEST(Resampler, EqualRatesDoNotShowCutsAtAll)
{
    const auto input = random_stream<TypeParam>(5000, 4);
    const auto r = make_resampler<TypeParam>(kWorkingRate);
    Random random(5);
    EXPECT_EQ(input, resample_in_pieces<TypeParam>(
                         *r, input, [&] { return 1 + random.below(50); },
                         [&] { return 1 + random.below(50); }));
}

TYPED_TEST(Resampler, ResetStartsTheStreamAnew)
{
    for (const uint32_t rate : kRates) {
        const auto r = make_resampler<TypeParam>(rate);
        const auto input = random_stream<TypeParam>(2000, rate);
        Stream<TypeParam> first(3000), second(3000);
        const Counts one =
            run<TypeParam>(*r, input.data(), input.size(), first.data(), first.size());
        run<TypeParam>(*r, input.data(), 333, second.data(), 5);
        TypeParam::reset(r.get());
        EXPECT_EQ(one,
                  run<TypeParam>(*r, input.data(), input.size(), second.data(), second.size()));
        EXPECT_TRUE(std::equal(first.data(), first.data() + one.produced, second.data())) << rate;
    }
}

TYPED_TEST(Resampler, NullsDoNothing)
{
    TypeParam::destroy(nullptr);
    TypeParam::reset(nullptr);
    Stream<TypeParam> samples(100, 5);
    Counts counts{9, 9};
    TypeParam::resample(nullptr, samples.data(), 100, samples.data(), 0, &counts.consumed,
                        &counts.produced);
    EXPECT_EQ(Counts{}, counts);
    const auto r = make_resampler<TypeParam>(44100);
    TypeParam::resample(r.get(), nullptr, 100, nullptr, 100, nullptr, nullptr);
    EXPECT_EQ(40U, r->history_end);
    TypeParam::resample(r.get(), samples.data(), 10, nullptr, 100, nullptr, nullptr);
    EXPECT_EQ(50U, r->history_end);
}

TYPED_TEST(Resampler, FailedAllocationsMakeNoResampler)
{
    for (const uint32_t rate : {48000U, 44100U, 8000U, kWorkingRate}) {
        for_every_failed_allocation([rate](auto fired) {
            const auto r = make_resampler<TypeParam>(rate);
            EXPECT_EQ(fired(), r == nullptr);
        });
    }
}

TYPED_TEST(Resampler, NeverAllocatesAfterItsCreation)
{
    for (const uint32_t rate : kRates) {
        const auto r = make_resampler<TypeParam>(rate);
        const auto input = random_stream<TypeParam>(1000, 6);
        Stream<TypeParam> output(2000);
        const uint64_t before = allocation_count();
        run<TypeParam>(*r, input.data(), input.size(), output.data(), output.size());
        TypeParam::reset(r.get());
        EXPECT_EQ(before, allocation_count());
    }
}

// The phase advances before the taps are read and the window moves after, which shakes the time of
// an output by up to one input sample. What that costs, at 1 kHz:
TYPED_TEST(Resampler, PolyphaseOutputsAreUpToOneInputSampleOff)
{
    const auto residue = [](uint32_t rate) {
        const auto input = sine_stream<TypeParam>(rate, 1000, 2 * rate);
        return tone_to_residue<TypeParam>(resample_whole<TypeParam>(rate, input), 1000, 500);
    };
    EXPECT_NEAR(24, residue(48000), 1.5);
    EXPECT_NEAR(9, residue(8000), 1.5);
    EXPECT_GT(residue(44100), 90);
    EXPECT_GT(residue(22050), 90);
}

// A fingerprint's frames begin at the same input sample by either algorithm.
TEST_F(ResamplerTwins, StepTogetherThroughEveryStream)
{
    for (const uint32_t rate : {8000U, 16000U, 22050U, 24000U, 32000U, 44100U, 48000U, 11025U}) {
        const auto fixed = make_resampler<FixedTwin>(rate);
        const auto floating = make_resampler<FloatTwin>(rate);
        const Stream<FixedTwin> fixed_input(3000, 1);
        const Stream<FloatTwin> float_input(3000, 1);
        Stream<FixedTwin> fixed_output(3000);
        Stream<FloatTwin> float_output(3000);
        Random random(rate);
        for (int call = 0; call < 500; ++call) {
            const uint32_t count = random.below(random.below(8) == 0 ? 3000 : 100);
            const uint32_t capacity = random.below(random.below(2) == 0 ? 3000 : 50);
            ASSERT_EQ(
                run<FixedTwin>(*fixed, fixed_input.data(), count, fixed_output.data(), capacity),
                run<FloatTwin>(*floating, float_input.data(), count, float_output.data(), capacity))
                << rate;
            ASSERT_EQ(fixed->phase, floating->phase) << rate;
            ASSERT_EQ(fixed->history_end - fixed->history_start,
                      floating->history_end - floating->history_start)
                << rate;
        }
    }
}

} // namespace kz::test
