/// @file
/// Small pieces of music for tests of the commands for catalogues, and what those commands print.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <nlohmann/json.hpp>

namespace kz::test {

/// Hertz of all pieces.
constexpr uint32_t kPieceRate = 16000;

/// A piece of music of its own for each seed: mono samples.
std::vector<int16_t> piece(uint64_t seed, double seconds = 30);

/// Part of a piece, in seconds.
std::vector<int16_t> part(const std::vector<int16_t>& samples, double from, double seconds);

/// The bytes of the WAV file of a piece.
std::string wav(const std::vector<int16_t>& samples);

/// The bytes of the trail file of a piece.
std::string trail_file(const std::vector<int16_t>& samples);

bool contains(const std::string& text, const std::string& part);

/// The objects of JSON Lines.
std::vector<nlohmann::json> lines_of(const std::string& text);

} // namespace kz::test
