/// @file
/// All codes of a store at one moment: those of a side file, and those that came since.
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <unordered_set>
#include <vector>

#include "catalogue/index/index_file.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat {

/// A side file that is mapped.
struct MappedIndex {
    MappedFile file;
    IndexContents contents;
};

/// Maps a side file and checks it. Throws IndexFileError, or std::system_error when it cannot be
/// read.
MappedIndex map_index(const std::string& path);

/// Whether one of the tracks, whose ids rise, has this id.
bool has_track(std::span<const TrackSpan> tracks, int64_t id);

/// What a store has, kept up to date from its log of changes. Copies share the codes.
class Snapshot {
public:
    /// Reads everything from the store. Tracks whose trails are damaged are left out; when that
    /// leaves none, it throws as the store did.
    explicit Snapshot(Store& store);

    /// Begins with a side file, and reads from the store what has changed since it was written.
    /// Throws IndexFileError when the file is not one of this store.
    Snapshot(Store& store, MappedIndex mapped);

    /// That of a side file which has just been written.
    explicit Snapshot(MappedIndex mapped);

    /// Takes in what has changed. False: the log does not lead from here to what the store has, and
    /// everything must be read again. After an exception the snapshot is as it was, or has a part
    /// of the changes and takes the rest the next time.
    bool update(Store& store);

    int64_t cursor() const { return cursor_; }
    size_t left_out() const { return left_out_.size(); } ///< tracks whose trails are damaged
    Corpus corpus() const;
    Corpus tail() const; ///< what the side file does not have
    const MappedIndex* mapped() const { return mapped_.get(); }
    std::span<const TrackSpan> mapped_tracks() const { return mapped_tracks_; } ///< not removed

    /// Whether more than a tenth of what the side file has was added or removed since.
    bool is_stale() const;

private:
    /// Tracks in memory.
    struct Chunk {
        std::shared_ptr<const std::vector<Code>> codes;
        std::vector<TrackSpan> tracks;
    };
    struct Changes;

    void read_whole_tracks(Store& store);
    int64_t last_id() const;
    Changes read_changes(Store& store) const;
    void add(std::vector<Code> codes, std::vector<TrackSpan> tracks);
    void remove(const std::unordered_set<int64_t>& ids);
    bool agrees_with(Store& store) const;
    bool is_of(Store& store) const;

    std::shared_ptr<const MappedIndex> mapped_;
    std::vector<TrackSpan> mapped_tracks_;
    std::vector<Chunk> chunks_;
    std::unordered_set<int64_t> left_out_;
    int64_t cursor_ = 0;
};

} // namespace kzcat
