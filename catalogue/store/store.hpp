/// @file
/// Where the tracks of a catalogue are kept: the interface that memory, SQLite and other databases
/// implement.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "catalogue/model/document_bands.hpp"
#include "catalogue/model/trail.hpp"

namespace kzcat {

/// Why a store could not do what it was asked, in a sentence that names a cure. Nothing was
/// changed.
class StoreError : public std::runtime_error {
public:
    enum class Kind {
        cannot_open,   ///< missing, no permission, not a catalogue
        newer_version, ///< written by a later version
        other_profile, ///< features that cannot be compared
        read_only,
        busy, ///< another writer holds it
        full, ///< disk or quota
        damaged,
        not_found,
        invalid, ///< an argument
        failed,  ///< anything else the system reported
    };
    StoreError(Kind kind, const std::string& text) : std::runtime_error(text), kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

using ContentKey = std::array<uint8_t, 16>; ///< hash of the features: content_key()
using FileHash = std::array<uint8_t, 32>;   ///< SHA-256 of a file's bytes

/// A tag as the sound file has it: "title", "artist", ... in lower case, and its value. Both are
/// UTF-8 without NUL, and the name is not empty.
struct Tag {
    std::string name;
    std::string value;
    bool operator==(const Tag&) const = default;
};

/// A file or other place that a track was added from.
struct Source {
    std::string uri;   ///< the path as it was added, any bytes but NUL; names one track at a time
    int64_t size = -1; ///< bytes; -1 when not a file
    int64_t mtime_ns = -1;
    std::optional<FileHash> hash;
    bool operator==(const Source&) const = default;
};

struct NewTrack {
    Trail trail;
    DocumentBands document_bands; ///< empty: documents are not answered by this track
    std::vector<Tag> tags;
    Source source;       ///< none when its uri is empty
    int64_t added = 0;   ///< seconds since 1970; 0: now
    bool yields = false; ///< what is known stays: sources are only added, and so are tags
};

struct Added {
    int64_t track = 0;
    bool is_new = false;    ///< false: a track with the same features was there
    bool has_source = true; ///< false: the source stayed with another track, see NewTrack::yields
};

struct TrackInfo {
    int64_t id = 0;
    ContentKey key{};
    Profile profile = Profile::standard;
    uint64_t samples = 0;
    uint64_t codes = 0;
    bool has_document_bands = false;
    int64_t added = 0;           ///< seconds since 1970
    std::vector<Tag> tags;       ///< in the order in which they were given
    std::vector<Source> sources; ///< the first added first
};

struct SourceInfo {
    int64_t track = 0;
    Source source;
};

enum class ChangeKind { added, removed };

struct Change {
    int64_t cursor = 0; ///< rises; never given twice
    int64_t track = 0;
    ChangeKind kind = ChangeKind::added;
    uint32_t mark = 0; ///< random: tells apart two copies of a catalogue that both went on changing
};

/// A fault that verify() found.
struct Fault {
    int64_t track = 0; ///< 0 when no single track is concerned
    std::string text;
};

/// One writer, many readers, in one or several processes. Every call throws StoreError, or
/// std::bad_alloc; what throws has changed nothing. An object belongs to one thread at a time.
/// Functions that are passed in must not change the store.
class Store {
public:
    virtual ~Store() = default;

    /// Features of another profile are refused.
    virtual Profile profile() = 0;

    /// Adds tracks and sources in one transaction: all are there for good when it returns, or none.
    ///
    /// A track whose features are there already gains the source, the tags whose names it lacks,
    /// and document bands when it has none. The same source given again for the same track replaces
    /// what was noted of the file, and the tags unless none are given. A source that another track
    /// had moves to this one (the file was overwritten), and the other track goes when it has no
    /// source left.
    virtual std::vector<Added> add(std::span<const NewTrack> tracks) = 0;

    /// Gives a track one source more, by the rules of add(): the same bytes at another path.
    virtual void add_source(int64_t track, const Source& source) = 0;

    /// Removes a track with all its sources; false when there is none.
    virtual bool remove(int64_t track) = 0;

    /// Removes one source, and its track when it was the last one; false when there is none.
    virtual bool remove_source(std::string_view uri) = 0;

    virtual std::optional<SourceInfo> find_source(std::string_view uri) = 0;

    /// A source of these bytes; of several the one with the lowest track.
    virtual std::optional<SourceInfo> find_hash(const FileHash& hash) = 0;
    virtual std::optional<TrackInfo> find_track(int64_t track) = 0;

    /// Tracks in the order of their ids, from the one after `after`; stops when `visit` returns
    /// false.
    virtual void visit_tracks(int64_t after,
                              const std::function<bool(const TrackInfo&)>& visit) = 0;

    /// The same with their trails; their checksums are checked.
    virtual void visit_trails(int64_t after,
                              const std::function<bool(int64_t track, const Trail&)>& visit) = 0;

    /// None when there is no such track.
    virtual std::optional<Trail> trail(int64_t track) = 0;

    /// None when there is no such track, or it has none.
    virtual std::optional<DocumentBands> document_bands(int64_t track) = 0;

    /// What has changed since a cursor, oldest first: which tracks came and went. A track comes
    /// once and goes at most once, for its id is never given to another.
    virtual std::vector<Change> changes(int64_t after, size_t limit) = 0;

    /// The cursor of the newest change; 0 when nothing was ever added.
    virtual int64_t last_change() = 0;

    /// 32 random hexadecimal digits that name this catalogue for good. A copied file has the same.
    virtual std::string catalogue_id() = 0;

    virtual uint64_t track_count() = 0;
    virtual uint64_t code_count() = 0;

    /// Small values that users of the store keep in it. Names and values are UTF-8 without NUL.
    virtual std::optional<std::string> setting(std::string_view name) = 0;
    virtual void set_setting(std::string_view name, std::string_view value) = 0;

    /// Reads everything and reports what is wrong; `progress` is called with tracks done and in all
    /// and stops the work by returning false.
    virtual void verify(const std::function<void(const Fault&)>& report,
                        const std::function<bool(uint64_t, uint64_t)>& progress) = 0;
};

/// How a catalogue file is opened.
enum class Access { read, write, create }; ///< create: write, and make the file when there is none

} // namespace kzcat
