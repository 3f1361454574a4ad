// In which order the databases of a catalogue are written:
//
//   1. the catalogue's own: `pending` names the new tracks  (committed at once by a second session)
//   2. each shard: their codes                              (committed)
//   3. the catalogue's own: rows of tracks, and `pending` no longer names the new ones, but those
//      that were removed                                    (committed; only this moment counts)
//   4. each shard: codes of what was removed goes; `pending` no longer names it
//
// Whatever ends this early leaves codes on shards at most, and `pending` names all of them.

#include "catalogue/store/postgresql/writer.hpp"

#include <algorithm>
#include <deque>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/store/hash.hpp"
#include "catalogue/store/little_endian.hpp"
#include "catalogue/store/rules.hpp"

namespace kzcat::postgresql {

namespace {

/// Numbers as the table has them; `room` keeps them where the processor's order is another.
template <std::unsigned_integral Number>
Bytes stored(std::span<const Number> numbers, std::vector<std::byte>& room)
{
    if constexpr (std::endian::native == std::endian::little) {
        return std::as_bytes(numbers);
    } else {
        room.resize(numbers.size_bytes());
        put_little_endian(numbers, std::span(room));
        return room;
    }
}

/// Trails on their way to one shard, which receives them in one statement.
class Trails {
public:
    Trails(Connection& connection, int64_t shard) : connection_(connection), shard_(shard) {}

    void add(int64_t track, const Trail& trail)
    {
        const Bytes bytes = stored(std::span(trail.codes), rooms_.emplace_back());
        tracks_.push_back(track);
        sums_.push_back(int64_t{crc32c(bytes)});
        codes_.push_back(bytes);
        waiting_ += bytes.size();
        if (waiting_ >= kMostWaiting) {
            write();
        }
    }

    void write()
    {
        if (!tracks_.empty()) {
            connection_.query("INSERT INTO trail (shard, track, crc, codes) SELECT $1::bigint, * "
                              "FROM unnest($2::bigint[], $3::bigint[], $4::bytea[])",
                              shard_, std::span<const int64_t>(tracks_),
                              std::span<const int64_t>(sums_), std::span<const Bytes>(codes_));
        }
        tracks_.clear();
        sums_.clear();
        codes_.clear();
        rooms_.clear();
        waiting_ = 0;
    }

private:
    static constexpr size_t kMostWaiting = size_t{1} << 24; ///< bytes

    Connection& connection_;
    int64_t shard_;
    std::vector<int64_t> tracks_;
    std::vector<int64_t> sums_;
    std::vector<Bytes> codes_;
    std::deque<std::vector<std::byte>> rooms_;
    size_t waiting_ = 0;
};

/// Those that an interrupted writer has left are replaced.
void write_bands(Connection& connection, int64_t track, const DocumentBands& bands)
{
    std::vector<std::byte> room;
    const Bytes bytes = stored(std::span(bands), room);
    connection.query("INSERT INTO document_bands (track, crc, bands) VALUES ($1, $2, $3) ON "
                     "CONFLICT (track) DO UPDATE SET crc = excluded.crc, bands = excluded.bands",
                     track, int64_t{crc32c(bytes)}, bytes);
}

/// In its turn, so that codes that were being written when their writer ended are there or not.
void remove_codes(Connection& shard, std::span<const int64_t> tracks)
{
    Transaction transaction(shard, Transaction::Kind::write);
    shard.query(kTakeTurn);
    shard.query("DELETE FROM trail WHERE track = ANY ($1)", tracks);
    shard.query("DELETE FROM document_bands WHERE track = ANY ($1)", tracks);
    transaction.commit();
}

std::optional<TrackRow> find(const Rows& rows)
{
    const std::vector<TrackRow> found = read_track_rows(rows);
    return found.empty() ? std::nullopt : std::optional(found.front());
}

} // namespace

void Writer::settle()
{
    if (shards_.numbers().empty()) {
        return;
    }
    const Rows rows =
        own_.query("SELECT pending.track, pending.shard, track.id IS NULL FROM pending "
                   "LEFT JOIN track ON track.id = pending.track");
    std::map<int64_t, std::vector<int64_t>> left;
    for (int row = 0; row < rows.count(); ++row) {
        auto& tracks = left[rows.integer(row, 1)];
        if (rows.boolean(row, 2)) {
            tracks.push_back(rows.integer(row, 0));
        }
    }
    for (const auto& [shard, tracks] : left) {
        try {
            remove_codes(shards_.at(shard), tracks);
        } catch (const StoreError&) {
            continue; // it cannot be reached; what is to be added elsewhere need not wait for it
        }
        own_.query("DELETE FROM pending WHERE shard = $1 AND track = ANY ($2)", shard,
                   std::span<const int64_t>(tracks));
    }
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
    codes_[row.shard].push_back(
        {.track = id, .trail = &track.trail, .bands = &track.document_bands});
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
        codes_[row.shard].push_back(
            {.track = row.id, .trail = nullptr, .bands = &track.document_bands});
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
    const int64_t track = rows.integer(0, 0);
    const int64_t shard = rows.integer(0, 1);
    std::erase_if(codes_[shard], [track](const Codes& codes) { return codes.track == track; });
    if (shard != 0) {
        removed_[shard].push_back(track);
    }
    return true;
}

void Writer::write_codes()
{
    announce();
    for (const auto& [shard, all] : codes_) {
        if (all.empty()) {
            continue;
        }
        Connection& connection = shards_.at(shard);
        Transaction transaction(connection, Transaction::Kind::write);
        connection.query(kTakeTurn);
        Trails trails(connection, shard);
        for (const Codes& codes : all) {
            if (codes.trail != nullptr) {
                trails.add(codes.track, *codes.trail);
            }
            if (!codes.bands->empty()) {
                write_bands(connection, codes.track, *codes.bands);
            }
        }
        trails.write();
        transaction.commit(); // for shard 0 a part of the caller's, which commits it
    }
    retract();
}

/// Names the new tracks of shards, for good.
void Writer::announce()
{
    for (const auto& [shard, all] : codes_) {
        std::vector<int64_t> tracks;
        for (const Codes& codes : all) {
            if (codes.trail != nullptr && shard != 0) {
                tracks.push_back(codes.track);
            }
        }
        if (!tracks.empty()) {
            shards_.aside().query(
                "INSERT INTO pending (track, shard) SELECT track, $2::bigint FROM "
                "unnest($1::bigint[]) AS new (track)",
                std::span<const int64_t>(tracks), shard);
            announced_.insert(announced_.end(), tracks.begin(), tracks.end());
        }
    }
}

/// With the caller's transaction: the new tracks are no longer in question, but the removed are.
void Writer::retract()
{
    if (!announced_.empty()) {
        own_.query("DELETE FROM pending WHERE track = ANY ($1)",
                   std::span<const int64_t>(announced_));
    }
    for (const auto& [shard, tracks] : removed_) {
        own_.query("INSERT INTO pending (track, shard) SELECT track, $2::bigint FROM "
                   "unnest($1::bigint[]) AS old (track) ON CONFLICT DO NOTHING",
                   std::span<const int64_t>(tracks), shard);
    }
}

void Writer::clean() noexcept
{
    try {
        for (const auto& [shard, tracks] : removed_) {
            remove_codes(shards_.at(shard), tracks);
            own_.query("DELETE FROM pending WHERE track = ANY ($1)",
                       std::span<const int64_t>(tracks));
        }
    } catch (const std::exception&) {
        return; // `pending` still names them
    }
}

} // namespace kzcat::postgresql
