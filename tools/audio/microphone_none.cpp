// A build without PortAudio.

#include "audio/microphone.hpp"

namespace audio {

std::unique_ptr<LiveSource> open_microphone(const std::string&)
{
    throw FileError(
        "cannot be listened to: this program was built without PortAudio; build it with "
        "-DKZ_PORTAUDIO=ON, or record with another program and pipe the sound to -");
}

} // namespace audio
