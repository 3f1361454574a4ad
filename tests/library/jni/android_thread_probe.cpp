#include <mutex>

#include <utils/AndroidThreads.h>

#include "platform_probe.hpp"

namespace kz::test {

namespace {

std::mutex start_mutex;
ThreadLooks last_start;

int no_thread(android_thread_func_t, void*, const char*, int32_t, size_t, android_thread_id_t*)
{
    return 0;
}

int note_and_start(android_thread_func_t entry, void* argument, const char* name, int32_t priority,
                   size_t stack, android_thread_id_t* id)
{
    const std::lock_guard lock(start_mutex);
    last_start = {std::string(name).substr(0, 15), priority};
    return androidCreateRawThreadEtc(entry, argument, name, priority, stack, id);
}

const bool noting = [] {
    androidSetCreateThreadFunc(note_and_start);
    return true;
}();

} // namespace

NoThreads::NoThreads() { androidSetCreateThreadFunc(no_thread); }
NoThreads::~NoThreads() { androidSetCreateThreadFunc(note_and_start); }

ThreadLooks looks_of_this_thread()
{
    const std::lock_guard lock(start_mutex);
    return last_start;
}

} // namespace kz::test
