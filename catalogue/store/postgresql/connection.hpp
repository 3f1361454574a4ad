/// @file
/// libpq with ownership and errors as the catalogue has them: closed by themselves, StoreError
/// instead of numbers.
#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "catalogue/store/postgresql/libpq.hpp"
#include "catalogue/store/postgresql/parameters.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

struct Finish {
    void operator()(PGconn* connection) const noexcept { PQfinish(connection); }
};
struct Clear {
    void operator()(PGresult* result) const noexcept { PQclear(result); }
};

struct ConnectionOptions {
    std::string name = {}; ///< in messages; empty: the address without password
    std::chrono::milliseconds patience{10'000}; ///< how long a statement waits for other writers
    bool read_only = false;
    std::string user = {}; ///< where the address names none; empty: as libpq finds it
    std::string password = {};
    std::string session = {}; ///< SET statements that every session begins with
    bool any_server = false;  ///< a standby will do even if not read_only
};

/// What a statement gave. Rows and columns count from 0.
class Rows {
public:
    explicit Rows(PGresult* result) : result_(result) {}

    int count() const { return PQntuples(result_.get()); }
    bool empty() const { return count() == 0; }

    /// Rows that an INSERT, UPDATE or DELETE changed.
    int64_t affected() const;

    /// Whether the server names this as what it has done, such as "COMMIT".
    bool has_tag(std::string_view tag) const;

    bool is_null(int row, int column) const { return PQgetisnull(result_.get(), row, column) == 1; }

    /// Of a smallint, integer or bigint; 0 when it is NULL.
    int64_t integer(int row, int column) const;
    double real(int row, int column) const; ///< of a double precision
    bool boolean(int row, int column) const;

    /// Both are as they lie in the result, and stay valid with it.
    std::string_view text(int row, int column) const;
    Bytes bytes(int row, int column) const;

private:
    std::unique_ptr<PGresult, Clear> result_;
};

/// A session on a server, whose tables are those of the schema kzcat. One thread at a time.
///
/// When the connection is lost the call that meets this fails; the next one connects again, unless
/// a transaction was open. So it does when memory was too short to end a transaction.
class Connection {
public:
    /// `address` is a URL or "host=... dbname=...". Throws StoreError.
    explicit Connection(std::string address, ConnectionOptions options = {});

    const std::string& name() const { return options_.name; }
    const ConnectionOptions& options() const { return options_; }
    PGconn* handle() const { return connection_.get(); }
    const std::string& address() const { return address_; }
    std::string user() const { return PQuser(handle()); }

    /// Connects again when the session is known to have ended, unless a transaction is open.
    void ensure_connected();

    /// Runs statements that return nothing of interest.
    void execute(const std::string& sql);

    /// Runs one statement. `sql` must be a literal: it is compiled once for a connection.
    template <class... Values>
    Rows query(const char* sql, const Values&... values)
    {
        Parameters parameters;
        (parameters.add(values), ...);
        return run(sql, parameters);
    }

    /// The same for a text that is made for the occasion.
    template <class... Values>
    Rows query_once(const std::string& sql, const Values&... values)
    {
        Parameters parameters;
        (parameters.add(values), ...);
        return run_once(sql, parameters);
    }

    bool in_transaction() const { return depth_ != 0; }

    /// Whether the session is known to have ended.
    bool is_lost() const { return PQstatus(handle()) != CONNECTION_OK; }

private:
    friend class Transaction;

    void connect();
    void configure(PGconn* session);
    Rows run(const char* sql, const Parameters& parameters);
    Rows run_once(const std::string& sql, const Parameters& parameters);
    const std::string& compiled(const char* sql, const Parameters& parameters);
    Rows checked(PGconn* session, PGresult* result);
    Rows checked(PGresult* result) { return checked(handle(), result); }

    using Session = std::unique_ptr<PGconn, Finish>;

    std::string address_;
    ConnectionOptions options_;
    Session connection_;
    std::map<const char*, std::string> compiled_; ///< names, by the address of the text
    uint64_t compilations_ = 0; ///< the server may have compiled what the client could not note
    int depth_ = 0;             ///< transactions within each other
};

/// Undone unless it was committed. One within another is a part of that: only the outer one
/// commits, and it must not when the inner one has failed.
class Transaction {
public:
    enum class Kind {
        moment, ///< for reading only; everything that is read is of one moment
        write,
    };
    Transaction(Connection& connection, Kind kind);
    ~Transaction();
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    bool is_inner() const { return is_inner_; }
    void commit();

private:
    Connection& connection_;
    bool is_inner_;
    bool is_open_ = true;
};

} // namespace kzcat::postgresql
