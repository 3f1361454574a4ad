/// @file
/// What keeps the memory manager on: a plain start, counted holders, or both. One word holds it, so
/// that every change is one atomic exchange.
#pragma once

#include <cstdint>

namespace kz {

/// The manager's state; changes make a new one.
class MemoryState {
public:
    static constexpr uint32_t kMaxHolders = 0x3fffffff;

    constexpr MemoryState() noexcept = default;
    constexpr explicit MemoryState(uint32_t word) noexcept : word_(word) {}

    constexpr uint32_t word() const noexcept { return word_; }
    constexpr bool is_on() const noexcept { return (word_ & kOn) != 0; }
    constexpr uint32_t holders() const noexcept { return word_ >> kHolderShift; }

    /// After a plain start, which no counted release ends.
    constexpr MemoryState started() const noexcept { return MemoryState(word_ | kOn | kStarted); }

    /// After a plain shut-down: off for every user. Holders stay counted.
    constexpr MemoryState shut_down() const noexcept
    {
        return MemoryState(word_ & ~(kOn | kStarted));
    }

    /// With one holder more. There must be fewer than kMaxHolders.
    constexpr MemoryState acquired() const noexcept
    {
        return MemoryState((word_ | kOn) + kOneHolder);
    }

    /// With one holder less, of whom there must be one: off after the last, unless it was started
    /// plainly.
    constexpr MemoryState released() const noexcept
    {
        const uint32_t rest = word_ - kOneHolder;
        const bool stays_on = rest >> kHolderShift != 0 || (rest & kStarted) != 0;
        return MemoryState(stays_on ? rest : rest & ~kOn);
    }

private:
    static constexpr uint32_t kOn = 1;
    static constexpr uint32_t kStarted = 2;
    static constexpr uint32_t kHolderShift = 2;
    static constexpr uint32_t kOneHolder = 1U << kHolderShift;

    uint32_t word_ = 0;
};

/// Counts one holder more, or one less, and switches the manager accordingly.
///
/// @return False, with nothing changed, when the count is at its end.
bool acquire_memory() noexcept;
bool release_memory() noexcept;

/// Allocations of this thread that have failed so far, modulo 2^32; those while the manager was off
/// are among them. It lets a caller notice a failure that the functions between conceal.
uint32_t failed_allocations() noexcept;

/// While it lives, _kzmem_free() on this thread frees although the manager is off. For owners that
/// may outlive a plain shut-down; at most one per thread.
class FreesWhileOff {
public:
    FreesWhileOff() noexcept;
    ~FreesWhileOff();
    FreesWhileOff(const FreesWhileOff&) = delete;
    FreesWhileOff& operator=(const FreesWhileOff&) = delete;
};

} // namespace kz
