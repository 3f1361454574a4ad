/// @file
/// A store in one SQLite file: docs/catalogue_file.md describes it.
#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "catalogue/store/store.hpp"

namespace kzcat {

struct SqliteOptions {
    std::chrono::milliseconds patience{10'000}; ///< how long a call waits for another writer
    const char* vfs =
        nullptr; ///< the name of what reads and writes files; null: the system's usual
};

/// Opens a catalogue file. Throws StoreError: cannot_open, newer_version, other_profile, read_only,
/// busy, full, damaged or failed.
///
/// A file that exists and is empty is an empty catalogue, for that is what an interrupted creation
/// leaves. While a file is open its process must not open and close it by other means: POSIX would
/// drop the locks that it holds.
std::unique_ptr<Store> open_sqlite_store(const std::string& path, Access access,
                                         const SqliteOptions& options = {});

} // namespace kzcat
