// No exception passes through FFmpeg's code.

#include "audio/ffmpeg_input.hpp"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <new>
#include <utility>

#include <sys/stat.h>
#include <unistd.h>

#include "audio/source.hpp"

namespace audio {

namespace {

constexpr size_t kBuffer = 32768;

int read_input(void* input, uint8_t* bytes, int count) noexcept
{
    return static_cast<FfmpegInput*>(input)->read({bytes, static_cast<size_t>(count)});
}

int64_t seek_input(void* input, int64_t offset, int whence) noexcept
{
    return static_cast<FfmpegInput*>(input)->seek(offset, whence);
}

} // namespace

std::string ffmpeg_error_text(int error)
{
    char text[AV_ERROR_MAX_STRING_SIZE] = {};
    ffmpeg().av_strerror(error, text, sizeof text);
    return text;
}

int FfmpegFileInput::read(std::span<uint8_t> bytes)
{
    for (;;) {
        const ssize_t count = ::pread(file_, bytes.data(), bytes.size(), at_);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count <= 0) {
            return count < 0 ? AVERROR(errno) : AVERROR_EOF;
        }
        at_ += count;
        return static_cast<int>(count);
    }
}

int64_t FfmpegFileInput::seek(int64_t offset, int whence)
{
    struct stat facts = {};
    if (::fstat(file_, &facts) != 0) {
        return AVERROR(errno);
    }
    int64_t base = 0;
    switch (whence & ~AVSEEK_FORCE) {
    case AVSEEK_SIZE:
        return facts.st_size;
    case SEEK_CUR:
        base = at_;
        break;
    case SEEK_END:
        base = facts.st_size;
        break;
    default:
        break;
    }
    int64_t target = 0;
    if (__builtin_add_overflow(base, offset, &target) || target < 0) {
        return AVERROR(EINVAL);
    }
    at_ = target;
    return at_;
}

FfmpegPipeInput::FfmpegPipeInput(Descriptor pipe, const Patience& patience)
    : pipe_(std::move(pipe)), patience_(patience)
{
}

int FfmpegPipeInput::read(std::span<uint8_t> bytes)
{
    try {
        const size_t count = read_some(pipe_.number(), std::as_writable_bytes(bytes), patience_);
        return count > 0 ? static_cast<int>(count) : AVERROR_EOF;
    } catch (const FileError& error) {
        trouble_ = error.what();
        return AVERROR_EXIT;
    } catch (const std::bad_alloc&) {
        return AVERROR(ENOMEM);
    }
}

IoContext make_io(FfmpegInput& input)
{
    auto* const buffer = static_cast<uint8_t*>(ffmpeg().av_malloc(kBuffer));
    AVIOContext* const io =
        buffer == nullptr
            ? nullptr
            : ffmpeg().avio_alloc_context(buffer, kBuffer, 0, &input, read_input, nullptr,
                                          input.can_seek() ? seek_input : nullptr);
    if (io == nullptr) {
        ffmpeg().av_free(buffer);
        throw std::bad_alloc();
    }
    return IoContext(io);
}

} // namespace audio
