#include "waits.hpp"

#include <atomic>
#include <thread>

#include <pthread.h>

namespace {

std::atomic<uint64_t> waits{0};
std::atomic<bool> losing_signals{false};
std::atomic<pthread_cond_t*> last_waited_for{nullptr};

} // namespace

extern "C" {

int __real_pthread_cond_wait(pthread_cond_t* condition, pthread_mutex_t* mutex);
int __real_pthread_cond_signal(pthread_cond_t* condition);

int __wrap_pthread_cond_wait(pthread_cond_t* condition, pthread_mutex_t* mutex)
{
    last_waited_for = condition;
    ++waits;
    return __real_pthread_cond_wait(condition, mutex);
}

int __wrap_pthread_cond_signal(pthread_cond_t* condition)
{
    return losing_signals ? 0 : __real_pthread_cond_signal(condition);
}

} // extern "C"

namespace kz::test {

uint64_t waits_begun() { return waits; }

void until_waits_have_begun(uint64_t count)
{
    while (waits < count) {
        std::this_thread::yield();
    }
}

void lose_signals(bool lose) { losing_signals = lose; }

LostSignals::LostSignals() { lose_signals(true); }
LostSignals::~LostSignals() { lose_signals(false); }

void wake_without_reason() { pthread_cond_broadcast(last_waited_for); }

} // namespace kz::test
