// A build without FFmpeg.

#include "audio/file_source.hpp"
#include "audio/live_ffmpeg.hpp"

namespace audio {

std::unique_ptr<FileSource> open_with_ffmpeg(int, const AcceptsRate&, bool)
{
    throw NotRecognised(not_recognised_text() +
                        "; a build with FFmpeg (-DKZ_FFMPEG=ON) reads M4A, MP4, WMA and more");
}

std::string ffmpeg_version() { return {}; }

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
