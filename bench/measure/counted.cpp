#include "measure/counted.hpp"

#include <cstdio>

#include "measure/bits.hpp"

#if __has_include(<valgrind/callgrind.h>)

// The requests are macros of the C language.
#pragma GCC diagnostic ignored "-Wold-style-cast"
#include <valgrind/callgrind.h>

namespace kz::bench {

void run_counted(const std::vector<Case>& cases)
{
    require(RUNNING_ON_VALGRIND != 0, "nobody counts: see bench/counts.py");
    std::printf("%s\n%s\n", KZ_BENCH_BUILD, variant().c_str());
    for (const Case& one : cases) {
        const Prepared prepared = one.prepare();
        prepared.run();
        CALLGRIND_START_INSTRUMENTATION;
        prepared.run();
        CALLGRIND_STOP_INSTRUMENTATION;
        CALLGRIND_DUMP_STATS_AT(one.name.c_str());
    }
}

} // namespace kz::bench

#else

namespace kz::bench {

void run_counted(const std::vector<Case>& /*cases*/)
{
    throw Failure("built without valgrind's headers");
}

} // namespace kz::bench

#endif
