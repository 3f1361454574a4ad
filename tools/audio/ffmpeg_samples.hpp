/// @file
/// From FFmpeg's frames to a stream of interleaved samples.
#pragma once

#include <cstddef>
#include <vector>

#include "audio/ffmpeg_handles.hpp"
#include "audio/stream_format.hpp"

namespace audio {

/// The form in which the samples of a frame are passed on: floats of all channels where these are
/// wanted and the decoder makes more than 16 bits; else 16-bit PCM, in which more than two channels
/// are mixed down to one.
StreamFormat format_of(const AVFrame& frame, bool floats);

/// Puts the samples of a frame behind `samples`, in the form of format_of(). False for samples of a
/// kind that no decoder of sound makes.
bool append_samples(const AVFrame& frame, bool floats, std::vector<std::byte>& samples);

} // namespace audio
