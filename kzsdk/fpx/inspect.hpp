/// @file
/// What the command-line program asks of a fingerprint in the making beyond the public interface.
#pragma once

#include <cstdint>

#include "kzsdk/fpx/fpx.h"

namespace kz::fpx {

/// Frames of input that the feed loop's next step takes when it is offered plenty. Feeding exactly
/// this many with each call gives the same document, to the bit, as feeding everything in one call:
/// the way to stream a file. Never 0. Less than 150000 for rates up to 48000 Hz, about 3 s of audio
/// in general.
uint32_t next_block_frames(const kz_fpx_handle& handle) noexcept;

/// Samples at the working rate (11025 Hz) dropped as leading silence so far.
uint32_t signal_offset(const kz_fpx_handle& handle) noexcept;

/// Whether the end of leading silence was found.
bool signal_found(const kz_fpx_handle& handle) noexcept;

/// How far the fingerprint is, 0 .. 100.
uint32_t percent_progress(const kz_fpx_handle& handle) noexcept;

} // namespace kz::fpx
