/// @file
/// A file descriptor with an owner.
#pragma once

#include <utility>

#include <unistd.h>

namespace audio {

/// A file descriptor that is closed at the end, unless it was only borrowed.
class Descriptor {
public:
    enum Ownership { borrowed, owned };
    Descriptor() = default;
    Descriptor(int number, Ownership ownership) : number_(number), ownership_(ownership) {}
    Descriptor(Descriptor&& other) noexcept
        : number_(std::exchange(other.number_, -1)),
          ownership_(std::exchange(other.ownership_, borrowed))
    {
    }
    Descriptor& operator=(Descriptor&& other) noexcept
    {
        std::swap(number_, other.number_);
        std::swap(ownership_, other.ownership_);
        return *this;
    }
    ~Descriptor()
    {
        if (ownership_ == owned) {
            ::close(number_);
        }
    }
    int number() const { return number_; }

private:
    int number_ = -1;
    Ownership ownership_ = borrowed;
};

} // namespace audio
