// The bytes go on as they are; on a big-endian machine those of each sample are turned round.

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

} // namespace

std::string odd_bytes_text(uint64_t odd_bytes, const StreamFormat& format)
{
    return "ends with " + std::to_string(odd_bytes) +
           (odd_bytes == 1 ? " odd byte" : " odd bytes") + ", whole frames of " +
           std::to_string(format.frame_bytes()) + " bytes are needed";
}

void to_native_order(std::span<std::byte> samples, Encoding encoding)
{
    if constexpr (std::endian::native == std::endian::big) {
        const size_t size = sample_bytes(encoding);
        for (; samples.size() >= size; samples = samples.subspan(size)) {
            std::ranges::reverse(samples.first(size));
        }
    }
}

RawSamples::RawSamples(int file, bool seekable, const StreamFormat& format, const Section& section,
                       const Patience& patience)
    : file_(file), patience_(patience), format_(format),
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
    to_native_order(wanted.first(count), format_.encoding);
    frames_left_ -= count / frame_bytes;
    return count / frame_bytes;
}

size_t RawSamples::read_bytes(std::span<std::byte> bytes)
{
    size_t done = 0;
    while (done < bytes.size()) {
        const size_t count = read_some(file_, bytes.subspan(done), patience_);
        if (count == 0) {
            break;
        }
        done += count;
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
