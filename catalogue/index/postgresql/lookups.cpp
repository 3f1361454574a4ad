/// @file
/// The statements of look-ups.

#include "catalogue/index/postgresql/lookups.hpp"

#include <algorithm>
#include <iterator>
#include <utility>

namespace kzcat::postgresql {

namespace {

template <class Value, class Read>
std::vector<Value> joined(const Rows& rows, Read read)
{
    std::vector<Value> all;
    for (int row = 0; row < rows.count(); ++row) {
        if (!rows.is_null(row, 1)) {
            const auto some = read(rows.bytes(row, 1));
            all.insert(all.end(), some.begin(), some.end());
        }
    }
    return all;
}

std::vector<RankedPlace> joined_places(const Rows& rows)
{
    return joined<RankedPlace>(rows, [](Bytes bytes) { return to_places(bytes); });
}

constexpr const char* kEverywhere = " true";

std::string listed(const std::vector<int64_t>& numbers)
{
    std::string text;
    for (const int64_t number : numbers) {
        text += (text.empty() ? "" : ", ") + std::to_string(number);
    }
    return text;
}

} // namespace

const char* const kCountStatement = "SELECT shard, kzcat.kz_count(segment, list, words, $2) "
                                    "FROM kzcat.posting WHERE list = ANY ($1) GROUP BY shard";

const char* const kRankStatement = "SELECT shard, kzcat.kz_rank(track, codes, $2) "
                                   "FROM kzcat.trail WHERE track = ANY ($1) GROUP BY shard";

Lookups::Lookups(std::string address, bool partial)
    : sessions_(std::move(address)), partial_(partial)
{
}

void Lookups::refresh()
{
    const auto read = [](Connection& session) {
        std::vector<int64_t> shards;
        const Rows rows = session.query("SELECT number FROM shard ORDER BY number");
        for (int row = 0; row < rows.count(); ++row) {
            shards.push_back(rows.integer(row, 0));
        }
        if (session.query("SELECT to_regclass('kzcat.posting')::text").is_null(0, 0)) {
            throw StoreError(StoreError::Kind::cannot_open,
                             session.name() +
                                 ": the catalogue's shards cannot be searched through this server "
                                 "yet; let its administrator run kzcat-shards for it");
        }
        return shards;
    };
    shards_ = sessions_.with(read);
    const std::scoped_lock lock(mutex_);
    missing_.clear();
}

ShardCoverage Lookups::coverage() const
{
    const std::scoped_lock lock(mutex_);
    const size_t of = std::max<size_t>(shards_.size(), 1);
    return {.answered = static_cast<uint32_t>(of - missing_.size()),
            .of = static_cast<uint32_t>(of)};
}

/// What leaves out the servers that do not answer. They are named in the text of a statement: only
/// then does the planner drop them.
std::string Lookups::where() const
{
    const std::scoped_lock lock(mutex_);
    return missing_.empty() ? kEverywhere : " shard NOT IN (" + listed(missing_) + ")";
}

/// Why a shard does not answer; none when it does.
std::optional<std::string> Lookups::refusal_of(int64_t shard)
{
    try {
        sessions_.with([shard](Connection& session) {
            return session.query_once(
                "SELECT 1 FROM kzcat.trail WHERE shard = " + std::to_string(shard) + " LIMIT 1");
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
    if (error.kind() != StoreError::Kind::failed || shards_.empty()) {
        throw error;
    }
    // When the coordinator itself is gone, this says so.
    sessions_.with([](Connection& session) { return session.query_once("SELECT 1"); });
    std::vector<int64_t> missing;
    std::string why;
    for (const int64_t shard : shards_) {
        if (const auto refusal = refusal_of(shard)) {
            why = missing.empty() ? *refusal : why;
            missing.push_back(shard);
        }
    }
    if (!missing.empty() && (!partial_ || missing.size() == shards_.size())) {
        throw StoreError(StoreError::Kind::failed,
                         (missing.size() == 1 ? "shard " : "shards ") + listed(missing) + " of " +
                             std::to_string(shards_.size()) + " gave no answer (" + why +
                             "); start what is down, or accept answers from the others with "
                             "--partial");
    }
    // Those that were missing stay so until refresh(): an answer in the making may lack them.
    const std::scoped_lock lock(mutex_);
    std::ranges::copy_if(missing, std::back_inserter(missing_), [this](int64_t shard) {
        return std::ranges::find(missing_, shard) == missing_.end();
    });
}

Rows Lookups::ask(const Ask& ask)
{
    const auto attempt = [&] {
        return sessions_.with([&](Connection& session) { return ask(session, where()); });
    };
    try {
        return attempt();
    } catch (const StoreError& error) {
        look_for_servers(error);
    }
    return attempt();
}

std::vector<RankedPlace> Lookups::places(const char* function, const char* table,
                                         const ShardBytes& query)
{
    const auto statement = [&](Connection& session, const std::string& where) {
        return session.query_once(std::string("SELECT shard, kzcat.") + function +
                                      "(track, codes, $1) FROM kzcat." + table + " WHERE" + where +
                                      " GROUP BY shard",
                                  Bytes(query));
    };
    return joined_places(ask(statement));
}

std::vector<RankedPlace> Lookups::scan(const ShardBytes& query)
{
    return places("kz_scan", "trail", query);
}

std::vector<RankedPlace> Lookups::scan_tail(const ShardBytes& query)
{
    return places("kz_scan", "tail", query);
}

/// Those that the catalogue has: a shard may have codes of tracks that are just being added, or
/// were just removed.
std::vector<int64_t> Lookups::known(const std::vector<int64_t>& tracks)
{
    if (shards_.empty()) {
        return tracks;
    }
    return sessions_.with([&](Connection& session) {
        const Rows rows = session.query("SELECT id FROM kzcat.track WHERE id = ANY ($1)",
                                        std::span<const int64_t>(tracks));
        std::vector<int64_t> known;
        for (int row = 0; row < rows.count(); ++row) {
            known.push_back(rows.integer(row, 0));
        }
        return known;
    });
}

/// A statement of look-ups, which a server compiles once, or another for the servers that are left.
Rows Lookups::ask(const char* statement, std::span<const int64_t> numbers, Bytes query)
{
    return ask([&](Connection& session, const std::string& where) {
        if (where == kEverywhere) {
            return session.query(statement, numbers, query);
        }
        std::string narrowed = statement;
        narrowed.insert(narrowed.find(" GROUP BY"), " AND" + where);
        return session.query_once(narrowed, numbers, query);
    });
}

std::vector<Look> Lookups::count(const CountQuery& query)
{
    std::vector<int64_t> lists = {kTracksList};
    std::ranges::transform(query.lists, std::back_inserter(lists), &CountQuery::List::list);
    return joined<Look>(ask(kCountStatement, lists, to_bytes(query)),
                        [](Bytes row) { return to_looks(row); });
}

std::vector<RankedPlace> Lookups::rank(const std::vector<int64_t>& tracks, const ShardBytes& query)
{
    return joined_places(ask(kRankStatement, tracks, query));
}

void Lookups::fetch_codes(const std::vector<int64_t>& tracks,
                          const std::function<void(int64_t, std::vector<Code>)>& take)
{
    const std::vector<int64_t> wanted = known(tracks);
    const Rows rows = ask([&](Connection& session, const std::string& where) {
        return session.query_once(
            "SELECT track, codes FROM kzcat.trail WHERE track = ANY ($1) AND" + where,
            std::span<const int64_t>(wanted));
    });
    for (int row = 0; row < rows.count(); ++row) {
        std::vector<Code> codes;
        get_little_endian(rows.bytes(row, 1), codes);
        take(rows.integer(row, 0), std::move(codes));
    }
}

SummedLengths Lookups::lengths()
{
    const Rows rows = ask([](Connection& session, const std::string& where) {
        return session.query_once(
            "SELECT list, words FROM kzcat.posting WHERE list BETWEEN -5 AND -2 AND" + where);
    });
    SummedLengths lengths;
    for (int row = 0; row < rows.count(); ++row) {
        lengths.add(static_cast<uint32_t>(-2 - rows.integer(row, 0)), rows.bytes(row, 1));
    }
    return lengths;
}

uint64_t Lookups::tail_tracks()
{
    const Rows rows = ask([](Connection& session, const std::string& where) {
        return session.query_once("SELECT shard, count(*) FROM kzcat.tail WHERE" + where +
                                  " GROUP BY shard");
    });
    uint64_t tracks = 0;
    for (int row = 0; row < rows.count(); ++row) {
        tracks += static_cast<uint64_t>(rows.integer(row, 1));
    }
    return tracks;
}

void Lookups::request_posting(uint64_t least)
{
    const std::vector<int64_t> places = shards_.empty() ? std::vector<int64_t>{0} : shards_;
    const auto request = [&](Connection& session) {
        const Rows rights = session.query("SELECT has_table_privilege('kzcat.posting_request', "
                                          "'INSERT') AND NOT pg_is_in_recovery()");
        for (size_t i = 0; rights.boolean(0, 0) && i < places.size(); ++i) {
            session.query(
                "INSERT INTO kzcat.posting_request (shard, least) VALUES ($1::bigint, $2)",
                places[i], static_cast<int64_t>(least));
        }
        return true;
    };
    try {
        sessions_.with(request);
    } catch (const StoreError& error) {
        if (error.kind() != StoreError::Kind::read_only) { // a shard's standby, for one
            throw;
        }
    }
}

} // namespace kzcat::postgresql
