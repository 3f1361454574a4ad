/// @file
/// What a caller that cuts a stream into pieces needs to allocate room for them once.
#pragma once

#include <cstdint>

#include "kzsdk/fpx/fpx.h"

namespace kz::fpx {

/// No kz_fpx_fingerprint_get_next_frames() of this handle reports more. Saturates at 2^32 - 1.
uint32_t largest_piece_frames(const kz_fpx_handle& handle) noexcept;

} // namespace kz::fpx
