// A store in memory. Every call that changes something first collects what will be different in a
// draft; only when that is complete, and memory for it is there, is it taken over, which cannot
// fail. So a call that throws has changed nothing.

#include "catalogue/store/memory/memory_store.hpp"

#include <algorithm>
#include <map>
#include <random>
#include <utility>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/rules.hpp"

namespace kzcat {

namespace {

/// Never changed once it is in a table: another takes its place.
struct Row {
    TrackInfo info;
    std::shared_ptr<const Trail> trail;
    std::shared_ptr<const DocumentBands> bands; ///< null: none
};

using RowPointer = std::shared_ptr<const Row>;
using Rows = std::map<int64_t, RowPointer>;
using Keys = std::map<ContentKey, int64_t>;
using Uris = std::map<std::string, int64_t, std::less<>>;
using Settings = std::map<std::string, std::string, std::less<>>;

/// What a store holds; as a draft, what of it will be different. A null row or a track 0 in a draft
/// stands for what will no longer be there.
struct Tables {
    Rows rows;
    Keys keys;
    Uris uris;
};

template <class Map>
void take_over(Map& into, Map& from) noexcept
{
    while (!from.empty()) {
        auto node = from.extract(from.begin());
        const auto old = into.find(node.key());
        if (old != into.end()) {
            into.erase(old);
        }
        if (node.mapped() != typename Map::mapped_type{}) {
            into.insert(std::move(node));
        }
    }
}

template <class Map, class Key>
typename Map::mapped_type look_up(const Map& draft, const Map& base, const Key& key)
{
    if (const auto found = draft.find(key); found != draft.end()) {
        return found->second;
    }
    const auto found = base.find(key);
    return found == base.end() ? typename Map::mapped_type{} : found->second;
}

auto source_at(const std::vector<Source>& sources, std::string_view uri)
{
    return std::find_if(sources.begin(), sources.end(),
                        [&](const Source& source) { return source.uri == uri; });
}

class Draft {
public:
    Draft(const Tables& base, int64_t next_id) : base_(base), next_id_(next_id) {}

    RowPointer row(int64_t track) const { return look_up(tables_.rows, base_.rows, track); }
    int64_t track_of(const std::string& uri) const
    {
        return look_up(tables_.uris, base_.uris, uri);
    }

    Added add(const NewTrack& track)
    {
        const ContentKey key = content_key(track.trail);
        const int64_t known = look_up(tables_.keys, base_.keys, key);
        Added added{.track = known, .is_new = known == 0};
        if (known == 0) {
            added.track = insert(track, key);
        } else {
            enrich(known, track);
        }
        const int64_t owner = track.source.uri.empty() ? 0 : track_of(track.source.uri);
        if (!track.yields || owner == 0) {
            give(added.track, track.source);
        } else {
            added.has_source = owner == added.track;
        }
        return added;
    }

    /// Moves the source to a track from wherever it is; nothing when it is none.
    void give(int64_t track, const Source& source)
    {
        if (source.uri.empty()) {
            return;
        }
        const int64_t owner = track_of(source.uri);
        Row changed = *row(track);
        if (owner == track) {
            const auto place = source_at(changed.info.sources, source.uri);
            changed.info.sources[static_cast<size_t>(place - changed.info.sources.begin())] =
                source;
        } else {
            changed.info.sources.push_back(source);
        }
        replace(std::move(changed));
        tables_.uris[source.uri] = track;
        if (owner != 0 && owner != track) {
            take(owner, source.uri);
        }
    }

    void remove(int64_t track)
    {
        const RowPointer gone = row(track);
        for (const Source& source : gone->info.sources) {
            if (track_of(source.uri) == track) {
                tables_.uris[source.uri] = 0;
            }
        }
        tables_.keys[gone->info.key] = 0;
        tables_.rows[track] = nullptr;
        note(track, ChangeKind::removed);
    }

    /// Takes a source from a track, and removes the track when it was the last.
    void take(int64_t track, std::string_view uri)
    {
        Row changed = *row(track);
        changed.info.sources.erase(source_at(changed.info.sources, uri));
        if (changed.info.sources.empty()) {
            remove(track);
        } else {
            replace(std::move(changed));
        }
    }

