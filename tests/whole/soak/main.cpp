// soak [seconds] [threads]: makes fingerprints on many threads and compares every document with the
// one that a thread alone got, and those with what is on record. Fails when one differs, and when
// memory, threads or descriptors have grown since the end of the first tenth.

#include <chrono>
#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <thread>

#include "kzsdk/abs/memory.h"
#include "whole/soak/usage.hpp"
#include "whole/soak/worker.hpp"

namespace {

using namespace kz::soak;
using Clock = std::chrono::steady_clock;

/// KiB that the heap's arenas may still take while threads meet in other orders. A sanitizer keeps
/// what was freed, and notes about it.
constexpr uint64_t kAllowedGrowth = KZ_SANITIZED ? 1024 * 1024 : 16 * 1024;

void print(double seconds, const Tally& tally, const Usage& usage)
{
    std::printf("%6.0f s %8" PRIu64 " documents %6" PRIu64 " abandoned %3" PRIu64 " wrong %8" PRIu64
                " KiB resident %3" PRIu64 " threads %3" PRIu64 " descriptors\n",
                seconds, tally.documents.load(), tally.abandoned.load(), tally.wrong.load(),
                usage.resident_kibibytes, usage.threads, usage.descriptors);
    std::fflush(stdout);
}

/// Lets time go by; prints ten lines on the way. True when nothing has grown since the first.
bool watch(double seconds, const Tally& tally)
{
    const auto begun = Clock::now();
    Usage first;
    Usage now;
    for (int tenth = 1; tenth <= 10; ++tenth) {
        std::this_thread::sleep_until(begun + std::chrono::duration<double>(seconds * tenth / 10));
        now = usage_now();
        print(seconds * tenth / 10, tally, now);
        first = tenth == 1 ? now : first;
    }
    return now.resident_kibibytes <= first.resident_kibibytes + kAllowedGrowth &&
           now.threads <= first.threads && now.descriptors <= first.descriptors;
}

/// A thread that was joined may still be listed for a moment.
bool is_given_back(const Usage& before)
{
    for (int tries = 0; tries < 100; ++tries) {
        const Usage now = usage_now();
        if (now.descriptors <= before.descriptors && now.threads <= before.threads) {
            return true;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    return false;
}

const char* verdict(bool as_alone, bool steady, bool given_back)
{
    return !as_alone     ? "FAILED: documents differ"
           : !steady     ? "FAILED: something grew"
           : !given_back ? "FAILED: something was not given back"
                         : "held";
}

} // namespace

int main(int argc, char** argv)
{
    const double seconds = argc > 1 ? std::atof(argv[1]) : 60;
    const int threads = argc > 2 ? std::atoi(argv[2]) : 8;
    if (seconds <= 0 || threads <= 0 || kzmem_initialize(0, 0) != KZ_OK) {
        std::fprintf(stderr, "usage: soak [seconds] [threads]\n");
        return 2;
    }
    std::string problem;
    const auto recordings = make_recordings(problem);
    std::printf("%s%zu recordings, %u ways of cutting each, %d threads\n", problem.c_str(),
                recordings.size(), kCuts, threads);
    std::thread([] {}).join(); // a sanitizer has a thread of its own from the first one on
    const Usage before = usage_now();
    Tally tally;
    bool steady = false;
    {
        std::atomic<bool> stop{false};
        std::vector<std::jthread> workers;
        for (int i = 0; i < threads; ++i) {
            workers.emplace_back(
                [&, i] { work(recordings, static_cast<uint64_t>(i) + 1, stop, tally); });
        }
        steady = watch(seconds, tally);
        stop = true;
    }
    const bool as_alone = problem.empty() && tally.wrong == 0 && tally.documents != 0;
    const bool given_back = is_given_back(before);
    static_cast<void>(kzmem_shutdown());
    std::printf("%s\n", verdict(as_alone, steady, given_back));
    return as_alone && steady && given_back ? 0 : 1;
}
