// Opening and creating catalogue files.
//
// A file is created in one transaction, so that another process sees an empty file or a whole
// catalogue. What is opened is checked before it is used: the application's number, the format,
// every table, index and trigger, and the profile. A file that someone wrote on purpose can
// therefore not make SQLite run anything but the statements of this library.

#include "catalogue/store/sqlite/opening.hpp"

#include <cerrno>
#include <filesystem>
#include <set>
#include <system_error>
#include <thread>
#include <tuple>
#include <utility>

#include "catalogue/store/row_sum.hpp"
#include "catalogue/store/rules.hpp"
#include "catalogue/store/sqlite/schema.hpp"

namespace kzcat::sqlite {

namespace {

namespace fs = std::filesystem;
using Kind = StoreError::Kind;

constexpr int kLongestValue = 1 << 28; ///< bytes; no hostile length leads to more memory than this
static_assert(kMaxCodes * 8 + 1024 <= kLongestValue &&
                  kMaxDocumentBands * 2 + 1024 <= kLongestValue,
              "the limit is on whole rows: the rest of the row needs room too");

[[noreturn]] void refuse(Kind kind, const std::string& path, const std::string& text)
{
    throw StoreError(kind, path + ": " + text);
}

[[noreturn]] void refuse_damaged(const std::string& path, const std::string& why)
{
    refuse(Kind::damaged, path,
           "it is damaged (" + why + "); restore it from a copy, or make it again from the sound");
}

/// Size and time of change: what tells that a file was written.
struct FileState {
    uintmax_t bytes = 0;
    fs::file_time_type changed{};

