// The C interface: adding and removing tracks, and looking through them.

#include <algorithm>

#include "catalogue/handles.hpp"

namespace {

using namespace kzcat;

[[noreturn]] void fail_not_found(const std::string& what)
{
    throw Failure(KZCAT_ERROR_NOT_FOUND, what + " is in the catalogue; list what there is");
}

[[noreturn]] void fail_no_track(int64_t track)
{
    fail_not_found("no track with the id " + std::to_string(track));
}

/// Runs a call that gives a track, as `find` finds it in the store.
template <class Find>
kzcat_status give_track(kzcat_catalogue* catalogue, kzcat_track** out_track, Find find) noexcept
{
    return guarded([=] {
        clear_place(out_track);
        require(catalogue != nullptr, "the catalogue is null; pass an open one");
        *out_track = new kzcat_track{catalogue->whole.with_store(find)};
    });
}

TrackInfo track_of(Store& store, int64_t id)
{
    auto info = store.find_track(id);
    if (!info) {
        fail_no_track(id);
    }
    return *std::move(info);
}

TrackInfo next_track(Store& store, int64_t after)
{
    std::optional<TrackInfo> found;
    store.visit_tracks(after, [&](const TrackInfo& info) {
        found = info;
        return false;
    });
    if (!found) {
        fail_not_found("no track with an id above " + std::to_string(after));
    }
    return *std::move(found);
}

template <class Item>
const Item& item_at(const std::vector<Item>& items, uint32_t place, const char* noun)
{
    if (place >= items.size()) {
        throw Failure(KZCAT_ERROR_NOT_FOUND,
                      "the track has " + std::to_string(items.size()) + " " + noun);
    }
    return items[place];
}

} // namespace

Source kzcat::to_source(const kzcat_source& source)
{
    require(source.uri != nullptr && *source.uri != 0,
            "a source has no uri; pass the path that the "
            "track comes from, or any name for it");
    Source result = {
        .uri = source.uri, .size = source.size, .mtime_ns = source.mtime_ns, .hash = {}};
    if (source.hash != nullptr) {
        result.hash.emplace();
        std::copy_n(source.hash, KZCAT_HASH_SIZE, result.hash->begin());
    }
    return result;
}

std::vector<Tag> kzcat::to_tags(const kzcat_tag* tags, uint64_t count)
{
    require(tags != nullptr || count == 0, "the tags are null; pass some, or a count of 0");
    std::vector<Tag> result;
    for (const kzcat_tag& tag : std::span(tags, static_cast<size_t>(count))) {
        require(tag.name != nullptr && tag.value != nullptr,
                "the name or the value of a tag is null; pass texts");
        result.push_back({.name = tag.name, .value = tag.value});
    }
    return result;
}

void kzcat::require_codes(const kzcat_trail* trail)
{
    require(trail != nullptr, "a track has no trail; make one with a builder");
    if (trail->trail.codes.empty()) {
        throw Failure(KZCAT_ERROR_INVALID_ARGUMENT,
                      "a trail is empty, since its sound is shorter than a second; pass longer "
                      "sound");
    }
}

NewTrack kzcat::to_new_track(const kzcat_new_track& track)
{
    require_codes(track.trail);
    return {.trail = track.trail->trail,
            .document_bands = track.trail->document_bands,
            .tags = to_tags(track.tags, track.tag_count),
            .source = to_source(track.source)};
}

kzcat_status kzcat_add(kzcat_catalogue* catalogue, const kzcat_new_track* tracks, uint64_t count,
                       kzcat_added* out_added) noexcept
{
    return guarded([=] {
        require(catalogue != nullptr, "the catalogue is null; pass an open one");
        require(tracks != nullptr || count == 0, "the tracks are null; pass some, or a count of 0");
        std::vector<NewTrack> all;
        for (const kzcat_new_track& track : std::span(tracks, static_cast<size_t>(count))) {
            all.push_back(to_new_track(track));
        }
        const auto added = catalogue->whole.add(all);
        for (size_t i = 0; out_added != nullptr && i < added.size(); ++i) {
            out_added[i] = {
                .track = added[i].track, .is_new = added[i].is_new ? 1u : 0u, .reserved = 0};
        }
    });
}

kzcat_status kzcat_add_source(kzcat_catalogue* catalogue, int64_t track,
                              const kzcat_source* source) noexcept
{
    return guarded([=] {
        require(catalogue != nullptr && source != nullptr,
                "the catalogue or the source is null; pass both");
        const Source added = to_source(*source);
        catalogue->whole.with_store([&](Store& store) {
            static_cast<void>(track_of(store, track));
            store.add_source(track, added);
        });
    });
}

