#include "kzsdk/abs/memory.h"

#include <atomic>
#include <cstdlib>
#include <cstring>

namespace {

// Atomic so that a start-up beside a running user is a defined, if unwise, thing to do.
std::atomic<uint8_t> memory_on{0};

bool is_on() noexcept { return memory_on.load(std::memory_order_relaxed) != 0; }

} // namespace

kz_status kzmem_initialize(uint32_t /*first*/, int32_t /*second*/) noexcept
{
    return memory_on.exchange(1, std::memory_order_relaxed) != 0 ? KZ_MEM_ALREADY_ON : KZ_OK;
}

kz_status kzmem_shutdown() noexcept
{
    return memory_on.exchange(0, std::memory_order_relaxed) != 0 ? KZ_OK : KZ_MEM_NOT_ON;
}

kz_status kzmem_query_availability() noexcept
{
    return is_on() ? KZ_MEM_ALREADY_ON : KZ_MEM_NOT_ON;
}

void* _kzmem_malloc(uint32_t size) noexcept { return is_on() ? std::malloc(size) : nullptr; }

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
    return is_on() ? std::realloc(block, size) : nullptr;
}

kz_status _kzmem_free(void* block) noexcept
{
    if (!is_on()) {
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
