// A wait is cut into slices, since a signal may be delivered to another thread than the one that
// waits.

#include "audio/waiting.hpp"

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include <poll.h>
#include <unistd.h>

#include "audio/source.hpp"

namespace audio {

namespace {

constexpr int kSlice = 100; ///< milliseconds

FileError timed_out(double seconds)
{
    char text[96];
    std::snprintf(text, sizeof text, "was given up: nothing came for %g s (--timeout)", seconds);
    return FileError(text);
}

} // namespace

double Wait::passed() const { return std::chrono::duration<double>(Clock::now() - start_).count(); }

int Wait::slice() const
{
    if (!patience_.timeout) {
        return kSlice;
    }
    const double left = (*patience_.timeout - passed()) * 1000 + 1;
    return static_cast<int>(std::clamp(left, 1.0, double{kSlice}));
}

void Wait::check() const
{
    if (is_stopped()) {
        throw FileError("was given up: interrupted");
    }
    if (is_timed_out()) {
        throw timed_out(*patience_.timeout);
    }
}

void wait_for(int file, const Patience& patience)
{
    const Wait wait(patience);
    for (;;) {
        wait.check();
        pollfd state = {.fd = file, .events = POLLIN, .revents = 0};
        const int ready = ::poll(&state, 1, wait.slice());
        if (ready > 0) {
            return; // errors too: the next read() has their number
        }
        if (ready < 0 && errno != EINTR) {
            throw system_error("cannot be read", errno);
        }
    }
}

size_t read_some(int file, std::span<std::byte> bytes, const Patience& patience)
{
    for (;;) {
        wait_for(file, patience);
        const ssize_t count = ::read(file, bytes.data(), bytes.size());
        if (count >= 0) {
            return static_cast<size_t>(count);
        }
        if (errno != EINTR && errno != EAGAIN) {
            throw system_error("cannot be read", errno);
        }
    }
}

} // namespace audio
