// What no single check sees: SQLite's own covers the structure of the file, checksums and keys
// cover what is in it, and the log of changes is played back.

#include "catalogue/store/sqlite/verification.hpp"

#include <algorithm>
#include <limits>
#include <set>
#include <string>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/row_sum.hpp"
#include "catalogue/store/sqlite/opening.hpp"
#include "catalogue/store/sqlite/rows.hpp"

namespace kzcat::sqlite {

namespace {

using Kind = StoreError::Kind;

class Verification {
public:
    Verification(Connection& connection, Profile profile,
                 const std::function<void(const Fault&)>& report,
                 const std::function<bool(uint64_t, uint64_t)>& progress)
        : connection_(connection), profile_(profile), report_(report), progress_(progress)
    {
    }

    void run()
    {
        const ReadTransaction moment(connection_);
        attempt(0, [this] { check_schema(); });
        attempt(0, [this] { check_structure(); });
        attempt(0, [this] { check_references(); });
        attempt(0, [this] { check_catalogue(); });
        attempt(0, [this] { check_settings(); });
        attempt(0, [this] { check_changes(); });
        attempt(0, [this] { check_sequences(); });
        attempt(0, [this] { check_tracks(); });
    }

private:
    /// What cannot be read is a fault too, and the other checks go on.
    template <class Check>
    void attempt(int64_t track, Check check)
    {
        try {
            check();
        } catch (const StoreError& error) {
            if (error.kind() != Kind::damaged && error.kind() != Kind::failed) {
                throw;
            }
            report_({.track = track, .text = error.what()});
        }
    }

    void fault(int64_t track, const std::string& text) { report_({.track = track, .text = text}); }

    void check_schema()
    {
        for (const std::string& text : schema_faults(connection_)) {
            fault(0, text);
        }
    }

    void check_structure()
    {
        Statement row(connection_, "PRAGMA integrity_check");
        while (row.step()) {
            if (row.text(0) != "ok") {
                fault(0, "the structure of the file is damaged: " + std::string(row.text(0)));
            }
        }
    }

    void check_references()
    {
        Statement row(connection_, "PRAGMA foreign_key_check");
        while (row.step()) {
            fault(0, "a row of " + std::string(row.text(0)) + " belongs to no track");
        }
    }

    void check_catalogue()
    {
        Statement row(connection_, "SELECT id, profile, crc FROM catalogue");
        if (!row.step()) {
            fault(0, "the catalogue has lost its id");
        } else if (row.text(0).size() != 32 ||
                   catalogue_sum(row.text(0), row.integer(1)) != row.integer(2)) {
            fault(0, "the id or the profile of the catalogue has changed");
        }
    }

    void check_settings()
    {
        Statement row(connection_, "SELECT name, value, crc FROM setting");
        while (row.step()) {
            if (setting_sum(row.text(0), row.text(1)) != row.integer(2)) {
                fault(0, "the setting \"" + std::string(row.text(0)) + "\" has changed");
            }
        }
    }

    /// Ids of changes rise by one; a track comes once and goes at most once; what came and has not
    /// gone is there.
    void check_changes()
    {
        std::set<int64_t> there;
        Statement row(connection_, "SELECT id, track, kind, mark, total FROM change ORDER BY id");
        while (row.step()) {
            const bool follows = last_change_ < std::numeric_limits<int64_t>::max() &&
                                 row.integer(0) == last_change_ + 1;
            if (!follows || !is_consistent(row)) {
                fault(row.integer(1), "change " + std::to_string(row.integer(0)) +
                                          " of the log has changed or is missing");
            }
            last_change_ = row.integer(0);
            take_in(row, there);
        }
        Statement track(connection_, "SELECT id FROM track");
        while (track.step()) {
            if (there.erase(track.integer(0)) == 0) {
                fault(track.integer(0), "the log of changes does not have it");
            }
        }
        for (const int64_t missing : there) {
            fault(missing, "the log of changes has it, but it is gone");
        }
    }

    /// Numbers of a damaged row may be of any size: they are added only when they are as they
    /// should be, so that no sum overflows.
    static bool is_consistent(const Statement& row)
    {
        constexpr int64_t kMostTracks = int64_t{1} << 62U;
        constexpr int64_t kMostMark = 0xffffffff;
        const int64_t track = row.integer(1);
        const int64_t kind = row.integer(2);
        const int64_t mark = row.integer(3);
        return track > 0 && track < kMostTracks && (kind == kAddedCode || kind == kRemovedCode) &&
               mark >= 0 && mark <= kMostMark && track + kind + mark == row.integer(4);
    }

