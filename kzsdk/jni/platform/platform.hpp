/// @file
/// What the Android front needs of the system it runs on: a log and a thread. One adapter is
/// linked:
///
///     portable   log on standard error, POSIX thread; needs nothing but the C library
///     ndk        Android's log, POSIX thread; needs nothing but what the public NDK offers
///     aosp       Android's log, Android's thread starter; for a build inside the system's sources
#pragma once

#include <cstdint>

namespace kz::platform {

/// Priorities of Android's log.
enum LogPriority : int32_t {
    kLogDebug = 3,
    kLogError = 6,
};

/// Writes one line to the log.
///
/// @param tag     Null stands for the program's name.
/// @param format  As for `printf`; may hold one `%X`, which prints `value`.
void log(LogPriority priority, const char* tag, const char* format, uint32_t value = 0) noexcept;

/// The background priority of Android, a nice value.
inline constexpr int32_t kBackgroundPriority = 10;

/// Starts a detached thread with the system's stack size.
///
/// @param name      Lives until the thread runs. The system may show only its first 15 characters.
/// @param priority  A wish: a system that refuses it starts the thread all the same.
/// @return false when no thread was started.
bool start_thread(int (*entry)(void*), void* argument, const char* name, int32_t priority) noexcept;

} // namespace kz::platform
