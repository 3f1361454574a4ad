/// @file
/// What a trail is made of: rates, hops and the word that names them.
#pragma once

#include <cstddef>
#include <cstdint>

namespace kzcat {

/// One moment of a trail: bit i is the sign of the change over time of the difference in level of
/// pair i of neighbouring bands.
using Code = uint64_t;

constexpr uint32_t kWorkingRate = 11025;           ///< hertz; everything below counts its samples
constexpr uint32_t kFrameLength = 4096;            ///< samples of one transform
constexpr uint32_t kQueryHop = 512;                ///< from frame to frame of a query
constexpr uint32_t kTrailHop = 1024;               ///< from frame to frame of a trail
constexpr uint32_t kCodeHop = 2048;                ///< from code to code, in both
constexpr uint32_t kPhases = kCodeHop / kQueryHop; ///< a query is read at each of them
constexpr uint32_t kPairs = 64;                    ///< bits of a code

constexpr double kCodeSeconds = double{kCodeHop} / kWorkingRate;

/// Names the features of stored codes. Codes of different profiles are never compared.
enum class Profile : uint32_t {
    standard = 1, ///< Hann window, equalised frames, 64 pairs with low bands, a code every 0.186 s
};

} // namespace kzcat
