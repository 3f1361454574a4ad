/// @file
/// What a fingerprint is made with, by name: create(fixed, pcm16, 44100, stereo).
#pragma once

#include <cstdint>

#include "kzsdk/fpx/fpx.h"

namespace kz::test {

enum class Algorithm : uint32_t {
    fixed = KZ_FPX_ALGORITHM_FIXED,
    floating = KZ_FPX_ALGORITHM_FLOAT,
};

enum class Format : uint32_t {
    pcm8 = KZ_FPX_FORMAT_PCM8,
    pcm16 = KZ_FPX_FORMAT_PCM16,
    alaw = KZ_FPX_FORMAT_ALAW,
    ulaw = KZ_FPX_FORMAT_ULAW,
};

enum class Channels : uint32_t {
    mono = 1,
    stereo = 2,
};

using enum Algorithm;
using enum Format;
using enum Channels;

inline constexpr Algorithm kAlgorithms[] = {fixed, floating};

constexpr uint32_t number(Algorithm algorithm) { return static_cast<uint32_t>(algorithm); }
constexpr uint32_t number(Format format) { return static_cast<uint32_t>(format); }
constexpr uint32_t number(Channels channels) { return static_cast<uint32_t>(channels); }

} // namespace kz::test
