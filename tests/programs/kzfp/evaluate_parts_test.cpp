// What `kzfp evaluate` does to clips, and how it counts what became of them.

#include <algorithm>
#include <cmath>
#include <cstdlib>

#include <gtest/gtest.h>

#include "kzfp/evaluate/clip.hpp"
#include "kzfp/evaluate/effects.hpp"
#include "kzfp/evaluate/score.hpp"
#include "recordings.hpp"

namespace {

using namespace kz::test;
namespace ev = ::kzfp::evaluate;

TEST(EvaluateScore, HasTheIntervalOfWilson)
{
    const ev::Interval all = ev::confidence(10, 10);
    EXPECT_NEAR(0.7225, all.low, 1e-4);
    EXPECT_EQ(1, all.high);
    const ev::Interval half = ev::confidence(50, 100);
    EXPECT_NEAR(0.4038, half.low, 1e-4);
    EXPECT_NEAR(0.5962, half.high, 1e-4);
    EXPECT_NEAR(0.2775, ev::confidence(0, 10).high, 1e-4);
    EXPECT_EQ(0, ev::confidence(0, 10).low);
    EXPECT_EQ(1, ev::confidence(0, 0).high);
}

TEST(EvaluateScore, TakesQuantilesOfWhatThereIs)
{
    EXPECT_FALSE(ev::quantile({}, 0.5));
    EXPECT_EQ(3, ev::quantile({3}, 0.95));
    EXPECT_EQ(2, ev::quantile({3, 1, 2}, 0.5));
    std::vector<double> hundred;
    for (int i = 100; i > 0; --i) {
        hundred.push_back(i);
    }
    EXPECT_EQ(96, ev::quantile(hundred, 0.95)); // 95 of them are below
}

TEST(EvaluateScore, CountsTracksOfTheSameSoundNeitherWay)
{
    ev::Tally tally;
    ev::Outcome outcome;
    outcome.state = ev::Outcome::State::looked_up;
    outcome.accepted = true;
    tally.add(outcome);
    outcome.same_sound = true;
    tally.add(outcome);
    outcome.known = true;
    tally.add(outcome);
    EXPECT_EQ(1u, tally.strangers);
    EXPECT_EQ(1u, tally.false_matches);
    EXPECT_EQ(0u, tally.clips);
    EXPECT_EQ(2u, tally.same_sound);
}

ev::Clip clip_of_piece()
{
    ev::Clip clip = {.rate = kPieceRate, .channels = 1, .samples = {}};
    for (const int16_t sample : piece(1, 8)) {
        clip.samples.push_back(static_cast<float>(sample) / 32768);
    }
    return clip;
}

TEST(EvaluateEffects, AddNoiseOfTheStatedLevel)
{
    const ev::Clip clip = clip_of_piece();
    for (const auto colour : {ev::NoiseColour::white, ev::NoiseColour::pink}) {
        ev::Random random(1, "noise");
        ev::Clip noise = ev::with_noise(clip, random, colour, 20);
        for (size_t i = 0; i < noise.samples.size(); ++i) {
            noise.samples[i] -= clip.samples[i];
        }
        EXPECT_NEAR(0.1, level_of(noise) / level_of(clip), 1e-4);
    }
}

TEST(EvaluateEffects, KeepTheBandOfATelephone)
{
    const auto level_at = [](double hertz) {
        ev::Clip tone = {.rate = kPieceRate, .channels = 1, .samples = {}};
        for (size_t i = 0; i < 4 * kPieceRate; ++i) {
            const double turns = hertz * static_cast<double>(i) / kPieceRate;
            tone.samples.push_back(static_cast<float>(0.5 * std::sin(6.283185307179586 * turns)));
        }
        const ev::Pcm pcm = ev::over_telephone(tone);
        EXPECT_EQ(8000u, pcm.rate);
        double sum = 0;
        for (const int16_t sample : pcm.samples) {
            sum += double{static_cast<double>(sample)} * sample;
        }
        return std::sqrt(sum / static_cast<double>(pcm.samples.size())) / 32768;
    };
    EXPECT_NEAR(0.9 * 0.5 / std::sqrt(2), level_at(1000), 0.01);
    EXPECT_LT(level_at(100), 0.002);
    EXPECT_LT(level_at(3700), 0.002);
}

TEST(EvaluateEffects, ChangeTheLengthWithTheSpeed)
{
    const ev::Clip clip = clip_of_piece();
    const auto frames = static_cast<double>(clip.frames());
    EXPECT_NEAR(frames / 1.05, static_cast<double>(sped_up(clip, 1.05).frames()), 2);
    EXPECT_NEAR(frames / 0.95, static_cast<double>(sped_up(clip, 0.95).frames()), 2);
    EXPECT_EQ(clip.rate, sped_up(clip, 1.05).rate);
}

/// The largest sample, whatever its sign.
int peak_of_pcm(const ev::Pcm& pcm)
{
    int peak = 0;
    for (const int16_t sample : pcm.samples) {
        peak = std::max(peak, std::abs(int{sample}));
    }
    return peak;
}

TEST(EvaluateEffects, KeepALevelThatCanBeWritten)
{
    const ev::Clip clip = clip_of_piece();
    EXPECT_EQ(32767, peak_of_pcm(to_pcm(clipped(clip, 12))));
    EXPECT_NEAR(0.98 * 32767, peak_of_pcm(to_pcm_within_scale(scaled(clip, 10))), 1);
}

} // namespace
