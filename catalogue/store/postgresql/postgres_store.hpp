/// @file
/// A store in a PostgreSQL database, or in one for the tracks' names and several for their codes:
/// docs/catalogue_server.md describes it.
#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "catalogue/store/postgresql/place.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat {

namespace postgresql {
class Connection;
}

struct PostgresOptions {
    std::chrono::milliseconds patience{10'000}; ///< how long a call waits for another writer
};

/// Opens the catalogue at a server's address. Throws StoreError: cannot_open, newer_version,
/// other_profile, read_only, busy, full, damaged, invalid or failed.
///
/// When the connection is lost the call that meets this fails, and has changed nothing or, when it
/// was lost while the server committed, everything. The next call connects again.
std::unique_ptr<Store> open_postgres_store(const std::string& address, Access access,
                                           const PostgresOptions& options = {});

/// The session of a store that open_postgres_store() gave: what changes within a transaction of it
/// is kept or undone together with what else the transaction does.
postgresql::Connection& connection_of(Store& store);

} // namespace kzcat
