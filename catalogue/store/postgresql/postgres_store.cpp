// A store on PostgreSQL. Each call that changes something is one transaction of the catalogue's own
// database; rows of tracks are read as of one moment, some hundred at a time.

#include "catalogue/store/postgresql/postgres_store.hpp"

#include <algorithm>
#include <limits>
#include <type_traits>
#include <utility>

#include "catalogue/store/postgresql/opening.hpp"
#include "catalogue/store/postgresql/trails.hpp"
#include "catalogue/store/postgresql/verification.hpp"
#include "catalogue/store/postgresql/writer.hpp"
#include "catalogue/store/rules.hpp"

namespace kzcat {

namespace postgresql {

namespace {

using Kind = StoreError::Kind;

std::optional<SourceInfo> first_source(const Rows& rows)
{
    return rows.empty() ? std::nullopt : std::optional(read_source(rows, 0));
}

Change read_change(const Rows& rows, int row)
{
    return {.cursor = rows.integer(row, 0),
            .track = rows.integer(row, 1),
            .kind = rows.integer(row, 2) == kAddedCode ? ChangeKind::added : ChangeKind::removed,
            .mark = static_cast<uint32_t>(rows.integer(row, 3) & 0xffffffff)};
}

class PostgresStore final : public Store {
public:
    PostgresStore(const std::string& address, Access access, const PostgresOptions& options)
        : access_(access), opened_(open_catalogue(address, access, options)),
          own_(*opened_.connection), shards_(own_, opened_.identity.id)
    {
    }

    Connection& connection() { return own_; }

    Profile profile() override { return opened_.identity.profile; }

    std::vector<Added> add(std::span<const NewTrack> tracks) override
    {
        for (const NewTrack& track : tracks) {
            check_new_track(track, profile());
        }
        return change(
            [tracks](Writer& writer) {
                std::vector<Added> added;
                added.reserve(tracks.size());
                for (const NewTrack& track : tracks) {
                    added.push_back(writer.add(track));
                }
                return added;
            },
            tracks);
    }

    void add_source(int64_t track, const Source& source) override
    {
        check_source(source);
        change([&](Writer& writer) {
            if (!find_track_row(own_, track)) {
                throw StoreError(Kind::not_found, own_.name() + ": there is no track " +
                                                      std::to_string(track) +
                                                      "; list what there is");
            }
            writer.give(track, source);
            return true;
        });
    }

    bool remove(int64_t track) override
    {
        return change([track](Writer& writer) { return writer.remove(track); });
    }

    bool remove_source(std::string_view uri) override
    {
        return change([uri](Writer& writer) { return writer.remove_source(uri); });
    }

    std::optional<SourceInfo> find_source(std::string_view uri) override
    {
        return first_source(own_.query("SELECT " KZCAT_SERVER_SOURCE_COLUMNS
                                       " FROM source WHERE sha256(uri) = sha256($1) AND uri = $1",
                                       std::as_bytes(std::span(uri))));
    }

    std::optional<SourceInfo> find_hash(const FileHash& hash) override
    {
        return first_source(own_.query("SELECT " KZCAT_SERVER_SOURCE_COLUMNS
                                       " FROM source WHERE hash = $1 ORDER BY track, id LIMIT 1",
                                       bytes_of(hash)));
    }

    std::optional<TrackInfo> find_track(int64_t track) override
    {
        const Transaction moment(own_, Transaction::Kind::moment);
        const auto row = find_track_row(own_, track);
        return row ? std::optional(read_tracks(own_, {&*row, 1}, profile()).front()) : std::nullopt;
    }

    void visit_tracks(int64_t after, const std::function<bool(const TrackInfo&)>& visit) override
    {
        for (auto tracks = next_tracks(after); !tracks.empty(); tracks = next_tracks(after)) {
            after = tracks.back().id;
            for (const TrackInfo& track : tracks) {
                if (!visit(track)) {
                    return;
                }
            }
        }
    }

    void visit_trails(int64_t after,
                      const std::function<bool(int64_t track, const Trail&)>& visit) override
    {
        bool goes_on = true;
        const auto take = [&](const TrackRow& track, const Trail* trail) {
            goes_on = trail == nullptr || visit(track.id, *trail);
            return goes_on;
        };
        for (auto rows = next_track_rows(own_, after); goes_on && !rows.empty();
             rows = next_track_rows(own_, after)) {
            after = rows.back().id;
            read_trails(own_, shards_, rows, profile(), take);
        }
    }

