// Who holds which lock. Recognising shares the index; taking in what has changed, by this process
// or another, has it alone. The store is held only for as long as one of its calls takes.

#include "catalogue/catalogue.hpp"

#include <algorithm>
#include <vector>

namespace kzcat {

namespace {

/// Tracks that are copied in one transaction.
constexpr size_t kBatch = 64;

/// A track with everything that is known of it.
struct WholeTrack {
    TrackInfo info;
    Trail trail;
    DocumentBands bands;
};

struct Batch {
    std::vector<WholeTrack> tracks;
    uint64_t passed = 0; ///< tracks that were looked at
    uint64_t damaged = 0;
};

/// Reads what belongs to a track; false when that is damaged.
bool complete(Store& store, WholeTrack& track)
{
    try {
        track.trail = store.trail(track.info.id).value_or(Trail{});
        track.bands = store.document_bands(track.info.id).value_or(DocumentBands{});
        return true;
    } catch (const StoreError& error) {
        if (error.kind() != StoreError::Kind::damaged) {
            throw;
        }
        return false;
    }
}

/// The next tracks after `after`, which moves on to the last of them; none are passed at the end.
Batch read_batch(Store& store, int64_t& after)
{
    std::vector<TrackInfo> found;
    store.visit_tracks(after, [&](const TrackInfo& info) {
        found.push_back(info);
        return found.size() < kBatch;
    });
    Batch batch;
    for (TrackInfo& info : found) {
        after = info.id;
        ++batch.passed;
        WholeTrack track = {.info = std::move(info), .trail = {}, .bands = {}};
        if (!complete(store, track)) {
            ++batch.damaged;
        } else if (!track.trail.codes.empty()) { // else another process has removed it meanwhile
            batch.tracks.push_back(std::move(track));
        }
    }
    return batch;
}

/// A track once for each of its sources, all of which yield to what is there.
void append_to(std::vector<NewTrack>& tracks, const WholeTrack& track)
{
    NewTrack added = {.trail = track.trail,
                      .document_bands = track.bands,
                      .tags = track.info.tags,
                      .source = {},
                      .added = track.info.added,
                      .yields = true};
    if (track.info.sources.empty()) {
        tracks.push_back(added);
    }
    for (const Source& source : track.info.sources) {
        added.source = source;
        tracks.push_back(added);
    }
}

std::vector<NewTrack> to_new_tracks(const std::vector<WholeTrack>& batch)
{
    std::vector<NewTrack> tracks;
    for (const WholeTrack& track : batch) {
        append_to(tracks, track);
    }
    return tracks;
}

} // namespace

Catalogue::Catalogue(std::unique_ptr<Store> store, IndexOptions options)
    : store_(std::move(store)), options_(std::move(options))
{
}

int64_t Catalogue::last_change()
{
    return with_store([](Store& store) { return store.last_change(); });
}

void Catalogue::bring_index_up_to_date()
{
    {
        const std::shared_lock lock(index_mutex_);
        if (index_ != nullptr && !index_->is_due() && index_change_ == last_change()) {
            return;
        }
    }
    const std::unique_lock lock(index_mutex_);
    // Before it is taken in: what changes meanwhile is then taken in again, not missed.
    const int64_t change = last_change();
    if (index_ == nullptr) {
        index_ = with_store([this](Store& store) { return open_index(store, options_); });
    } else if (index_change_ != change || index_->is_due()) {
        with_store([this](Store& store) { index_->refresh(store); });
    }
    index_change_ = change;
}

Recognised Catalogue::recognise(const QueryBands& query, const MatchOptions& options)
{
    return with_index([&](Index& index) -> Recognised {
        auto answer = kzcat::recognise(query, index, options);
        return {std::move(answer), index.coverage()};
    });
}

Recognised Catalogue::recognise(const Trail& query, const MatchOptions& options)
{
    return with_index([&](Index& index) -> Recognised {
        auto answer = kzcat::recognise(query, index, options);
        return {std::move(answer), index.coverage()};
    });
}

std::vector<Added> Catalogue::add(std::span<const NewTrack> tracks)
{
    auto added = with_store([tracks](Store& store) { return store.add(tracks); });
    for (size_t i = 0; i < tracks.size(); ++i) {
        // It may have got what answers documents, which the log of changes does not say.
        if (!added[i].is_new && !tracks[i].document_bands.empty()) {
            const std::unique_lock lock(documents_mutex_);
            documents_change_ = -1;
            break;
        }
    }
    return added;
}

/// Takes in what answers documents of one track, if it has that; false when it is damaged.
bool Catalogue::take_in_document(Store& store, int64_t track)
{
    try {
        if (const auto bands = store.document_bands(track); bands && !bands->empty()) {
            documents_.set(track, *bands);
        }
        return true;
    } catch (const StoreError& error) {
        if (error.kind() != StoreError::Kind::damaged) {
            throw;
        }
        return false;
    }
}

/// The first time all tracks, from then on what has changed since.
void Catalogue::take_in_documents()
{
    constexpr size_t kChanges = 1024; // at a time
    const auto take = [this](Store& store, int64_t track) {
        if (!take_in_document(store, track)) {
            ++damaged_documents_;
        }
    };
    with_store([&](Store& store) {
        if (documents_change_ < 0) {
            documents_ = {};
            damaged_documents_ = 0;
            const int64_t change = store.last_change(); // what changes meanwhile comes again
            std::vector<int64_t> tracks;
            store.visit_tracks(0, [&tracks](const TrackInfo& info) {
                if (info.has_document_bands) {
                    tracks.push_back(info.id);
                }
                return true;
            });
            std::ranges::for_each(tracks, [&](int64_t track) { take(store, track); });
            documents_change_ = change;
            return;
        }
        for (auto changes = store.changes(documents_change_, kChanges); !changes.empty();
             changes = store.changes(documents_change_, kChanges)) {
            for (const Change& change : changes) {
                documents_.erase(change.track);
                take(store, change.track);
                documents_change_ = change.cursor;
            }
        }
    });
}

void Catalogue::bring_documents_up_to_date()
{
    {
        const std::shared_lock lock(documents_mutex_);
        if (documents_change_ >= 0 && documents_change_ == last_change()) {
            return;
        }
    }
    const std::unique_lock lock(documents_mutex_);
    take_in_documents();
}

DocumentAnswer Catalogue::recognise(const DocumentValues& query, size_t candidates)
{
    bring_documents_up_to_date();
    const std::shared_lock lock(documents_mutex_);
    return documents_.find(query, candidates);
}

bool Catalogue::index_is_open()
{
    const std::shared_lock lock(index_mutex_);
    return index_ != nullptr;
}

uint64_t Catalogue::left_out(bool documents)
{
    if (documents) {
        const std::shared_lock lock(documents_mutex_);
        return damaged_documents_;
    }
    const std::shared_lock lock(index_mutex_);
    return index_ == nullptr ? 0 : index_->facts().left_out;
}

IndexFacts Catalogue::index_facts(bool open)
{
    if (!open && !index_is_open()) {
        return {};
    }
    return with_index([](Index& index) { return index.facts(); });
}

bool Catalogue::merge(Catalogue& other, const Progress& progress, Merged& merged)
{
    const uint64_t total = other.with_store([](Store& store) { return store.track_count(); });
    uint64_t done = 0;
    for (int64_t after = 0;;) {
        const Batch batch =
            other.with_store([&after](Store& store) { return read_batch(store, after); });
        if (batch.passed == 0) {
            return true;
        }
        const auto added = add(to_new_tracks(batch.tracks));
        const auto fresh = std::ranges::count_if(added, &Added::is_new);
        merged.tracks_new += static_cast<uint64_t>(fresh);
        merged.tracks_known += batch.tracks.size() - static_cast<uint64_t>(fresh);
        merged.tracks_damaged += batch.damaged;
        done += batch.passed;
        if (!progress(done, total)) {
            return false;
        }
    }
}

} // namespace kzcat