    void take_in(const Statement& row, std::set<int64_t>& there)
    {
        const int64_t track = row.integer(1);
        if (row.integer(2) == kAddedCode) {
            if (!there.insert(track).second || track <= last_track_) {
                fault(track, "the log of changes has it twice");
            }
            last_track_ = std::max(last_track_, track);
        } else if (row.integer(2) != kRemovedCode || there.erase(track) == 0) {
            fault(track, "the log of changes has it removed before it was added");
        }
    }

    /// Ids must go on from where they were, or one would be given twice.
    void check_sequences()
    {
        check_sequence("track", last_track_);
        check_sequence("change", last_change_);
    }

    /// A table that never had a row has no sequence.
    void check_sequence(std::string_view table, int64_t wanted)
    {
        Statement row(connection_, "SELECT seq FROM sqlite_sequence WHERE name = ?", table);
        const int64_t last = row.step() ? row.integer(0) : 0;
        if (last != wanted || row.step()) {
            fault(0, "the next id of the table " + std::string(table) + " has changed");
        }
    }

    void check_tracks()
    {
        Statement total(connection_, "SELECT count(*) FROM track");
        const uint64_t all = total.step() ? static_cast<uint64_t>(total.integer(0)) : 0;
        Statement row(connection_,
                      "SELECT id, key, samples, codes, added, crc FROM track ORDER BY id");
        for (uint64_t done = 1; row.step(); ++done) {
            attempt(row.integer(0), [&] { check_track(row); });
            if (!progress_(done, all)) {
                return;
            }
        }
    }

    void check_track(const Statement& row)
    {
        const int64_t id = row.integer(0);
        if (track_sum(row.blob(1), row.integer(2), row.integer(3), row.integer(4)) !=
            row.integer(5)) {
            fault(id, "its row has changed");
        }
        attempt(id, [&] { check_codes(id, row.blob(1)); });
        attempt(id, [&] { check_bands(id); });
        attempt(id, [&] { check_tags(id); });
        attempt(id, [&] { check_sources(id); });
    }

    void check_codes(int64_t id, std::span<const std::byte> key)
    {
        Statement row(connection_,
                      "SELECT " KZCAT_TRAIL_COLUMNS
                      " FROM track LEFT JOIN trail ON trail.track = track.id WHERE track.id = ?",
                      id);
        if (!row.step()) {
            return;
        }
        Trail trail;
        trail.profile = profile_;
        read_trail(row, connection_.path(), trail);
        const ContentKey wanted = content_key(trail);
        if (!std::ranges::equal(key, std::as_bytes(std::span(wanted)))) {
            fault(id, "its codes are not those that its key was made of");
        }
    }

    void check_bands(int64_t id)
    {
        Statement row(connection_, "SELECT track, crc, bands FROM document_bands WHERE track = ?",
                      id);
        if (row.step()) {
            read_bands(row, connection_.path());
        }
    }

    void check_tags(int64_t id)
    {
        Statement row(connection_,
                      "SELECT place, name, value, crc FROM tag WHERE track = ? ORDER BY place", id);
        for (int64_t place = 0; row.step(); ++place) {
            const Tag tag{.name = std::string(row.text(1)), .value = std::string(row.text(2))};
            if (row.integer(0) != place || tag_sum(id, place, tag) != row.integer(3)) {
                fault(id, "its tag \"" + tag.name + "\" has changed");
            }
        }
    }

    void check_sources(int64_t id)
    {
        Statement row(connection_,
                      "SELECT track, uri, size, mtime_ns, hash, crc FROM source WHERE track = ?",
                      id);
        while (const std::optional<SourceInfo> found = read_one_source(row)) {
            const bool has_hash = found->source.hash.has_value();
            if (has_hash == row.is_null(4) || source_sum(id, found->source) != row.integer(5)) {
                fault(id, "its source \"" + found->source.uri + "\" has changed");
            }
        }
    }

    Connection& connection_;
    Profile profile_;
    const std::function<void(const Fault&)>& report_;
    const std::function<bool(uint64_t, uint64_t)>& progress_;
    int64_t last_change_ = 0;
    int64_t last_track_ = 0;
};

} // namespace

void verify(Connection& connection, Profile profile,
            const std::function<void(const Fault&)>& report,
            const std::function<bool(uint64_t, uint64_t)>& progress)
{
    Verification(connection, profile, report, progress).run();
}

} // namespace kzcat::sqlite
