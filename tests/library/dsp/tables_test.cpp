/// Every word of the generated tables, pinned. The tables must not depend on the machine that
/// builds them; the laws that they obey are tested where they are used.

#include "kzsdk/kernels/tables.hpp"

#include <bit>
#include <cmath>
#include <numbers>
#include <span>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/dsp/filter_design.hpp"
#include "kzsdk/dsp/resampler.h"
#include "kzsdk/kernels/butterfly.hpp"
#include "whole/golden/table_digests.hpp"

namespace kz::test {

namespace {

// FNV-1a over the words, low byte first.
template <class Word>
uint64_t digest(std::span<const Word> words, uint64_t hash = 0xcbf29ce484222325u)
{
    for (const Word word : words) {
        for (size_t byte = 0; byte < sizeof(Word); ++byte) {
            hash ^= (static_cast<uint64_t>(word) >> (8 * byte)) & 0xff;
            hash *= 0x100000001b3u;
        }
    }
    return hash;
}

uint64_t digest_of_floats(std::span<const float> values)
{
    std::vector<uint32_t> bits;
    for (const float value : values) {
        bits.push_back(std::bit_cast<uint32_t>(value));
    }
    return digest(std::span<const uint32_t>(bits));
}

struct Filter {
    const int16_t* (*msb)() noexcept;
    const uint16_t* (*lsb)() noexcept;
    uint32_t (*length)() noexcept;

    uint64_t digest_of_halves() const
    {
        return digest(std::span(lsb(), length()), digest(std::span(msb(), length())));
    }
};

} // namespace

TEST(Tables, TransformFactorsAreTheKnownWords)
{
    const auto& c = kernels::kDctCoefficients;
    EXPECT_EQ(0, c[0]);
    EXPECT_EQ(1518500224, c[1]);
    EXPECT_EQ(581104896, c[2]);
    EXPECT_EQ(-1402911360, c[3]);
    EXPECT_EQ(273694432, c[4]);
    EXPECT_EQ(131072, c[8192]);
    EXPECT_EQ(65536, c[16384]);
    EXPECT_EQ(kTransformDigest, digest(std::span<const int32_t>(c)));
}

TEST(Tables, TransformFactorsFollowTheirFormula)
{
    for (uint32_t h = 1; h < 32768; h *= 2) {
        for (uint32_t j = 0; j < h; ++j) {
            const double exact =
                0x1p30 / (h * std::cos((4.0 * j + 1) * std::numbers::pi / (4.0 * h)));
            // Rounded to single precision, then truncated.
            EXPECT_NEAR(exact, kernels::kDctCoefficients[h + j], std::abs(exact) * 0x1p-24 + 1);
            EXPECT_EQ(j<(h + 1) / 2, kernels::kDctCoefficients[h + j]> 0) << h << ' ' << j;
        }
    }
}

TEST(Tables, FilterTapsAreTheKnownWords)
{
    const std::pair<Filter, uint64_t> filters[] = {
        {{kzdsp_get_8000_11025_fixed_coeff_msb, kzdsp_get_8000_11025_fixed_coeff_lsb,
          kzdsp_get_8000_11025_fixed_coeff_length},
         kDigest8000},
        {{kzdsp_get_16000_11025_fixed_coeff_msb, kzdsp_get_16000_11025_fixed_coeff_lsb,
          kzdsp_get_16000_11025_fixed_coeff_length},
         kDigest16000},
        {{kzdsp_get_22050_11025_fixed_coeff_msb, kzdsp_get_22050_11025_fixed_coeff_lsb,
          kzdsp_get_22050_11025_fixed_coeff_length},
         kDigest22050},
        {{kzdsp_get_24000_11025_fixed_coeff_msb, kzdsp_get_24000_11025_fixed_coeff_lsb,
          kzdsp_get_24000_11025_fixed_coeff_length},
         kDigest24000},
        {{kzdsp_get_32000_11025_fixed_coeff_msb, kzdsp_get_32000_11025_fixed_coeff_lsb,
          kzdsp_get_32000_11025_fixed_coeff_length},
         kDigest32000},
        {{kzdsp_get_44100_11025_fixed_coeff_msb, kzdsp_get_44100_11025_fixed_coeff_lsb,
          kzdsp_get_44100_11025_fixed_coeff_length},
         kDigest44100},
        {{kzdsp_get_48000_11025_fixed_coeff_msb, kzdsp_get_48000_11025_fixed_coeff_lsb,
          kzdsp_get_48000_11025_fixed_coeff_length},
         kDigest48000},
    };
    for (const auto& [filter, expected] : filters) {
        EXPECT_EQ(expected, filter.digest_of_halves())
            << std::hex << "0x" << filter.digest_of_halves() << " over " << std::dec
            << filter.length() << " taps";
    }
}

// The tables replace what would otherwise be computed when a resampler or a transform is created.
TEST(Tables, DesignedFiltersMatchTheDesignToTheBit)
{
    for (const kernels::DesignedFilter& filter : kernels::designed_filters) {
        const auto layout = dsp::filter_layout(filter.up, filter.down);
        ASSERT_EQ(layout.length, uint64_t{filter.up} * filter.taps_per_phase);
        std::vector<float> taps(static_cast<size_t>(layout.length));
        dsp::design_windowed_sinc(layout, taps);
        for (size_t i = 0; i < taps.size(); ++i) {
            const size_t at = i % filter.up * filter.taps_per_phase + i / filter.up;
            ASSERT_EQ(std::bit_cast<uint32_t>(taps[i]), std::bit_cast<uint32_t>(filter.taps[at]))
                << "tap " << i << " of " << filter.up << '/' << filter.down;
        }
    }
}

TEST(Tables, FloatTransformFactorsMatchTheFormulaToTheBit)
{
    std::vector<float> factors(std::size(kernels::kDctFactors));
    kernels::fill_butterfly_factors(factors);
    EXPECT_EQ(digest_of_floats(factors), digest_of_floats(kernels::kDctFactors));
}

TEST(Tables, DecimatorTapsAreTheKnownFloats)
{
    EXPECT_EQ(kDigest2to1, digest_of_floats(kernels::coefficients_2to1));
    EXPECT_EQ(kDigest4to1, digest_of_floats(kernels::coefficients_4to1));
}

} // namespace kz::test
