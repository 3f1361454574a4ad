/// @file
/// The step that takes the finished fingerprint out of a fingerprinter.
#pragma once

#include <cstdint>

#include "kzsdk/abs/status.h"
#include "kzsdk/qv/query_document.hpp"

namespace kz::qvfixed {

/// Copies the fingerprint and computes its times.
///
/// Milliseconds are computed in 32 bits and wrap beyond 4.29 million samples at the working rate (390 s).
///
/// @param object  A kzqvfixed_fingerprinter.
/// @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer or a buffer below the fingerprint's size;
///         KZ_QV_ERROR_INCOMPLETE before the frame limit is reached, or when memory is short.
kz_status extract_fingerprint(const void* object, uint8_t* buffer, uint32_t size,
                              qv::FingerprintTimes& times) noexcept;

} // namespace kz::qvfixed
