// Resampling: to the word, however the stream is cut, and against the plain formula in double.
#include "whole/model/resampler.hpp"

#include <cmath>
#include <memory>
#include <numbers>

#include <gtest/gtest.h>

#include "support/allocation.hpp"
#include "whole/model/ideal.hpp"
#include "whole/model/library_taps.hpp"
#include "whole/model/material.hpp"

using namespace kz::model;

namespace {

struct Destroy {
    void operator()(KZDSP_resampler_fixed* resampler) const
    {
        KZDSP_resampler_fixed_destroy(resampler);
    }
};
using LibraryResampler = std::unique_ptr<KZDSP_resampler_fixed, Destroy>;

LibraryResampler library_resampler(const Ratio& ratio)
{
    const uint32_t target = ratio.hertz == 2 ? 1 : 11025;
    return LibraryResampler(KZDSP_resampler_fixed_create(ratio.hertz * 32768, target * 32768));
}

std::vector<Ratio> all_ratios()
{
    std::vector<Ratio> ratios(std::begin(kRatios), std::end(kRatios));
    ratios.push_back(kHalf);
    return ratios;
}

/// Offers blocks and rooms of sizes drawn from `draw` until the stream is used up; both sides must
/// take and give the same in every call.
template <class Draw>
void compare_call_by_call(const Ratio& ratio, const Material& material, Draw draw)
{
    Resampler model(ratio, library_taps(ratio));
    const LibraryResampler library = library_resampler(ratio);
    ASSERT_NE(nullptr, library);
    size_t outputs = 0;
    for (std::span<const int32_t> rest = material.words; !rest.empty();) {
        const auto block = rest.first(std::min(rest.size(), draw(true)));
        const size_t room = draw(false);
        std::vector<int32_t> expected(room, 0x5a5a5a5a);
        std::vector<int32_t> actual(room, 0x5a5a5a5a);
        const auto [consumed, produced] = model.resample(block, expected);
        uint32_t took = 0;
        uint32_t gave = 0;
        KZDSP_resampler_fixed_resample(library.get(), block.data(),
                                       static_cast<uint32_t>(block.size()), actual.data(),
                                       static_cast<uint32_t>(room), &took, &gave);
        ASSERT_EQ(consumed, took) << ratio.hertz << " Hz, " << material.name << " at " << outputs;
        ASSERT_EQ(produced, gave) << ratio.hertz << " Hz, " << material.name << " at " << outputs;
        ASSERT_EQ(expected, actual) << ratio.hertz << " Hz, " << material.name << " at " << outputs;
        outputs += produced;
        rest = rest.subspan(consumed);
    }
}

struct Tone {
    double level;    ///< of the tone itself, by least squares
    double decibels; ///< by which everything else lies below it
};

Tone tone_in(std::span<const int32_t> signal, double hertz)
{
    double ss = 0;
    double cc = 0;
    double sc = 0;
    double ys = 0;
    double yc = 0;
    double all = 0;
    for (size_t i = 0; i < signal.size(); ++i) {
        const double angle = 2 * std::numbers::pi * hertz * static_cast<double>(i) / 11025;
        const double s = std::sin(angle);
        const double c = std::cos(angle);
        ss += s * s;
        cc += c * c;
        sc += s * c;
        ys += signal[i] * s;
        yc += signal[i] * c;
        all += double{1} * signal[i] * signal[i];
    }
    const double determinant = ss * cc - sc * sc;
    const double a = (ys * cc - yc * sc) / determinant;
    const double b = (yc * ss - ys * sc) / determinant;
    const double tone = a * ys + b * yc;
    return {std::hypot(a, b), 10 * std::log10(tone / (all - tone))};
}

} // namespace

class ModelResampler : public kz::test::MemoryOn {};

TEST_F(ModelResampler, LibraryAgreesInOneCall)
{
    for (const Ratio& ratio : all_ratios()) {
        for (const Material& material : materials(std::max(ratio.hertz, 8000u), 20000)) {
            compare_call_by_call(ratio, material, [](bool) { return size_t{30000}; });
        }
    }
}

TEST_F(ModelResampler, LibraryAgreesInTheChunksOfAStream)
{
    for (const Ratio& ratio : all_ratios()) {
        for (const Material& material : materials(std::max(ratio.hertz, 8000u), 20000)) {
            compare_call_by_call(ratio, material,
                                 [](bool input) { return size_t{input ? 4096u : 32768u}; });
        }
    }
}

TEST_F(ModelResampler, LibraryAgreesInBlocksAndRoomsOfAnySize)
{
    for (const Ratio& ratio : all_ratios()) {
        uint64_t seed = 1;
        for (const Material& material : materials(std::max(ratio.hertz, 8000u), 12000)) {
            for (const uint32_t largest : {3u, 100u, 3000u}) {
                kz::test::Random random(seed++);
                compare_call_by_call(ratio, material,
                                     [&](bool) { return size_t{random.below(largest + 1)}; });
            }
        }
    }
}

TEST_F(ModelResampler, LibraryAgreesOneSampleAndOneOutputAtATime)
{
    for (const Ratio& ratio : all_ratios()) {
        compare_call_by_call(ratio, {"random words", random_words(3000, 9)},
                             [](bool) { return size_t{1}; });
    }
}

TEST_F(ModelResampler, LibraryComputesTheSameLengths)
{
    for (const Ratio& ratio : all_ratios()) {
        const LibraryResampler library = library_resampler(ratio);
        for (uint32_t n = 0; n < 40000; n += 1 + n / 50) {
            EXPECT_EQ(raw_length(ratio, n),
                      KZDSP_resampler_fixed_compute_raw_length(library.get(), n));
        }
        EXPECT_EQ(preroll(ratio), library->history_end) << ratio.hertz;
        EXPECT_EQ(taps_per_phase(ratio), library->taps_per_phase) << ratio.hertz;
    }
}

