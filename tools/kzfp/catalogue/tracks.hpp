/// @file
/// The tracks of a catalogue as values, and the way through all of them.
#pragma once

#include <cstdint>
#include <vector>

#include "kzfp/catalogue/handles.hpp"

namespace kzfp {

inline kzcat_track_facts facts_of(const Track& track)
{
    kzcat_track_facts facts;
    check(kzcat_track_get_facts(track.get(), &facts));
    return facts;
}

/// Texts and hashes stay valid as long as the track.
inline std::vector<kzcat_source> sources_of(const Track& track)
{
    std::vector<kzcat_source> sources(facts_of(track).source_count);
    for (uint32_t i = 0; i < sources.size(); ++i) {
        check(kzcat_track_get_source(track.get(), i, &sources[i]));
    }
    return sources;
}

/// In the order in which they were added; several may have one name. Texts stay valid as long as
/// the track.
inline std::vector<kzcat_tag> tags_of(const Track& track)
{
    std::vector<kzcat_tag> tags(facts_of(track).tag_count);
    for (uint32_t i = 0; i < tags.size(); ++i) {
        check(kzcat_track_get_tag(track.get(), i, &tags[i]));
    }
    return tags;
}

inline kzcat_facts facts_of(const Catalogue& catalogue)
{
    kzcat_facts facts;
    check(kzcat_get_facts(catalogue.get(), 0, &facts));
    return facts;
}

/// Gives each track whose id is above `after` to `visit`, in the order of ids, until that returns
/// false. Tracks may be added and removed meanwhile.
template <class Visit>
void visit_tracks(kzcat_catalogue& catalogue, int64_t after, Visit visit)
{
    while (const auto track = found<Track>(kzcat_get_next_track, &catalogue, after)) {
        after = facts_of(track).track;
        if (!visit(track)) {
            return;
        }
    }
}

} // namespace kzfp
