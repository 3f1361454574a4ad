/// @file
/// The thread of the portable and the NDK adapter: a detached POSIX thread, named and given a
/// priority where the system offers that.
#include <cstdio>

#include <pthread.h>
#ifdef __linux__
#include <sys/resource.h>
#endif

#include "kzsdk/jni/heap.hpp"
#include "kzsdk/jni/platform/platform.hpp"

namespace {

/// What a new thread runs with; freed by that thread.
struct Start {
    int (*entry)(void*);
    void* argument;
    const char* name;
    int32_t priority;
};

/// Gives the calling thread its name and priority. A refusal is ignored.
void apply_name_and_priority([[maybe_unused]] const Start& start) noexcept
{
#ifdef __linux__
    char name[16]; // the system holds 15 characters and refuses longer names
    std::snprintf(name, sizeof name, "%s", start.name);
    pthread_setname_np(pthread_self(), name);
    setpriority(PRIO_PROCESS, 0, start.priority); // on Linux a nice value is the thread's own
#endif
}

/// The body of every thread. What the entry returns is dropped.
void* run(void* argument) noexcept
{
    const Start start = *static_cast<Start*>(argument);
    std::free(argument);
    apply_name_and_priority(start);
    start.entry(start.argument);
    return nullptr;
}

} // namespace

bool kz::platform::start_thread(int (*entry)(void*), void* argument, const char* name,
                                int32_t priority) noexcept
{
    Start* const start = jni::create<Start>(Start{entry, argument, name, priority});
    if (start == nullptr) {
        return false;
    }
    pthread_t thread = {};
    if (pthread_create(&thread, nullptr, run, start) != 0) {
        jni::destroy(start);
        return false;
    }
    pthread_detach(thread);
    return true;
}
