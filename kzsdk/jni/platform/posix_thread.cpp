#include <cstdio>

#include <pthread.h>
#ifdef __linux__
#include <sys/resource.h>
#endif

#include "kzsdk/jni/heap.hpp"
#include "kzsdk/jni/platform/platform.hpp"

namespace {

struct Start {
    int (*entry)(void*);
    void* argument;
    const char* name;
    int32_t priority;
};

/// Dresses the calling thread. Refusals are of no consequence.
void dress([[maybe_unused]] const Start& start) noexcept
{
#ifdef __linux__
    char name[16]; // the system holds 15 characters and refuses longer names
    std::snprintf(name, sizeof name, "%s", start.name);
    pthread_setname_np(pthread_self(), name);
    setpriority(PRIO_PROCESS, 0, start.priority); // on Linux a nice value is the thread's own
#endif
}

void* run(void* argument) noexcept
{
    const Start start = *static_cast<Start*>(argument);
    std::free(argument);
    dress(start);
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
