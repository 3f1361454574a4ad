/// @file
/// Keeps kzsdk started for as long as an object needs it.
#pragma once

#include <stdexcept>

#include "kzsdk/abs/startup.h"

namespace kzcat {

/// Holds the library, which allocates only while it is held, from construction to destruction.
class LibraryHold {
public:
    LibraryHold()
    {
        if (kzinit_acquire() != KZ_OK) {
            throw std::runtime_error("The sound library has too many users to start once more.");
        }
    }
    LibraryHold(const LibraryHold&) = delete;
    LibraryHold& operator=(const LibraryHold&) = delete;
    ~LibraryHold() { static_cast<void>(kzinit_release()); }
};

} // namespace kzcat
