// Catalogue files for tests: changed by hand, looked at as bytes, opened without rights.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <stdexcept>
#include <string>

#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include "catalogue/store/sqlite/sqlite_store.hpp"
#include "tests/catalogue/store/tracks.hpp"
#include "tests/support/scratch_directory.hpp"

namespace kzcat::test {

/// Any database, without the checks of a catalogue.
class Database {
public:
    explicit Database(const std::string& path)
    {
        if (sqlite3_open(path.c_str(), &database_) != SQLITE_OK) {
            throw std::runtime_error(path);
        }
    }
    ~Database() { sqlite3_close(database_); }
    Database(const Database&) = delete;
    Database& operator=(const Database&) = delete;

    void execute(const std::string& sql)
    {
        if (sqlite3_exec(database_, sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK) {
            throw std::runtime_error(sql + ": " + sqlite3_errmsg(database_));
        }
    }

private:
    sqlite3* database_ = nullptr;
};

inline std::string read_file(const std::string& path)
{
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

inline void write_file(const std::string& path, const std::string& bytes)
{
    std::ofstream(path, std::ios::binary) << bytes;
}

/// A closed catalogue with the tracks 1 to `count`.
inline void make_catalogue(const std::string& path, uint64_t count)
{
    add_tracks(*open_sqlite_store(path, Access::create), 1, count);
}

/// Runs `act` in a process of its own that may do no more than any user; true when it gives true.
inline bool run_without_rights(const std::function<bool()>& act)
{
    constexpr uid_t kNobody = 65534;
    const pid_t child = fork();
    if (child == 0) {
        if (geteuid() == 0 && (setgid(kNobody) != 0 || setuid(kNobody) != 0)) {
            _exit(3);
        }
        bool good = false;
        try {
            good = act();
        } catch (const std::exception& error) {
            std::fprintf(stderr, "%s\n", error.what());
        }
        _exit(good ? 0 : 1);
    }
    int status = -1;
    waitpid(child, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

/// The kind of error that `act` ends with, and its text; fails when there is none.
struct Failure {
    StoreError::Kind kind;
    std::string text;
};

inline Failure failure_of(const std::function<void()>& act)
{
    try {
        act();
    } catch (const StoreError& error) {
        return {error.kind(), error.what()};
    }
    throw std::runtime_error("nothing was thrown");
}

} // namespace kzcat::test
