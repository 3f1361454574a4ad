#include "support/melody.hpp"

#include <algorithm>
#include <array>

namespace kz::test {

namespace {

// An arch for each half of the turn: near a sine, with some odd harmonics. Q15 from a phase of 32
// bits.
int32_t arch_wave(uint32_t phase)
{
    const auto x = static_cast<int64_t>(phase >> 16) - 32768;
    return static_cast<int32_t>((x * (32768 - (x < 0 ? -x : x))) >> 13);
}

int16_t clipped(int64_t value)
{
    return static_cast<int16_t>(std::clamp<int64_t>(value, INT16_MIN, INT16_MAX));
}

} // namespace

std::vector<int16_t> melody(uint32_t rate, uint32_t channels, double seconds, int64_t gain)
{
    struct Voice {
        uint32_t phase = 0;
        uint32_t step = 0;
        int64_t level = 0;
    };
    constexpr uint32_t kHertz[] = {55, 82, 110, 165, 220, 247, 330, 370, 440, 494, 659, 880, 1320};
    std::array<Voice, 3> voices;
    Congruential random(7);
    std::vector<int16_t> sound(static_cast<size_t>(rate * seconds) * channels);
    for (size_t frame = 0; frame < sound.size() / channels; ++frame) {
        if (frame % (rate / 5) == 0) {
            Voice& voice = voices[frame / (rate / 5) % voices.size()];
            const uint64_t hertz = kHertz[random.below(13)];
            voice.step = static_cast<uint32_t>((hertz << 32) / rate);
            voice.level = 1 << 24;
        }
        int64_t sum = 0;
        for (Voice& voice : voices) {
            voice.phase += voice.step;
            voice.level -= voice.level / (rate / 4);
            sum += (arch_wave(voice.phase) * voice.level) >> 26;
        }
        for (uint32_t channel = 0; channel < channels; ++channel) {
            const int64_t side = channel == 0 ? 256 : 224;
            sound[frame * channels + channel] = clipped((sum * gain * side) >> 16);
        }
    }
    return sound;
}

} // namespace kz::test
