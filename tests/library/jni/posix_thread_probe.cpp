#include <array>
#include <atomic>
#include <cerrno>

#include <pthread.h>
#include <sys/resource.h>

#include "platform_probe.hpp"

namespace kz::test {

namespace {

std::atomic<bool> refuse_threads{false};

} // namespace

NoThreads::NoThreads() { refuse_threads = true; }
NoThreads::~NoThreads() { refuse_threads = false; }

ThreadLooks looks_of_this_thread()
{
    std::array<char, 16> name = {};
    pthread_getname_np(pthread_self(), name.data(), name.size());
    return {name.data(), getpriority(PRIO_PROCESS, 0)};
}

} // namespace kz::test

extern "C" {

int __real_pthread_create(pthread_t* thread, const pthread_attr_t* attributes,
                          void* (*entry)(void*), void* argument);

int __wrap_pthread_create(pthread_t* thread, const pthread_attr_t* attributes,
                          void* (*entry)(void*), void* argument)
{
    return kz::test::refuse_threads ? EAGAIN
                                    : __real_pthread_create(thread, attributes, entry, argument);
}

} // extern "C"