kzcat_status kzcat_remove_track(kzcat_catalogue* catalogue, int64_t track) noexcept
{
    return guarded([=] {
        require(catalogue != nullptr, "the catalogue is null; pass an open one");
        if (!catalogue->whole.with_store([&](Store& store) { return store.remove(track); })) {
            fail_no_track(track);
        }
    });
}

kzcat_status kzcat_remove_source(kzcat_catalogue* catalogue, const char* uri) noexcept
{
    return guarded([=] {
        require(catalogue != nullptr && uri != nullptr,
                "the catalogue or the uri is null; pass both");
        if (!catalogue->whole.with_store([&](Store& store) { return store.remove_source(uri); })) {
            fail_not_found("no source '" + std::string(uri) + "'");
        }
    });
}

kzcat_status kzcat_get_next_track(kzcat_catalogue* catalogue, int64_t after,
                                  kzcat_track** out_track) noexcept
{
    return give_track(catalogue, out_track,
                      [after](Store& store) { return next_track(store, after); });
}

kzcat_status kzcat_get_track(kzcat_catalogue* catalogue, int64_t track,
                             kzcat_track** out_track) noexcept
{
    return give_track(catalogue, out_track,
                      [track](Store& store) { return track_of(store, track); });
}

kzcat_status kzcat_find_source(kzcat_catalogue* catalogue, const char* uri,
                               kzcat_track** out_track) noexcept
{
    return give_track(catalogue, out_track, [uri](Store& store) {
        require(uri != nullptr, "the uri is null; pass a text");
        const auto source = store.find_source(uri);
        if (!source) {
            fail_not_found("no source '" + std::string(uri) + "'");
        }
        return track_of(store, source->track);
    });
}

kzcat_status kzcat_find_hash(kzcat_catalogue* catalogue, const uint8_t* hash,
                             kzcat_track** out_track) noexcept
{
    return give_track(catalogue, out_track, [hash](Store& store) {
        require(hash != nullptr, "the hash is null; pass 32 bytes");
        FileHash wanted;
        std::copy_n(hash, wanted.size(), wanted.begin());
        const auto source = store.find_hash(wanted);
        if (!source) {
            fail_not_found("no source with these bytes");
        }
        return track_of(store, source->track);
    });
}

kzcat_status kzcat_track_get_facts(const kzcat_track* track, kzcat_track_facts* out_facts) noexcept
{
    return guarded([=] {
        require(track != nullptr && out_facts != nullptr,
                "the track or the record for its facts is null; pass both");
        const TrackInfo& info = track->info;
        *out_facts = {};
        out_facts->track = info.id;
        out_facts->samples = info.samples;
        out_facts->code_count = info.codes;
        out_facts->added = info.added;
        out_facts->sample_rate = kWorkingRate;
        out_facts->tag_count = static_cast<uint32_t>(info.tags.size());
        out_facts->source_count = static_cast<uint32_t>(info.sources.size());
        out_facts->answers_documents = info.has_document_bands ? 1 : 0;
    });
}

kzcat_status kzcat_track_get_tag(const kzcat_track* track, uint32_t place,
                                 kzcat_tag* out_tag) noexcept
{
    return guarded([=] {
        require(track != nullptr && out_tag != nullptr,
                "the track or the record for the tag is null; pass both");
        *out_tag = {};
        const Tag& tag = item_at(track->info.tags, place, "tags");
        *out_tag = {.name = tag.name.c_str(), .value = tag.value.c_str()};
    });
}

kzcat_status kzcat_track_get_source(const kzcat_track* track, uint32_t place,
                                    kzcat_source* out_source) noexcept
{
    return guarded([=] {
        require(track != nullptr && out_source != nullptr,
                "the track or the record for the source is null; pass both");
        *out_source = {};
        const Source& source = item_at(track->info.sources, place, "sources");
        *out_source = {.uri = source.uri.c_str(),
                       .size = source.size,
                       .mtime_ns = source.mtime_ns,
                       .hash = source.hash ? source.hash->data() : nullptr};
    });
}

kzcat_status kzcat_track_free(kzcat_track** track_ref) noexcept { return free_handle(track_ref); }

kzcat_status kzcat_get_trail(kzcat_catalogue* catalogue, int64_t track,
                             kzcat_trail** out_trail) noexcept
{
    return guarded([=] {
        clear_place(out_trail);
        require(catalogue != nullptr, "the catalogue is null; pass an open one");
        auto found = std::make_unique<kzcat_trail>();
        catalogue->whole.with_store([&](Store& store) {
            auto trail = store.trail(track);
            if (!trail) {
                fail_no_track(track);
            }
            found->trail = *std::move(trail);
            found->document_bands = store.document_bands(track).value_or(DocumentBands{});
        });
        *out_trail = found.release();
    });
}
