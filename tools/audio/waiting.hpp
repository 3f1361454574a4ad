/// @file
/// Waiting for what comes bit by bit: pipes, FIFOs, sockets.
#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <optional>
#include <span>

namespace audio {

/// How long an input is waited for.
struct Patience {
    std::optional<double> timeout; ///< seconds in which nothing comes; without it there is no end
    std::function<bool()> stop;    ///< true ends the wait at once; may be empty
};

/// The time that passes while nothing comes.
class Wait {
public:
    /// `patience` outlives the object.
    explicit Wait(const Patience& patience) : patience_(patience) {}

    /// Something came: the time starts again.
    void restart() { start_ = Clock::now(); }

    /// How long a single call may wait, in milliseconds, before check() is due again.
    int slice() const;

    /// Throws FileError when the wait is to end.
    void check() const;

    /// As check(), but reports it.
    bool is_over() const { return is_stopped() || is_timed_out(); }

private:
    using Clock = std::chrono::steady_clock;

    bool is_stopped() const { return patience_.stop && patience_.stop(); }
    bool is_timed_out() const { return patience_.timeout && passed() >= *patience_.timeout; }
    double passed() const;

    const Patience& patience_;
    Clock::time_point start_ = Clock::now();
};

/// Returns once `file` has bytes, or has ended. Throws FileError when the patience is exhausted.
void wait_for(int file, const Patience& patience);

/// Reads what is there, at most `bytes`, waiting for the first byte. Returns 0 at the end. Throws
/// FileError.
size_t read_some(int file, std::span<std::byte> bytes, const Patience& patience);

} // namespace audio
