/// @file
/// Numbers for live objects. Java keeps an object in a field of 32 bits, which cannot hold a
/// pointer everywhere; it gets a number instead, and a number that is unknown or stale finds
/// nothing.
#pragma once

#include <cstdint>

#include <pthread.h>

namespace kz::jni {

/// What an object must be to have a number. The registry owns the fields while it has the object.
struct Registered {
    int32_t number = 0;
    uint32_t pins = 0;
    bool claimed = false;
    Registered* next = nullptr;
};

/// A number is given again only when all others have been given: a stale copy would have to survive
/// four thousand million objects. Objects are looked up in a list, since each has a thread, and
/// threads are few.
///
/// Threads: all calls are safe at any time. Whoever has claimed an object is the one to remove it,
/// and does not get further as long as somebody has it pinned.
class Registry {
public:
    /// @param last_number  The number given before the first one.
    constexpr explicit Registry(int32_t last_number = 0) noexcept : last_number_(last_number) {}

    /// Gives the object a number, which is never 0 nor that of another object here.
    int32_t add(Registered& object) noexcept;

    /// Finds an object and keeps it from being removed; null for a number of none. Goes with
    /// unpin().
    Registered* pin(int32_t number) noexcept;
    void unpin(Registered& object) noexcept;

    /// Finds an object that is to be removed. Null for a number of none, and for one that is
    /// claimed: of two that want to remove an object one does.
    Registered* claim(int32_t number) noexcept;

    /// Removes a claimed object: it cannot be found from now on. Returns when no thread has it
    /// pinned.
    void remove(Registered& object) noexcept;

private:
    Registered** find(int32_t number) noexcept;
    int32_t next_number() noexcept;

    pthread_mutex_t mutex_ = PTHREAD_MUTEX_INITIALIZER;
    pthread_cond_t unpinned_ = PTHREAD_COND_INITIALIZER;
    Registered* first_ = nullptr;
    int32_t last_number_;
};

} // namespace kz::jni
