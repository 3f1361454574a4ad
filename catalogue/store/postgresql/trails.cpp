// Codes are read from each database in one statement for many tracks. Rows of tracks were read
// before: a track whose codes are missing may have been removed between the two.

#include "catalogue/store/postgresql/trails.hpp"

#include <algorithm>
#include <map>

namespace kzcat::postgresql {

namespace {

constexpr int64_t kCodesAtOnce = int64_t{1} << 20; // 8 MB

bool is_there(Connection& own, int64_t track)
{
    return !own.query("SELECT 1 FROM track WHERE id = $1", track).empty();
}

/// Rows of a shard, and which of them has which track.
struct Fetched {
    Rows rows;
    std::map<int64_t, int> places;
};

Fetched fetch(Connection& shard, std::span<const int64_t> tracks)
{
    Fetched fetched{
        .rows = shard.query("SELECT track, crc, codes FROM trail WHERE track = ANY ($1)", tracks),
        .places = {}};
    for (int row = 0; row < fetched.rows.count(); ++row) {
        fetched.places[fetched.rows.integer(row, 0)] = row;
    }
    return fetched;
}

std::map<int64_t, Fetched> fetch_all(Shards& shards, std::span<const TrackRow> tracks)
{
    std::map<int64_t, std::vector<int64_t>> wanted;
    for (const TrackRow& track : tracks) {
        wanted[track.shard].push_back(track.id);
    }
    std::map<int64_t, Fetched> fetched;
    for (const auto& [shard, ids] : wanted) {
        fetched.emplace(shard, fetch(shards.at(shard), ids));
    }
    return fetched;
}

/// How many of the first tracks are read at once.
size_t count_at_once(std::span<const TrackRow> tracks)
{
    int64_t codes = 0;
    size_t count = 0;
    while (count < tracks.size() && (count == 0 || codes + tracks[count].codes <= kCodesAtOnce)) {
        codes += std::clamp<int64_t>(tracks[count].codes, 0, kCodesAtOnce);
        ++count;
    }
    return count;
}

/// False when the track has gone.
bool read_one(Connection& own, const Fetched& fetched, const TrackRow& track, Trail& trail)
{
    const auto place = fetched.places.find(track.id);
    if (place != fetched.places.end()) {
        const Rows& rows = fetched.rows;
        read_codes(own.name(), track, rows.bytes(place->second, 2), rows.integer(place->second, 1),
                   trail);
        return true;
    }
    if (is_there(own, track.id)) {
        refuse_damaged(own.name(), track.id, "codes");
    }
    return false;
}

} // namespace

std::vector<TrackRow> next_track_rows(Connection& own, int64_t after)
{
    return read_track_rows(own.query("SELECT " KZCAT_SERVER_TRACK_COLUMNS
                                     " FROM track WHERE id > $1 ORDER BY id LIMIT $2",
                                     after, kBatch));
}

std::optional<TrackRow> find_track_row(Connection& own, int64_t track)
{
    const auto rows = read_track_rows(
        own.query("SELECT " KZCAT_SERVER_TRACK_COLUMNS " FROM track WHERE id = $1", track));
    return rows.empty() ? std::nullopt : std::optional(rows.front());
}

void read_trails(Connection& own, Shards& shards, std::span<const TrackRow> tracks, Profile profile,
                 const std::function<bool(const TrackRow&, const Trail*)>& visit,
                 const std::function<void(int64_t, const StoreError&)>& damaged)
{
    Trail trail;
    trail.profile = profile;
    while (!tracks.empty()) {
        const auto some = tracks.first(count_at_once(tracks));
        const auto fetched = fetch_all(shards, some);
        for (const TrackRow& track : some) {
            const Trail* read = nullptr;
            try {
                read = read_one(own, fetched.at(track.shard), track, trail) ? &trail : nullptr;
            } catch (const StoreError& error) {
                if (!damaged || error.kind() != StoreError::Kind::damaged) {
                    throw;
                }
                damaged(track.id, error);
            }
            if (!visit(track, read)) {
                return;
            }
        }
        tracks = tracks.subspan(some.size());
    }
}

std::optional<DocumentBands> read_document_bands(Connection& own, Shards& shards,
                                                 const TrackRow& track)
{
    if (!track.has_bands) {
        return std::nullopt;
    }
    const Rows rows =
        shards.at(track.shard)
            .query("SELECT crc, bands FROM document_bands WHERE track = $1", track.id);
    if (!rows.empty()) {
        return read_bands(own.name(), track.id, rows.bytes(0, 1), rows.integer(0, 0));
    }
    if (is_there(own, track.id)) {
        refuse_damaged(own.name(), track.id, "document bands");
    }
    return std::nullopt;
}

} // namespace kzcat::postgresql
