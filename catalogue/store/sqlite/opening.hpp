/// @file
/// From a path to a connection whose file is known to be a catalogue of this format.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "catalogue/store/sqlite/connection.hpp"
#include "catalogue/store/sqlite/sqlite_store.hpp"

namespace kzcat::sqlite {

constexpr int64_t kApplicationId = 0x4b5a4341; // "KZCA"
constexpr int64_t kFormat = 1;                 // user_version

/// What an opening found.
struct Opened {
    std::unique_ptr<Connection> connection; ///< null: the file is empty, and may only be read
    Profile profile = Profile::standard;
};

Opened open_catalogue(const std::string& path, Access access, const SqliteOptions& options);

/// A catalogue in memory without tracks, which stands in for a file that is empty.
Opened open_stand_in(const std::string& path, const SqliteOptions& options);

/// What is missing from the schema, or differs from it, or was added to its tables; empty when it
/// is as it should be.
std::vector<std::string> schema_faults(Connection& connection);

} // namespace kzcat::sqlite
