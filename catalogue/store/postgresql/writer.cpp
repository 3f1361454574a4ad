// Tracks, their tags and their sources, in the catalogue's own database.

#include "catalogue/store/postgresql/writer.hpp"

#include <set>
#include <utility>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/rules.hpp"

namespace kzcat::postgresql {

namespace {

std::optional<TrackRow> find(const Rows& rows)
{
    const std::vector<TrackRow> found = read_track_rows(rows);
    return found.empty() ? std::nullopt : std::optional(found.front());
}

} // namespace

void Writer::prepare(std::span<const NewTrack> tracks)
{
    std::set<int64_t> shards;
    if (!shards_.numbers().empty()) {
        for (const NewTrack& track : tracks) {
            shards.insert(shards_.place_of(content_key(track.trail)));
        }
        // Look-ups read the tables of every shard, which connecting makes.
        if (!tracks.empty() && own_.query("SELECT FROM track LIMIT 1").empty()) {
            shards_.reach_new();
        }
    }
    codes_.prepare(std::move(shards));
}

Added Writer::add(const NewTrack& track)
{
    const ContentKey key = content_key(track.trail);
    const std::optional<TrackRow> known = find(own_.query(
        "SELECT " KZCAT_SERVER_TRACK_COLUMNS " FROM track WHERE key = $1", bytes_of(key)));
    const int64_t id = known ? known->id : insert(track, key);
    if (known) {
        enrich(*known, track);
    }
    Added added{.track = id, .is_new = !known, .has_source = true};
    const int64_t owner = track.source.uri.empty() ? 0 : owner_of(track.source.uri);
    if (!track.yields || owner == 0) {
        give(id, track.source, owner);
    } else {
        added.has_source = owner == id;
    }
    return added;
}

int64_t Writer::insert(const NewTrack& track, const ContentKey& key)
{
    TrackRow row;
    row.key = key;
    row.shard = shards_.place_of(key);
    row.samples = static_cast<int64_t>(track.trail.samples);
    row.codes = static_cast<int64_t>(track.trail.codes.size());
    row.has_bands = !track.document_bands.empty();
    row.added = track.added != 0 ? track.added : seconds_now();
    const Rows rows = own_.query("INSERT INTO track (key, shard, samples, codes, has_bands, added, "
                                 "crc) VALUES ($1, $2::bigint, $3, $4, $5, $6, $7) RETURNING id",
                                 bytes_of(key), row.shard, row.samples, row.codes, row.has_bands,
                                 row.added, sum_of(row));
    const int64_t id = rows.integer(0, 0);
    codes_.add(row.shard, {.track = id, .trail = &track.trail, .bands = &track.document_bands});
    insert_tags(id, track.tags);
    return id;
}

void Writer::insert_tags(int64_t track, std::span<const Tag> tags)
{
    if (tags.empty()) {
        return;
    }
    std::vector<std::string> names;
    std::vector<std::string> values;
    std::vector<int64_t> sums;
    for (const Tag& tag : tags) {
        sums.push_back(tag_sum(track, static_cast<int64_t>(names.size()), tag));
        names.push_back(tag.name);
        values.push_back(tag.value);
    }
    own_.query(
        "INSERT INTO tag (track, place, name, value, crc) SELECT $1, place - 1, name, value, "
        "crc FROM unnest($2::text[], $3::text[], $4::bigint[]) WITH ORDINALITY AS given "
        "(name, value, crc, place)",
        track, std::span<const std::string>(names), std::span<const std::string>(values),
        std::span<const int64_t>(sums));
}

void Writer::enrich(const TrackRow& known, const NewTrack& track)
{
    const bool same_source =
        !track.yields && !track.source.uri.empty() && owner_of(track.source.uri) == known.id;
    const std::vector<Tag> kept = read_tags(own_, known.id);
    const std::vector<Tag> tags = merge_tags(kept, track.tags, same_source);
    if (tags != kept) {
        own_.query("DELETE FROM tag WHERE track = $1", known.id);
        insert_tags(known.id, tags);
    }
    if (!known.has_bands && !track.document_bands.empty()) {
        TrackRow row = known;
        row.has_bands = true;
        own_.query("UPDATE track SET has_bands = true, crc = $2 WHERE id = $1", row.id,
                   sum_of(row));
        codes_.add(row.shard, {.track = row.id, .trail = nullptr, .bands = &track.document_bands});
    }
}

int64_t Writer::owner_of(std::string_view uri)
{
    const Bytes bytes = std::as_bytes(std::span(uri));
    const Rows rows =
        own_.query("SELECT track FROM source WHERE sha256(uri) = sha256($1) AND uri = $1", bytes);
    return rows.empty() ? 0 : rows.integer(0, 0);
}

void Writer::give(int64_t track, const Source& source)
{
    give(track, source, owner_of(source.uri));
}

void Writer::give(int64_t track, const Source& source, int64_t owner)
{
    if (source.uri.empty()) {
        return;
    }
    if (owner == track) {
        update_source(track, source);
        return;
    }
    if (owner != 0) {
        delete_source(source.uri);
    }
    insert_source(track, source);
    if (owner != 0) {
        remove_without_sources(owner);
    }
}

void Writer::insert_source(int64_t track, const Source& source)
{
    own_.query("INSERT INTO source (uri, track, size, mtime_ns, hash, crc) VALUES ($1, $2, $3, $4, "
               "$5, $6)",
               std::as_bytes(std::span(source.uri)), track, to_column(source.size),
               to_column(source.mtime_ns), to_column(source.hash), source_sum(track, source));
}

void Writer::update_source(int64_t track, const Source& source)
{
    own_.query(
        "UPDATE source SET size = $2, mtime_ns = $3, hash = $4, crc = $5 WHERE sha256(uri) = "
        "sha256($1) AND uri = $1",
        std::as_bytes(std::span(source.uri)), to_column(source.size), to_column(source.mtime_ns),
        to_column(source.hash), source_sum(track, source));
}

void Writer::delete_source(std::string_view uri)
{
    own_.query("DELETE FROM source WHERE sha256(uri) = sha256($1) AND uri = $1",
               std::as_bytes(std::span(uri)));
}

bool Writer::remove_source(std::string_view uri)
{
    const int64_t owner = owner_of(uri);
    if (owner == 0) {
        return false;
    }
    delete_source(uri);
    remove_without_sources(owner);
    return true;
}

bool Writer::remove(int64_t track)
{
    return note_removed(own_.query("DELETE FROM track WHERE id = $1 RETURNING id, shard", track));
}

void Writer::remove_without_sources(int64_t track)
{
    note_removed(own_.query("DELETE FROM track WHERE id = $1 AND NOT EXISTS "
                            "(SELECT 1 FROM source WHERE track = $1) RETURNING id, shard",
                            track));
}

/// A trigger removes the codes that lie beside the catalogue.
bool Writer::note_removed(const Rows& rows)
{
    if (rows.empty()) {
        return false;
    }
    codes_.remove(rows.integer(0, 1), rows.integer(0, 0));
    return true;
}

} // namespace kzcat::postgresql
