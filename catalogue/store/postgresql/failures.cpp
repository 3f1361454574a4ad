// libpq has no codes for refused connections: they are told apart by the server's English texts. A
// server that speaks another language is quoted instead.

#include "catalogue/store/postgresql/failures.hpp"

#include <algorithm>
#include <iterator>

namespace kzcat::postgresql {

namespace {

using Kind = StoreError::Kind;

struct Refusal {
    std::string_view sign; ///< what libpq's text has in it
    std::string_view sentence;
    Kind kind;
    bool quoted; ///< libpq's text is of use
};

constexpr Refusal kRefusals[] = {
    {"password authentication failed",
     "the server refused the user's password; correct it in the address, in PGPASSWORD or in "
     "~/.pgpass",
     Kind::cannot_open, false},
    {"no password supplied",
     "the server wants a password; put it into ~/.pgpass or PGPASSWORD, or into the address as "
     "USER:PASSWORD@HOST",
     Kind::cannot_open, false},
    {"no pg_hba.conf entry",
     "the server lets this user in from nowhere near here; let its administrator add a line to "
     "pg_hba.conf",
     Kind::cannot_open, true},
    {"authentication failed",
     "the server does not take this program for that user; name the user in the address, or let "
     "the server's administrator add a line to pg_hba.conf",
     Kind::cannot_open, true},
    {"role \"",
     "the server has no such user; name one in the address as USER@HOST, or create it with "
     "createuser",
     Kind::cannot_open, true},
    {"database \"",
     "the server has no such database; create it with createdb, or correct the name in the address",
     Kind::cannot_open, true},
    {"too many clients",
     "the server has all the connections that it allows; try again later, or raise its "
     "max_connections",
     Kind::busy, false},
    {"connection slots are reserved",
     "the server has all the connections that it allows; try again later, or raise its "
     "max_connections",
     Kind::busy, false},
    {"is starting up", "the server is starting; try again in a moment", Kind::busy, false},
    {"is shutting down", "the server is stopping; try again when it runs again", Kind::busy, false},
    {"session is read-only",
     "the server is a standby, or allows reading only; name the one that may be written",
     Kind::read_only, true},
    {"is in hot standby mode",
     "the server is a standby, which may only be read; name the one that may be written",
     Kind::read_only, true},
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
    Kind kind;
    std::string_view sentence;
};

// The first that fits.
constexpr Failure kFailures[] = {
    {"08", Kind::failed, ""},
    {"57P", Kind::failed, ""}, // ended by an administrator, crashed, starting
    {"40", Kind::busy, "other writers were in the way; try again"},
    {"53100", Kind::full,
     "the server's disk is full; nothing was changed: make room there and try again"},
    {"53200", Kind::failed, "the server is short of memory; try again later"},
    {"25006", Kind::read_only,
     "the server is a standby, or allows reading only; name the one that may be written"},
    {"42501", Kind::read_only,
     "this user may not do that; let the owner of the database grant the right, or name another "
     "user"},
    {"42P01", Kind::damaged,
     "a table of the catalogue is missing; restore the database from a copy, or make the catalogue "
     "again"},
    {"42703", Kind::damaged,
     "a table of the catalogue was changed; restore the database from a copy, or make the "
     "catalogue again"},
    {"3F000", Kind::damaged,
     "the tables of the catalogue have gone; restore the database from a copy, or make the "
     "catalogue again"},
    {"XX001", Kind::damaged,
     "the server found damaged data; restore the database from a copy, or take what is whole into "
     "a new catalogue with merge"},
    {"XX002", Kind::damaged,
     "the server found a damaged index; repair it with REINDEX DATABASE, and then verify"},
    {"54", Kind::invalid, "a value is too long to be kept; shorten it"},
};

} // namespace

StoreError describe_refusal(const std::string& name, std::string_view text)
{
    const auto* found = std::ranges::find_if(kRefusals, [text](const Refusal& refusal) {
        return text.find(refusal.sign) != std::string_view::npos;
    });
    if (found == std::end(kRefusals)) {
        return {Kind::cannot_open, name + ": no server answers there (" + in_one_line(text) +
                                       "); check host and port, and that the server runs"};
    }
    const std::string detail = found->quoted ? " (" + in_one_line(text) + ")" : "";
    return {found->kind, name + ": " + std::string(found->sentence) + detail};
}

StoreError describe_failure(const std::string& name, std::string_view state, std::string_view text,
                            std::chrono::milliseconds patience)
{
    if (state == "55P03") {
        return {Kind::busy, name + ": another writer has held it for " + in_seconds(patience) +
                                "; try again when that has finished"};
    }
    const auto* found = std::ranges::find_if(
        kFailures, [state](const Failure& failure) { return state.starts_with(failure.state); });
    const std::string detail = " (" + in_one_line(text) + ")";
    if (state.empty() || (found != std::end(kFailures) && found->sentence.empty())) {
        return {Kind::failed, name + ": the connection to the server was lost" + detail +
                                  "; check that the server runs, and try again"};
    }
    if (found == std::end(kFailures)) {
        return {Kind::failed, name + ": the server reported: " + in_one_line(text) +
                                  "; check the server's log, then try again"};
    }
    return {found->kind, name + ": " + std::string(found->sentence) + detail};
}

} // namespace kzcat::postgresql
