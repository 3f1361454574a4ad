/// @file
/// SQLite with ownership and errors as the catalogue has them: closed by themselves, StoreError
/// instead of numbers.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include <sqlite3.h>

#include "catalogue/store/store.hpp"

namespace kzcat::sqlite {

struct Close {
    void operator()(sqlite3* database) const noexcept { sqlite3_close_v2(database); }
};
struct Finalize {
    void operator()(sqlite3_stmt* statement) const noexcept { sqlite3_finalize(statement); }
};

struct OpenOptions {
    int flags = 0; ///< SQLITE_OPEN_...
    bool immutable = false;
    std::chrono::milliseconds patience{0};
    const char* vfs = nullptr;
};

/// An open database file. One thread at a time.
class Connection {
public:
    /// `path` is taken literally: no name is special.
    Connection(const std::string& path, const OpenOptions& options);

    /// Called after whatever was read; throws when that cannot be trusted. May be empty.
    void set_guard(std::function<void()> guard) { guard_ = std::move(guard); }

    sqlite3* handle() const { return database_.get(); }
    const std::string& path() const { return path_; }
    std::chrono::milliseconds patience() const { return patience_; }

    /// Runs statements that return nothing of interest.
    void execute(const char* sql);

    /// Throws what the result of the last SQLite call means; std::bad_alloc when memory was short.
    [[noreturn]] void fail(int code) const;
    void check(int code) const
    {
        if (code != SQLITE_OK) {
            fail(code);
        }
    }

private:
    void roll_back() noexcept;

    friend class Statement;
    friend class ReadTransaction;
    friend class WriteTransaction;

    /// A compiled statement, kept for the next time.
    struct Compiled {
        std::unique_ptr<sqlite3_stmt, Finalize> statement;
        bool in_use = false;
    };

    std::string path_;
    std::chrono::milliseconds patience_;
    std::unique_ptr<sqlite3, Close> database_;
    std::unique_ptr<sqlite3_stmt, Finalize> rollback_; ///< compiled early: it needs no memory
    std::map<const char*, Compiled> compiled_; ///< by the address of the text; goes before the file
    std::function<void()> guard_;
    int open_reads_ = 0;
};

/// What a call of SQLite means for a catalogue, as a sentence with a cure.
StoreError describe(int code, int system_error, const std::string& path,
                    std::chrono::milliseconds patience, const char* detail);

/// One run of a statement. `sql` must be a literal: it is compiled once for a connection.
class Statement {
public:
    template <class... Values>
    Statement(Connection& connection, const char* sql, const Values&... values)
        : Statement(connection, sql, Prepare{})
    {
        int place = 0;
        (bind(++place, values), ...);
    }
    ~Statement();
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;

    /// Goes to the next row; false when there is none.
    bool step();

    /// Runs to the end.
    void run()
    {
        while (step()) {
        }
    }

    bool is_null(int column) const;
    int64_t integer(int column) const;
    double real(int column) const;

    /// Both stay valid until the next step.
    std::string_view text(int column) const;
    std::span<const std::byte> blob(int column) const;

private:
    struct Prepare {};
    Statement(Connection& connection, const char* sql, Prepare);

    void bind(int place, int64_t value);
    void bind(int place, std::string_view value);
    void bind(int place, std::span<const std::byte> value);
    void bind(int place, const std::optional<int64_t>& value);
    void bind(int place, const std::optional<std::span<const std::byte>>& value);

    Connection& connection_;
    Connection::Compiled* kept_ = nullptr; ///< null: `own_` is used
    std::unique_ptr<sqlite3_stmt, Finalize> own_;
    sqlite3_stmt* statement_ = nullptr;
};

/// Everything that is read while it lives is of one moment. May be nested.
class ReadTransaction {
public:
    explicit ReadTransaction(Connection& connection);
    ~ReadTransaction();
    ReadTransaction(const ReadTransaction&) = delete;
    ReadTransaction& operator=(const ReadTransaction&) = delete;

private:
    Connection& connection_;
};

/// Undone unless it was committed. Waits for other writers.
class WriteTransaction {
public:
    explicit WriteTransaction(Connection& connection);
    ~WriteTransaction();
    WriteTransaction(const WriteTransaction&) = delete;
    WriteTransaction& operator=(const WriteTransaction&) = delete;

    void commit();

private:
    Connection& connection_;
};

} // namespace kzcat::sqlite
