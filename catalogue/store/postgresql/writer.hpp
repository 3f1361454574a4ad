/// @file
/// Changes to the tables of a catalogue on servers.
#pragma once

#include <cstdint>
#include <span>
#include <string_view>

#include "catalogue/store/postgresql/code_writer.hpp"
#include "catalogue/store/postgresql/connection.hpp"
#include "catalogue/store/postgresql/rows.hpp"
#include "catalogue/store/postgresql/shards.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

/// What is done within one transaction of the catalogue's own session, which the caller has begun
/// and in which it is the only writer. The codes of its tracks are a CodeWriter's.
class Writer {
public:
    Writer(Connection& own, Shards& shards) : own_(own), shards_(shards), codes_(own, shards) {}

    /// To be called before the caller is the only writer: it waits for shards whose hosts are
    /// silent, so that other writers need not. `tracks` are those that are to be added.
    void prepare(std::span<const NewTrack> tracks);

    /// The first thing to do as the only writer.
    void settle() { codes_.settle(); }

    Added add(const NewTrack& track);
    void give(int64_t track, const Source& source);
    bool remove(int64_t track);
    bool remove_source(std::string_view uri);

    /// Writes the codes of what was added. The tracks passed to add() must still be there.
    void write_codes() { codes_.write(); }

    /// To be called once the transaction is committed.
    void clean() noexcept { codes_.clean(); }

private:
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

    Connection& own_;
    Shards& shards_;
    CodeWriter codes_;
};

} // namespace kzcat::postgresql
