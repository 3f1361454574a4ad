/// @file
/// Ownership over the library's own allocator.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <limits>
#include <memory>
#include <type_traits>

#include "kzsdk/abs/memory.h"

namespace kz {

/// Hands a block back to the library's own allocator.
struct Release {
    void operator()(void* block) const noexcept { static_cast<void>(_kzmem_free(block)); }
};

/// A block of the library's allocator, or null. `owned<T[]>` is an array.
template <class T>
using owned = std::unique_ptr<T, Release>;

/// Allocates `count` values of plain type T, cleared to zero bytes. Null when the memory manager is
/// off, the heap fails, or the size does not fit the allocator's 32 bits (nothing is tried then).
template <class T>
owned<T[]> make_array(uint64_t count) noexcept
{
    static_assert(std::is_trivial_v<T>);
    if (count > std::numeric_limits<uint32_t>::max() / sizeof(T)) {
        return nullptr;
    }
    const auto bytes = static_cast<uint32_t>(count * sizeof(T));
    // An empty array is a block all the same: null means failure, and a heap may answer 0 with it.
    void* block = _kzmem_malloc(bytes == 0 ? 1 : bytes);
    if (block != nullptr) {
        std::memset(block, 0, bytes);
    }
    return owned<T[]>(static_cast<T*>(block));
}

/// Allocates one record of plain type T, cleared to zero bytes. Null on failure.
template <class T>
owned<T> make_record() noexcept
{
    return owned<T>(make_array<T>(1).release());
}

/// Allocates a copy of `count` values. Null on failure.
template <class T>
owned<T[]> copy_array(const T* source, uint64_t count) noexcept
{
    auto copy = make_array<T>(count);
    if (copy && count != 0) {
        std::memcpy(copy.get(), source, static_cast<size_t>(count * sizeof(T)));
    }
    return copy;
}

} // namespace kz
