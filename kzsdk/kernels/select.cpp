#include <atomic>
#include <cstdlib>
#include <string_view>

#include "kzsdk/kernels/variants.hpp"

namespace kz::dsp {
namespace {

const Kernels* named(const RunnableKernels& runnable, const char* name) noexcept
{
    if (name != nullptr) {
        for (const Kernels* table : runnable) {
            if (std::string_view(table->name) == name) {
                return table;
            }
        }
    }
    return nullptr;
}

const Kernels& choose() noexcept
{
    const RunnableKernels runnable = runnable_kernels();
    const Kernels* pinned = named(runnable, std::getenv("KZSDK_KERNELS"));
#if defined(KZ_KERNELS)
    pinned = pinned != nullptr ? pinned : named(runnable, KZ_KERNELS);
#endif
    return pinned != nullptr ? *pinned : *runnable.tables[runnable.count - 1];
}

} // namespace

const Kernels& kernels() noexcept
{
    // Threads that meet here first all choose the same, so it does not matter which one stores it.
    static std::atomic<const Kernels*> chosen{nullptr};
    const Kernels* table = chosen.load(std::memory_order_relaxed);
    if (table == nullptr) {
        table = &choose();
        chosen.store(table, std::memory_order_relaxed);
    }
    return *table;
}

RunnableKernels runnable_kernels() noexcept
{
    RunnableKernels found;
    const auto add = [&found](const Kernels& table) { found.tables[found.count++] = &table; };
    add(kPlainKernels);
#if defined(KZ_KERNELS_X86)
    __builtin_cpu_init();
    if (__builtin_cpu_supports("sse4.1") != 0) {
        add(kSse41Kernels);
    }
    if (__builtin_cpu_supports("avx2") != 0) {
        add(kAvx2Kernels);
    }
#elif defined(KZ_KERNELS_NEON)
    add(kNeonKernels); // every processor of this architecture has it
#endif
    return found;
}

} // namespace kz::dsp
