/// @file
/// The clocks that the benchmarks read.
#pragma once

#include <ctime>

namespace kz::bench {

inline double read_clock(clockid_t clock)
{
    timespec now = {};
    clock_gettime(clock, &now);
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

/// Processor time of this thread, in seconds. It stops while others have the processor, so it is
/// the one to read on a machine that does other work.
inline double cpu_now() { return read_clock(CLOCK_THREAD_CPUTIME_ID); }

inline double wall_now() { return read_clock(CLOCK_MONOTONIC); }

/// How much of this thread's processor time a call takes, in seconds.
template <class Call>
double cpu_seconds(Call call)
{
    const double begun = cpu_now();
    call();
    return cpu_now() - begun;
}

} // namespace kz::bench
