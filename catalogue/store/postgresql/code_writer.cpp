// In which order the databases of a catalogue are written:
//
//   1. the catalogue's own: `pending` names the new tracks  (committed at once by a second session)
//   2. each shard: their codes                              (committed)
//   3. the catalogue's own: rows of tracks, and `pending` no longer names the new ones, but those
//      that were removed                                    (committed; only this moment counts)
//   4. each shard: codes of what was removed goes; `pending` no longer names it
//
// Whatever ends this early leaves codes on shards at most, and `pending` names all of them.

#include "catalogue/store/postgresql/code_writer.hpp"

#include <algorithm>
#include <deque>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/store/little_endian.hpp"

namespace kzcat::postgresql {

namespace {

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

} // namespace

void CodeWriter::prepare(std::set<int64_t> shards)
{
    if (shards_.numbers().empty()) {
        return;
    }
    const Rows rows = own_.query("SELECT DISTINCT shard FROM pending");
    for (int row = 0; row < rows.count(); ++row) {
        shards.insert(rows.integer(row, 0));
    }
    std::ranges::for_each(shards, [this](int64_t shard) { shards_.reach(shard); });
}

void CodeWriter::settle()
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
            remove_codes(shard, tracks);
        } catch (const StoreError&) {
            continue; // it cannot be reached; what is to be added elsewhere need not wait for it
        }
        own_.query("DELETE FROM pending WHERE shard = $1 AND track = ANY ($2)", shard,
                   std::span<const int64_t>(tracks));
    }
}

/// In its turn, so that codes that were being written when their writer ended are there or not.
void CodeWriter::remove_codes(int64_t shard, std::span<const int64_t> tracks)
{
    shards_.note_silence(shard, [&] {
        Connection& connection = shards_.promptly(shard);
        Transaction transaction(connection, Transaction::Kind::write);
        connection.query(kTakeTurn);
        connection.query("DELETE FROM trail WHERE track = ANY ($1)", tracks);
        connection.query("DELETE FROM document_bands WHERE track = ANY ($1)", tracks);
        transaction.commit();
    });
}

void CodeWriter::add(int64_t shard, const Codes& codes) { codes_[shard].push_back(codes); }

void CodeWriter::remove(int64_t shard, int64_t track)
{
    std::erase_if(codes_[shard], [track](const Codes& codes) { return codes.track == track; });
    if (shard != 0) {
        removed_[shard].push_back(track);
    }
}

void CodeWriter::write()
{
    announce();
    for (const auto& of_shard : codes_) {
        if (!of_shard.second.empty()) {
            shards_.note_silence(of_shard.first, [&] { write(of_shard.first, of_shard.second); });
        }
    }
    retract();
}

void CodeWriter::write(int64_t shard, const std::vector<Codes>& all)
{
    Connection& connection = shards_.promptly(shard);
    Transaction transaction(connection, Transaction::Kind::write);
    connection.query(kTakeTurn);
    if (shard != 0) {
        // While the catalogue's session lives nobody else clears `pending`; whoever does so
        // afterwards waits here until these codes are committed.
        own_.query("SELECT 1");
    }
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

/// Names the new tracks of shards, for good.
void CodeWriter::announce()
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
void CodeWriter::retract()
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

void CodeWriter::clean() noexcept
{
    try {
        for (const auto& [shard, tracks] : removed_) {
            remove_codes(shard, tracks);
            own_.query("DELETE FROM pending WHERE track = ANY ($1)",
                       std::span<const int64_t>(tracks));
        }
    } catch (const std::exception&) {
        return; // `pending` still names them
    }
}

} // namespace kzcat::postgresql
