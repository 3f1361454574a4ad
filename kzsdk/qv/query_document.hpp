/// @file
/// The query document: what a recognition service is sent.
#pragma once

#include <cstdint>

#include "kzsdk/abs/status.h"
#include "kzsdk/xml/xml.h"

namespace kz::qv {

/// Times of a fingerprint in milliseconds. They are not part of the document.
struct FingerprintTimes {
    uint32_t start;    ///< leading silence that was dropped
    uint32_t duration; ///< from the first frame's start to the last frame's end
};

/// What a document is made of.
struct FingerprintSource {
    const char* name;    ///< of the algorithm
    const char* version; ///< of the algorithm
    uint32_t size;       ///< of the fingerprint, in bytes
    const void* object;  ///< handed to `extract`

    /// Writes the fingerprint, or refuses with a status.
    kz_status (*extract)(const void* object, uint8_t* buffer, uint32_t size,
                         FingerprintTimes& times) noexcept;
};

/// Builds the document.
///
/// @param[out] out_tree  The root, which the caller disposes; untouched on failure.
/// @return 0, KZ_QV_ERROR_MEMORY, KZ_QV_ERROR_EMPTY for a fingerprint without values, or the status
///         of `extract`.
kz_status build_query_document(const FingerprintSource& source, XMLTag** out_tree) noexcept;

} // namespace kz::qv
