/// @file
/// The tags between the root and the place that a walk has reached.
///
/// Tags do not store their parents, so a walk has to remember the way back. It does so here and not
/// on the call stack: a tree of any depth is walked. Documents of the usual few levels need no
/// memory for it.
#pragma once

#include <cstring>
#include <type_traits>
#include <utility>

#include "kzsdk/abs/owned.hpp"

namespace kz::xml {

/// A stack of entries. The first 32 lie in the object, more on the heap.
template <class Entry>
requires std::is_trivially_copyable_v<Entry>
class OpenTags {
public:
    bool is_empty() const noexcept { return count_ == 0; }

    Entry& top() noexcept { return entries()[count_ - 1]; }

    void pop() noexcept { --count_; }

    /// False when memory is short; nothing has changed then.
    bool push(const Entry& entry) noexcept
    {
        if (count_ == capacity_ && !grow()) {
            return false;
        }
        entries()[count_++] = entry;
        return true;
    }

private:
    static constexpr uint32_t kInPlace = 32;

    Entry* entries() noexcept { return more_ ? more_.get() : in_place_; }

    bool grow() noexcept
    {
        auto more = make_array<Entry>(uint64_t{capacity_} * 2);
        if (!more) {
            return false;
        }
        std::memcpy(more.get(), entries(), count_ * sizeof(Entry));
        more_ = std::move(more);
        capacity_ *= 2;
        return true;
    }

    owned<Entry[]> more_;
    uint32_t count_ = 0;
    uint32_t capacity_ = kInPlace;
    Entry in_place_[kInPlace];
};

} // namespace kz::xml
