/// @file
/// The library as the program uses it: its rates, and what it says went wrong.
#pragma once

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <string>

#include "audio/stream_format.hpp"
#include "kzsdk/abs/status.h"

namespace kzfp {

/// By their numbers in the extraction interface.
enum class Algorithm : uint32_t { fixed = 1, floating = 2 };

constexpr uint32_t kWorkingRate = 11025; ///< hertz; what the library analyses at

/// The rates that the fixed-point algorithm takes, hertz.
constexpr uint32_t kFixedRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};

/// Whether samples of a rate go to the library as they are.
constexpr bool takes_rate(Algorithm algorithm, uint32_t rate)
{
    return algorithm == Algorithm::floating
               ? audio::is_usual_rate(rate)
               : std::ranges::find(kFixedRates, rate) != std::end(kFixedRates);
}

/// What a status means, as the library says it, and its number.
std::string status_text(kz_status status);

/// Throws FileError for a step of the library that failed.
[[noreturn]] void fail(const std::string& step, kz_status status);

} // namespace kzfp
