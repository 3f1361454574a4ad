#include <utils/AndroidThreads.h>

#include "kzsdk/jni/platform/platform.hpp"

bool kz::platform::start_thread(int (*entry)(void*), void* argument, const char* name,
                                int32_t priority) noexcept
{
    return androidCreateThreadEtc(entry, argument, name, priority, 0, nullptr) != 0;
}
