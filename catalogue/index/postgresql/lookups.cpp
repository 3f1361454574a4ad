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

/// A statement of those below, for the servers that are left.
std::string narrowed(const char* statement, const std::string& where)
{
    std::string text = statement;
    return text.insert(text.find(" GROUP BY"), " AND" + where);
}

} // namespace

const char* const kCountStatement = "SELECT shard, kzcat.kz_count(segment, list, words, $2) "
                                    "FROM kzcat.posting WHERE list = ANY ($1) GROUP BY shard";

const char* const kRankStatement = "SELECT shard, kzcat.kz_rank(track, codes, $2) "
                                   "FROM kzcat.trail WHERE track = ANY ($1) GROUP BY shard";

const char* const kLengthsStatement = "SELECT shard, list, kzcat.kz_lengths(words) "
                                      "FROM kzcat.posting WHERE list BETWEEN -5 AND -2 "
                                      "GROUP BY shard, list";

Lookups::Lookups(std::string address, bool any_server, bool partial)
    : sessions_(std::move(address), any_server), partial_(partial)
{
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
    if (shards_.all.empty()) {
        return tracks;
    }
    return sessions_.with([&](Connection& session) {
        return numbers_in(session.query("SELECT id FROM kzcat.track WHERE id = ANY ($1)",
                                        std::span<const int64_t>(tracks)));
    });
}

/// A statement of look-ups, which a server compiles once, or another for the servers that are left.
Rows Lookups::ask(const char* statement, std::span<const int64_t> numbers, Bytes query)
{
    return ask([&](Connection& session, const std::string& where) {
        if (where == kEverywhere) {
            return session.query(statement, numbers, query);
        }
        return session.query_once(narrowed(statement, where), numbers, query);
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
        return session.query_once(narrowed(kLengthsStatement, where));
    });
    SummedLengths lengths;
    for (int row = 0; row < rows.count(); ++row) {
        lengths.add(static_cast<uint32_t>(-2 - rows.integer(row, 1)), rows.bytes(row, 2));
    }
    return lengths;
}

uint64_t Lookups::tail_tracks() { return tail_tracks(""); }

uint64_t Lookups::tail_tracks(const std::string& condition)
{
    const Rows rows = ask([&](Connection& session, const std::string& where) {
        return session.query_once("SELECT shard, count(*) FROM kzcat.tail WHERE" + where +
                                  condition + " GROUP BY shard");
    });
    uint64_t tracks = 0;
    for (int row = 0; row < rows.count(); ++row) {
        tracks += static_cast<uint64_t>(rows.integer(row, 1));
    }
    return tracks;
}

/// Whether tracks of the shard's tail were posted, which there may be more of.
bool Lookups::post_segment(int64_t shard, uint64_t least)
{
    const std::string here = " AND shard = " + std::to_string(shard);
    const uint64_t before = tail_tracks(here);
    sessions_.with([&](Connection& session) {
        return session.query(
            "INSERT INTO kzcat.posting_request (shard, least) VALUES ($1::bigint, $2)", shard,
            static_cast<int64_t>(least));
    });
    return tail_tracks(here) < before;
}

void Lookups::request_posting(uint64_t least)
{
    const bool may_ask = sessions_.with([](Connection& session) {
        return session
            .query("SELECT has_table_privilege('kzcat.posting_request', 'INSERT') AND NOT "
                   "pg_is_in_recovery()")
            .boolean(0, 0);
    });
    const std::vector<int64_t> places = shards_.all.empty() ? std::vector<int64_t>{0} : shards_.all;
    for (size_t i = 0; may_ask && i < places.size(); ++i) {
        try {
            while (post_segment(places[i], least)) {
            }
        } catch (const StoreError&) {
            continue; // a full disk, a standby, a track that was removed meanwhile
        }
    }
}

} // namespace kzcat::postgresql