// Inside one block every product is rounded down and lacks the product of the low halves: up to 3
// units in the last place, 1.2 on average. At half level, where two samples share a product, it is
// less.
TEST_F(ModelResampler, LibraryStaysWithinRoundingOfThePlainFormula)
{
    for (const Ratio& ratio : all_ratios()) {
        const uint32_t rate = std::max(ratio.hertz, 8000u);
        for (const std::vector<int32_t>& words :
             {as_words(kz::test::tune(rate, 1, 1.0), 14), random_words(rate, 5, 3)}) {
            const ideal::Signal expected =
                ideal::resample(ratio, ideal::Signal(words.begin(), words.end()));
            std::vector<int32_t> actual(expected.size());
            uint32_t took = 0;
            uint32_t gave = 0;
            KZDSP_resampler_fixed_resample(library_resampler(ratio).get(), words.data(),
                                           static_cast<uint32_t>(words.size()), actual.data(),
                                           static_cast<uint32_t>(actual.size()), &took, &gave);
            ASSERT_EQ(expected.size(), gave);
            double lowest = 0;
            double highest = 0;
            for (size_t i = 0; i < actual.size(); ++i) {
                lowest = std::min(lowest, actual[i] - expected[i]);
                highest = std::max(highest, actual[i] - expected[i]);
            }
            const auto taps = static_cast<double>(taps_per_phase(ratio));
            EXPECT_GE(lowest, -(ratio.up == 1 ? 0.5 : 1.5) * taps) << ratio.hertz;
            EXPECT_LE(highest, 1.0) << ratio.hertz;
        }
    }
}

// The one place where a cut may show: products across it keep the bits that products inside a block
// leave out.
TEST_F(ModelResampler, ACutMovesNoOutputByMoreThanTwoUnitsPerTap)
{
    for (const Ratio& ratio : all_ratios()) {
        const std::vector<int32_t> words = random_words(20000, ratio.hertz, 3);
        const auto in_blocks = [&](size_t block) {
            const LibraryResampler library = library_resampler(ratio);
            std::vector<int32_t> outputs(30000);
            uint32_t total = 0;
            for (size_t at = 0; at < words.size(); at += block) {
                uint32_t took = 0;
                uint32_t gave = 0;
                const size_t count = std::min(block, words.size() - at);
                KZDSP_resampler_fixed_resample(library.get(), words.data() + at,
                                               static_cast<uint32_t>(count), outputs.data() + total,
                                               static_cast<uint32_t>(outputs.size()) - total, &took,
                                               &gave);
                EXPECT_EQ(count, took);
                total += gave;
            }
            outputs.resize(total);
            return outputs;
        };
        const std::vector<int32_t> whole = in_blocks(words.size());
        for (const size_t block : {1u, 37u, 500u}) {
            const std::vector<int32_t> cut = in_blocks(block);
            ASSERT_EQ(whole.size(), cut.size()) << ratio.hertz;
            const auto bound = static_cast<int32_t>(2 * taps_per_phase(ratio));
            for (size_t i = 0; i < whole.size(); ++i) {
                ASSERT_LE(cut[i] - whole[i], bound) << ratio.hertz;
                ASSERT_GE(cut[i] - whole[i], ratio.up == 1 ? -bound : 0) << ratio.hertz;
            }
        }
    }
}

// The phase runs one step ahead of the window, so an output lies up to one input sample beside its
// ideal time, by another distance each time. What that leaves beside a tone of 1 kHz is deliberate;
// here is how much it is. Decimation has one phase only and nothing to show but its rounding.
TEST_F(ModelResampler, AToneCarriesTheResidueOfAPhaseThatRunsAhead)
{
    struct Expected {
        uint32_t hertz;
        double level;
        double decibels;
    };
    constexpr Expected kExpected[] = {
        {8000, 0.6469, 8.8},   {16000, 0.9786, 14.1}, {24000, 0.9936, 20.0}, {32000, 0.9971, 24.6},
        {48000, 0.9967, 24.1}, {11025, 1.0, 100},     {22050, 0.4997, 100},  {44100, 0.4997, 100},
    };
    for (const Expected& expected : kExpected) {
        const double full = 1 << 29;
        std::vector<int32_t> input(expected.hertz);
        for (size_t i = 0; i < input.size(); ++i) {
            const double angle =
                2 * std::numbers::pi * 1000 * static_cast<double>(i) / expected.hertz;
            input[i] = static_cast<int32_t>(std::lround(full * std::sin(angle)));
        }
        std::vector<int32_t> output(11025);
        const auto* ratio =
            std::find_if(std::begin(kRatios), std::end(kRatios),
                         [&](const Ratio& each) { return each.hertz == expected.hertz; });
        uint32_t took = 0;
        uint32_t gave = 0;
        KZDSP_resampler_fixed_resample(library_resampler(*ratio).get(), input.data(),
                                       static_cast<uint32_t>(input.size()), output.data(),
                                       static_cast<uint32_t>(output.size()), &took, &gave);
        const Tone tone = tone_in(std::span(output).subspan(200, 9000), 1000);
        EXPECT_NEAR(expected.level, tone.level / full, 0.0005) << expected.hertz;
        if (expected.decibels < 100) {
            EXPECT_NEAR(expected.decibels, tone.decibels, 0.1) << expected.hertz;
        } else {
            EXPECT_GE(tone.decibels, expected.decibels) << expected.hertz;
        }
    }
}
