/// @file
/// The log of the Android adapters: the system's own.
#include <android/log.h>

#include "kzsdk/jni/platform/platform.hpp"

void kz::platform::log(LogPriority priority, const char* tag, const char* format,
                       uint32_t value) noexcept
{
    __android_log_print(priority, tag, format, value);
}
