/// @file
/// The sessions by number. Numbers are given out in rising order, so an old one does not find a new
/// session.
#include "kzsdk/jni/registry.hpp"

#include "kzsdk/jni/lock.hpp"

namespace kz::jni {

int32_t Registry::add(Registered& object) noexcept
{
    const Lock lock(mutex_);
    object.number = next_number();
    object.next = first_;
    first_ = &object;
    return object.number;
}

Registered* Registry::pin(int32_t number) noexcept
{
    const Lock lock(mutex_);
    Registered* const object = *find(number);
    if (object != nullptr) {
        ++object->pins;
    }
    return object;
}

void Registry::unpin(Registered& object) noexcept
{
    const Lock lock(mutex_);
    if (--object.pins == 0) {
        pthread_cond_broadcast(&unpinned_);
    }
}

Registered* Registry::claim(int32_t number) noexcept
{
    const Lock lock(mutex_);
    Registered* const object = *find(number);
    if (object == nullptr || object->claimed) {
        return nullptr;
    }
    object->claimed = true;
    return object;
}

/// Waits until no pin is left. The object is out of the list before, so no new pin can come.
void Registry::remove(Registered& object) noexcept
{
    const Lock lock(mutex_);
    *find(object.number) = object.next;
    while (object.pins != 0) {
        pthread_cond_wait(&unpinned_, &mutex_);
    }
}

/// The link that leads to the object, or the null link at the end.
Registered** Registry::find(int32_t number) noexcept
{
    Registered** link = &first_;
    while (*link != nullptr && (*link)->number != number) {
        link = &(*link)->next;
    }
    return link;
}

/// After 2^32 sessions numbers begin again; 0 and those still in use are passed over.
int32_t Registry::next_number() noexcept
{
    do {
        last_number_ = static_cast<int32_t>(int64_t{last_number_} + 1);
    } while (last_number_ == 0 || *find(last_number_) != nullptr);
    return last_number_;
}

} // namespace kz::jni
