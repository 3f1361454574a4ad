// libpq has no codes for refused connections: they are told apart by the server's English texts. A
// server that speaks another language is quoted instead.

#include "catalogue/store/postgresql/failures.hpp"

#include <algorithm>
#include <iterator>

namespace kzcat::postgresql {

namespace {

using Kind = StoreError::Kind;

struct Refusal {
    std::string_view sign;  ///< what libpq's text has in it
    std::string_view other; ///< and this
    std::string_view sentence;
    Kind kind;
    bool quoted; ///< libpq's text is of use
};

// The first one applies whose signs are both in the text.
constexpr Refusal kRefusals[] = {
    {"password authentication failed", "",
     "the server refused the user's password; correct it in the address, in PGPASSWORD or in "
     "~/.pgpass",
     Kind::cannot_open, false},
    {"no password supplied", "",
     "the server wants a password; put it into ~/.pgpass or PGPASSWORD, or into the address as "
     "USER:PASSWORD@HOST",
     Kind::cannot_open, false},
    {"no pg_hba.conf entry", "",
     "the server accepts no connections of this user to this database from this machine; let its "
     "administrator add a line to pg_hba.conf",
     Kind::cannot_open, true},
    {"authentication failed", "",
     "the server does not take this program for that user; name the user in the address, or let "
     "the server's administrator add a line to pg_hba.conf",
     Kind::cannot_open, true},
    {"is not permitted to log in", "",
     "this user may not connect to the server; let its administrator allow that with ALTER ROLE "
     "... LOGIN, or name another user",
     Kind::cannot_open, true},
    {"permission denied for database", "",
     "this user may not connect to that database; let its owner allow that with GRANT CONNECT ON "
     "DATABASE, or name another user",
     Kind::cannot_open, true},
    {"role \"", "does not exist",
     "the server has no such user; name one in the address as USER@HOST, or create it with "
     "createuser",
     Kind::cannot_open, true},
    {"database \"", "does not exist",
     "the server has no such database; create it with createdb, or correct the name in the address",
     Kind::cannot_open, true},
    {"too many clients", "",
     "the server has all the connections that it allows; try again later, or raise its "
     "max_connections",
     Kind::busy, false},
    {"connection slots are reserved", "",
     "the server has all the connections that it allows; try again later, or raise its "
     "max_connections",
     Kind::busy, false},
    {"is starting up", "", "the server is starting; try again in a moment", Kind::busy, false},
    {"is shutting down", "", "the server is stopping; try again when it runs again", Kind::busy,
     false},
    {"is in recovery mode", "", "the server recovers from a crash; try again in a moment",
     Kind::busy, false},
    {"not yet accepting connections", "",
     "the server is starting, and has to read what it has written before; try again in a moment",
     Kind::busy, false},
    {"session is read-only", "",
     "the server is a standby, or allows reading only; name the one that may be written",
     Kind::read_only, true},
    {"is in hot standby mode", "",
     "the server is a standby, which may only be read; name the one that may be written",
     Kind::read_only, true},
    {"FATAL:", "",
     "the server refuses the connection; correct what it names, or ask its administrator",
     Kind::cannot_open, true},
};

/// libpq's texts have several lines, and end with one; their guesses are left out.
std::string in_one_line(std::string_view text)
{
    text = text.substr(0, text.find("\n\tIs the server running"));
    text = text.substr(0, text.find("\n\tThis probably means"));
    std::string line;
    for (const char character : text) {
        if (character == '\n' || character == '\t') {
            if (!line.empty() && line.back() != ' ') {
                line += ' ';
            }
        } else {
            line += character;
        }
    }
    while (!line.empty() && line.back() == ' ') {
        line.pop_back();
    }
    return line;
}

std::string in_seconds(std::chrono::milliseconds patience)
{
    return std::to_string(patience.count() / 1000) + "." +
           std::to_string(patience.count() % 1000 / 100) + " s";
}

struct Failure {
    std::string_view state; ///< how it begins
    std::string_view sign;  ///< what the server's text has in it
    Kind kind;
    std::string_view sentence;
};

// The first one applies whose state and sign are the server's.
constexpr Failure kFailures[] = {
    {"08", "", Kind::failed, ""},
    {"57P", "", Kind::failed, ""}, // ended by an administrator, crashed, starting
    {"40", "conflict with recovery", Kind::busy,
     "the standby had to take over changes to what was being read; try again, or raise its "
     "max_standby_streaming_delay"},
    {"40", "", Kind::busy, "other writers were in the way; try again"},
    {"53100", "", Kind::full,
     "the server's disk is full; nothing was changed: make room there and try again"},
    {"53200", "", Kind::failed, "the server is short of memory; try again later"},
    {"25006", "", Kind::read_only,
     "the server is a standby, or allows reading only; name the one that may be written"},
    {"42501", "", Kind::read_only,
     "this user may not do that; let the owner of the database grant the right, or name another "
     "user"},
    {"42P01", "", Kind::damaged,
     "a table of the catalogue is missing; restore the database from a copy, or make the catalogue "
     "again"},
    {"42703", "", Kind::damaged,
     "a table of the catalogue was changed; restore the database from a copy, or make the "
     "catalogue again"},
    {"3F000", "", Kind::damaged,
     "the tables of the catalogue have gone; restore the database from a copy, or make the "
     "catalogue again"},
    {"XX001", "", Kind::damaged,
     "the server found damaged data; restore the database from a copy, or take what is whole into "
     "a new catalogue with merge"},
    {"XX002", "", Kind::damaged,
     "the server found a damaged index; repair it with REINDEX DATABASE, and then verify"},
    {"54", "", Kind::invalid, "a value is too long to be kept; shorten it"},
    {"42704", "user mapping not found", Kind::cannot_open,
     "the server has no login to the shards for this user; let its administrator make one for each "
     "with CREATE USER MAPPING, or name another user"},
    {"42883", "kz_", Kind::failed,
     "the extension kzmatch of this version is missing in the schema kzcat; install the package "
     "postgresql-15-kzmatch there, then CREATE EXTENSION kzmatch SCHEMA kzcat, or, when it is in "
     "another schema, ALTER EXTENSION kzmatch SET SCHEMA kzcat"},
    {"58P01", "kzmatch", Kind::failed,
     "the server's files of the extension kzmatch are missing; install the package "
     "postgresql-15-kzmatch there"},
};

constexpr std::string_view kNoServer = "could not connect to server \"";

/// A coordinator passes on what a shard has reported with the statement that it had sent there.
bool is_of_shard(const ServerReport& report)
{
    return report.context.find("remote SQL command") != std::string_view::npos;
}

StoreError describe_empty_shard(const std::string& whose, const ServerReport& report)
{
    return {Kind::damaged,
            whose +
                ": a table of the catalogue is missing; let the administrator run kzcat-shards "
                "with all shards in their order, which makes the tables where there are none, "
                "or restore the database from a copy (" +
                in_one_line(report.text) + ")"};
}

/// A coordinator reports its own failures to connect as libpq does, in the detail.
StoreError describe_unreached(const std::string& name, const ServerReport& report)
{
    const std::string_view rest = report.text.substr(kNoServer.size());
    const std::string server(rest.substr(0, rest.find('"')));
    const StoreError refusal = describe_refusal(name + ", server " + server, report.detail);
    return {Kind::failed, refusal.what()};
}

StoreError describe_loss(const std::string& name, const ServerReport& report)
{
    return {Kind::failed, name + ": the connection to the server was lost (" +
                              in_one_line(report.text) +
                              "); check that the server runs, and try again"};
}

StoreError describe_unknown(const std::string& name, const ServerReport& report)
{
    const std::string cure =
        report.hint.empty() ? "check the server's log, then try again" : in_one_line(report.hint);
    return {Kind::failed,
            name + ": the server reported: " + in_one_line(report.text) + "; " + cure};
}

} // namespace

StoreError describe_refusal(const std::string& name, std::string_view text)
{
    const auto* found = std::ranges::find_if(kRefusals, [text](const Refusal& refusal) {
        return text.find(refusal.sign) != std::string_view::npos &&
               text.find(refusal.other) != std::string_view::npos;
    });
    if (found == std::end(kRefusals)) {
        return {Kind::cannot_open, name + ": no server answers there (" + in_one_line(text) +
                                       "); check host and port, and that the server runs"};
    }
    const std::string detail = found->quoted ? " (" + in_one_line(text) + ")" : "";
    return {found->kind, name + ": " + std::string(found->sentence) + detail};
}

StoreError describe_failure(const std::string& name, const ServerReport& report,
                            std::chrono::milliseconds patience)
{
    const std::string whose = is_of_shard(report) ? name + ", one of the shards" : name;
    if (report.state == "55P03") {
        return {Kind::busy, whose + ": another writer has held it for " + in_seconds(patience) +
                                "; try again when that has finished"};
    }
    if (report.state == "08001" && report.text.starts_with(kNoServer)) {
        return describe_unreached(name, report);
    }
    if (report.state == "42P01" && is_of_shard(report)) {
        return describe_empty_shard(whose, report);
    }
    const auto* found = std::ranges::find_if(kFailures, [&report](const Failure& failure) {
        return report.state.starts_with(failure.state) &&
               report.text.find(failure.sign) != std::string_view::npos;
    });
    if (report.state.empty() || (found != std::end(kFailures) && found->sentence.empty())) {
        return describe_loss(whose, report);
    }
    if (found == std::end(kFailures)) {
        return describe_unknown(whose, report);
    }
    return {found->kind,
            whose + ": " + std::string(found->sentence) + " (" + in_one_line(report.text) + ")"};
}

} // namespace kzcat::postgresql
