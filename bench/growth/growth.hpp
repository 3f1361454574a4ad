/// @file
/// How the cost grows: a table for each quantity that can grow, with the law that it must obey.
#pragma once

#include <array>
#include <cstdio>
#include <optional>
#include <string>
#include <vector>

#include "case.hpp"
#include "library.hpp"
#include "measure/cpu_clock.hpp"
#include "measure/spread.hpp"
#include "support/melody.hpp"

namespace kz::bench {

struct GrowthTable {
    std::string law;
    std::vector<std::string> columns;
    std::vector<std::vector<std::string>> rows;
    std::optional<bool> holds; ///< none where it could not be judged
};

struct Growth {
    std::string name;
    /// `thorough` selects sizes that take minutes.
    GrowthTable (*measure)(bool thorough);
};

/// Every table, in order.
std::vector<Growth> all_growths();

GrowthTable grow_duration(bool thorough);
GrowthTable grow_silence(bool thorough);
GrowthTable grow_windows(bool thorough);
GrowthTable grow_frames(bool thorough);
GrowthTable grow_block(bool thorough);
GrowthTable grow_threads(bool thorough);
GrowthTable grow_memory(bool thorough);
GrowthTable grow_document(bool thorough);

// ---- what the tables share

/// The input that most of them feed: 44100 Hz stereo, 16 bits.
inline constexpr uint32_t kRate = 44100;
inline constexpr uint32_t kFrameBytes = 4;
inline constexpr Job kStereo{fixed, pcm16, kRate, stereo};

inline std::vector<int16_t> stereo_sound() { return kz::test::melody(kRate, 2, kOffered); }

inline size_t bytes_of(const std::vector<int16_t>& sound) { return sound.size() * sizeof(int16_t); }

/// "12.3 ms": a time with three digits and a fitting unit.
std::string in_time(double seconds);

/// A number with this many decimals.
std::string number(double value, int decimals = 0);

} // namespace kz::bench
