/// @file
/// All codes of a store at one moment: those of a side file, and those that came since.

#include "catalogue/index/snapshot.hpp"

#include <algorithm>
#include <utility>

namespace kzcat {

namespace {

constexpr size_t kChangesAtOnce = 1000;

/// Chunks of fewer codes are joined with what is added later.
constexpr size_t kSmallChunk = size_t{1} << 20;

void append(std::vector<Code>& codes, std::vector<TrackSpan>& tracks, int64_t id,
            std::span<const Code> added)
{
    tracks.push_back({.id = id, .first = codes.size(), .count = added.size()});
    codes.insert(codes.end(), added.begin(), added.end());
}

/// Runs a reading of the store; false when what it reads is damaged.
template <class Read>
bool is_whole(Read read)
{
    try {
        read();
        return true;
    } catch (const StoreError& error) {
        if (error.kind() != StoreError::Kind::damaged) {
            throw;
        }
        return false;
    }
}

} // namespace

/// What a log says, before any of it is taken in.
struct Snapshot::Changes {
    std::vector<Code> codes; ///< of the tracks that were added
    std::vector<TrackSpan> tracks;
    std::unordered_set<int64_t> removed;
    std::unordered_set<int64_t> left_out; ///< damaged
    int64_t cursor = 0;
};

MappedIndex map_index(const std::string& path)
{
    MappedIndex mapped;
    mapped.file = MappedFile(path);
    mapped.contents = read_index_file(mapped.file.bytes());
    return mapped;
}

bool has_track(std::span<const TrackSpan> tracks, int64_t id)
{
    return std::ranges::binary_search(tracks, id, {}, &TrackSpan::id);
}

/// What is added while the tracks are visited may be among them or not; update() takes the rest
/// from the log.
Snapshot::Snapshot(Store& store) : cursor_(store.last_change())
{
    std::vector<Code> codes;
    std::vector<TrackSpan> tracks;
    codes.reserve(static_cast<size_t>(store.code_count()));
    try {
        store.visit_trails(0, [&](int64_t id, const Trail& trail) {
            append(codes, tracks, id, trail.codes);
            return true;
        });
        add(std::move(codes), std::move(tracks));
    } catch (const StoreError& error) {
        if (error.kind() != StoreError::Kind::damaged) {
            throw;
        }
        read_whole_tracks(store);
        if (chunks_.empty()) {
            throw;
        }
    }
    update(store);
}

/// Track by track, which takes longer than all in one go but passes over those that are damaged.
void Snapshot::read_whole_tracks(Store& store)
{
    std::vector<int64_t> ids;
    store.visit_tracks(0, [&ids](const TrackInfo& info) {
        ids.push_back(info.id);
        return true;
    });
    std::vector<Code> codes;
    std::vector<TrackSpan> tracks;
    for (const int64_t id : ids) {
        const auto read = [&] {
            if (const auto trail = store.trail(id)) {
                append(codes, tracks, id, trail->codes);
            }
        };
        if (!is_whole(read)) {
            left_out_.insert(id);
        }
    }
    add(std::move(codes), std::move(tracks));
}

Snapshot::Snapshot(Store& store, MappedIndex mapped) : Snapshot(std::move(mapped))
{
    const auto& header = mapped_->contents.header;
    if (header.catalogue != store.catalogue_id()) {
        throw IndexFileError("belongs to another catalogue");
    }
    if (header.profile != store.profile()) {
        throw IndexFileError("has codes of another profile");
    }
    if (header.cursor > store.last_change()) {
        throw IndexFileError("is newer than the catalogue");
    }
    if (!update(store) || !is_of(store)) {
        throw IndexFileError("does not have what the catalogue has");
    }
}

Snapshot::Snapshot(MappedIndex mapped)
    : mapped_(std::make_shared<MappedIndex>(std::move(mapped))),
      mapped_tracks_(mapped_->contents.tracks), cursor_(mapped_->contents.header.cursor)
{
}

int64_t Snapshot::last_id() const
{
    const auto last = std::find_if(chunks_.rbegin(), chunks_.rend(),
                                   [](const auto& chunk) { return !chunk.tracks.empty(); });
    if (last != chunks_.rend()) {
        return last->tracks.back().id;
    }
    return mapped_tracks_.empty() ? 0 : mapped_tracks_.back().id;
}

/// Ids rise and are never given twice, so what has no higher id than the last track was read
/// before.
Snapshot::Changes Snapshot::read_changes(Store& store) const
{
    Changes changes{.codes = {}, .tracks = {}, .removed = {}, .left_out = {}, .cursor = cursor_};
    int64_t last = last_id();
    const auto take = [&](int64_t id) {
        if (const auto trail = store.trail(id); trail && id > last) {
            append(changes.codes, changes.tracks, id, trail->codes);
            last = id;
        }
    };
    for (;;) {
        const auto batch = store.changes(changes.cursor, kChangesAtOnce);
        for (const auto& change : batch) {
            changes.cursor = change.cursor;
            if (change.kind == ChangeKind::removed) {
                changes.removed.insert(change.track);
            } else if (!is_whole([&] { take(change.track); })) {
                changes.left_out.insert(change.track);
            }
        }
        if (batch.empty()) {
            return changes;
        }
    }
}

void Snapshot::add(std::vector<Code> codes, std::vector<TrackSpan> tracks)
{
    if (tracks.empty()) {
        return;
    }
    if (!chunks_.empty() && chunks_.back().codes->size() < kSmallChunk) {
        const Chunk& small = chunks_.back();
        std::vector<Code> joined = *small.codes;
        std::vector<TrackSpan> all = small.tracks;
        for (const auto& track : tracks) {
            append(joined, all, track.id, Segment{codes, tracks}.of(track));
        }
        chunks_.back() = {std::make_shared<const std::vector<Code>>(std::move(joined)),
                          std::move(all)};
        return;
    }
    chunks_.push_back(
        {std::make_shared<const std::vector<Code>>(std::move(codes)), std::move(tracks)});
}

void Snapshot::remove(const std::unordered_set<int64_t>& ids)
{
    const auto is_removed = [&](const TrackSpan& track) { return ids.contains(track.id); };
    if (!ids.empty()) {
        std::erase_if(left_out_, [&](int64_t id) { return ids.contains(id); });
        std::erase_if(mapped_tracks_, is_removed);
        for (auto& chunk : chunks_) {
            std::erase_if(chunk.tracks, is_removed);
        }
    }
}

bool Snapshot::update(Store& store)
{
    constexpr int kAttempts = 8; // a writer may be at work
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        Changes changes = read_changes(store);
        add(std::move(changes.codes), std::move(changes.tracks));
        left_out_.merge(changes.left_out);
        remove(changes.removed);
        cursor_ = changes.cursor;
        if (agrees_with(store)) {
            return true;
        }
    }
    return false;
}

