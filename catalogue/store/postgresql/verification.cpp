// Checksums and keys cover what is in the rows, the log of changes is played back, and codes that
// no track has are looked for. The structure of the tables is the server's own concern.

#include "catalogue/store/postgresql/verification.hpp"

#include <algorithm>
#include <set>
#include <string>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/postgresql/trails.hpp"

namespace kzcat::postgresql {

namespace {

using Kind = StoreError::Kind;

class Verification {
public:
    Verification(Connection& own, Shards& shards, const Identity& identity,
                 const std::function<void(const Fault&)>& report,
                 const std::function<bool(uint64_t, uint64_t)>& progress)
        : own_(own), shards_(shards), identity_(identity), report_(report), progress_(progress)
    {
    }

    void run()
    {
        check_catalogue();
        check_settings();
        check_log();
        check_sequence();
        check_strays(shards_.numbers());
        check_tracks();
    }

private:
    void fault(int64_t track, const std::string& text) { report_({.track = track, .text = text}); }

    /// What cannot be read is a fault too, and the other checks go on.
    template <class Check>
    void attempt(int64_t track, Check check)
    {
        try {
            check();
        } catch (const StoreError& error) {
            if (error.kind() != Kind::damaged) {
                throw;
            }
            fault(track, error.what());
        }
    }

    void check_catalogue()
    {
        const Rows rows = own_.query("SELECT id, profile, crc FROM catalogue");
        if (rows.empty() ||
            catalogue_sum(rows.text(0, 0), rows.integer(0, 1)) != rows.integer(0, 2)) {
            fault(0, "the id or the profile of the catalogue has changed");
        }
    }

    void check_settings()
    {
        const Rows rows = own_.query("SELECT name, value, crc FROM setting");
        for (int row = 0; row < rows.count(); ++row) {
            if (setting_sum(rows.text(row, 0), rows.text(row, 1)) != rows.integer(row, 2)) {
                fault(0, "the setting \"" + std::string(rows.text(row, 0)) + "\" has changed");
            }
        }
    }

    /// Ids of changes rise by one; a track comes once and goes at most once; what came and has not
    /// gone is there.
    void check_log()
    {
        const Transaction moment(own_, Transaction::Kind::moment);
        std::set<int64_t> there;
        while (take_in_changes(there)) {
        }
        const Rows tracks = own_.query("SELECT id FROM track");
        for (int row = 0; row < tracks.count(); ++row) {
            if (there.erase(tracks.integer(row, 0)) == 0) {
                fault(tracks.integer(row, 0), "the log of changes does not have it");
            }
        }
        for (const int64_t missing : there) {
            fault(missing, "the log of changes has it, but it is gone");
        }
    }

    /// False at the end of the log.
    bool take_in_changes(std::set<int64_t>& there)
    {
        const Rows rows = own_.query("SELECT id, track, kind, mark FROM change WHERE id > $1 "
                                     "ORDER BY id LIMIT 10000",
                                     last_change_);
        for (int row = 0; row < rows.count(); ++row) {
            const int64_t mark = rows.integer(row, 3);
            if (rows.integer(row, 0) != last_change_ + 1 || mark < 0 || mark > 0xffffffff) {
                fault(rows.integer(row, 1), "change " + std::to_string(rows.integer(row, 0)) +
                                                " of the log has changed or is missing");
            }
            last_change_ = rows.integer(row, 0);
            take_in(rows.integer(row, 1), rows.integer(row, 2), there);
        }
        return !rows.empty();
    }

    void take_in(int64_t track, int64_t kind, std::set<int64_t>& there)
    {
        if (kind == kAddedCode) {
            if (!there.insert(track).second || track <= last_track_) {
                fault(track, "the log of changes has it twice");
            }
            last_track_ = std::max(last_track_, track);
        } else if (kind != kRemovedCode || there.erase(track) == 0) {
            fault(track, "the log of changes has it removed before it was added");
        }
    }

    /// Ids must go on from where they were, or one would be given twice.
    void check_sequence()
    {
        const Rows rows = own_.query("SELECT last_value FROM track_id_seq");
        if (rows.empty() || rows.integer(0, 0) < last_track_) {
            fault(0, "the next id of the table track has changed");
        }
    }

    void check_strays(std::vector<int64_t> shards)
    {
        if (shards.empty()) {
            shards.push_back(0);
        }
        for (const int64_t shard : shards) {
            for (int64_t after = 0; check_some_strays(shard, after);) {
            }
        }
    }

