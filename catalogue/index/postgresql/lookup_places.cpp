/// @file
/// Which servers look-ups go to, and what is wrong with those that do not answer.

#include <algorithm>
#include <iterator>
#include <utility>

#include "catalogue/index/postgresql/lookups.hpp"

namespace kzcat::postgresql {

namespace {

std::string listed(const std::vector<int64_t>& numbers)
{
    std::string text;
    for (const int64_t number : numbers) {
        text += (text.empty() ? "" : ", ") + std::to_string(number);
    }
    return text;
}

} // namespace

void Lookups::refresh()
{
    set_shards({.all = sessions_.with([](Connection& session) {
                    if (session.query("SELECT to_regclass('kzcat.posting')::text").is_null(0, 0)) {
                        throw StoreError(StoreError::Kind::cannot_open,
                                         session.name() + ": the catalogue's shards cannot be "
                                                          "searched through this server yet; let "
                                                          "its administrator run kzcat-shards for "
                                                          "it");
                    }
                    return numbers_in(session.query("SELECT number FROM shard ORDER BY number"));
                }),
                .missing = {}});
    if (!shards_.all.empty()) {
        check_tables();
        check_places();
    }
}

Lookups::Shards Lookups::shards() const
{
    const std::scoped_lock lock(mutex_);
    return shards_;
}

void Lookups::set_shards(Shards shards)
{
    const std::scoped_lock lock(mutex_);
    shards_ = std::move(shards);
}

/// Of a shard without foreign tables nothing would be found, and nobody would miss it.
void Lookups::check_tables()
{
    sessions_.with([](Connection& session) {
        const auto unreachable = numbers_in(session.query(
            "SELECT number FROM kzcat.shard WHERE (SELECT count(*) <> 4 OR count(DISTINCT "
            "ftserver) "
            "<> 1 FROM pg_inherits JOIN pg_class ON oid = inhrelid JOIN pg_foreign_table ON "
            "ftrelid "
            "= oid WHERE inhparent IN (to_regclass('kzcat.trail'), to_regclass('kzcat.tail'), "
            "to_regclass('kzcat.posting'), to_regclass('kzcat.node')) AND "
            "pg_get_expr(relpartbound, "
            "oid) = 'FOR VALUES IN (' || number || ')') ORDER BY number"));
        if (!unreachable.empty()) {
            throw StoreError(StoreError::Kind::cannot_open,
                             session.name() + ": shard " + listed(unreachable) +
                                 " stands in the table kzcat.shard, but look-ups do not reach it, "
                                 "since its foreign tables are missing or are those of several "
                                 "servers; let the administrator run kzcat-shards with all shards "
                                 "in their order");
        }
        return true;
    });
}

/// The addresses that look-ups go to are not those that tracks were added by.
void Lookups::check_places()
{
    const std::string id = sessions_.with([](Connection& session) {
        const Rows rows = session.query("SELECT id FROM kzcat.catalogue");
        return rows.empty() ? std::string() : std::string(rows.text(0, 0));
    });
    const Rows rows = ask([](Connection& session, const std::string& where) {
        return session.query_once(
            "SELECT (SELECT pg_get_expr(relpartbound, oid) FROM pg_class WHERE oid = "
            "node.tableoid), 'FOR VALUES IN (' || shard || ')', catalogue FROM kzcat.node WHERE" +
            where);
    });
    std::vector<std::string> right;
    for (int row = 0; row < rows.count(); ++row) {
        if (rows.text(row, 0) == rows.text(row, 1) && rows.text(row, 2) == id) {
            right.emplace_back(rows.text(row, 0));
        }
    }
    const auto [all, missing] = shards();
    for (const int64_t shard : all) {
        const std::string bound = "FOR VALUES IN (" + std::to_string(shard) + ")";
        if (std::ranges::find(missing, shard) == missing.end() &&
            std::ranges::find(right, bound) == right.end()) {
            throw StoreError(
                StoreError::Kind::cannot_open,
                "shard " + std::to_string(shard) +
                    ": the database that look-ups go to is another part of this catalogue, or "
                    "belongs to another one; correct the shard's address in the table kzcat.shard, "
                    "and run kzcat-shards with all shards in their order, which has its foreign "
                    "server kzcat_shard_" +
                    std::to_string(shard) + " go there too");
        }
    }
}

ShardCoverage Lookups::coverage() const
{
    const std::scoped_lock lock(mutex_);
    const size_t of = std::max<size_t>(shards_.all.size(), 1);
    return {.answered = static_cast<uint32_t>(of - shards_.missing.size()),
            .of = static_cast<uint32_t>(of)};
}

/// What leaves out the servers that do not answer. They are named in the text of a statement: only
/// then does the planner drop them.
std::string Lookups::where() const
{
    const std::scoped_lock lock(mutex_);
    return shards_.missing.empty() ? kEverywhere
                                   : " shard NOT IN (" + listed(shards_.missing) + ")";
}

/// Why a shard does not answer; none when it does.
std::optional<std::string> Lookups::refusal_of(int64_t shard)
{
    try {
        sessions_.with([shard](Connection& session) {
            // The condition has the shard look for the extension, too.
            return session.query_once(
                "SELECT 1 FROM kzcat.trail WHERE shard = " + std::to_string(shard) +
                " AND kzcat.kz_version(track) > 0 LIMIT 1");
        });
        return std::nullopt;
    } catch (const StoreError& error) {
        return error.what();
    }
}

/// After a statement has failed: finds out which servers are the reason, and goes on when none is
/// any more, or a partial answer is wanted and some are left.
void Lookups::look_for_servers(const StoreError& error)
{
    if (error.kind() != StoreError::Kind::failed || shards_.all.empty()) {
        throw error;
    }
    // When the coordinator itself is gone, this says so.
    sessions_.with([](Connection& session) { return session.query_once("SELECT 1"); });
    std::vector<int64_t> missing;
    std::string why;
    for (const int64_t shard : shards_.all) {
        if (const auto refusal = refusal_of(shard)) {
            why = missing.empty() ? *refusal : why;
            missing.push_back(shard);
        }
    }
    if (!missing.empty() && (!partial_ || missing.size() == shards_.all.size())) {
        throw StoreError(StoreError::Kind::failed,
                         (missing.size() == 1 ? "shard " : "shards ") + listed(missing) + " of " +
                             std::to_string(shards_.all.size()) + " gave no answer (" + why +
                             "); start what is down, or accept answers from the others with "
                             "--partial");
    }
    // Those that were missing stay so until refresh(): an answer that is being put together may
    // lack them.
    const std::scoped_lock lock(mutex_);
    auto& known = shards_.missing;
    std::ranges::copy_if(missing, std::back_inserter(known), [&known](int64_t shard) {
        return std::ranges::find(known, shard) == known.end();
    });
}

} // namespace kzcat::postgresql
