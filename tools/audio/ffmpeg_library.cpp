#include "audio/ffmpeg_library.hpp"

#include <cstddef>
#include <string>

namespace audio {

namespace {

constexpr size_t kLargestBlock = size_t{256} << 20; ///< bytes that a file can make FFmpeg allocate

} // namespace

/// FFmpeg's own lines name no file, and would stand between the program's; what matters of them
/// comes back as errors.
Ffmpeg::Ffmpeg()
{
    av_log_set_level(AV_LOG_QUIET);
    av_max_alloc(kLargestBlock);
    avformat_network_init();
}

const Ffmpeg& ffmpeg()
try {
    static const Ffmpeg library;
    return library;
} catch (const LibraryError& error) {
    throw LibraryError("FFmpeg's libraries cannot be opened (" + std::string(error.what()) +
                       "); install them (Debian: libavformat" +
                       std::to_string(LIBAVFORMAT_VERSION_MAJOR) + ")");
}

} // namespace audio
