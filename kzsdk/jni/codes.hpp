/// @file
/// The small numbers that the Android front speaks with: what its calls return, and what it
/// reports.
#pragma once

#include <cstdint>

namespace android {

/// What the calls of the front return.
enum Code : int32_t {
    kOk = 0,
    kNoMemory = -2,    ///< no memory, or no thread, for the worker or the audio
    kBadAudio = -3,    ///< no array, or a length that is not positive or exceeds the array
    kRefused = -4,     ///< the worker is not ready for a request
    kNotProduced = -5, ///< the job made no fingerprint
};

/// What a worker reports of a job.
enum Event : int32_t {
    kSucceeded = 0,
    kFailed = 1,
};

/// Bytes of the buffer that a job writes its text to. A text that fills it has no terminator.
inline constexpr uint32_t kTextSize = 600;

} // namespace android
