// A store in one SQLite file. Each call that changes something is one transaction; each that reads
// from several tables reads them as of one moment.

#include "catalogue/store/sqlite/sqlite_store.hpp"

#include <algorithm>
#include <limits>
#include <utility>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/row_sum.hpp"
#include "catalogue/store/rules.hpp"
#include "catalogue/store/sqlite/opening.hpp"
#include "catalogue/store/sqlite/rows.hpp"
#include "catalogue/store/sqlite/verification.hpp"

namespace kzcat {

namespace sqlite {

namespace {

using Kind = StoreError::Kind;

/// Changes to the tables within a transaction that the caller has begun.
class Writer {
public:
    explicit Writer(Connection& connection) : connection_(connection) {}

    Added add(const NewTrack& track)
    {
        const ContentKey key = content_key(track.trail);
        const std::optional<int64_t> known = find_key(key);
        const int64_t id = known ? *known : insert(track, key);
        if (known) {
            enrich(id, track);
        }
        Added added{.track = id, .is_new = !known, .has_source = true};
        const int64_t owner = track.source.uri.empty() ? 0 : owner_of(track.source.uri);
        if (!track.yields || owner == 0) {
            give(id, track.source);
        } else {
            added.has_source = owner == id;
        }
        return added;
    }

    /// Moves the source to a track from wherever it is; nothing when it is none.
    void give(int64_t track, const Source& source)
    {
        if (source.uri.empty()) {
            return;
        }
        const int64_t owner = owner_of(source.uri);
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

    bool remove(int64_t track)
    {
        Statement(connection_, "DELETE FROM track WHERE id = ?", track).run();
        return sqlite3_changes64(connection_.handle()) > 0;
    }

    bool remove_source(std::string_view uri)
    {
        const int64_t owner = owner_of(uri);
        if (owner == 0) {
            return false;
        }
        delete_source(uri);
        remove_without_sources(owner);
        return true;
    }

private:
    std::optional<int64_t> find_key(const ContentKey& key)
    {
        Statement row(connection_, "SELECT id FROM track WHERE key = ?", bytes_of(key));
        return row.step() ? std::optional(row.integer(0)) : std::nullopt;
    }

    int64_t owner_of(std::string_view uri)
    {
        Statement row(connection_, "SELECT track FROM source WHERE uri = ?", uri);
        return row.step() ? row.integer(0) : 0;
    }

    int64_t insert(const NewTrack& track, const ContentKey& key)
    {
        const auto key_bytes = bytes_of(key);
        const auto samples = static_cast<int64_t>(track.trail.samples);
        const auto codes = static_cast<int64_t>(track.trail.codes.size());
        const int64_t added = track.added != 0 ? track.added : seconds_now();
        Statement(connection_,
                  "INSERT INTO track (key, samples, codes, added, crc) VALUES (?, ?, ?, ?, ?)",
                  key_bytes, samples, codes, added, track_sum(key_bytes, samples, codes, added))
            .run();
        const int64_t id = sqlite3_last_insert_rowid(connection_.handle());
        std::vector<std::byte> room;
        const auto bytes = stored(std::span(track.trail.codes), room);
        Statement(connection_, "INSERT INTO trail (track, crc, codes) VALUES (?, ?, ?)", id,
                  int64_t{crc32c(bytes)}, bytes)
            .run();
        insert_bands(id, track.document_bands);
        insert_tags(id, track.tags);
        return id;
    }

    void insert_bands(int64_t track, const DocumentBands& bands)
    {
        if (bands.empty()) {
            return;
        }
        std::vector<std::byte> room;
        const auto bytes = stored(std::span(bands), room);
        Statement(connection_, "INSERT INTO document_bands (track, crc, bands) VALUES (?, ?, ?)",
                  track, int64_t{crc32c(bytes)}, bytes)
            .run();
    }

    void insert_tags(int64_t track, std::span<const Tag> tags)
    {
        int64_t place = 0;
        for (const Tag& tag : tags) {
            Statement(connection_,
                      "INSERT INTO tag (track, place, name, value, crc) VALUES (?, ?, ?, ?, ?)",
                      track, place, std::string_view{tag.name}, std::string_view{tag.value},
                      tag_sum(track, place, tag))
                .run();
            ++place;
        }
    }

    void enrich(int64_t id, const NewTrack& track)
    {
        const bool same_source =
            !track.yields && !track.source.uri.empty() && owner_of(track.source.uri) == id;
        const std::vector<Tag> kept = read_tags(connection_, id);
        const std::vector<Tag> tags = merge_tags(kept, track.tags, same_source);
        if (tags != kept) {
            Statement(connection_, "DELETE FROM tag WHERE track = ?", id).run();
            insert_tags(id, tags);
        }
        if (!has_bands(connection_, id)) {
            insert_bands(id, track.document_bands);
        }
    }

    void insert_source(int64_t track, const Source& source)
    {
        Statement(connection_,
                  "INSERT INTO source (uri, track, size, mtime_ns, hash, crc) "
                  "VALUES (?, ?, ?, ?, ?, ?)",
                  std::string_view{source.uri}, track, to_column(source.size),
                  to_column(source.mtime_ns), to_column(source.hash), source_sum(track, source))
            .run();
    }

    void update_source(int64_t track, const Source& source)
    {
        Statement(connection_,
                  "UPDATE source SET size = ?, mtime_ns = ?, hash = ?, crc = ? WHERE uri = ?",
                  to_column(source.size), to_column(source.mtime_ns), to_column(source.hash),
                  source_sum(track, source), std::string_view{source.uri})
            .run();
    }

    void delete_source(std::string_view uri)
    {
        Statement(connection_, "DELETE FROM source WHERE uri = ?", uri).run();
    }

    void remove_without_sources(int64_t track)
    {
        Statement(connection_,
                  "DELETE FROM track WHERE id = ?1 AND NOT EXISTS "
                  "(SELECT 1 FROM source WHERE track = ?1)",
                  track)
            .run();
    }

    Connection& connection_;
};

class SqliteStore final : public Store {
public:
    SqliteStore(std::string path, Access access, const SqliteOptions& options)
        : path_(std::move(path)), access_(access), options_(options)
    {
        open();
    }

