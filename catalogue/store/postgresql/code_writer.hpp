/// @file
/// The codes of tracks that come and go, in the catalogue's own database and on its shards.
#pragma once

#include <cstdint>
#include <map>
#include <set>
#include <span>
#include <vector>

#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/shards.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

/// Waits until no other writer of a database is in its transaction.
constexpr const char* kTakeTurn = "SELECT pg_advisory_xact_lock(1264206657)"; // "KZCA"

/// The part of a Writer that has to do with codes.
///
/// Codes for shards are committed there before the catalogue's transaction, so that no transaction
/// is over two databases: without its row in the catalogue's table a track is not there, and the
/// table `pending` has what may have to be removed.
class CodeWriter {
public:
    struct Codes {
        int64_t track = 0;
        const Trail* trail = nullptr; ///< null: they are there
        const DocumentBands* bands = nullptr;
    };

    CodeWriter(Connection& own, Shards& shards) : own_(own), shards_(shards) {}

    /// Asks these shards and those that settle() needs for an answer, so that those whose hosts are
    /// silent are waited for before the turn.
    void prepare(std::set<int64_t> shards);

    /// Removes codes that an interrupted writer has left on shards, as far as these can be reached.
    void settle();

    /// What was added and removed in the catalogue's own table.
    void add(int64_t shard, const Codes& codes);
    void remove(int64_t shard, int64_t track);

    /// Writes the codes of what was added and not removed since.
    void write();

    /// Removes the codes of what was removed, once that is committed; what cannot be removed now,
    /// the next writer removes.
    void clean() noexcept;

private:
    void write(int64_t shard, const std::vector<Codes>& all);
    void remove_codes(int64_t shard, std::span<const int64_t> tracks);
    void announce();
    void retract();

    Connection& own_;
    Shards& shards_;
    std::map<int64_t, std::vector<Codes>> codes_;     ///< by shard
    std::vector<int64_t> announced_;                  ///< what `pending` names
    std::map<int64_t, std::vector<int64_t>> removed_; ///< by shard, but for those on shard 0
};

} // namespace kzcat::postgresql
