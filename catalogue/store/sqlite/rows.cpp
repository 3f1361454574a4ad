// Records from rows.

#include "catalogue/store/sqlite/rows.hpp"

#include <algorithm>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/store/little_endian.hpp"

namespace kzcat::sqlite {

namespace {

[[noreturn]] void refuse(const std::string& path, int64_t track, const std::string& what)
{
    throw StoreError(StoreError::Kind::damaged,
                     path + ": the " + what + " of track " + std::to_string(track) +
                         " are damaged; remove the track, and add its file again");
}

template <size_t Count>
bool copy_blob(std::span<const std::byte> blob, std::array<uint8_t, Count>& array)
{
    if (blob.size() != Count) {
        return false;
    }
    std::transform(blob.begin(), blob.end(), array.begin(),
                   [](std::byte byte) { return std::to_integer<uint8_t>(byte); });
    return true;
}

/// From columns uri, size, mtime_ns, hash, the first of which is `column`.
Source read_source(const Statement& row, int column)
{
    Source source;
    source.uri = row.text(column);
    source.size = row.is_null(column + 1) ? -1 : row.integer(column + 1);
    source.mtime_ns = row.is_null(column + 2) ? -1 : row.integer(column + 2);
    FileHash hash{};
    if (copy_blob(row.blob(column + 3), hash)) {
        source.hash = hash;
    }
    return source;
}

std::vector<Source> read_sources(Connection& connection, int64_t track)
{
    Statement row(connection,
                  "SELECT uri, size, mtime_ns, hash FROM source WHERE track = ? ORDER BY id",
                  track);
    std::vector<Source> sources;
    while (row.step()) {
        sources.push_back(read_source(row, 0));
    }
    return sources;
}

} // namespace

void Rising::check(int64_t id, const std::string& path)
{
    if (last_ && id <= *last_) {
        throw StoreError(StoreError::Kind::damaged,
                         path + ": it is damaged (row " + std::to_string(id) +
                             " is out of order); find out what with verify, and take what is "
                             "whole into a new catalogue with merge");
    }
    last_ = id;
}

std::optional<int64_t> to_column(int64_t number)
{
    return number == -1 ? std::nullopt : std::optional(number);
}

std::optional<std::span<const std::byte>> to_column(const std::optional<FileHash>& hash)
{
    if (!hash) {
        return std::nullopt;
    }
    return std::as_bytes(std::span(*hash));
}

bool has_track(Connection& connection, int64_t track)
{
    return Statement(connection, "SELECT 1 FROM track WHERE id = ?", track).step();
}

bool has_bands(Connection& connection, int64_t track)
{
    return Statement(connection, "SELECT 1 FROM document_bands WHERE track = ?", track).step();
}

std::vector<Tag> read_tags(Connection& connection, int64_t track)
{
    Statement row(connection, "SELECT name, value FROM tag WHERE track = ? ORDER BY place", track);
    std::vector<Tag> tags;
    while (row.step()) {
        tags.push_back({.name = std::string(row.text(0)), .value = std::string(row.text(1))});
    }
    return tags;
}

TrackInfo read_track(Connection& connection, const Statement& row, Profile profile)
{
    TrackInfo info;
    info.id = row.integer(0);
    copy_blob(row.blob(1), info.key);
    info.profile = profile;
    if (row.integer(2) < 0 || row.integer(3) < 0) {
        refuse(connection.path(), info.id, "numbers");
    }
    info.samples = static_cast<uint64_t>(row.integer(2));
    info.codes = static_cast<uint64_t>(row.integer(3));
    info.added = row.integer(4);
    info.has_document_bands = has_bands(connection, info.id);
    info.tags = read_tags(connection, info.id);
    info.sources = read_sources(connection, info.id);
    return info;
}

// A double adds whole numbers exactly up to 2^53, and does not overflow.
uint64_t read_code_count(Connection& connection)
{
    const ReadTransaction moment(connection);
    Statement pages(connection, "SELECT page_count * page_size FROM pragma_page_count, "
                                "pragma_page_size");
    Statement row(connection, "SELECT total(codes), min(codes) FROM track");
    const int64_t bytes = pages.step() ? pages.integer(0) : 0;
    const double total = row.step() ? row.real(0) : 0;
    if (row.integer(1) < 0 || total > static_cast<double>(bytes) / sizeof(Code)) {
        throw StoreError(StoreError::Kind::damaged,
                         connection.path() +
                             ": it is damaged (tracks claim more codes than the file can hold); "
                             "find out which with verify, remove them, and add their files again");
    }
    return static_cast<uint64_t>(total);
}

std::optional<SourceInfo> read_one_source(Statement& row)
{
    if (!row.step()) {
        return std::nullopt;
    }
    return SourceInfo{.track = row.integer(0), .source = read_source(row, 1)};
}

void read_trail(const Statement& row, const std::string& path, Trail& trail)
{
    const auto bytes = row.blob(4);
    if (row.is_null(4) || int64_t{crc32c(bytes)} != row.integer(3) ||
        bytes.size() % sizeof(Code) != 0 ||
        static_cast<int64_t>(bytes.size() / sizeof(Code)) != row.integer(2) || row.integer(1) < 0) {
        refuse(path, row.integer(0), "codes");
    }
    trail.samples = static_cast<uint64_t>(row.integer(1));
    get_little_endian(bytes, trail.codes);
}

DocumentBands read_bands(const Statement& row, const std::string& path)
{
    const auto bytes = row.blob(2);
    if (int64_t{crc32c(bytes)} != row.integer(1) || bytes.size() % (15 * sizeof(uint16_t)) != 0) {
        refuse(path, row.integer(0), "document bands");
    }
    DocumentBands bands;
    get_little_endian(bytes, bands);
    return bands;
}

} // namespace kzcat::sqlite
