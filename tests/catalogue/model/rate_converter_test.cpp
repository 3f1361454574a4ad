// Sound of any rate at the working rate: its level, its place in time and what is above half of it.

#include <algorithm>
#include <cmath>
#include <numbers>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/model/library_hold.hpp"
#include "catalogue/model/profile.hpp"
#include "catalogue/model/rate_converter.hpp"
#include "support/allocation.hpp"

namespace {

using kzcat::RateConverter;

constexpr uint32_t kRates[] = {6000,  8000,  11000,  11025,  12000,  16000,  22050,
                               24000, 32000, 37800,  44056,  44100,  48000,  64000,
                               88200, 96000, 100001, 176400, 192000, 384000, 705600};

double sine_at(double hertz, double seconds)
{
    return 10000 * std::sin(2 * std::numbers::pi * hertz * seconds);
}

// Half a second of a sine.
std::vector<float> converted(uint32_t rate, double hertz, double gain)
{
    std::vector<float> samples(rate / 2);
    for (size_t i = 0; i < samples.size(); ++i) {
        samples[i] = static_cast<float>(sine_at(hertz, static_cast<double>(i) / rate));
    }
    std::vector<float> output;
    RateConverter(rate, gain).convert(samples, output);
    return output;
}

// The library's filters put an output up to two samples of their input beside its place.
double furthest_off(uint32_t rate)
{
    const bool designed = rate == 6000 || rate == 11000 || rate == 11025 || rate == 12000 ||
                          rate == 37800 || rate == 44056;
    return designed ? 0.01 / rate : 2.0 / std::min(rate, 8000U);
}

class RateConverting : public kz::test::MemoryOn {};

TEST_F(RateConverting, KeepsLevelAndPlace)
{
    const kzcat::LibraryHold library;
    constexpr double kHertz = 441;
    for (const uint32_t rate : kRates) {
        const auto output = converted(rate, kHertz, 0.5);
        ASSERT_GT(output.size(), 5000U) << rate;
        const double slope = 5000 * 2 * std::numbers::pi * kHertz;
        const double tolerance = slope * furthest_off(rate) + 40; // and the filter's ripple
        for (size_t n = 1000; n < 5000; ++n) {
            const double expected =
                sine_at(kHertz, static_cast<double>(n) / kzcat::kWorkingRate) / 2;
            ASSERT_NEAR(expected, static_cast<double>(output[n]), tolerance)
                << rate << " Hz, sample " << n;
        }
        const auto [low, high] = std::minmax_element(output.begin() + 1000, output.begin() + 5000);
        EXPECT_NEAR(5000, static_cast<double>(*high), 50) << rate;
        EXPECT_NEAR(-5000, static_cast<double>(*low), 50) << rate;
    }
}

TEST_F(RateConverting, RemovesWhatIsTooHigh)
{
    const kzcat::LibraryHold library;
    for (const uint32_t rate : kRates) {
        for (const double hertz : {7500.0, 9000.0, 20000.0}) {
            if (hertz < rate / 2.0) {
                const auto output = converted(rate, hertz, 1);
                const auto loudest = std::max_element(output.begin() + 1000, output.end());
                EXPECT_LT(*loudest, 100) << hertz << " Hz at " << rate << " Hz";
            }
        }
    }
}

TEST_F(RateConverting, HasNothingToSayOfNothing)
{
    const kzcat::LibraryHold library;
    for (const uint32_t rate : kRates) {
        std::vector<float> output;
        RateConverter(rate, 1).convert({}, output);
        EXPECT_TRUE(output.empty()) << rate;
    }
}

} // namespace
