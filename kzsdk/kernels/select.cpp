/// @file
/// The choice of a variant: the best one that the processor runs, or the one that the environment
/// or the build names.

#include <atomic>
#include <cstdlib>
#include <string_view>

#include "kzsdk/kernels/variants.hpp"

namespace kz::kernels {
namespace {

const Variant* named(const RunnableVariants& runnable, const char* name) noexcept
{
    if (name != nullptr) {
        for (const Variant* table : runnable) {
            if (std::string_view(table->name) == name) {
                return table;
            }
        }
    }
    return nullptr;
}

const Variant& choose() noexcept
{
    const RunnableVariants runnable = runnable_variants();
    const Variant* pinned = named(runnable, std::getenv("KZSDK_KERNELS"));
#if defined(KZ_KERNELS)
    pinned = pinned != nullptr ? pinned : named(runnable, KZ_KERNELS);
#endif
    return pinned != nullptr ? *pinned : *runnable.tables[runnable.count - 1];
}

} // namespace

const Variant& active() noexcept
{
    // Threads that meet here first all choose the same, so it does not matter which one stores it.
    static std::atomic<const Variant*> chosen{nullptr};
    const Variant* table = chosen.load(std::memory_order_relaxed);
    if (table == nullptr) {
        table = &choose();
        chosen.store(table, std::memory_order_relaxed);
    }
    return *table;
}

RunnableVariants runnable_variants() noexcept
{
    RunnableVariants found;
    const auto add = [&found](const Variant& table) { found.tables[found.count++] = &table; };
    add(kPlainVariant);
#if defined(KZ_KERNELS_X86)
    __builtin_cpu_init();
    if (__builtin_cpu_supports("sse4.1") != 0) {
        add(kSse41Variant);
    }
    if (__builtin_cpu_supports("avx2") != 0) {
        add(kAvx2Variant);
    }
#elif defined(KZ_KERNELS_WASM)
    add(kSse41Variant); // a module with vectors is not compiled by what has none
#elif defined(KZ_KERNELS_NEON)
    add(kNeonVariant); // every processor of this architecture has it
#endif
    return found;
}

} // namespace kz::kernels