    /// Looks whether the next codes of a shard are those of tracks; false at the end.
    bool check_some_strays(int64_t shard, int64_t& after)
    {
        std::vector<int64_t> tracks = numbers_in(shards_.at(shard).query(
            "SELECT track FROM trail WHERE track > $1 ORDER BY track LIMIT 10000", after));
        if (tracks.empty()) {
            return false;
        }
        after = tracks.back();
        tracks = numbers_in(own_.query(
            "SELECT stray FROM unnest($1::bigint[]) AS codes (stray) WHERE NOT EXISTS (SELECT 1 "
            "FROM track WHERE id = stray AND shard = $2) AND NOT EXISTS (SELECT 1 FROM pending "
            "WHERE track = stray)",
            std::span<const int64_t>(tracks), shard));
        // Those of a track that a writer has removed meanwhile have gone by now.
        tracks = numbers_in(
            shards_.at(shard).query("SELECT track FROM trail WHERE track = ANY ($1) ORDER BY track",
                                    std::span<const int64_t>(tracks)));
        for (const int64_t track : tracks) {
            fault(track, "there are codes of it in the table kzcat.trail of shard " +
                             std::to_string(shard) + ", but no such track; delete that row");
        }
        return true;
    }

    static std::vector<int64_t> numbers_in(const Rows& rows)
    {
        std::vector<int64_t> numbers;
        for (int row = 0; row < rows.count(); ++row) {
            numbers.push_back(rows.integer(row, 0));
        }
        return numbers;
    }

    void check_tracks()
    {
        const Rows counted = own_.query("SELECT count(*) FROM track");
        total_ = static_cast<uint64_t>(counted.integer(0, 0));
        for (int64_t after = 0;;) {
            const std::vector<TrackRow> rows = next_track_rows(own_, after);
            if (rows.empty()) {
                return;
            }
            after = rows.back().id;
            check_tags(rows);
            check_sources(rows);
            if (!check_contents(rows)) {
                return;
            }
        }
    }

    /// False when the caller wants no more.
    bool check_contents(const std::vector<TrackRow>& rows)
    {
        bool goes_on = true;
        const auto check = [&](const TrackRow& track, const Trail* trail) {
            if (sum_of(track) != track.crc) {
                fault(track.id, "its row has changed");
            }
            if (trail != nullptr && content_key(*trail) != track.key) {
                fault(track.id, "its codes are not those that its key was made of");
            }
            attempt(track.id, [&] { read_document_bands(own_, shards_, track); });
            ++done_;
            goes_on = progress_(done_, std::max(done_, total_));
            return goes_on;
        };
        read_trails(own_, shards_, rows, identity_.profile, check,
                    [this](int64_t track, const StoreError& error) { fault(track, error.what()); });
        return goes_on;
    }

    void check_tags(const std::vector<TrackRow>& tracks)
    {
        const Rows rows = own_.query("SELECT track, place, name, value, crc FROM tag WHERE track "
                                     "BETWEEN $1 AND $2 ORDER BY track, place",
                                     tracks.front().id, tracks.back().id);
        int64_t place = 0;
        for (int row = 0; row < rows.count(); ++row) {
            const int64_t track = rows.integer(row, 0);
            place = row > 0 && rows.integer(row - 1, 0) == track ? place + 1 : 0;
            const Tag tag{.name = std::string(rows.text(row, 2)),
                          .value = std::string(rows.text(row, 3))};
            if (rows.integer(row, 1) != place ||
                tag_sum(track, place, tag) != rows.integer(row, 4)) {
                fault(track, "its tag \"" + tag.name + "\" has changed");
            }
        }
    }

    void check_sources(const std::vector<TrackRow>& tracks)
    {
        const Rows rows =
            own_.query("SELECT " KZCAT_SERVER_SOURCE_COLUMNS ", crc FROM source WHERE "
                       "track BETWEEN $1 AND $2",
                       tracks.front().id, tracks.back().id);
        for (int row = 0; row < rows.count(); ++row) {
            const SourceInfo found = read_source(rows, row);
            const bool has_hash = found.source.hash.has_value();
            if (has_hash == rows.is_null(row, 4) ||
                source_sum(found.track, found.source) != rows.integer(row, 5)) {
                fault(found.track, "its source \"" + found.source.uri + "\" has changed");
            }
        }
    }

    Connection& own_;
    Shards& shards_;
    const Identity& identity_;
    const std::function<void(const Fault&)>& report_;
    const std::function<bool(uint64_t, uint64_t)>& progress_;
    int64_t last_change_ = 0;
    int64_t last_track_ = 0;
    uint64_t done_ = 0;
    uint64_t total_ = 0;
};

} // namespace

void verify(Connection& own, Shards& shards, const Identity& identity,
            const std::function<void(const Fault&)>& report,
            const std::function<bool(uint64_t, uint64_t)>& progress)
{
    Verification(own, shards, identity, report, progress).run();
}

} // namespace kzcat::postgresql
