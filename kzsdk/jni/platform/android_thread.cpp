/// @file
/// The thread of the adapter for Android's own sources: its starter sets name and priority.
#include <utils/AndroidThreads.h>

#include "kzsdk/jni/platform/platform.hpp"

bool kz::platform::start_thread(int (*entry)(void*), void* argument, const char* name,
                                int32_t priority) noexcept
{
    return androidCreateThreadEtc(entry, argument, name, priority, 0, nullptr) != 0;
}