    void forget(const std::string& uri) { tables_.uris[uri] = 0; }

    Tables& tables() { return tables_; }
    int64_t next_id() const { return next_id_; }
    const std::vector<Change>& changes() const { return changes_; }

private:
    int64_t insert(const NewTrack& track, const ContentKey& key)
    {
        Row row;
        row.info.id = next_id_++;
        row.info.key = key;
        row.info.profile = track.trail.profile;
        row.info.samples = track.trail.samples;
        row.info.codes = track.trail.codes.size();
        row.info.added = track.added != 0 ? track.added : seconds_now();
        row.info.tags = track.tags;
        row.trail = std::make_shared<const Trail>(track.trail);
        set_bands(row, track.document_bands);
        tables_.keys[key] = row.info.id;
        note(row.info.id, ChangeKind::added);
        return replace(std::move(row));
    }

    void enrich(int64_t known, const NewTrack& track)
    {
        Row changed = *row(known);
        const bool same_source = !track.yields && !track.source.uri.empty() &&
                                 track_of(track.source.uri) == changed.info.id;
        changed.info.tags = merge_tags(changed.info.tags, track.tags, same_source);
        if (changed.bands == nullptr) {
            set_bands(changed, track.document_bands);
        }
        replace(std::move(changed));
    }

    static void set_bands(Row& row, const DocumentBands& bands)
    {
        if (!bands.empty()) {
            row.bands = std::make_shared<const DocumentBands>(bands);
            row.info.has_document_bands = true;
        }
    }

    int64_t replace(Row row)
    {
        const int64_t id = row.info.id;
        tables_.rows[id] = std::make_shared<const Row>(std::move(row));
        return id;
    }

    void note(int64_t track, ChangeKind kind)
    {
        changes_.push_back({.cursor = 0, .track = track, .kind = kind, .mark = random_()});
    }

    const Tables& base_;
    Tables tables_;
    int64_t next_id_;
    std::vector<Change> changes_;
    std::random_device random_;
};

class MemoryStore final : public Store {
public:
    explicit MemoryStore(Profile profile) : profile_(profile), id_(random_catalogue_id()) {}

    Profile profile() override { return profile_; }

    std::vector<Added> add(std::span<const NewTrack> tracks) override
    {
        for (const NewTrack& track : tracks) {
            check_new_track(track, profile_);
        }
        Draft draft(tables_, next_id_);
        std::vector<Added> added;
        added.reserve(tracks.size());
        for (const NewTrack& track : tracks) {
            added.push_back(draft.add(track));
        }
        commit(draft);
        return added;
    }

    void add_source(int64_t track, const Source& source) override
    {
        check_source(source);
        if (tables_.rows.count(track) == 0) {
            throw StoreError(StoreError::Kind::not_found,
                             "there is no track " + std::to_string(track) +
                                 " in this catalogue; list what there is");
        }
        Draft draft(tables_, next_id_);
        draft.give(track, source);
        commit(draft);
    }

    bool remove(int64_t track) override
    {
        if (tables_.rows.count(track) == 0) {
            return false;
        }
        Draft draft(tables_, next_id_);
        draft.remove(track);
        commit(draft);
        return true;
    }

    bool remove_source(std::string_view uri) override
    {
        const auto found = tables_.uris.find(uri);
        if (found == tables_.uris.end()) {
            return false;
        }
        Draft draft(tables_, next_id_);
        draft.forget(found->first);
        draft.take(found->second, uri);
        commit(draft);
        return true;
    }

    std::optional<SourceInfo> find_source(std::string_view uri) override
    {
        const auto found = tables_.uris.find(uri);
        if (found == tables_.uris.end()) {
            return std::nullopt;
        }
        const TrackInfo& info = tables_.rows.at(found->second)->info;
        return SourceInfo{.track = info.id, .source = *source_at(info.sources, uri)};
    }