    Profile profile() override
    {
        current();
        return opened_.profile;
    }

    std::vector<Added> add(std::span<const NewTrack> tracks) override
    {
        for (const NewTrack& track : tracks) {
            check_new_track(track, opened_.profile);
        }
        WriteTransaction transaction(writable());
        Writer writer(*opened_.connection);
        std::vector<Added> added;
        added.reserve(tracks.size());
        for (const NewTrack& track : tracks) {
            added.push_back(writer.add(track));
        }
        transaction.commit();
        return added;
    }

    void add_source(int64_t track, const Source& source) override
    {
        check_source(source);
        WriteTransaction transaction(writable());
        if (!has_track(*opened_.connection, track)) {
            throw StoreError(Kind::not_found, path_ + ": there is no track " +
                                                  std::to_string(track) + "; list what there is");
        }
        Writer(*opened_.connection).give(track, source);
        transaction.commit();
    }

    bool remove(int64_t track) override
    {
        WriteTransaction transaction(writable());
        const bool was_there = Writer(*opened_.connection).remove(track);
        transaction.commit();
        return was_there;
    }

    bool remove_source(std::string_view uri) override
    {
        WriteTransaction transaction(writable());
        const bool was_there = Writer(*opened_.connection).remove_source(uri);
        transaction.commit();
        return was_there;
    }

    std::optional<SourceInfo> find_source(std::string_view uri) override
    {
        Statement row(current(),
                      "SELECT track, uri, size, mtime_ns, hash FROM source WHERE uri = ?", uri);
        return read_one_source(row);
    }

    std::optional<SourceInfo> find_hash(const FileHash& hash) override
    {
        Statement row(current(),
                      "SELECT track, uri, size, mtime_ns, hash FROM source WHERE hash = ? "
                      "ORDER BY track, id LIMIT 1",
                      bytes_of(hash));
        return read_one_source(row);
    }

    std::optional<TrackInfo> find_track(int64_t track) override
    {
        const ReadTransaction moment(current());
        Statement row(*opened_.connection, "SELECT " KZCAT_TRACK_COLUMNS " FROM track WHERE id = ?",
                      track);
        return row.step() ? std::optional(read_track(*opened_.connection, row, opened_.profile))
                          : std::nullopt;
    }

    void visit_tracks(int64_t after, const std::function<bool(const TrackInfo&)>& visit) override
    {
        const ReadTransaction moment(current());
        Statement row(*opened_.connection,
                      "SELECT " KZCAT_TRACK_COLUMNS " FROM track WHERE id > ? ORDER BY id", after);
        Rising ids;
        do {
            if (!row.step()) {
                return;
            }
            ids.check(row.integer(0), path_);
        } while (visit(read_track(*opened_.connection, row, opened_.profile)));
    }

