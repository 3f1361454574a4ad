// Calls of the system that wait are not restarted, so that a wait for sound ends too.

#include "kzfp/output/interruption.hpp"

#include <atomic>
#include <csignal>

namespace kzfp {

namespace {

std::atomic<bool> asked = false;
static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler sets it");

} // namespace

void watch_for_interruption()
{
    struct sigaction action = {};
    action.sa_handler = [](int) { asked.store(true); };
    action.sa_flags = static_cast<int>(SA_RESETHAND);
    for (const int number : {SIGINT, SIGTERM}) {
        sigaction(number, &action, nullptr);
    }
}

bool interrupted() { return asked.load(); }

} // namespace kzfp
