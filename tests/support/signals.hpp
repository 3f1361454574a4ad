/// @file
/// Seeded test signals; the same samples on every machine.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace kz::test {

/// A small generator with stated output (splitmix64), so that seeds mean the same everywhere.
class Random {
public:
    explicit Random(uint64_t seed) : state_(seed) {}
    uint64_t next64();
    uint32_t next() { return static_cast<uint32_t>(next64() >> 32); }
    /// Uniform in 0 .. bound - 1.
    uint32_t below(uint32_t bound)
    {
        return static_cast<uint32_t>((uint64_t{next()} * bound) >> 32);
    }
    /// Uniform in [-1, 1).
    double unit() { return static_cast<double>(next64() >> 11) * 0x1p-52 - 1.0; }

private:
    uint64_t state_;
};

/// A melody of decaying harmonic notes over a bass, the same music at every rate: interleaved
/// 16-bit samples, `channels` of them per frame, with a little difference between left and right.
/// `level` is the peak in units of full scale; above 1 it clips.
std::vector<int16_t> tune(uint32_t rate, uint32_t channels, double seconds, double level = 0.5,
                          uint64_t seed = 1);

std::vector<int16_t> sine(uint32_t rate, double hertz, double seconds, double level);

std::vector<int16_t> noise(size_t count, double level, uint64_t seed);

} // namespace kz::test