    void visit_trails(int64_t after,
                      const std::function<bool(int64_t track, const Trail&)>& visit) override
    {
        const ReadTransaction moment(current());
        Statement row(*opened_.connection,
                      "SELECT " KZCAT_TRAIL_COLUMNS
                      " FROM track LEFT JOIN trail ON trail.track = track.id "
                      "WHERE track.id > ? ORDER BY track.id",
                      after);
        Trail trail;
        trail.profile = opened_.profile;
        Rising ids;
        do {
            if (!row.step()) {
                return;
            }
            ids.check(row.integer(0), path_);
            read_trail(row, path_, trail);
        } while (visit(row.integer(0), trail));
    }

    std::optional<Trail> trail(int64_t track) override
    {
        Statement row(current(),
                      "SELECT " KZCAT_TRAIL_COLUMNS
                      " FROM track LEFT JOIN trail ON trail.track = track.id WHERE track.id = ?",
                      track);
        if (!row.step()) {
            return std::nullopt;
        }
        Trail trail;
        trail.profile = opened_.profile;
        read_trail(row, path_, trail);
        return trail;
    }

    std::optional<DocumentBands> document_bands(int64_t track) override
    {
        Statement row(current(), "SELECT track, crc, bands FROM document_bands WHERE track = ?",
                      track);
        return row.step() ? std::optional(read_bands(row, path_)) : std::nullopt;
    }

    std::vector<Change> changes(int64_t after, size_t limit) override
    {
        constexpr uint64_t kMost = std::numeric_limits<int64_t>::max();
        const auto most = static_cast<int64_t>(std::min<uint64_t>(limit, kMost));
        Statement row(current(),
                      "SELECT id, track, kind, mark FROM change WHERE id > ? ORDER BY id LIMIT ?",
                      after, most);
        std::vector<Change> changes;
        Rising cursors;
        while (row.step()) {
            cursors.check(row.integer(0), path_);
            changes.push_back(
                {.cursor = row.integer(0),
                 .track = row.integer(1),
                 .kind = row.integer(2) == kAddedCode ? ChangeKind::added : ChangeKind::removed,
                 .mark = static_cast<uint32_t>(row.integer(3))});
        }
        return changes;
    }

    int64_t last_change() override { return number("SELECT max(id) FROM change"); }

    std::string catalogue_id() override
    {
        Statement row(current(), "SELECT id FROM catalogue");
        return row.step() ? std::string(row.text(0)) : std::string();
    }

    uint64_t track_count() override { return count("SELECT count(*) FROM track"); }
    uint64_t code_count() override { return read_code_count(current()); }

    std::optional<std::string> setting(std::string_view name) override
    {
        Statement row(current(), "SELECT value FROM setting WHERE name = ?", name);
        return row.step() ? std::optional(std::string(row.text(0))) : std::nullopt;
    }

    void set_setting(std::string_view name, std::string_view value) override
    {
        check_setting(name, value);
        WriteTransaction transaction(writable());
        Statement(*opened_.connection,
                  "INSERT INTO setting (name, value, crc) VALUES (?, ?, ?) ON CONFLICT (name) "
                  "DO UPDATE SET value = excluded.value, crc = excluded.crc",
                  name, value, setting_sum(name, value))
            .run();
        transaction.commit();
    }

    void verify(const std::function<void(const Fault&)>& report,
                const std::function<bool(uint64_t, uint64_t)>& progress) override
    {
        sqlite::verify(current(), opened_.profile, report, progress);
    }

private:
    void open()
    {
        opened_ = open_catalogue(path_, access_, options_);
        is_stand_in_ = opened_.connection == nullptr;
        if (is_stand_in_) {
            opened_ = open_stand_in(path_, options_);
        }
    }

    /// The connection to read from: an empty file may have become a catalogue meanwhile.
    Connection& current()
    {
        if (is_stand_in_) {
            open();
        }
        return *opened_.connection;
    }

    Connection& writable()
    {
        if (access_ == Access::read) {
            throw StoreError(Kind::read_only,
                             path_ + ": it was opened for reading; open it for writing");
        }
        return *opened_.connection;
    }

    int64_t number(const char* sql)
    {
        Statement row(current(), sql);
        return row.step() ? row.integer(0) : 0;
    }

    uint64_t count(const char* sql)
    {
        return static_cast<uint64_t>(std::max<int64_t>(0, number(sql)));
    }

    std::string path_;
    Access access_;
    SqliteOptions options_;
    Opened opened_;
    bool is_stand_in_ = false;
};

} // namespace

} // namespace sqlite

std::unique_ptr<Store> open_sqlite_store(const std::string& path, Access access,
                                         const SqliteOptions& options)
{
    return std::make_unique<sqlite::SqliteStore>(path, access, options);
}

} // namespace kzcat
