#include "support/allocation.hpp"

#include <atomic>
#include <cstddef>

namespace {

// As wide as every processor can change atomically without a helper library.
std::atomic<ptrdiff_t> blocks{0};
std::atomic<size_t> allocations{0};
std::atomic<size_t> fail_at{0}; // 0: never
std::atomic<bool> keep_failing{false};
std::atomic<bool> has_fired{false};

bool must_fail()
{
    const size_t nth = ++allocations;
    const size_t at = fail_at;
    const bool fails = at != 0 && (nth == at || (keep_failing && nth > at));
    if (fails) {
        has_fired = true;
    }
    return fails;
}

} // namespace

extern "C" {

void* __real_malloc(size_t size);
void* __real_calloc(size_t count, size_t size);
void* __real_realloc(void* block, size_t size);
void __real_free(void* block);

void* __wrap_malloc(size_t size)
{
    void* block = must_fail() ? nullptr : __real_malloc(size);
    blocks += block != nullptr;
    return block;
}

void* __wrap_calloc(size_t count, size_t size)
{
    void* block = must_fail() ? nullptr : __real_calloc(count, size);
    blocks += block != nullptr;
    return block;
}

void* __wrap_realloc(void* block, size_t size)
{
    if (must_fail()) {
        return nullptr;
    }
    void* resized = __real_realloc(block, size);
    blocks += (block == nullptr && resized != nullptr);
    blocks -= (block != nullptr && resized == nullptr && size == 0); // freed, not failed
    return resized;
}

void __wrap_free(void* block)
{
    blocks -= block != nullptr;
    __real_free(block);
}

} // extern "C"

namespace kz::test {

int64_t live_blocks() { return blocks; }

uint64_t allocation_count() { return allocations; }

AllocationFault::AllocationFault(uint64_t nth, Mode mode)
{
    has_fired = false;
    keep_failing = mode == FromThenOn;
    fail_at = allocations + static_cast<size_t>(nth);
}

AllocationFault::~AllocationFault() { fail_at = 0; }

bool AllocationFault::fired() const { return has_fired; }

} // namespace kz::test
