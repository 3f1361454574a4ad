// Logarithms without the C library, beside those with it.

#include <cmath>

#include <gtest/gtest.h>

#include "catalogue/model/band_edges.hpp"
#include "catalogue/model/hann_window.hpp"
#include "catalogue/model/logarithm.hpp"
#include "catalogue/model/series.hpp"
#include "support/signals.hpp"

namespace {

TEST(Logarithm, IsRightToFourRoundings)
{
    double largest = 0;
    for (float x = 0.5F; x < 4; x = std::nextafter(x, 8.0F) + 1e-6F) {
        largest = std::max(largest, std::fabs(kzcat::log2_of(x) - std::log2(double{x})));
    }
    EXPECT_LT(largest, 1.5e-7);
}

TEST(Logarithm, OfARatioKeepsSmallDifferences)
{
    kz::test::Random random(1);
    for (int i = 0; i < 100000; ++i) {
        const float a = std::ldexp(static_cast<float>(random.unit()) + 1.5F, 40);
        const float b = a * (1 + static_cast<float>(random.unit()) * 1e-3F);
        const double expected = std::log2(double{a} / double{b});
        ASSERT_NEAR(expected, double{kzcat::log2_ratio(a, b)}, 2.5e-7);
    }
}

TEST(Logarithm, OfPowersOfTwoIsExact)
{
    for (int power = -126; power < 128; ++power) {
        EXPECT_EQ(static_cast<float>(power), kzcat::log2_of(std::ldexp(1.0F, power)));
    }
}

TEST(Series, AgreeWithTheLibrary)
{
    for (double x = -1.5707963; x < 1.5707964; x += 1e-4) {
        EXPECT_NEAR(std::sin(x), kzcat::sine(x), 5e-16);
        EXPECT_NEAR(std::cos(x), kzcat::cosine(x), 5e-16);
    }
}

TEST(BandBins, TakeEveryBinOnce)
{
    double previous = kzcat::edge_position(kzcat::kFirstFineBand);
    for (const kzcat::BandBins& band : kzcat::kBandBins.bands) {
        const double end = previous + static_cast<double>(band.first_weight) + band.whole_count +
                           static_cast<double>(band.last_weight);
        EXPECT_LE(band.first, previous);
        EXPECT_LE(band.last, end + 1e-6);
        previous = end;
    }
    EXPECT_NEAR(kzcat::edge_position(kzcat::kFirstFineBand + int{kzcat::kFineBands}), previous,
                1e-4);
    EXPECT_NEAR(160 * 8192 / 11025.0 + 0.5, kzcat::edge_position(0), 1e-12);
    EXPECT_NEAR(160 * std::exp2(-57 / 36.0) * 8192 / 11025 + 0.5, kzcat::edge_position(-57), 1e-12);
}

} // namespace
