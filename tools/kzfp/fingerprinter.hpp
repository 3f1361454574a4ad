/// @file
/// From a stream of samples to a fingerprint.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
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

/// One of many fingerprints of a source.
struct Window {
    double time = 0;                        ///< seconds of the source at which it begins
    std::optional<Fingerprint> fingerprint; ///< none when there is silence up to the next window
};

/// Reads a source to its end and gives each window to `deliver`, in their order and as soon as it
/// is complete; one begins every `step` seconds. Windows that the end cuts off are left out. Throws
/// audio::FileError, also when there is too little sound for any.
void take_windows(audio::Source& source, Algorithm algorithm, double step,
                  const std::function<void(const Window&)>& deliver);

} // namespace kzfp
