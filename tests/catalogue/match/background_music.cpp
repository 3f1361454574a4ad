// Each piece has a scale, a tempo and instruments of its own: a melody that walks over the scale,
// chords of three notes, a bass, and in most pieces drums.

#include "background_music.hpp"

#include <algorithm>
#include <array>
#include <span>

#include "catalogue/match/population.hpp"
#include "catalogue/model/extractor.hpp"
#include "kzsdk/stream/stream.h"

namespace kzcat::test {
namespace {

class Random {
public:
    explicit Random(uint64_t seed) : state_(seed * 0x9E3779B97F4A7C15U + 1) {}
    uint32_t below(uint32_t limit)
    {
        state_ = state_ * 6364136223846793005U + 1442695040888963407U;
        return static_cast<uint32_t>(((state_ >> 32) * limit) >> 32);
    }

private:
    uint64_t state_;
};

enum class Shape { saw, square, triangle, noise };

// A note that dies away: its level falls by 1 / 2^decay with every 16th sample.
struct Note {
    Shape shape = Shape::saw;
    uint32_t phase = 0;
    uint32_t step = 0; // of the phase, for each sample
    int32_t level = 0;
    int decay = 8;
    int glide = 0; // the step falls by 1 / 2^glide with every 16th sample; 0: it does not

    int32_t next(uint32_t time, Random& random)
    {
        phase += step;
        if (time % 16 == 0) {
            level -= (level >> decay) + (level > 0 ? 1 : 0);
            step -= glide == 0 ? 0 : step >> glide;
        }
        return static_cast<int32_t>((static_cast<int64_t>(wave(random)) * level) >> 15);
    }

    int32_t wave(Random& random) const
    {
        const auto place = static_cast<int32_t>(phase >> 16); // 0 .. 65535
        switch (shape) {
        case Shape::saw:
            return place - 32768;
        case Shape::square:
            return place < 32768 ? -20000 : 20000;
        case Shape::triangle:
            return (place < 32768 ? 2 * place : 131070 - 2 * place) - 32767;
        case Shape::noise:
            break;
        }
        return static_cast<int32_t>(random.below(65536)) - 32768;
    }
};

// The phase's step of a note: semitones above 55 Hz.
uint32_t step_of(uint32_t semitones)
{
    constexpr std::array<uint64_t, 12> kRatios = {65536, 69433, 73562,  77936,  82570,  87480,
                                                  92682, 98193, 104032, 110218, 116772, 123715};
    constexpr uint64_t kStepOf55Hz = (uint64_t{55} << 32) / 11025;
    return static_cast<uint32_t>(((kStepOf55Hz * kRatios[semitones % 12]) >> 16)
                                 << (semitones / 12));
}

class Piece {
public:
    Piece(size_t number, Playing playing) : random_(number + 1), noise_(number + 1000)
    {
        sixteenth_ = 900 + random_.below(900) - playing.shorter;
        key_ = random_.below(12) + playing.semitones;
        minor_ = random_.below(2) == 1;
        drums_ = number % 4 != 3;
        melody_shape_ = static_cast<Shape>(number % 3);
        chord_shape_ = static_cast<Shape>((number + 1) % 3);
    }

    uint32_t sixteenth() const { return sixteenth_; }

    std::vector<int16_t> play(size_t samples)
    {
        std::vector<int16_t> sound(samples);
        for (uint32_t time = 0; time < samples; ++time) {
            if (time % sixteenth_ == 0) {
                begin_step(time / sixteenth_);
            }
            int32_t sum = 0;
            for (Note& note : notes_) {
                sum += note.next(time, noise_);
            }
            sound[time] = static_cast<int16_t>(std::clamp(sum, -32768, 32767));
        }
        return sound;
    }

private:
    // Places of the instruments among the notes.
    static constexpr size_t kMelody = 0, kBass = 1, kChord = 2, kKick = 5, kSnare = 6, kHat = 7;

    uint32_t tone(uint32_t degree) const
    {
        constexpr std::array<uint32_t, 7> kMajor = {0, 2, 4, 5, 7, 9, 11};
        constexpr std::array<uint32_t, 7> kMinor = {0, 2, 3, 5, 7, 8, 10};
        const auto& scale = minor_ ? kMinor : kMajor;
        return key_ + 12 * (degree / 7) + scale[degree % 7];
    }

    void strike(size_t place, Shape shape, uint32_t semitones, int32_t level, int decay)
    {
        notes_[place] = {.shape = shape,
                         .phase = notes_[place].phase,
                         .step = step_of(semitones),
                         .level = level,
                         .decay = decay};
    }

    void begin_step(uint32_t step)
    {
        if (step % 16 == 0) {
            root_ = random_.below(7);
            for (uint32_t i = 0; i < 3; ++i) {
                strike(kChord + i, chord_shape_, 24 + tone(root_ + 2 * i), 3500, 8);
            }
        }
        if (step % 4 == 0 || random_.below(8) == 0) {
            strike(kBass, Shape::triangle, tone(root_), 9000, 7);
        }
        if (random_.below(2) == 0) {
            walk_ = (walk_ + 20 + random_.below(5) - 2) % 20;
            strike(kMelody, melody_shape_, 36 + tone(walk_), 8000, 6 + static_cast<int>(walk_ % 2));
        }
        if (drums_) {
            beat(step);
        }
    }

    void beat(uint32_t step)
    {
        if (step % 8 == 0 || random_.below(12) == 0) {
            strike(kKick, Shape::triangle, 12, 12000, 5);
            notes_[kKick].glide = 6;
        }
        if (step % 8 == 4) {
            strike(kSnare, Shape::noise, 0, 7000, 4);
        }
        if (step % 2 == 0) {
            strike(kHat, Shape::noise, 0, 2500, 3);
        }
    }

    Random random_;
    Random noise_;           // apart, so that the notes do not depend on the tempo
    uint32_t sixteenth_ = 0; // samples
    uint32_t key_ = 0;
    bool minor_ = false;
    bool drums_ = false;
    Shape melody_shape_ = Shape::saw;
    Shape chord_shape_ = Shape::saw;
    uint32_t root_ = 0;
    uint32_t walk_ = 7;
    std::array<Note, 8> notes_{};
};

constexpr size_t kCodesOfPiece = 512;
constexpr size_t kSkipped = 4; // codes at the ends, where frames of the silence before would count

} // namespace

uint32_t sixteenth_note(size_t number) { return Piece(number, {}).sixteenth(); }

std::vector<int16_t> background_music(size_t number, size_t samples, Playing playing)
{
    return Piece(number, playing).play(samples);
}

std::vector<Code> make_background_codes()
{
    std::vector<Code> codes;
    for (size_t number = 0; number < kBackgroundPieces; ++number) {
        const auto sound =
            background_music(number, (kCodesOfPiece + 2 * kSkipped) * kCodeHop + kFrameLength);
        TrailExtractor extractor(
            {.encoding = KZ_STREAM_FORMAT_PCM16, .rate = kWorkingRate, .channels = 1});
        extractor.feed(std::as_bytes(std::span(sound)));
        const Trail trail = extractor.finish();
        const auto kept = std::span(trail.codes).subspan(kSkipped, kCodesOfPiece);
        codes.insert(codes.end(), kept.begin(), kept.end());
    }
    return codes;
}

} // namespace kzcat::test