    bool operator==(const FileState&) const = default;
};

std::optional<FileState> state_of(const std::string& path)
{
    std::error_code error;
    const FileState state{.bytes = fs::file_size(path, error),
                          .changed =
                              error ? fs::file_time_type{} : fs::last_write_time(path, error)};
    return error ? std::nullopt : std::optional(state);
}

bool has_log(const std::string& path)
{
    std::error_code error;
    const uintmax_t bytes = fs::file_size(path + "-wal", error);
    return !error && bytes != 0;
}

void check_path(const std::string& path, Access access)
{
    if (path.empty() || path.find('\0') != std::string::npos) {
        throw StoreError(Kind::invalid, "the path of a catalogue must be a file name; give one");
    }
    std::error_code error;
    const fs::file_status status = fs::status(path, error);
    if (status.type() == fs::file_type::not_found) {
        if (access != Access::create) {
            refuse(Kind::cannot_open, path,
                   "there is no such file; check the path, or make the catalogue by adding to it");
        }
    } else if (error) {
        refuse(Kind::cannot_open, path,
               "it cannot be opened (" + error.message() +
                   "); check the path, and the permissions of its folder");
    } else if (status.type() != fs::file_type::regular) {
        refuse(Kind::cannot_open, path, "it is not a file; give the path of a catalogue file");
    } else if (fs::file_size(path, error) == 1) {
        // SQLite would take it as empty, and overwrite it.
        refuse(Kind::cannot_open, path, "it is not a catalogue; check the path");
    }
}

int64_t integer_of(Connection& connection, const char* sql)
{
    Statement statement(connection, sql);
    return statement.step() ? statement.integer(0) : 0;
}

void configure(Connection& connection, Access access)
{
    sqlite3* database = connection.handle();
    for (const auto& [option, value] :
         {std::pair(SQLITE_DBCONFIG_DEFENSIVE, 1), std::pair(SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0),
          std::pair(SQLITE_DBCONFIG_ENABLE_FKEY, 1), std::pair(SQLITE_DBCONFIG_ENABLE_TRIGGER, 1),
          std::pair(SQLITE_DBCONFIG_ENABLE_VIEW, 0), std::pair(SQLITE_DBCONFIG_DQS_DML, 0)}) {
        connection.check(sqlite3_db_config(database, option, value, nullptr));
    }
    sqlite3_limit(database, SQLITE_LIMIT_LENGTH, kLongestValue);
    connection.execute("PRAGMA cell_size_check = ON; PRAGMA mmap_size = 0;"
                       "PRAGMA temp_store = MEMORY; PRAGMA synchronous = FULL");
    if (access == Access::read) {
        connection.execute("PRAGMA query_only = ON");
    }
}

/// A file that cannot even be read-locked, because it lies where nothing may be written, is read as
/// it stands. Whoever may write there could change it meanwhile: that is noticed after every read.
std::unique_ptr<Connection> open_unlocked(const std::string& path, const SqliteOptions& options)
{
    if (has_log(path)) {
        refuse(Kind::cannot_open, path,
               "its log (" + path +
                   "-wal) must be taken in first, and its folder may not be written; open it once "
                   "where that is allowed, or copy both files to such a folder");
    }
    auto connection = std::make_unique<Connection>(path, OpenOptions{.flags = SQLITE_OPEN_READONLY,
                                                                     .immutable = true,
                                                                     .patience = options.patience,
                                                                     .vfs = options.vfs});
    connection->set_guard([path, before = state_of(path)] {
        if (has_log(path) || state_of(path) != before) {
            refuse(Kind::busy, path, "another process changed it while it was read; open it again");
        }
    });
    configure(*connection, Access::read);
    return connection;
}

std::unique_ptr<Connection> open_locked(const std::string& path, Access access,
                                        const SqliteOptions& options)
{
    const int create = access == Access::create ? SQLITE_OPEN_CREATE : 0;
    auto connection =
        std::make_unique<Connection>(path, OpenOptions{.flags = SQLITE_OPEN_READWRITE | create,
                                                       .immutable = false,
                                                       .patience = options.patience,
                                                       .vfs = options.vfs});
    if (access != Access::read && sqlite3_db_readonly(connection->handle(), "main") == 1) {
        refuse(Kind::read_only, path,
               "it may not be written; change the permissions of the file and of its folder, or "
               "work on a copy");
    }
    configure(*connection, access);
    integer_of(*connection, "PRAGMA user_version"); // the first look at the file itself
    return connection;
}

/// Whether opening failed only because locks cannot be taken where nothing may be written.
bool may_be_unwritable(StoreError::Kind kind)
{
    return kind == Kind::cannot_open || kind == Kind::read_only;
}

std::unique_ptr<Connection> connect(const std::string& path, Access access,
                                    const SqliteOptions& options)
{
    if (access != Access::read) {
        return open_locked(path, access, options);
    }
    std::optional<StoreError> first;
    try {
        return open_locked(path, access, options);
    } catch (const StoreError& error) {
        if (!may_be_unwritable(error.kind())) {
            throw;
        }
        first = error;
    }
    auto connection = open_unlocked(path, options);
    try {
        integer_of(*connection, "PRAGMA user_version");
    } catch (const StoreError&) {
        throw *first;
    }
    return connection;
}

bool is_empty(Connection& connection)
{
    return integer_of(connection, "PRAGMA user_version") == 0 &&
           integer_of(connection, "PRAGMA application_id") == 0 &&
           integer_of(connection, "SELECT count(*) FROM sqlite_schema") == 0;
}

/// Two processes that do this at once may meet a lock for which SQLite does not wait.
void switch_to_log(Connection& connection)
{
    const auto end = std::chrono::steady_clock::now() + connection.patience();
    while (true) {
        errno = 0;
        const int code = sqlite3_exec(connection.handle(), "PRAGMA journal_mode = WAL", nullptr,
                                      nullptr, nullptr);
        if ((code & 0xff) != SQLITE_BUSY || std::chrono::steady_clock::now() > end) {
            connection.check(code);
            return;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
}

void write_schema(Connection& connection)
{
    WriteTransaction transaction(connection);
    if (!is_empty(connection)) {
        return; // another process was faster
    }
    connection.execute(kSchema);
    connection.execute("PRAGMA application_id = 0x4b5a4341; PRAGMA user_version = 1");
    const std::string id = random_catalogue_id();
    const auto profile = static_cast<int64_t>(Profile::standard);
    Statement(connection, "INSERT INTO catalogue (only_row, id, profile, crc) VALUES (1, ?, ?, ?)",
              std::string_view{id}, profile, catalogue_sum(id, profile))
        .run();
    transaction.commit();
}

void create(Connection& connection)
{
    connection.execute("PRAGMA page_size = 8192");
    switch_to_log(connection);
    write_schema(connection);
}

void check_format(Connection& connection)
{
    const std::string& path = connection.path();
    if (integer_of(connection, "PRAGMA application_id") != kApplicationId) {
        refuse(Kind::cannot_open, path,
               "it is a database of another program, not a catalogue; check the path");
    }
    const int64_t format = integer_of(connection, "PRAGMA user_version");
    if (format > kFormat) {
        refuse(Kind::newer_version, path,
               "a later version wrote it, in format " + std::to_string(format) +
                   ", and this one reads format " + std::to_string(kFormat) +
                   "; update this program");
    }
    if (const auto faults = schema_faults(connection); !faults.empty() || format != kFormat) {
        refuse_damaged(path, faults.empty() ? "there is no such format" : faults.front());
    }
}

Profile check_profile(Connection& connection)
{
    Statement row(connection, "SELECT profile FROM catalogue");
    if (!row.step()) {
        refuse_damaged(connection.path(), "it does not say what it is");
    }
    const int64_t profile = row.integer(0);
    const auto usable = static_cast<int64_t>(Profile::standard);
    if (profile != usable) {
        refuse(Kind::other_profile, connection.path(),
               "it has features of profile " + std::to_string(profile) +
                   ", which cannot be compared with those of this version, profile " +
                   std::to_string(usable) +
                   "; use the version that made it, or make it again from the sound");
    }
    return Profile::standard;
}

/// Someone may have switched the file to another kind of log: readers would then block writers.
void ensure_log(Connection& connection)
{
    const auto has_one = [&] {
        Statement mode(connection, "PRAGMA journal_mode");
        return mode.step() && mode.text(0) == "wal";
    };
    if (!has_one()) {
        switch_to_log(connection);
    }
}

struct Object {
    std::string type; ///< "table", "index", "trigger", "view"
    std::string name;
    std::string table;
    std::string sql;

    bool operator<(const Object& other) const
    {
        return std::tie(type, name, table, sql) <
               std::tie(other.type, other.name, other.table, other.sql);
    }
};

std::set<Object> read_schema(Connection& connection)
{
    std::set<Object> objects;
    Statement rows(connection, "SELECT type, name, tbl_name, sql FROM sqlite_schema");
    while (rows.step()) {
        objects.insert({.type = std::string(rows.text(0)),
                        .name = std::string(rows.text(1)),
                        .table = std::string(rows.text(2)),
                        .sql = std::string(rows.text(3))});
    }
    return objects;
}

/// Whether SQLite makes a table of this text and nothing else, whatever stands beside it.
bool creates_table(std::string_view sql) { return sql.starts_with("CREATE TABLE "); }

std::unique_ptr<Connection> make_in_memory(const std::string& path, const SqliteOptions& options)
{
    constexpr int kFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_MEMORY;
    auto connection = std::make_unique<Connection>(path, OpenOptions{.flags = kFlags,
                                                                     .immutable = false,
                                                                     .patience = options.patience,
                                                                     .vfs = nullptr});
    write_schema(*connection);
    return connection;
}

} // namespace

Opened open_stand_in(const std::string& path, const SqliteOptions& options)
{
    auto connection = make_in_memory(path, options);
    configure(*connection, Access::read);
    return {.connection = std::move(connection), .profile = Profile::standard};
}

// Tables of others may lie in the file too, but nothing else: the table that a trigger or an index
// is listed under may be spelled in another way, or be a lie, so it does not show what they act on.
std::vector<std::string> schema_faults(Connection& connection)
{
    static const std::set<Object> wanted = read_schema(*make_in_memory("the schema", {}));
    const std::set<Object> found = read_schema(connection);
    std::set<std::string> tables;
    std::vector<std::string> faults;
    for (const Object& object : wanted) {
        tables.insert(object.table);
        if (!found.contains(object)) {
            faults.push_back("the " + object.type + " " + object.name + " is missing or changed");
        }
    }
    for (const Object& object : found) {
        const bool acts = !object.sql.empty() && !creates_table(object.sql);
        if ((acts || tables.contains(object.table)) && !wanted.contains(object)) {
            faults.push_back("the " + object.type + " " + object.name + " does not belong there");
        }
    }
    return faults;
}

Opened open_catalogue(const std::string& path, Access access, const SqliteOptions& options)
{
    check_path(path, access);
    auto connection = connect(path, access, options);
    if (is_empty(*connection)) {
        if (access == Access::read) {
            return {};
        }
        create(*connection);
    }
    check_format(*connection);
    const Profile profile = check_profile(*connection);
    if (access != Access::read) {
        ensure_log(*connection);
    }
    return {.connection = std::move(connection), .profile = profile};
}

} // namespace kzcat::sqlite
