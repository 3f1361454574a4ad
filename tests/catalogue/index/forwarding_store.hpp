// A store that hands every call on to another, for tests that change one of them.
#pragma once

#include <string>
#include <utility>

#include "catalogue/store/store.hpp"

namespace kzcat::test {

class ForwardingStore : public Store {
public:
    explicit ForwardingStore(Store& to) : to_(to) {}

    Profile profile() override { return to_.profile(); }
    std::vector<Added> add(std::span<const NewTrack> tracks) override { return to_.add(tracks); }
    void add_source(int64_t track, const Source& source) override { to_.add_source(track, source); }
    bool remove(int64_t track) override { return to_.remove(track); }
    bool remove_source(std::string_view uri) override { return to_.remove_source(uri); }
    std::optional<SourceInfo> find_source(std::string_view uri) override
    {
        return to_.find_source(uri);
    }
    std::optional<SourceInfo> find_hash(const FileHash& hash) override
    {
        return to_.find_hash(hash);
    }
    std::optional<TrackInfo> find_track(int64_t track) override { return to_.find_track(track); }
    void visit_tracks(int64_t after, const std::function<bool(const TrackInfo&)>& visit) override
    {
        to_.visit_tracks(after, visit);
    }
    void visit_trails(int64_t after,
                      const std::function<bool(int64_t, const Trail&)>& visit) override
    {
        to_.visit_trails(after, visit);
    }
    std::optional<Trail> trail(int64_t track) override { return to_.trail(track); }
    std::optional<DocumentBands> document_bands(int64_t track) override
    {
        return to_.document_bands(track);
    }
    std::vector<Change> changes(int64_t after, size_t limit) override
    {
        return to_.changes(after, limit);
    }
    int64_t last_change() override { return to_.last_change(); }
    std::string catalogue_id() override { return to_.catalogue_id(); }
    uint64_t track_count() override { return to_.track_count(); }
    uint64_t code_count() override { return to_.code_count(); }
    std::optional<std::string> setting(std::string_view name) override { return to_.setting(name); }
    void set_setting(std::string_view name, std::string_view value) override
    {
        to_.set_setting(name, value);
    }
    void verify(const std::function<void(const Fault&)>& report,
                const std::function<bool(uint64_t, uint64_t)>& progress) override
    {
        to_.verify(report, progress);
    }

private:
    Store& to_;
};

} // namespace kzcat::test
