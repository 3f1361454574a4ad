// libsndfile comes first: it is the faster reader of what both read. But its version 1.2 takes some
// files of Opus for damaged in their middle, so these are for FFmpeg where that is there.

#include "audio/file_source.hpp"

#include <cstdio>

#include <sndfile.h>

#include "audio/sound_file.hpp"

namespace audio {

std::unique_ptr<FileSource> open_file_source(int file, const AcceptsRate& accepts_rate, bool floats)
{
    try {
        auto opened = std::make_unique<SoundFile>(file, accepts_rate, floats);
        if (!opened->is_opus() || ffmpeg_version().empty()) {
            return opened;
        }
    } catch (const NotRecognised&) {
    }
    return open_with_ffmpeg(file, accepts_rate, floats);
}

std::string not_recognised_text()
{
    return "is not a sound file that can be read (WAV, FLAC, OGG, MP3, ...); headerless audio "
           "needs --raw";
}

std::string should_last(double seconds)
{
    char text[64];
    std::snprintf(text, sizeof text, "it should last %.1f s", seconds);
    return text;
}

std::string readers()
{
    std::string text = sf_version_string();
    if (const size_t dash = text.find('-'); dash != std::string::npos) {
        text[dash] = ' ';
    }
    const std::string ffmpeg = ffmpeg_version();
    return ffmpeg.empty() ? text : text + ", " + ffmpeg;
}

} // namespace audio
