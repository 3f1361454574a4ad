// Records from rows.

#include "catalogue/store/postgresql/rows.hpp"

#include <algorithm>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/store/little_endian.hpp"

namespace kzcat::postgresql {

namespace {

template <size_t Count>
bool copy_bytes(Bytes bytes, std::array<uint8_t, Count>& array)
{
    if (bytes.size() != Count) {
        return false;
    }
    std::ranges::transform(bytes, array.begin(),
                           [](std::byte byte) { return std::to_integer<uint8_t>(byte); });
    return true;
}

TrackRow read_track_row(const Rows& rows, int row)
{
    TrackRow track;
    track.id = rows.integer(row, 0);
    copy_bytes(rows.bytes(row, 1), track.key);
    track.shard = rows.integer(row, 2);
    track.samples = rows.integer(row, 3);
    track.codes = rows.integer(row, 4);
    track.has_bands = rows.boolean(row, 5);
    track.added = rows.integer(row, 6);
    track.crc = rows.integer(row, 7);
    return track;
}

/// Goes to where the track of a row is among tracks whose ids rise, as those of the rows do.
size_t place_in(std::span<const TrackInfo> infos, int64_t track, size_t from)
{
    while (from < infos.size() && infos[from].id < track) {
        ++from;
    }
    return from;
}

std::vector<int64_t> ids_of(std::span<const TrackRow> rows)
{
    std::vector<int64_t> ids;
    std::ranges::transform(rows, std::back_inserter(ids), &TrackRow::id);
    return ids;
}

void add_tags(Connection& connection, std::span<const int64_t> ids, std::vector<TrackInfo>& infos)
{
    const Rows rows = connection.query(
        "SELECT track, name, value FROM tag WHERE track = ANY ($1) ORDER BY track, place", ids);
    size_t place = 0;
    for (int row = 0; row < rows.count(); ++row) {
        place = place_in(infos, rows.integer(row, 0), place);
        infos[place].tags.push_back(
            {.name = std::string(rows.text(row, 1)), .value = std::string(rows.text(row, 2))});
    }
}

void add_sources(Connection& connection, std::span<const int64_t> ids,
                 std::vector<TrackInfo>& infos)
{
    const Rows rows = connection.query("SELECT " KZCAT_SERVER_SOURCE_COLUMNS
                                       " FROM source WHERE track = ANY ($1) ORDER BY track, id",
                                       ids);
    size_t place = 0;
    for (int row = 0; row < rows.count(); ++row) {
        SourceInfo found = read_source(rows, row);
        place = place_in(infos, found.track, place);
        infos[place].sources.push_back(std::move(found.source));
    }
}

} // namespace

std::optional<int64_t> to_column(int64_t number)
{
    return number == -1 ? std::nullopt : std::optional(number);
}

std::optional<Bytes> to_column(const std::optional<FileHash>& hash)
{
    return hash ? std::optional(bytes_of(*hash)) : std::nullopt;
}

int64_t sum_of(const TrackRow& row)
{
    return RowSum()
        .add(bytes_of(row.key))
        .add(row.shard)
        .add(row.samples)
        .add(row.codes)
        .add(int64_t{row.has_bands})
        .add(row.added)
        .value();
}

std::vector<TrackRow> read_track_rows(const Rows& rows)
{
    std::vector<TrackRow> tracks;
    for (int row = 0; row < rows.count(); ++row) {
        tracks.push_back(read_track_row(rows, row));
    }
    return tracks;
}

SourceInfo read_source(const Rows& rows, int row)
{
    SourceInfo info;
    info.track = rows.integer(row, 0);
    info.source.uri = rows.text(row, 1);
    info.source.size = rows.is_null(row, 2) ? -1 : rows.integer(row, 2);
    info.source.mtime_ns = rows.is_null(row, 3) ? -1 : rows.integer(row, 3);
    FileHash hash{};
    if (copy_bytes(rows.bytes(row, 4), hash)) {
        info.source.hash = hash;
    }
    return info;
}

std::vector<TrackInfo> read_tracks(Connection& connection, std::span<const TrackRow> rows,
                                   Profile profile)
{
    std::vector<TrackInfo> infos;
    for (const TrackRow& row : rows) {
        if (row.samples < 0 || row.codes < 0) {
            refuse_damaged(connection.name(), row.id, "numbers");
        }
        infos.push_back({.id = row.id,
                         .key = row.key,
                         .profile = profile,
                         .samples = static_cast<uint64_t>(row.samples),
                         .codes = static_cast<uint64_t>(row.codes),
                         .has_document_bands = row.has_bands,
                         .added = row.added,
                         .tags = {},
                         .sources = {}});
    }
    const std::vector<int64_t> ids = ids_of(rows);
    add_tags(connection, ids, infos);
    add_sources(connection, ids, infos);
    return infos;
}

std::vector<Tag> read_tags(Connection& connection, int64_t track)
{
    const Rows rows =
        connection.query("SELECT name, value FROM tag WHERE track = $1 ORDER BY place", track);
    std::vector<Tag> tags;
    for (int row = 0; row < rows.count(); ++row) {
        tags.push_back(
            {.name = std::string(rows.text(row, 0)), .value = std::string(rows.text(row, 1))});
    }
    return tags;
}

void read_codes(const std::string& name, const TrackRow& track, Bytes codes, int64_t crc,
                Trail& trail)
{
    if (int64_t{crc32c(codes)} != crc || codes.size() % sizeof(Code) != 0 ||
        static_cast<int64_t>(codes.size() / sizeof(Code)) != track.codes || track.samples < 0) {
        refuse_damaged(name, track.id, "codes");
    }
    trail.samples = static_cast<uint64_t>(track.samples);
    get_little_endian(codes, trail.codes);
}

DocumentBands read_bands(const std::string& name, int64_t track, Bytes bands, int64_t crc)
{
    if (int64_t{crc32c(bands)} != crc || bands.size() % (15 * sizeof(uint16_t)) != 0) {
        refuse_damaged(name, track, "document bands");
    }
    DocumentBands numbers;
    get_little_endian(bands, numbers);
    return numbers;
}

void refuse_damaged(const std::string& name, int64_t track, const std::string& what)
{
    throw StoreError(StoreError::Kind::damaged,
                     name + ": the " + what + " of track " + std::to_string(track) +
                         " are damaged; remove the track, and add its file again");
}

} // namespace kzcat::postgresql
