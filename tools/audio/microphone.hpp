/// @file
/// Microphones and other inputs of the sound card, through PortAudio where it was found.
#pragma once

#include <memory>
#include <string>

#include "audio/live.hpp"

namespace audio {

/// Listens to the first input whose name contains `name`; to the usual one when that is empty.
/// Throws FileError, which lists the inputs when there is none of that name.
std::unique_ptr<LiveSource> open_microphone(const std::string& name);

} // namespace audio
