// What has no melody matches nothing: beats of one tempo, however alike, tones, hum and silence.

#include <cmath>
#include <numbers>

#include <gtest/gtest.h>

#include "musical_corpus.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using namespace kzcat::test;

constexpr double kSeconds = 40;

// A drum that dies away within a tenth of a second: a falling tone, and noise.
struct Drum {
    double hertz = 0;
    double tone = 0; // level, as a share of full scale
    double noise = 0;
};

void strike(Samples& sound, double second, const Drum& drum, uint64_t seed)
{
    kz::test::Random random(seed);
    const size_t first = samples_in(second);
    for (size_t i = 0; i < samples_in(0.1) && first + i < sound.size(); ++i) {
        const double t = static_cast<double>(i) / kWorkingRate;
        const double level = std::exp(-40 * t);
        const double tone = std::sin(2 * std::numbers::pi * drum.hertz * t * (1 - 2 * t));
        const double value = 32767 * level * (drum.tone * tone + drum.noise * random.unit());
        sound[first + i] = static_cast<int16_t>(sound[first + i] + value);
    }
}

constexpr Drum kKick{.hertz = 70, .tone = 0.4, .noise = 0.02};
constexpr Drum kSnare{.hertz = 190, .tone = 0.1, .noise = 0.25};
constexpr Drum kHat{.hertz = 4000, .tone = 0, .noise = 0.08};

// Bars of eight steps; `kicks` and `snares` have a bit for each. The drums are recordings: every
// stroke of one sounds alike.
Samples beat(double tempo, unsigned kicks, unsigned snares)
{
    Samples sound(samples_in(kSeconds));
    const double step = 30 / tempo;
    for (unsigned i = 0; i * step < kSeconds; ++i) {
        strike(sound, i * step, kHat, 3);
        if ((kicks >> i % 8 & 1U) != 0) {
            strike(sound, i * step, kKick, 1);
        }
        if ((snares >> i % 8 & 1U) != 0) {
            strike(sound, i * step, kSnare, 2);
        }
    }
    return sound;
}

Samples tone(double hertz, double level = 0.5)
{
    return kz::test::sine(kWorkingRate, hertz, kSeconds, level);
}

Samples hum()
{
    Samples sound = tone(50, 0.3);
    const Samples third = tone(150, 0.1);
    for (size_t i = 0; i < sound.size(); ++i) {
        sound[i] = static_cast<int16_t>(sound[i] + third[i]);
    }
    return sound;
}

// Tracks of nothing but such sounds, beside the music.
const MusicalCorpus& sounds()
{
    static const MusicalCorpus made = [] {
        MusicalCorpus corpus = pieces();
        for (const double tempo : {90.0, 120.0, 140.0}) {
            corpus.add(trail_of(beat(tempo, 0b00010001, 0b01000100)));
            corpus.add(trail_of(beat(tempo, 0b11111111, 0)));
        }
        for (const Samples& sound : {tone(440), tone(1000), hum(), Samples(samples_in(kSeconds)),
                                     Samples(samples_in(kSeconds), 300)}) {
            corpus.add(trail_of(sound));
        }
        return corpus;
    }();
    return made;
}

MatchAnswer look_up(const Samples& sound, double begin)
{
    ScanSearcher searcher(sounds().corpus());
    return recognise(query_of(part_of(sound, begin, 14.3)), searcher, {});
}

TEST(Rhythm, OfOneTempoMatchesNoOther)
{
    for (const double tempo : {90.0, 120.0, 140.0}) {
        const auto other = look_up(beat(tempo, 0b01010001, 0b01000100), 7.77);
        EXPECT_TRUE(other.matches.empty()) << tempo << ": " << other.candidates[0].score;
        const auto sparse = look_up(beat(tempo, 0b00000001, 0b00010000), 3.21);
        EXPECT_TRUE(sparse.matches.empty()) << tempo << ": " << sparse.candidates[0].score;
    }
}

// A track of 20 seconds has few other places that it could be compared with.
TEST(Rhythm, OfAShortTrackMatchesNoOther)
{
    MusicalCorpus corpus = pieces();
    for (const double tempo : {90.0, 120.0, 140.0}) {
        corpus.add(trail_of(part_of(beat(tempo, 0b00010001, 0b01000100), 3, 20)));
    }
    ScanSearcher searcher(corpus.corpus());
    for (const double tempo : {90.0, 120.0, 140.0}) {
        const Samples other = part_of(beat(tempo, 0b01010001, 0b01000100), 7.77, 14.3);
        const auto answer = recognise(query_of(other), searcher, {});
        EXPECT_TRUE(answer.matches.empty()) << tempo << ": " << answer.candidates[0].score;
    }
}

TEST(Rhythm, OfAMetronomeMatchesNothing)
{
    for (const double tempo : {60.0, 120.0}) {
        const auto answer = look_up(beat(tempo, 0, 0), 5.55);
        EXPECT_TRUE(answer.matches.empty()) << tempo << ": " << answer.candidates[0].score;
    }
}

TEST(Tones, MatchNothing)
{
    for (const Samples& sound : {tone(440), tone(1000), tone(443), hum()}) {
        const auto answer = look_up(sound, 8.8);
        EXPECT_TRUE(answer.matches.empty()) << answer.candidates[0].score;
    }
}

TEST(Silence, MatchesNothing)
{
    for (const int level : {0, 1, 300, -20000}) {
        EXPECT_EQ(Verdict::too_quiet,
                  look_up(Samples(samples_in(kSeconds), static_cast<int16_t>(level)), 5).verdict);
    }
}

TEST(Noise, MatchesNothing)
{
    for (const double level : {0.00003, 0.001, 0.3}) {
        const Samples sound = kz::test::noise(samples_in(kSeconds), level, 77);
        EXPECT_TRUE(look_up(sound, 5).matches.empty()) << level;
    }
}

TEST(Music, IsFoundAmongRhythms)
{
    const auto answer = look_up(piece(5), 20);
    ASSERT_EQ(Verdict::match, answer.verdict);
    EXPECT_EQ(6, answer.matches[0].track);
}

} // namespace