    std::optional<SourceInfo> find_hash(const FileHash& hash) override
    {
        for (const auto& [id, row] : tables_.rows) {
            for (const Source& source : row->info.sources) {
                if (source.hash == hash) {
                    return SourceInfo{.track = id, .source = source};
                }
            }
        }
        return std::nullopt;
    }

    std::optional<TrackInfo> find_track(int64_t track) override
    {
        const Row* row = find(track);
        return row == nullptr ? std::nullopt : std::optional(row->info);
    }

    void visit_tracks(int64_t after, const std::function<bool(const TrackInfo&)>& visit) override
    {
        for (auto at = tables_.rows.upper_bound(after); at != tables_.rows.end(); ++at) {
            if (!visit(at->second->info)) {
                return;
            }
        }
    }

    void visit_trails(int64_t after,
                      const std::function<bool(int64_t track, const Trail&)>& visit) override
    {
        for (auto at = tables_.rows.upper_bound(after); at != tables_.rows.end(); ++at) {
            if (!visit(at->first, *at->second->trail)) {
                return;
            }
        }
    }

    std::optional<Trail> trail(int64_t track) override
    {
        const Row* row = find(track);
        return row == nullptr ? std::nullopt : std::optional(*row->trail);
    }

    std::optional<DocumentBands> document_bands(int64_t track) override
    {
        const Row* row = find(track);
        return row == nullptr || row->bands == nullptr ? std::nullopt : std::optional(*row->bands);
    }

    std::vector<Change> changes(int64_t after, size_t limit) override
    {
        const auto skipped = static_cast<size_t>(std::clamp<int64_t>(after, 0, last_change()));
        const std::span rest = std::span(changes_).subspan(skipped);
        const std::span first = rest.first(std::min(limit, rest.size()));
        return {first.begin(), first.end()};
    }

    int64_t last_change() override { return static_cast<int64_t>(changes_.size()); }
    std::string catalogue_id() override { return id_; }
    uint64_t track_count() override { return tables_.rows.size(); }

    uint64_t code_count() override
    {
        uint64_t count = 0;
        for (const auto& [id, row] : tables_.rows) {
            count += row->info.codes;
        }
        return count;
    }

    std::optional<std::string> setting(std::string_view name) override
    {
        const auto found = settings_.find(name);
        return found == settings_.end() ? std::nullopt : std::optional(found->second);
    }

    void set_setting(std::string_view name, std::string_view value) override
    {
        check_setting(name, value);
        Settings draft;
        draft.emplace(name, value);
        settings_.merge(draft);
        if (!draft.empty()) {
            settings_.find(name)->second.swap(draft.begin()->second);
        }
    }

    void verify(const std::function<void(const Fault&)>& report,
                const std::function<bool(uint64_t, uint64_t)>& progress) override
    {
        uint64_t done = 0;
        for (const auto& [id, row] : tables_.rows) {
            if (content_key(*row->trail) != row->info.key) {
                report({.track = id, .text = "the codes have changed in memory"});
            }
            if (!progress(++done, tables_.rows.size())) {
                return;
            }
        }
    }

private:
    const Row* find(int64_t track) const
    {
        const auto found = tables_.rows.find(track);
        return found == tables_.rows.end() ? nullptr : found->second.get();
    }

    void commit(Draft& draft)
    {
        const size_t needed = changes_.size() + draft.changes().size();
        if (needed > changes_.capacity()) {
            changes_.reserve(std::max(needed, 2 * changes_.capacity()));
        } // nothing below can fail
        for (Change change : draft.changes()) {
            change.cursor = last_change() + 1;
            changes_.push_back(change);
        }
        take_over(tables_.rows, draft.tables().rows);
        take_over(tables_.keys, draft.tables().keys);
        take_over(tables_.uris, draft.tables().uris);
        next_id_ = draft.next_id();
    }

    Profile profile_;
    std::string id_;
    Tables tables_;
    Settings settings_;
    std::vector<Change> changes_;
    int64_t next_id_ = 1;
};

} // namespace

std::unique_ptr<Store> make_memory_store(Profile profile)
{
    return std::make_unique<MemoryStore>(profile);
}

} // namespace kzcat
