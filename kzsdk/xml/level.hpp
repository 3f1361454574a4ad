/// @file
/// Depth of a tag in a rendered tree.
#pragma once

#include <cstdint>

namespace kz::xml {

/// A signed 16-bit count: one deeper than 32767 is -32768, and back.
using Level = int16_t;

constexpr Level deeper(Level level) noexcept { return static_cast<Level>(level + 1); }

constexpr Level shallower(Level level) noexcept { return static_cast<Level>(level - 1); }

} // namespace kz::xml