bool Snapshot::agrees_with(Store& store) const
{
    const Corpus all = corpus();
    const bool same_codes = all.code_count() == store.code_count() || !left_out_.empty();
    return all.track_count() + left_out_.size() == store.track_count() && same_codes;
}

/// Whether the file was made from this very store: one that was restored from an older copy has the
/// same id, and may have given the same numbers to other tracks since. The last track that both
/// have is then another.
bool Snapshot::is_of(Store& store) const
{
    if (mapped_tracks_.empty()) {
        return true;
    }
    const auto& last = mapped_tracks_.back();
    const Segment segment{mapped_->contents.codes, mapped_tracks_};
    bool same = false;
    const bool whole = is_whole([&] {
        const auto trail = store.trail(last.id);
        same = trail && std::ranges::equal(trail->codes, segment.of(last));
    });
    return whole && same;
}

Corpus Snapshot::tail() const
{
    Corpus tail;
    for (const auto& chunk : chunks_) {
        tail.segments.push_back({*chunk.codes, chunk.tracks});
    }
    return tail;
}

Corpus Snapshot::corpus() const
{
    Corpus all = tail();
    if (mapped_) {
        all.segments.insert(all.segments.begin(), {mapped_->contents.codes, mapped_tracks_});
    }
    return all;
}

bool Snapshot::is_stale() const
{
    constexpr uint64_t kShare = 10;
    const uint64_t in_file = mapped_ ? mapped_->contents.codes.size() : 0;
    const uint64_t added = tail().code_count();
    const uint64_t removed = in_file + added - corpus().code_count();
    return (added + removed) * kShare > in_file;
}

} // namespace kzcat
