/// @file
/// From rows to records. What a damaged or hostile file has in them never leads out of bounds.
#pragma once

#include <array>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "catalogue/store/sqlite/connection.hpp"
#include "catalogue/store/store.hpp"

/// What read_track() and read_trail() expect, as literals: statements are known by their address.
#define KZCAT_TRACK_COLUMNS "id, key, samples, codes, added"
#define KZCAT_TRAIL_COLUMNS "track.id, track.samples, track.codes, trail.crc, trail.codes"

namespace kzcat::sqlite {

constexpr int64_t kAddedCode = 1; ///< in change.kind
constexpr int64_t kRemovedCode = 2;

template <size_t Count>
std::span<const std::byte> bytes_of(const std::array<uint8_t, Count>& array)
{
    return std::as_bytes(std::span(array));
}

/// Ids as they come from a table, of which a damaged one may not be in order: callers rely on that.
class Rising {
public:
    /// Throws StoreError::Kind::damaged when the id is not above the last one.
    void check(int64_t id, const std::string& path);

private:
    std::optional<int64_t> last_;
};

/// -1 is NULL in the file.
std::optional<int64_t> to_column(int64_t number);
std::optional<std::span<const std::byte>> to_column(const std::optional<FileHash>& hash);

bool has_track(Connection& connection, int64_t track);
bool has_bands(Connection& connection, int64_t track);

std::vector<Tag> read_tags(Connection& connection, int64_t track);

/// With tags and sources, from a row of KZCAT_TRACK_COLUMNS.
TrackInfo read_track(Connection& connection, const Statement& row, Profile profile);

/// Codes of all tracks. Callers make room for them: a number that the file cannot hold is refused.
uint64_t read_code_count(Connection& connection);

/// From a row of track, uri, size, mtime_ns, hash; none when there is no row.
std::optional<SourceInfo> read_one_source(Statement& row);

/// From a row of KZCAT_TRAIL_COLUMNS into a trail whose profile is set. Throws
/// StoreError::Kind::damaged when the codes are not those that were stored.
void read_trail(const Statement& row, const std::string& path, Trail& trail);

/// From a row of track, crc, bands. Throws as read_trail() does.
DocumentBands read_bands(const Statement& row, const std::string& path);

} // namespace kzcat::sqlite
