// How errors in a file are worded.

#include "audio/source.hpp"

#include <cstdio>
#include <cstring>

namespace audio {

FileError system_error(const std::string& what, int error)
{
    return FileError(what + " (" + std::strerror(error) + ")");
}

FileError start_beyond_end(double end, double start)
{
    char text[96];
    std::snprintf(text, sizeof text, "ends at %.1f s, before the start at %.1f s", end, start);
    return FileError(text);
}

} // namespace audio
