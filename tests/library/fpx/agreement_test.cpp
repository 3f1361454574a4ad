/// How far the two algorithms' fingerprints of the same sound lie apart. docs/closeness.md holds
/// the table that this program prints.

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/signals.hpp"
#include "support/twins.hpp"

namespace kz::test {

namespace {

constexpr double kSeconds = 14.5; // 12 frames take 14.21 s
constexpr uint64_t kSeeds[] = {1, 2, 3};
constexpr uint32_t kRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};

using Values = std::array<int16_t, 30>;
using Sound = std::vector<int16_t>;

template <class Twin>
Values values_of(uint32_t rate, uint32_t channels, const Sound& sound)
{
    const auto object = make_fingerprinter<Twin>(pcm16, rate, Channels{channels});
    uint8_t complete = 0;
    EXPECT_EQ(KZ_OK, Twin::add_samples(object.get(), sound.data(),
                                       static_cast<uint32_t>(sound.size() * 2), &complete));
    EXPECT_EQ(1, complete);
    Values values{};
    EXPECT_EQ(60U, Twin::get_fingerprint(object->frame_manager, values.data(), 60));
    return values;
}

/// In units of a value: 32768 is full scale.
struct Distance {
    double sum = 0;
    uint32_t values = 0;
    int largest = 0;

    double mean() const { return sum / values; }

    void take(uint32_t rate, uint32_t channels, const Sound& sound)
    {
        const Values fixed = values_of<Fixed>(rate, channels, sound);
        const Values floating = values_of<Float>(rate, channels, sound);
        for (size_t i = 0; i < fixed.size(); ++i) {
            const int difference = std::abs(fixed[i] - floating[i]);
            sum += difference;
            ++values;
            largest = std::max(largest, difference);
        }
    }
};

Sound left_channel(const Sound& stereo)
{
    Sound left;
    for (size_t i = 0; i < stereo.size(); i += 2) {
        left.push_back(stereo[i]);
    }
    return left;
}

struct Row {
    Distance stereo;
    Distance mono;
    Distance noise;
};

Row measure(uint32_t rate)
{
    Row row;
    for (const uint64_t seed : kSeeds) {
        const Sound music = tune(rate, 2, kSeconds, 0.5, seed);
        row.stereo.take(rate, 2, music);
        row.mono.take(rate, 1, left_channel(music));
        const double level = 0.9 / static_cast<double>(seed * seed);
        row.noise.take(rate, 1, noise(static_cast<size_t>(kSeconds * rate), level, seed));
    }
    return row;
}

std::string cell(const Distance& distance)
{
    std::array<char, 64> text{};
    std::snprintf(text.data(), text.size(), " %.2f / %d |", distance.mean(), distance.largest);
    return text.data();
}

/// What the distances may be, about half as much again as was measured.
struct Bound {
    double mean;
    int largest;
};
constexpr Bound kMusic{8, 120};
// Noise reaches beyond 2660 Hz, where the fixed-point path does not make up for its decimator's
// loss.
constexpr Bound kNoise{30, 470};

void expect_within(const Bound& bound, const Distance& distance, uint32_t rate)
{
    EXPECT_LE(distance.mean(), bound.mean) << rate;
    EXPECT_LE(distance.largest, bound.largest) << rate;
}

class Agreement : public MemoryOn {};

} // namespace

TEST_F(Agreement, TheAlgorithmsStayCloseAtEveryRate)
{
    std::string table = "| rate | music, stereo | music, mono | noise |\n|---:|---:|---:|---:|\n";
    for (const uint32_t rate : kRates) {
        const Row row = measure(rate);
        table += "| " + std::to_string(rate) + " |" + cell(row.stereo) + cell(row.mono) +
                 cell(row.noise) + "\n";
        expect_within(kMusic, row.stereo, rate);
        expect_within(kMusic, row.mono, rate);
        expect_within(kNoise, row.noise, rate);
    }
    std::fputs(table.c_str(), stdout);
}

// The distance that says "another piece", to see the others against.
TEST_F(Agreement, OtherMusicIsFarAway)
{
    const Values one = values_of<Float>(22050, 2, tune(22050, 2, kSeconds, 0.5, 1));
    const Values other = values_of<Float>(22050, 2, tune(22050, 2, kSeconds, 0.5, 2));
    double sum = 0;
    for (size_t i = 0; i < one.size(); ++i) {
        sum += std::abs(one[i] - other[i]);
    }
    std::printf("another tune: %.0f in the mean\n", sum / 30);
    EXPECT_GT(sum / 30, 100);
}

} // namespace kz::test
