/// @file
/// The choice of an instruction set, by processor and environment.

#include "catalogue/model/processor.hpp"

#include <cstdlib>
#include <vector>

namespace kzcat {
namespace {

std::vector<Instructions> look_up_runnable()
{
    std::vector<Instructions> found{Instructions::plain};
#if defined(__x86_64__) || defined(__i386__)
    __builtin_cpu_init();
    const bool avx2 = __builtin_cpu_supports("avx2") != 0;
    if (avx2) {
        found.push_back(Instructions::avx2);
    }
    if (avx2 && __builtin_cpu_supports("avx512f") != 0 && __builtin_cpu_supports("avx512bw") != 0 &&
        __builtin_cpu_supports("avx512vpopcntdq") != 0) {
        found.push_back(Instructions::avx512);
    }
#elif defined(__aarch64__) && !defined(__AARCH64EB__)
    found.push_back(Instructions::neon); // every processor of this architecture has it
#endif
    return found;
}

Instructions choose()
{
    const char* pinned = std::getenv("KZCAT_KERNELS");
    for (const Instructions one : runnable_instructions()) {
        if (pinned != nullptr && name_of(one) == pinned) {
            return one;
        }
    }
    return runnable_instructions().back();
}

} // namespace

std::string_view name_of(Instructions instructions)
{
    switch (instructions) {
    case Instructions::neon:
        return "neon";
    case Instructions::avx2:
        return "avx2";
    case Instructions::avx512:
        return "avx512";
    case Instructions::plain:
        break;
    }
    return "plain";
}

std::span<const Instructions> runnable_instructions()
{
    static const std::vector<Instructions> runnable = look_up_runnable();
    return runnable;
}

Instructions chosen_instructions()
{
    static const Instructions chosen = choose();
    return chosen;
}

} // namespace kzcat
