/// @file
/// The log of the portable adapter: one line on standard error for each message.
#include <cerrno>
#include <cstdio>
#include <ctime>

#include <unistd.h>

#include "kzsdk/jni/platform/platform.hpp"

namespace {

/// Stands in for a null tag.
const char* program_name() noexcept
{
#ifdef __GLIBC__
    return program_invocation_short_name;
#else
    return "kzsdk";
#endif
}

/// The process's number where threads have none of their own.
int thread_number() noexcept
{
#ifdef __linux__
    return gettid();
#else
    return getpid();
#endif
}

char letter_of(kz::platform::LogPriority priority) noexcept
{
    return priority >= kz::platform::kLogError ? 'E' : 'D';
}

} // namespace

// The layout is the one in which Android's log writes to standard error on a desktop.
void kz::platform::log(LogPriority priority, const char* tag, const char* format,
                       uint32_t value) noexcept
{
    char message[256];
    std::snprintf(message, sizeof message, format, value);
    const std::time_t now = std::time(nullptr);
    std::tm local = {};
    localtime_r(&now, &local);
    std::fprintf(stderr, "%s %c %02d-%02d %02d:%02d:%02d %5d %5d %s\n",
                 tag != nullptr ? tag : program_name(), letter_of(priority), local.tm_mon + 1,
                 local.tm_mday, local.tm_hour, local.tm_min, local.tm_sec, getpid(),
                 thread_number(), message);
}
