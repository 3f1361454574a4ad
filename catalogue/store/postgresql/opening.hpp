/// @file
/// From an address to a session whose database is known to have a catalogue of this format.
#pragma once

#include <memory>
#include <string>

#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat::postgresql {

/// What a catalogue states of itself.
struct Identity {
    std::string id;
    Profile profile = Profile::standard;
};

struct Opened {
    std::unique_ptr<Connection> connection;
    Identity identity;
};

/// Makes the tables when there are none and `access` is create.
Opened open_catalogue(const std::string& address, Access access, const PostgresOptions& options);

/// Checks that a session's database is this part of a catalogue. Makes its tables when there are
/// none, unless the session is for reading only.
void check_shard(Connection& connection, const std::string& catalogue, int64_t shard);

/// The error for a program that is older than what it found.
StoreError newer_version(const std::string& name, int64_t format);

} // namespace kzcat::postgresql
