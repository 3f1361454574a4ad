/// @file
/// Values of members in a monitor's JSON.
#pragma once

#include <cmath>
#include <optional>
#include <string>

#include "kzfp/output/json_object.hpp"

namespace kzfp {

/// Times, scores and factors are good to a fraction of this.
inline double rounded(double number) { return std::round(number * 1e3) / 1e3; }

inline JsonObject text_or_null(const std::optional<std::string>& text)
{
    return text ? JsonObject(*text) : JsonObject(nullptr);
}

} // namespace kzfp
