// Opening and creating catalogues on servers. The tables are made in one transaction, so that
// others see none or all of them.

#include "catalogue/store/postgresql/opening.hpp"

#include "catalogue/store/postgresql/schema.hpp"
#include "catalogue/store/postgresql/writer.hpp"
#include "catalogue/store/row_sum.hpp"
#include "catalogue/store/rules.hpp"

namespace kzcat::postgresql {

namespace {

using Kind = StoreError::Kind;

[[noreturn]] void refuse(Kind kind, const Connection& connection, const std::string& text)
{
    throw StoreError(kind, connection.name() + ": " + text);
}

bool has_table(Connection& connection, std::string_view table)
{
    return connection
               .query("SELECT 1 FROM pg_catalog.pg_tables WHERE schemaname = 'kzcat' AND tablename "
                      "= $1",
                      table)
               .count() == 1;
}

/// Tags and settings are texts of any script.
void check_encoding(Connection& connection)
{
    const Rows rows = connection.query("SELECT current_setting('server_encoding')");
    if (rows.text(0, 0) != "UTF8" && rows.text(0, 0) != "SQL_ASCII") {
        refuse(Kind::cannot_open, connection,
               "the database keeps texts as " + std::string(rows.text(0, 0)) +
                   ", which has no room for every script; make one with createdb --encoding=UTF8 "
                   "--template=template0");
    }
}

/// Waits for others that make tables.
void begin_making(Connection& connection)
{
    connection.query(kTakeTurn);
    check_encoding(connection);
    connection.execute("CREATE SCHEMA IF NOT EXISTS kzcat");
}

/// What looks codes up on the server; without it they are looked up by the programs themselves.
void make_extension(Connection& connection)
{
    if (!connection.query("SELECT 1 FROM pg_available_extensions WHERE name = 'kzmatch'").empty()) {
        connection.execute("CREATE EXTENSION IF NOT EXISTS kzmatch SCHEMA kzcat");
    }
}

void make_node(Connection& connection, std::string_view catalogue, int64_t shard)
{
    make_extension(connection);
    connection.execute(kNodeSchema);
    connection.query("INSERT INTO node (only_row, format, catalogue, shard) VALUES "
                     "(1, $1::bigint, $2, $3::bigint)",
                     int64_t{kFormat}, catalogue, shard);
}

bool has_shards(Connection& connection)
{
    return has_table(connection, "shard") &&
           !connection.query("SELECT 1 FROM shard LIMIT 1").empty();
}

void make_catalogue(Connection& connection)
{
    Transaction transaction(connection, Transaction::Kind::write);
    begin_making(connection);
    if (has_table(connection, "catalogue")) {
        return; // another process was faster
    }
    const std::string id = random_catalogue_id();
    const auto profile = static_cast<int64_t>(Profile::standard);
    if (!has_shards(connection)) {
        make_node(connection, id, 0);
    }
    connection.execute(kCatalogueSchema);
    connection.query("INSERT INTO catalogue (only_row, format, id, profile, crc) VALUES "
                     "(1, $1::bigint, $2, $3, $4)",
                     int64_t{kFormat}, std::string_view{id}, profile, catalogue_sum(id, profile));
    transaction.commit();
}

void check_format(Connection& connection, int64_t format)
{
    if (format > kFormat) {
        throw newer_version(connection.name(), format);
    }
    if (format != kFormat) {
        refuse(Kind::damaged, connection,
               "it is damaged (there is no format " + std::to_string(format) +
                   "); restore the database from a copy, or make the catalogue again");
    }
}

Profile check_profile(Connection& connection, int64_t profile)
{
    const auto usable = static_cast<int64_t>(Profile::standard);
    if (profile != usable) {
        refuse(Kind::other_profile, connection,
               "it has features of profile " + std::to_string(profile) +
                   ", which cannot be compared with those of this version, profile " +
                   std::to_string(usable) +
                   "; use the version that made it, or make it again from the sound");
    }
    return Profile::standard;
}

Identity identify(Connection& connection)
{
    // The format first: another one may have other columns.
    const Rows format = connection.query("SELECT format FROM catalogue");
    if (!format.empty()) {
        check_format(connection, format.integer(0, 0));
    }
    const Rows rows = connection.query("SELECT id, profile FROM catalogue");
    if (rows.empty()) {
        refuse(Kind::damaged, connection,
               "it is damaged (it does not say what it is); restore the database from a copy");
    }
    return {.id = std::string(rows.text(0, 0)),
            .profile = check_profile(connection, rows.integer(0, 1))};
}

void check_rights(Connection& connection)
{
    const Rows rows =
        connection.query("SELECT has_table_privilege('track', 'INSERT') AND "
                         "has_table_privilege('track', 'DELETE'), pg_is_in_recovery()");
    if (rows.boolean(0, 1)) {
        refuse(Kind::read_only, connection,
               "the server is a standby, which may only be read; name the one that may be "
               "written, or several and target_session_attrs=read-write");
    }
    if (!rows.boolean(0, 0)) {
        refuse(Kind::read_only, connection,
               "the user " + connection.user() +
                   " may not write it; let the owner of the database grant the right, or name "
                   "another user");
    }
}

} // namespace

StoreError newer_version(const std::string& name, int64_t format)
{
    return {Kind::newer_version, name + ": a later version made it, in format " +
                                     std::to_string(format) + ", and this one reads format " +
                                     std::to_string(kFormat) + "; update this program"};
}

Opened open_catalogue(const std::string& address, Access access, const PostgresOptions& options)
{
    auto connection = std::make_unique<Connection>(
        address,
        ConnectionOptions{.patience = options.patience, .read_only = access == Access::read});
    if (!has_table(*connection, "catalogue")) {
        if (access != Access::create) {
            refuse(Kind::cannot_open, *connection,
                   "there is no catalogue in this database; check the address, or make the "
                   "catalogue by adding to it");
        }
        make_catalogue(*connection);
    }
    const Identity identity = identify(*connection);
    if (access != Access::read) {
        check_rights(*connection);
    }
    return {.connection = std::move(connection), .identity = identity};
}

void check_shard(Connection& connection, const std::string& catalogue, int64_t shard)
{
    if (!has_table(connection, "node")) {
        if (connection.options().read_only) {
            refuse(Kind::damaged, connection,
                   "it has no tables of a catalogue; restore the database from a copy, or, when "
                   "it is new, let the administrator run kzcat-shards with all shards in their "
                   "order");
        }
        Transaction transaction(connection, Transaction::Kind::write);
        begin_making(connection);
        if (!has_table(connection, "node")) {
            make_node(connection, catalogue, shard);
        }
        transaction.commit();
    }
    const Rows format = connection.query("SELECT format FROM node");
    if (!format.empty()) {
        check_format(connection, format.integer(0, 0));
    }
    const Rows rows = connection.query("SELECT catalogue, shard FROM node");
    if (rows.empty() || rows.text(0, 0) != catalogue || rows.integer(0, 1) != shard) {
        refuse(Kind::cannot_open, connection,
               "its database is another part of this catalogue, or belongs to another one; correct "
               "the address in the table kzcat.shard, and run kzcat-shards with all shards in "
               "their order, which corrects the foreign servers");
    }
}

} // namespace kzcat::postgresql
