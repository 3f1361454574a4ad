/// @file
/// Changes to the tables of a catalogue on servers.
#pragma once

#include <cstdint>
#include <map>
#include <string_view>
#include <vector>

#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/rows.hpp"
#include "catalogue/store/postgresql/shards.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

/// Waits until no other writer of a database is in its transaction.
constexpr const char* kTakeTurn = "SELECT pg_advisory_xact_lock(1264206657)"; // "KZCA"

/// What is done within one transaction of the catalogue's own session, which the caller has begun
/// and in which it is the only writer.
///
/// Codes for shards are committed there before the catalogue's transaction, so that no transaction
/// is over two databases: without its row in the catalogue's table a track is not there, and the
/// table `pending` has what may have to be removed.
class Writer {
public:
    Writer(Connection& own, Shards& shards) : own_(own), shards_(shards) {}

    /// Removes codes that an interrupted writer has left on shards, as far as these can be reached.
    void settle();

    Added add(const NewTrack& track);
    void give(int64_t track, const Source& source);
    bool remove(int64_t track);
    bool remove_source(std::string_view uri);

    /// Writes the codes of what was added. The tracks passed to add() must still be there.
    void write_codes();

    /// To be called once the transaction is committed. Removes the codes of what was removed; what
    /// cannot be removed now is by the next writer.
    void clean() noexcept;

private:
    struct Codes {
        int64_t track = 0;
        const Trail* trail = nullptr; ///< null: they are there
        const DocumentBands* bands = nullptr;
    };

    int64_t insert(const NewTrack& track, const ContentKey& key);
    void enrich(const TrackRow& known, const NewTrack& track);
    void insert_tags(int64_t track, std::span<const Tag> tags);
    void give(int64_t track, const Source& source, int64_t owner);
    void insert_source(int64_t track, const Source& source);
    void update_source(int64_t track, const Source& source);
    int64_t owner_of(std::string_view uri);
    void delete_source(std::string_view uri);
    void remove_without_sources(int64_t track);
    bool note_removed(const Rows& rows);
    void announce();
    void retract();

    Connection& own_;
    Shards& shards_;
    std::map<int64_t, std::vector<Codes>> codes_;     ///< by shard
    std::vector<int64_t> announced_;                  ///< what `pending` names
    std::map<int64_t, std::vector<int64_t>> removed_; ///< by shard, but for those on shard 0
};

} // namespace kzcat::postgresql
