/// @file
/// From rows to records and back.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/row_sum.hpp"
#include "catalogue/store/store.hpp"

/// What read_track_rows() and read_source() expect.
#define KZCAT_SERVER_TRACK_COLUMNS "id, key, shard, samples, codes, has_bands, added, crc"
#define KZCAT_SERVER_SOURCE_COLUMNS "track, uri, size, mtime_ns, hash"

namespace kzcat::postgresql {

constexpr int64_t kAddedCode = 1; ///< in change.kind
constexpr int64_t kRemovedCode = 2;

template <size_t Count>
Bytes bytes_of(const std::array<uint8_t, Count>& array)
{
    return std::as_bytes(std::span(array));
}

/// -1 is NULL in the table.
std::optional<int64_t> to_column(int64_t number);
std::optional<Bytes> to_column(const std::optional<FileHash>& hash);

/// A row of the table track.
struct TrackRow {
    int64_t id = 0;
    ContentKey key{};
    int64_t shard = 0;
    int64_t samples = 0;
    int64_t codes = 0;
    bool has_bands = false;
    int64_t added = 0;
    int64_t crc = 0;
};

/// What `crc` of the row should be.
int64_t sum_of(const TrackRow& row);

std::vector<TrackRow> read_track_rows(const Rows& rows);

/// From a row of KZCAT_SERVER_SOURCE_COLUMNS.
SourceInfo read_source(const Rows& rows, int row);

/// What tracks have, in the order of `rows`, whose ids rise.
std::vector<TrackInfo> read_tracks(Connection& connection, std::span<const TrackRow> rows,
                                   Profile profile);

std::vector<Tag> read_tags(Connection& connection, int64_t track);

/// From the columns of a trail, `codes` and `crc`; throws StoreError::Kind::damaged when they are
/// not what was stored.
void read_codes(const std::string& name, const TrackRow& track, Bytes codes, int64_t crc,
                Trail& trail);
DocumentBands read_bands(const std::string& name, int64_t track, Bytes bands, int64_t crc);

/// The error for codes or bands that are not there or not as they were stored.
[[noreturn]] void refuse_damaged(const std::string& name, int64_t track, const std::string& what);

} // namespace kzcat::postgresql
