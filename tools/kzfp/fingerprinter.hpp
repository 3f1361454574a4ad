/// @file
/// From a stream of samples to a fingerprint.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "audio/source.hpp"
#include "kzfp/library.hpp"

namespace kzfp {

/// How much sound a fingerprint needs: "14.22 s".
std::string sound_needed();

struct Fingerprint {
    std::string document;        ///< the query document, without a line break at its end
    std::vector<int16_t> values; ///< those of the document, signed
    uint32_t signal_offset = 0;  ///< leading silence that was skipped, in samples at kWorkingRate
};

/// Reads no more of `source` than the fingerprint needs. The document is the one that a single call
/// with the whole stream would give. Throws audio::FileError, also when there is too little sound.
Fingerprint take_fingerprint(audio::Source& source, Algorithm algorithm);

} // namespace kzfp
