// One poll and one read for each call, so that nothing is held back.

#include "audio/live_raw.hpp"

#include <algorithm>
#include <cerrno>
#include <utility>

#include <poll.h>
#include <unistd.h>

#include "audio/raw_samples.hpp"

namespace audio {

LiveRaw::LiveRaw(Descriptor file, const StreamFormat& format, Patience patience)
    : file_(std::move(file)), format_(format), patience_(std::move(patience)), silence_(patience_)
{
}

HeardFrames LiveRaw::read(std::span<std::byte> bytes, int milliseconds)
{
    if (ended_) {
        return {Heard::end, 0};
    }
    try {
        silence_.check();
        return wait(milliseconds) ? take(bytes) : HeardFrames{};
    } catch (const FileError& error) {
        return end(error.what());
    }
}

/// Whether there is something to read; a signal ends the wait.
bool LiveRaw::wait(int milliseconds)
{
    pollfd state = {.fd = file_.number(), .events = POLLIN, .revents = 0};
    const int ready = ::poll(&state, 1, milliseconds);
    if (ready < 0 && errno != EINTR) {
        throw system_error("cannot be read", errno);
    }
    return ready > 0;
}

HeardFrames LiveRaw::take(std::span<std::byte> bytes)
{
    const size_t frame_bytes = format_.frame_bytes();
    const size_t room = bytes.size() / frame_bytes * frame_bytes;
    std::ranges::copy(begun_, bytes.begin());
    const ssize_t got = ::read(file_.number(), bytes.data() + begun_.size(), room - begun_.size());
    if (got < 0 && (errno == EINTR || errno == EAGAIN)) {
        return {};
    }
    if (got < 0) {
        throw system_error("cannot be read", errno);
    }
    if (got == 0) {
        return end(begun_.empty() ? "" : odd_bytes_text(begun_.size(), format_));
    }
    silence_.restart();
    const size_t count = begun_.size() + static_cast<size_t>(got);
    const auto whole = bytes.first(count / frame_bytes * frame_bytes);
    begun_.assign(bytes.begin() + static_cast<std::ptrdiff_t>(whole.size()),
                  bytes.begin() + static_cast<std::ptrdiff_t>(count));
    to_native_order(whole, format_.encoding);
    const size_t frames = whole.size() / frame_bytes;
    return {frames > 0 ? Heard::samples : Heard::nothing, frames};
}

HeardFrames LiveRaw::end(std::string trouble)
{
    ended_ = true;
    trouble_ = std::move(trouble);
    return {Heard::end, 0};
}

} // namespace audio
