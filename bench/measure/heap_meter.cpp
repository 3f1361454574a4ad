#include "measure/heap_meter.hpp"

#include <algorithm>
#include <cstddef>

#include <malloc.h>

namespace {

thread_local kz::bench::HeapUse use; // nothing is shared, so threads do not wait for each other

int64_t size_of(void* block) { return static_cast<int64_t>(malloc_usable_size(block)); }

void* added(void* block)
{
    use.bytes += size_of(block);
    use.peak = std::max(use.peak, use.bytes);
    ++use.allocations;
    return block;
}

} // namespace

extern "C" {

void* __real_malloc(size_t size);
void* __real_calloc(size_t count, size_t size);
void* __real_realloc(void* block, size_t size);
void __real_free(void* block);

void* __wrap_malloc(size_t size) { return added(__real_malloc(size)); }

void* __wrap_calloc(size_t count, size_t size) { return added(__real_calloc(count, size)); }

void* __wrap_realloc(void* block, size_t size)
{
    const int64_t before = size_of(block);
    void* const resized = __real_realloc(block, size);
    use.bytes -= resized != nullptr ? before : 0;
    return added(resized);
}

void __wrap_free(void* block)
{
    use.bytes -= size_of(block);
    __real_free(block);
}

} // extern "C"

namespace kz::bench {

HeapUse heap_use() { return use; }

void reset_heap_peak() { use.peak = use.bytes; }

} // namespace kz::bench
