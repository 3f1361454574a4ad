/// @file
/// Arrays that begin at a cache line, so that a time does not depend on where the heap put them.
#pragma once

#include <cstddef>
#include <new>
#include <vector>

namespace kz::bench {

template <class T>
struct LineAllocator {
    using value_type = T;
    static constexpr std::align_val_t kLine{64};

    LineAllocator() = default;
    template <class Other>
    explicit LineAllocator(const LineAllocator<Other>& /*other*/)
    {
    }
    T* allocate(size_t count) { return static_cast<T*>(::operator new(count * sizeof(T), kLine)); }
    void deallocate(T* block, size_t /*count*/) { ::operator delete(block, kLine); }
    bool operator==(const LineAllocator& /*other*/) const { return true; }
};

template <class T>
using Aligned = std::vector<T, LineAllocator<T>>;

} // namespace kz::bench
