/// @file
/// Live sound that has a format of its own, through FFmpeg's libraries where they were found.
#pragma once

#include <memory>
#include <string>

#include "audio/descriptor.hpp"
#include "audio/live.hpp"

namespace audio {

/// Opens a pipe through which a sound file comes. Throws FileError.
std::unique_ptr<LiveSource> open_pipe(Descriptor pipe, const Patience& patience);

/// Opens a URL that FFmpeg opens. Throws FileError.
std::unique_ptr<LiveSource> open_url(const std::string& url, const Patience& patience);

} // namespace audio
