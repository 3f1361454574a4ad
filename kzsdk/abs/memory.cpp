/// @file
/// The memory manager: a switch in front of the system heap, and no bookkeeping of blocks.
///
/// While it is off every allocation returns null and nothing is freed. A plain start and counted
/// holders keep it on, see memory_state.hpp.
#include "kzsdk/abs/memory.h"

#include <atomic>
#include <cstdlib>
#include <cstring>

#include "kzsdk/abs/memory_state.hpp"

namespace {

using kz::MemoryState;

// Atomic so that a start-up beside a running user is a defined, if unwise, thing to do, and so that
// holders may come and go on any thread.
std::atomic<uint32_t> state_word{0};

// The GNU dynamic linker's own library would be needed to look thread storage up at run time. In
// this model its place is fixed when the library is loaded.
#ifdef __GLIBC__
#define KZ_THREAD_STORAGE [[gnu::tls_model("initial-exec")]] constinit thread_local
#else
#define KZ_THREAD_STORAGE constinit thread_local
#endif

KZ_THREAD_STORAGE uint32_t failures = 0;
KZ_THREAD_STORAGE bool frees_while_off = false;

MemoryState state() noexcept { return MemoryState(state_word.load(std::memory_order_relaxed)); }

bool is_on() noexcept { return state().is_on(); }

// Puts `change(state)` in the state's place.
//
// @return The state before.
template <class Change>
MemoryState exchange(Change change) noexcept
{
    uint32_t word = state_word.load(std::memory_order_relaxed);
    while (!state_word.compare_exchange_weak(word, change(MemoryState(word)).word(),
                                             std::memory_order_relaxed)) {
    }
    return MemoryState(word);
}

// Counts a failure. Empty blocks are none: a heap may answer 0 bytes with null.
void* counted(void* block, uint32_t size) noexcept
{
    if (block == nullptr && size != 0) {
        ++failures;
    }
    return block;
}

} // namespace

namespace kz {

bool acquire_memory() noexcept
{
    const MemoryState before = exchange([](MemoryState now) {
        return now.holders() < MemoryState::kMaxHolders ? now.acquired() : now;
    });
    return before.holders() < MemoryState::kMaxHolders;
}

bool release_memory() noexcept
{
    const MemoryState before =
        exchange([](MemoryState now) { return now.holders() != 0 ? now.released() : now; });
    return before.holders() != 0;
}

uint32_t failed_allocations() noexcept { return failures; }

FreesWhileOff::FreesWhileOff() noexcept { frees_while_off = true; }

FreesWhileOff::~FreesWhileOff() { frees_while_off = false; }

} // namespace kz

kz_status kzmem_initialize(uint32_t /*first*/, int32_t /*second*/) noexcept
{
    const MemoryState before = exchange([](MemoryState now) { return now.started(); });
    return before.is_on() ? KZ_MEM_ALREADY_ON : KZ_OK;
}

kz_status kzmem_shutdown() noexcept
{
    const MemoryState before = exchange([](MemoryState now) { return now.shut_down(); });
    return before.is_on() ? KZ_OK : KZ_MEM_NOT_ON;
}

kz_status kzmem_query_availability() noexcept
{
    return is_on() ? KZ_MEM_ALREADY_ON : KZ_MEM_NOT_ON;
}

void* _kzmem_malloc(uint32_t size) noexcept
{
    return counted(is_on() ? std::malloc(size) : nullptr, size);
}

void* _kzmem_calloc(uint32_t count, uint32_t size) noexcept
{
    const auto bytes = static_cast<uint32_t>(uint64_t{count} * size); // wraps: see the header
    void* block = _kzmem_malloc(bytes);
    if (block != nullptr) {
        std::memset(block, 0, bytes);
    }
    return block;
}

void* _kzmem_realloc(void* block, uint32_t size) noexcept
{
    return counted(is_on() ? std::realloc(block, size) : nullptr, size);
}

kz_status _kzmem_free(void* block) noexcept
{
    if (!is_on() && !frees_while_off) {
        return KZ_MEM_NOT_ON;
    }
    std::free(block);
    return KZ_OK;
}

void* kzmem_memset(void* destination, int32_t value, uint32_t size) noexcept
{
    return size == 0 ? destination : std::memset(destination, value, size);
}

void* kzmem_memmove(void* destination, const void* source, uint32_t size) noexcept
{
    return size == 0 ? destination : std::memmove(destination, source, size);
}

void* kzmem_memcpy(void* destination, const void* source, uint32_t size) noexcept
{
    return size == 0 ? destination : std::memcpy(destination, source, size);
}

int16_t kzmem_memcmp(const void* a, const void* b, uint32_t length) noexcept
{
    const int order = length == 0 ? 0 : std::memcmp(a, b, length);
    return static_cast<int16_t>((order > 0) - (order < 0));
}
