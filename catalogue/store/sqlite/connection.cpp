// SQLite's handles and results. A statement is compiled once and used again; where one runs inside
// another run of itself, the inner one is compiled for the occasion.

#include "catalogue/store/sqlite/connection.hpp"

#include <cerrno>
#include <cstring>
#include <limits>
#include <new>
#include <system_error>
#include <utility>

namespace kzcat::sqlite {

namespace {

using Kind = StoreError::Kind;

/// A path as SQLite takes it without seeing anything special in it.
std::string to_uri(const std::string& path, bool immutable)
{
    std::string uri = path.starts_with('/') ? "file://" : "file:./";
    for (const char character : path) {
        const auto byte = static_cast<unsigned char>(character);
        if (std::strchr("%?#", character) != nullptr || byte < 0x20 || byte > 0x7e) {
            uri += '%';
            uri += "0123456789ABCDEF"[byte >> 4U];
            uri += "0123456789ABCDEF"[byte & 0xfU];
        } else {
            uri += character;
        }
    }
    return immutable ? uri + "?immutable=1" : uri;
}

bool is_out_of_room(int code, int system_error)
{
    const bool is_write = code == SQLITE_IOERR_WRITE || code == SQLITE_IOERR_FSYNC ||
                          code == SQLITE_IOERR_TRUNCATE || code == SQLITE_IOERR_SHMSIZE ||
                          code == SQLITE_IOERR_DIR_FSYNC || code == SQLITE_IOERR_CLOSE;
    return (code & 0xff) == SQLITE_FULL ||
           (is_write &&
            (system_error == ENOSPC || system_error == EDQUOT || system_error == EFBIG));
}

Kind kind_of(int code, int system_error)
{
    if (is_out_of_room(code, system_error)) {
        return Kind::full;
    }
    switch (code & 0xff) {
    case SQLITE_BUSY:
    case SQLITE_LOCKED:
        return Kind::busy;
    case SQLITE_READONLY:
    case SQLITE_PERM:
    case SQLITE_AUTH:
        return Kind::read_only;
    case SQLITE_CANTOPEN:
    case SQLITE_NOTADB:
        return Kind::cannot_open;
    case SQLITE_CORRUPT:
        return Kind::damaged;
    case SQLITE_TOOBIG:
        return Kind::invalid;
    default:
        return Kind::failed;
    }
}

std::string seconds(std::chrono::milliseconds patience)
{
    return std::to_string(patience.count() / 1000) + "." +
           std::to_string(patience.count() % 1000 / 100) + " s";
}

std::string sentence(Kind kind, int code, std::chrono::milliseconds patience,
                     const std::string& detail)
{
    switch (kind) {
    case Kind::full:
        return "the disk or a quota is full; nothing was changed: make room and try again";
    case Kind::busy:
        return "another writer has held it for " + seconds(patience) +
               "; try again when that has finished";
    case Kind::read_only:
        return "it may not be written; change the permissions of the file and of its folder, or "
               "work on a copy";
    case Kind::damaged:
        return "it is damaged (" + detail +
               "); find out what with verify, and take what is whole into a new catalogue with "
               "merge";
    case Kind::cannot_open:
        return code == SQLITE_NOTADB
                   ? "it is not a catalogue; check the path"
                   : "it cannot be opened (" + detail +
                         "); check the path, and the permissions of the file and of its folder";
    case Kind::invalid:
        return "a value is too long to be kept; shorten it";
    default:
        return detail + "; check the disk and the system's messages, then try again";
    }
}

} // namespace

StoreError describe(int code, int system_error, const std::string& path,
                    std::chrono::milliseconds patience, const char* detail)
{
    const Kind kind = kind_of(code, system_error);
    std::string full_detail = detail;
    if (system_error != 0 && (kind == Kind::failed || kind == Kind::cannot_open)) {
        full_detail += ": " + std::generic_category().message(system_error);
    }
    return {kind, path + ": " + sentence(kind, code & 0xff, patience, full_detail)};
}

Connection::Connection(const std::string& path, const OpenOptions& options)
    : path_(path), patience_(options.patience)
{
    sqlite3* database = nullptr;
    errno = 0;
    const int flags = options.flags | SQLITE_OPEN_URI | SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_EXRESCODE;
    const int code =
        sqlite3_open_v2(to_uri(path, options.immutable).c_str(), &database, flags, options.vfs);
    database_.reset(database);
    if (database == nullptr) {
        throw std::bad_alloc();
    }
    check(code);
    check(sqlite3_busy_timeout(database, static_cast<int>(options.patience.count())));
    sqlite3_stmt* rollback = nullptr;
    check(sqlite3_prepare_v3(database, "ROLLBACK", -1, SQLITE_PREPARE_PERSISTENT, &rollback,
                             nullptr));
    rollback_.reset(rollback);
}

// A step that finds memory short rolls nothing back, but the next one may.
void Connection::roll_back() noexcept
{
    constexpr int kAttempts = 2;
    for (int i = 0; i < kAttempts && sqlite3_get_autocommit(handle()) == 0; ++i) {
        sqlite3_step(rollback_.get());
        sqlite3_reset(rollback_.get());
    }
}

void Connection::execute(const char* sql)
{
    errno = 0;
    check(sqlite3_exec(handle(), sql, nullptr, nullptr, nullptr));
}

// SQLite does not note why the system refused what a COMMIT asked for, but leaves errno alone.
void Connection::fail(int code) const
{
    const int system_error = errno != 0 ? errno : sqlite3_system_errno(handle());
    if (code == SQLITE_NOMEM || code == SQLITE_IOERR_NOMEM) {
        throw std::bad_alloc();
    }
    throw describe(code, system_error, path_, patience_, sqlite3_errstr(code));
}

Statement::Statement(Connection& connection, const char* sql, Prepare) : connection_(connection)
{
    Connection::Compiled& compiled = connection.compiled_[sql];
    const bool is_first = compiled.statement == nullptr;
    if (is_first || compiled.in_use) {
        errno = 0;
        sqlite3_stmt* statement = nullptr;
        connection.check(sqlite3_prepare_v3(connection.handle(), sql, -1,
                                            is_first ? SQLITE_PREPARE_PERSISTENT : 0, &statement,
                                            nullptr));
        (is_first ? compiled.statement : own_).reset(statement);
    }
    if (own_ == nullptr) {
        kept_ = &compiled;
        kept_->in_use = true;
    }
    statement_ = kept_ != nullptr ? kept_->statement.get() : own_.get();
}

Statement::~Statement()
{
    sqlite3_reset(statement_);
    if (kept_ != nullptr) {
        sqlite3_clear_bindings(statement_);
        kept_->in_use = false;
    }
}

bool Statement::step()
{
    errno = 0;
    const int code = sqlite3_step(statement_);
    if (connection_.guard_) {
        connection_.guard_();
    }
    if (code != SQLITE_ROW && code != SQLITE_DONE) {
        connection_.fail(code);
    }
    return code == SQLITE_ROW;
}

bool Statement::is_null(int column) const
{
    return sqlite3_column_type(statement_, column) == SQLITE_NULL;
}

int64_t Statement::integer(int column) const { return sqlite3_column_int64(statement_, column); }

double Statement::real(int column) const { return sqlite3_column_double(statement_, column); }

std::string_view Statement::text(int column) const
{
    const auto* bytes = reinterpret_cast<const char*>(sqlite3_column_text(statement_, column));
    if (bytes == nullptr) {
        if (!is_null(column)) {
            throw std::bad_alloc();
        }
        return {};
    }
    return {bytes, static_cast<size_t>(sqlite3_column_bytes(statement_, column))};
}

std::span<const std::byte> Statement::blob(int column) const
{
    const auto* bytes = static_cast<const std::byte*>(sqlite3_column_blob(statement_, column));
    const auto count = static_cast<size_t>(sqlite3_column_bytes(statement_, column));
    if (bytes == nullptr && sqlite3_errcode(connection_.handle()) == SQLITE_NOMEM) {
        throw std::bad_alloc();
    }
    return bytes == nullptr ? std::span<const std::byte>() : std::span(bytes, count);
}

void Statement::bind(int place, int64_t value)
{
    connection_.check(sqlite3_bind_int64(statement_, place, value));
}

// A null pointer would be bound as NULL.
void Statement::bind(int place, std::string_view value)
{
    connection_.check(sqlite3_bind_text64(statement_, place, value.empty() ? "" : value.data(),
                                          value.size(), SQLITE_STATIC, SQLITE_UTF8));
}

void Statement::bind(int place, std::span<const std::byte> value)
{
    connection_.check(sqlite3_bind_blob64(
        statement_, place, value.empty() ? "" : static_cast<const void*>(value.data()),
        value.size(), SQLITE_STATIC));
}

void Statement::bind(int place, const std::optional<int64_t>& value)
{
    if (value) {
        bind(place, *value);
    } else {
        connection_.check(sqlite3_bind_null(statement_, place));
    }
}

void Statement::bind(int place, const std::optional<std::span<const std::byte>>& value)
{
    if (value) {
        bind(place, *value);
    } else {
        connection_.check(sqlite3_bind_null(statement_, place));
    }
}

ReadTransaction::ReadTransaction(Connection& connection) : connection_(connection)
{
    if (connection.open_reads_ == 0) {
        connection.roll_back(); // what could not be rolled back for want of memory
        Statement(connection, "BEGIN").run();
    }
    ++connection.open_reads_;
}

ReadTransaction::~ReadTransaction()
{
    if (--connection_.open_reads_ == 0) {
        connection_.roll_back(); // there is nothing to keep
    }
}

WriteTransaction::WriteTransaction(Connection& connection) : connection_(connection)
{
    if (connection.open_reads_ != 0) {
        throw StoreError(Kind::invalid, connection.path() +
                                            ": a function that visits tracks must not change the "
                                            "catalogue; collect what to do, and do it afterwards");
    }
    connection.roll_back(); // what could not be rolled back for want of memory
    Statement(connection, "BEGIN IMMEDIATE").run();
}

WriteTransaction::~WriteTransaction() { connection_.roll_back(); }

void WriteTransaction::commit() { Statement(connection_, "COMMIT").run(); }

} // namespace kzcat::sqlite
