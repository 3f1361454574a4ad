/// @file
/// Objects and bytes on the system's heap. The library's own allocator fails until a job has
/// started the core; objects and workers are there before that, and outlive a core that is shut
/// down.
#pragma once

#include <cstddef>
#include <cstdlib>
#include <memory>
#include <new>
#include <utility>

namespace kz::jni {

struct FreeToSystem {
    void operator()(void* block) const noexcept { std::free(block); }
};

/// A block of plain data on the system's heap, or null.
template <class T>
using system_owned = std::unique_ptr<T, FreeToSystem>;

template <class T>
system_owned<T[]> make_system_array(size_t count) noexcept
{
    return system_owned<T[]>(static_cast<T*>(std::malloc(count * sizeof(T))));
}

/// Constructs an object; null when memory is short. `operator new` would need the C++ run-time
/// library.
template <class T, class... Arguments>
T* create(Arguments&&... arguments) noexcept
{
    void* place = std::malloc(sizeof(T));
    return place != nullptr ? ::new (place) T(std::forward<Arguments>(arguments)...) : nullptr;
}

/// Undoes create(). Null does nothing.
template <class T>
void destroy(T* object) noexcept
{
    if (object != nullptr) {
        object->~T();
        std::free(object);
    }
}

} // namespace kz::jni