    std::optional<Trail> trail(int64_t track) override
    {
        std::optional<Trail> found;
        if (const auto row = find_track_row(own_, track)) {
            read_trails(own_, shards_, {&*row, 1}, profile(),
                        [&found](const TrackRow&, const Trail* trail) {
                            found = trail == nullptr ? std::nullopt : std::optional(*trail);
                            return true;
                        });
        }
        return found;
    }

    std::optional<DocumentBands> document_bands(int64_t track) override
    {
        const auto row = find_track_row(own_, track);
        return row ? read_document_bands(own_, shards_, *row) : std::nullopt;
    }

    std::vector<Change> changes(int64_t after, size_t limit) override
    {
        constexpr auto kMost = static_cast<size_t>(std::numeric_limits<int64_t>::max());
        const Rows rows = own_.query("SELECT id, track, kind, mark FROM change WHERE id > $1 "
                                     "ORDER BY id LIMIT $2",
                                     after, static_cast<int64_t>(std::min(limit, kMost)));
        std::vector<Change> changes;
        for (int row = 0; row < rows.count(); ++row) {
            changes.push_back(read_change(rows, row));
        }
        return changes;
    }

    int64_t last_change() override { return number("SELECT coalesce(max(id), 0) FROM change"); }
    std::string catalogue_id() override { return opened_.identity.id; }
    uint64_t track_count() override { return count("SELECT count(*) FROM track"); }

    uint64_t code_count() override
    {
        return count("SELECT coalesce(sum(greatest(codes, 0)), 0)::bigint FROM track");
    }

    std::optional<std::string> setting(std::string_view name) override
    {
        const Rows rows =
            own_.query("SELECT value FROM setting WHERE sha256(name) = sha256($1) AND name = $1",
                       std::as_bytes(std::span(name)));
        return rows.empty() ? std::nullopt : std::optional(std::string(rows.text(0, 0)));
    }

    void set_setting(std::string_view name, std::string_view value) override
    {
        check_setting(name, value);
        change([&](Writer&) {
            own_.query("INSERT INTO setting (name, value, crc) VALUES ($1, $2, $3) ON CONFLICT "
                       "(sha256(name)) DO UPDATE SET value = excluded.value, crc = excluded.crc",
                       std::as_bytes(std::span(name)), value, setting_sum(name, value));
            return true;
        });
    }

    void verify(const std::function<void(const Fault&)>& report,
                const std::function<bool(uint64_t, uint64_t)>& progress) override
    {
        postgresql::verify(own_, shards_, opened_.identity, report, progress);
    }

private:
    /// Runs `act` as the only writer, in one transaction. It may add `tracks`.
    template <class Act>
    std::invoke_result_t<Act, Writer&> change(Act act, std::span<const NewTrack> tracks = {})
    {
        if (access_ == Access::read) {
            throw StoreError(Kind::read_only,
                             own_.name() + ": it was opened for reading; open it for writing");
        }
        Writer writer(own_, shards_);
        writer.prepare(tracks);
        Transaction transaction(own_, Transaction::Kind::write);
        own_.query(kTakeTurn);
        writer.settle();
        auto result = act(writer);
        writer.write_codes();
        transaction.commit();
        if (!transaction.is_inner()) {
            writer.clean();
        }
        return result;
    }

    std::vector<TrackInfo> next_tracks(int64_t after)
    {
        const Transaction moment(own_, Transaction::Kind::moment);
        return read_tracks(own_, next_track_rows(own_, after), profile());
    }

    int64_t number(const char* sql)
    {
        const Rows rows = own_.query(sql);
        return rows.empty() ? 0 : rows.integer(0, 0);
    }

    uint64_t count(const char* sql) { return static_cast<uint64_t>(number(sql)); }

    Access access_;
    Opened opened_;
    Connection& own_;
    Shards shards_;
};

} // namespace

} // namespace postgresql

std::unique_ptr<Store> open_postgres_store(const std::string& address, Access access,
                                           const PostgresOptions& options)
{
    return std::make_unique<postgresql::PostgresStore>(address, access, options);
}

postgresql::Connection& connection_of(Store& store)
{
    return dynamic_cast<postgresql::PostgresStore&>(store).connection();
}

} // namespace kzcat
