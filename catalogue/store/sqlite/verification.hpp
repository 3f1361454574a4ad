/// @file
/// Looking at every byte of a catalogue file that means something.
#pragma once

#include <cstdint>
#include <functional>

#include "catalogue/store/sqlite/connection.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat::sqlite {

/// Store::verify(). Reads the file as of one moment; writers go on.
void verify(Connection& connection, Profile profile,
            const std::function<void(const Fault&)>& report,
            const std::function<bool(uint64_t, uint64_t)>& progress);

} // namespace kzcat::sqlite
