/// @file
/// Finding on PostgreSQL servers: what is counted, ranked and scanned is done where the tracks are.
#pragma once

#include <memory>
#include <string>

#include "catalogue/index/index.hpp"

namespace kzcat {

/// An index over a catalogue at `options.server`, or null when the server has no means of searching
/// and the catalogue is small: it is then searched in memory. Throws StoreError.
std::unique_ptr<Index> open_postgres_index(Store& store, const IndexOptions& options);

} // namespace kzcat
