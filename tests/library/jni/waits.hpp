/// @file
/// Intercepts condition variables: the library's waits and signals only, not those of the C++
/// run-time library.
#pragma once

#include <cstdint>

namespace kz::test {

/// Waits that have begun so far. One that has begun holds the mutex until it sleeps.
uint64_t waits_begun();

/// Returns when so many waits have begun.
void until_waits_have_begun(uint64_t count);

/// Whether signals are lost.
void lose_signals(bool lose);

/// Signals are lost while it lives.
class LostSignals {
public:
    LostSignals();
    ~LostSignals();
    LostSignals(const LostSignals&) = delete;
    LostSignals& operator=(const LostSignals&) = delete;
};

/// Wakes all that wait on the condition that was waited on last.
void wake_without_reason();

} // namespace kz::test
