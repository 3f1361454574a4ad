/// @file
/// From a stream of samples to a fingerprint.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "audio_source.hpp"

namespace kzfp {

constexpr uint32_t kWorkingRate = 11025; ///< hertz; what the library analyses at

/// Starts the library for as long as it lives.
class Library {
public:
    Library();
    ~Library();
    Library(const Library&) = delete;
    Library& operator=(const Library&) = delete;
};

struct Fingerprint {
    std::string document;        ///< the query document, without a line break at its end
    std::vector<int16_t> values; ///< those of the document, signed
    uint32_t signal_offset = 0;  ///< leading silence that was skipped, in samples at kWorkingRate
};

/// Reads no more of `source` than the fingerprint needs. The document is the one that a single call
/// with the whole stream would give. Throws FileError, also when there is too little sound.
Fingerprint take_fingerprint(AudioSource& source, Algorithm algorithm);

} // namespace kzfp
