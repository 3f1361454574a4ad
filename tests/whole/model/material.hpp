/// @file
/// What the models and the library are compared on: music, noise, extremes, silence.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string>
#include <vector>

#include "support/signals.hpp"

namespace kz::model {

struct Material {
    std::string name;
    std::vector<int32_t> words;
};

/// 16-bit samples as mono words; 14 bits up is what one full channel gives, 15 what two give.
inline std::vector<int32_t> as_words(std::span<const int16_t> samples, int shift)
{
    std::vector<int32_t> words;
    words.reserve(samples.size());
    for (const int16_t sample : samples) {
        words.push_back(sample * (1 << shift));
    }
    return words;
}

/// For an equaliser: some from 1 to 5000, and those about 256, up to which levels are bytes.
inline std::vector<uint32_t> numbers_of_levels()
{
    std::vector<uint32_t> all{254, 255, 256, 257, 258};
    for (uint32_t levels = 1; levels <= 5000; levels += 1 + levels / 5) {
        all.push_back(levels);
    }
    return all;
}

inline std::vector<int32_t> random_words(size_t count, uint64_t seed, int shift = 0)
{
    test::Random random(seed);
    std::vector<int32_t> words(count);
    for (int32_t& word : words) {
        word = static_cast<int32_t>(random.next()) >> shift;
    }
    return words;
}

/// Extremes of 32 bits and nothing else: whatever can wrap does.
inline std::vector<int32_t> edge_words(size_t count, uint64_t seed)
{
    static constexpr int32_t kEdges[] = {INT32_MIN, INT32_MAX, -1, 0, 1, -65536, 65535, -32768};
    test::Random random(seed);
    std::vector<int32_t> words(count);
    for (int32_t& word : words) {
        word = kEdges[random.below(8)];
    }
    return words;
}

/// `count` words of each kind.
inline std::vector<Material> materials(uint32_t rate, size_t count)
{
    const double seconds = static_cast<double>(count + 1) / rate;
    const auto cut = [count](std::vector<int32_t> words) {
        words.resize(count);
        return words;
    };
    return {
        {"music", cut(as_words(test::tune(rate, 1, seconds), 14))},
        {"clipped music", cut(as_words(test::tune(rate, 1, seconds, 20.0), 15))},
        {"quiet music", cut(as_words(test::tune(rate, 1, seconds, 0.0005), 14))},
        {"a sine", cut(as_words(test::sine(rate, 997, seconds, 0.9), 14))},
        {"noise", as_words(test::noise(count, 1.0, 2), 15)},
        {"random words", random_words(count, 3)},
        {"edge words", edge_words(count, 4)},
        {"silence", std::vector<int32_t>(count, 0)},
    };
}

inline std::vector<uint8_t> to_bytes(std::span<const int16_t> samples)
{
    std::vector<uint8_t> bytes(samples.size_bytes());
    std::memcpy(bytes.data(), samples.data(), bytes.size());
    return bytes;
}

} // namespace kz::model
