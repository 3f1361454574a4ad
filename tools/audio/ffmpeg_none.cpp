// A build without FFmpeg.

#include "audio/live_ffmpeg.hpp"

namespace audio {

std::unique_ptr<LiveSource> open_pipe(Descriptor, const Patience&)
{
    throw FileError("cannot be listened to as it comes: this program was built without FFmpeg; "
                    "build it with -DKZ_FFMPEG=ON, or send samples and say so with --raw");
}

std::unique_ptr<LiveSource> open_url(const std::string&, const Patience&)
{
    throw FileError("cannot be opened: this program was built without FFmpeg; build it with "
                    "-DKZ_FFMPEG=ON, or fetch it with another program and pipe it to -");
}

} // namespace audio
