// Statements are compiled by the server once for a connection and then called by name. All values
// travel in binary.

#include "catalogue/store/postgresql/connection.hpp"

#include <array>
#include <bit>
#include <cstdlib>
#include <new>
#include <tuple>
#include <utility>

#include <poll.h>

#include "catalogue/store/postgresql/address.hpp"
#include "catalogue/store/postgresql/failures.hpp"
#include "catalogue/store/postgresql/place.hpp"

namespace kzcat::postgresql {

namespace {

using StoreKind = StoreError::Kind;

/// Takes no part of the address and of what it leaves open from what others may have set. Locks go
/// with the session: a client whose machine has gone without a word holds them for a minute.
constexpr const char* kSession =
    "SET search_path = kzcat, pg_catalog; SET client_min_messages = warning; "
    "SET default_transaction_isolation = 'read committed'; SET standard_conforming_strings = on; "
    "SET bytea_output = 'hex'; SET tcp_keepalives_idle = 30; SET tcp_keepalives_interval = 10; "
    "SET tcp_keepalives_count = 3; SET tcp_user_timeout = 40000; ";

uint64_t number_from(const char* bytes, int count)
{
    uint64_t number = 0;
    for (int i = 0; i < count; ++i) {
        number = (number << 8U) | static_cast<unsigned char>(bytes[i]);
    }
    return number;
}

/// Sees what a server has sent that ended the session: first why, then the end.
void look_for_end(PGconn* connection)
{
    pollfd socket = {.fd = PQsocket(connection), .events = POLLIN, .revents = 0};
    for (int i = 0; i < 2 && socket.fd >= 0 && ::poll(&socket, 1, 0) > 0; ++i) {
        PQconsumeInput(connection);
        socket.fd = PQsocket(connection);
    }
}

/// Whether a session can be used for the next call. One whose transaction could not be ended, since
/// memory was short, cannot: what was begun there goes with it.
bool is_ready(PGconn* connection)
{
    return PQstatus(connection) == CONNECTION_OK && PQtransactionStatus(connection) == PQTRANS_IDLE;
}

} // namespace

int64_t Rows::affected() const
{
    const char* text = PQcmdTuples(result_.get());
    return std::strtoll(text, nullptr, 10);
}

bool Rows::has_tag(std::string_view tag) const { return PQcmdStatus(result_.get()) == tag; }

int64_t Rows::integer(int row, int column) const
{
    const char* bytes = PQgetvalue(result_.get(), row, column);
    switch (const int count = PQgetlength(result_.get(), row, column)) {
    case 2:
        return std::bit_cast<int16_t>(static_cast<uint16_t>(number_from(bytes, count)));
    case 4:
        return std::bit_cast<int32_t>(static_cast<uint32_t>(number_from(bytes, count)));
    case 8:
        return std::bit_cast<int64_t>(number_from(bytes, count));
    default:
        return 0;
    }
}

double Rows::real(int row, int column) const
{
    return std::bit_cast<double>(number_from(PQgetvalue(result_.get(), row, column),
                                             PQgetlength(result_.get(), row, column)));
}

bool Rows::boolean(int row, int column) const
{
    return PQgetlength(result_.get(), row, column) == 1 &&
           *PQgetvalue(result_.get(), row, column) != 0;
}

std::string_view Rows::text(int row, int column) const
{
    return {PQgetvalue(result_.get(), row, column),
            static_cast<size_t>(PQgetlength(result_.get(), row, column))};
}

Bytes Rows::bytes(int row, int column) const { return std::as_bytes(std::span(text(row, column))); }

Connection::Connection(std::string address, ConnectionOptions options)
    : address_(std::move(address)), options_(std::move(options))
{
    if (options_.name.empty()) {
        options_.name = shown_place(address_);
    }
    check_address(address_, options_.name);
    connect();
}

// What stands before the address is overridden by it, and what stands after it overrides it. Of
// several hosts the first that may be written serves a writer. A host that has gone without a word
// is noticed within a minute, whether it was sent something or something is awaited from it.
void Connection::connect()
{
    const bool any = options_.read_only || options_.any_server;
    const std::array<std::pair<const char*, const char*>, 11> settings = {{
        {"connect_timeout", "10"},
        {"keepalives_idle", "30"},
        {"keepalives_interval", "10"},
        {"keepalives_count", "3"},
        {"tcp_user_timeout", "40000"},
        {"fallback_application_name", "kzcat"},
        {"user", options_.user.c_str()},
        {"password", options_.password.c_str()},
        {"dbname", address_.c_str()},
        {"target_session_attrs", any ? "" : "read-write"},
        {nullptr, nullptr},
    }};
    std::array<const char*, settings.size()> names = {};
    std::array<const char*, settings.size()> values = {};
    for (size_t i = 0; i < settings.size(); ++i) {
        std::tie(names[i], values[i]) = settings[i];
    }
    Session fresh(PQconnectdbParams(names.data(), values.data(), 1));
    if (fresh == nullptr) {
        throw std::bad_alloc();
    }
    configure(fresh.get());
    compiled_.clear();
    connection_ = std::move(fresh);
}

void Connection::configure(PGconn* session)
{
    if (PQstatus(session) != CONNECTION_OK) {
        throw describe_refusal(name(), PQerrorMessage(session));
    }
    PQsetNoticeProcessor(
        session, [](void*, const char*) {}, nullptr);
    if (PQsetClientEncoding(session, "UTF8") != 0) {
        throw describe_refusal(name(), PQerrorMessage(session));
    }
    const std::string settings =
        kSession + ("SET lock_timeout = " + std::to_string(options_.patience.count())) +
        (options_.read_only ? "; SET default_transaction_read_only = on; " : "; ") +
        options_.session;
    checked(session, PQexec(session, settings.c_str()));
}

void Connection::ensure_connected()
{
    if (!in_transaction()) {
        look_for_end(handle());
        if (!is_ready(handle())) {
            connect();
        }
    }
}

Rows Connection::checked(PGconn* session, PGresult* result)
{
    Rows rows(result);
    const ExecStatusType status = PQresultStatus(result);
    if (status == PGRES_TUPLES_OK || status == PGRES_COMMAND_OK || status == PGRES_EMPTY_QUERY) {
        return rows;
    }
    const auto field = [result](int code) {
        const char* text = result == nullptr ? nullptr : PQresultErrorField(result, code);
        return std::string_view(text == nullptr ? "" : text);
    };
    const std::string_view state = field(PG_DIAG_SQLSTATE);
    if (state.empty() && PQstatus(session) == CONNECTION_OK) {
        throw std::bad_alloc(); // the only failure of libpq's own
    }
    const std::string_view text = field(PG_DIAG_MESSAGE_PRIMARY);
    throw describe_failure(name(),
                           {.state = state,
                            .text = text.empty() ? PQerrorMessage(session) : text,
                            .detail = field(PG_DIAG_MESSAGE_DETAIL),
                            .hint = field(PG_DIAG_MESSAGE_HINT),
                            .context = field(PG_DIAG_CONTEXT)},
                           options_.patience);
}

void Connection::execute(const std::string& sql)
{
    ensure_connected();
    checked(PQexec(handle(), sql.c_str()));
}

const std::string& Connection::compiled(const char* sql, const Parameters& parameters)
{
    const auto [place, is_new] = compiled_.try_emplace(sql);
    if (is_new) {
        try {
            std::string statement = "s";
            statement += std::to_string(++compilations_);
            checked(PQprepare(handle(), statement.c_str(), sql, parameters.count(),
                              parameters.types()));
            place->second = statement;
        } catch (...) {
            compiled_.erase(place);
            throw;
        }
    }
    return place->second;
}

Rows Connection::run(const char* sql, const Parameters& parameters)
{
    ensure_connected();
    const std::string& statement = compiled(sql, parameters);
    return checked(PQexecPrepared(handle(), statement.c_str(), parameters.count(),
                                  parameters.values(), parameters.lengths(), parameters.formats(),
                                  1));
}

Rows Connection::run_once(const std::string& sql, const Parameters& parameters)
{
    ensure_connected();
    return checked(PQexecParams(handle(), sql.c_str(), parameters.count(), parameters.types(),
                                parameters.values(), parameters.lengths(), parameters.formats(),
                                1));
}

Transaction::Transaction(Connection& connection, Kind kind)
    : connection_(connection), is_inner_(connection.in_transaction())
{
    if (!is_inner_) {
        connection.execute(kind == Kind::moment ? "BEGIN ISOLATION LEVEL REPEATABLE READ READ ONLY"
                                                : "BEGIN ISOLATION LEVEL READ COMMITTED");
    }
    ++connection.depth_;
}

Transaction::~Transaction()
{
    --connection_.depth_;
    if (!is_inner_ && is_open_) {
        PQclear(PQexec(connection_.handle(), "ROLLBACK"));
    }
}

void Transaction::commit()
{
    if (!is_inner_) {
        const Rows done = connection_.checked(PQexec(connection_.handle(), "COMMIT"));
        is_open_ = false;
        if (!done.has_tag(
                "COMMIT")) { // the server rolls back what has failed, and reports no error
            throw StoreError(StoreKind::failed, connection_.name() +
                                                    ": a part of the work failed, and nothing was "
                                                    "changed; try again");
        }
    }
    is_open_ = false;
}

} // namespace kzcat::postgresql
