// The bytes go on as they are; on a big-endian machine 16-bit samples are turned round.

#include "audio/raw_samples.hpp"

#include <algorithm>
#include <array>
#include <bit>
#include <cerrno>
#include <cmath>
#include <limits>
#include <utility>

#include <unistd.h>

namespace audio {

namespace {

uint64_t to_frames(double seconds, uint32_t rate)
{
    return static_cast<uint64_t>(std::llround(seconds * rate));
}

void swap_pairs(std::span<std::byte> bytes)
{
    for (size_t i = 0; i + 1 < bytes.size(); i += 2) {
        std::swap(bytes[i], bytes[i + 1]);
    }
}

} // namespace

std::string odd_bytes_text(uint64_t odd_bytes, const StreamFormat& format)
{
    return "ends with " + std::to_string(odd_bytes) +
           (odd_bytes == 1 ? " odd byte" : " odd bytes") + ", whole frames of " +
           std::to_string(format.frame_bytes()) + " bytes are needed";
}

RawSamples::RawSamples(int file, bool seekable, const StreamFormat& format, const Section& section)
    : file_(file), format_(format),
      frames_left_(section.length ? to_frames(*section.length, format.rate)
                                  : std::numeric_limits<uint64_t>::max())
{
    const uint64_t start = to_frames(section.start, format.rate) * format.frame_bytes();
    if (!seekable) {
        skip(start);
    } else if (::lseek(file, static_cast<off_t>(start), SEEK_CUR) < 0) {
        throw system_error("cannot be read", errno);
    }
}

size_t RawSamples::read(std::span<std::byte> bytes)
{
    const size_t frame_bytes = format_.frame_bytes();
    const size_t frames = std::min<uint64_t>(bytes.size() / frame_bytes, frames_left_);
    const auto wanted = bytes.first(frames * frame_bytes);
    const size_t count = read_bytes(wanted);
    if (count % frame_bytes != 0) {
        throw FileError(odd_bytes_text(count % frame_bytes, format_));
    }
    if (format_.encoding == Encoding::s16 && std::endian::native == std::endian::big) {
        swap_pairs(wanted.first(count));
    }
    frames_left_ -= count / frame_bytes;
    return count / frame_bytes;
}

size_t RawSamples::read_bytes(std::span<std::byte> bytes)
{
    size_t done = 0;
    while (done < bytes.size()) {
        const ssize_t count = ::read(file_, bytes.data() + done, bytes.size() - done);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            throw system_error("cannot be read", errno);
        }
        if (count == 0) {
            break;
        }
        done += static_cast<size_t>(count);
    }
    return done;
}

void RawSamples::skip(uint64_t count)
{
    std::array<std::byte, 65536> buffer;
    while (count > 0) {
        const size_t skipped =
            read_bytes(std::span(buffer).first(std::min<uint64_t>(buffer.size(), count)));
        if (skipped == 0) {
            return; // nothing is left: the first read() will say so
        }
        count -= skipped;
    }
}

} // namespace audio
