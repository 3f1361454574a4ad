/// @file
/// Looking at everything of a catalogue on servers that means something.
#pragma once

#include <cstdint>
#include <functional>

#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/opening.hpp"
#include "catalogue/store/postgresql/shards.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

/// Store::verify(). Others may go on writing.
void verify(Connection& own, Shards& shards, const Identity& identity,
            const std::function<void(const Fault&)>& report,
            const std::function<bool(uint64_t, uint64_t)>& progress);

} // namespace kzcat::postgresql
