// The C interface: tracks on their way from one catalogue to another, by whatever way.

#include <string>
#include <utility>
#include <vector>

#include "catalogue/handles.hpp"

namespace {

using namespace kzcat;

/// The frames of a recording of `samples`, as DocumentBandExtractor makes them.
uint64_t document_frames(uint64_t samples)
{
    return samples < kDocumentFrame ? 0 : (samples - kDocumentFrame) / kDocumentHop + 1;
}

/// The end of a recording may have reached its trail and not its bands.
void check_bands(const Trail& trail, uint64_t count)
{
    const uint64_t frames = count / kDocumentBandCount;
    const uint64_t most = document_frames(trail.samples) + 1;
    const bool fits = count % kDocumentBandCount == 0 && frames <= most && frames + 2 >= most;
    if (count != 0 && !fits) {
        throw Failure(KZCAT_ERROR_INVALID_ARGUMENT,
                      "the trail is as long as some " + std::to_string(most - 1) +
                          " frames of 15 band energies, but there are " + std::to_string(count) +
                          " numbers; pass those of its own recording");
    }
}

/// A track once for each of its sources, or once when it has none.
void append_to(std::vector<NewTrack>& all, const kzcat_stored_track& track)
{
    require_codes(track.trail);
    require(all_zero(track.reserved), "a reserved field of a track is not 0; clear the record");
    require(track.sources != nullptr || track.source_count == 0,
            "the sources are null; pass some, or a count of 0");
    NewTrack added = {.trail = track.trail->trail,
                      .document_bands = track.trail->document_bands,
                      .tags = to_tags(track.tags, track.tag_count),
                      .source = {},
                      .added = track.added,
                      .yields = true};
    if (track.source_count == 0) {
        all.push_back(added);
    }
    for (const kzcat_source& source :
         std::span(track.sources, static_cast<size_t>(track.source_count))) {
        added.source = to_source(source);
        all.push_back(added);
    }
}

/// What became of the track whose first appearance is at `at`, which moves on to the next one.
kzcat_added added_of(const std::vector<Added>& added, size_t& at, const kzcat_stored_track& track)
{
    const Added& first = added[at];
    at += track.source_count == 0 ? 1 : static_cast<size_t>(track.source_count);
    return {.track = first.track, .is_new = first.is_new ? 1U : 0U, .reserved = 0};
}

} // namespace

kzcat_status kzcat_trail_get_document_bands(const kzcat_trail* trail, uint16_t* bands,
                                            uint64_t capacity, uint64_t* out_count) noexcept
{
    return guarded([=] {
        require(out_count != nullptr, "the place for the count is null; pass one");
        *out_count = 0;
        require(trail != nullptr, "the trail is null; pass one");
        require(bands != nullptr || capacity == 0,
                "the bands are null; pass room, or a capacity of 0 to learn the count");
        copy_out(std::span(std::as_const(trail->document_bands)), bands, capacity, out_count);
    });
}

kzcat_status kzcat_trail_create_with_document_bands(const kzcat_trail* trail, const uint16_t* bands,
                                                    uint64_t count,
                                                    kzcat_trail** out_trail) noexcept
{
    return guarded([=] {
        clear_place(out_trail);
        require(trail != nullptr, "the trail is null; pass one");
        require(bands != nullptr || count == 0, "the bands are null; pass some, or a count of 0");
        check_bands(trail->trail, count);
        *out_trail = new kzcat_trail{.trail = trail->trail,
                                     .document_bands = DocumentBands(bands, bands + count)};
    });
}

kzcat_status kzcat_import(kzcat_catalogue* catalogue, const kzcat_stored_track* tracks,
                          uint64_t count, kzcat_added* out_added) noexcept
{
    return guarded([=] {
        require(catalogue != nullptr, "the catalogue is null; pass an open one");
        require(tracks != nullptr || count == 0, "the tracks are null; pass some, or a count of 0");
        const std::span all(tracks, static_cast<size_t>(count));
        std::vector<NewTrack> new_tracks;
        for (const kzcat_stored_track& track : all) {
            append_to(new_tracks, track);
        }
        const auto added = catalogue->whole.add(new_tracks);
        size_t at = 0;
        for (size_t i = 0; out_added != nullptr && i < all.size(); ++i) {
            out_added[i] = added_of(added, at, all[i]);
        }
    });
}
