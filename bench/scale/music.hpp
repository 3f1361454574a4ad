/// @file
/// The music and the clips of evaluation/, and pseudo catalogues made of its trails.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "catalogue/match/corpus.hpp"
#include "catalogue/model/fine_bands.hpp"

namespace kz::scale {

struct NamedTrail {
    std::string id;
    std::vector<kzcat::Code> codes;
};

/// The tracks of one half that belong into the catalogue, of the manifest's order. Trails are kept
/// in `media`/trails, and made from `media`/tracks the first time.
std::vector<NamedTrail> known_tracks(const std::filesystem::path& manifest,
                                     const std::filesystem::path& media, const std::string& half);

/// A clip of which the truth is known.
struct Clip {
    std::filesystem::path file;
    std::string kind;
    std::string track;
    bool known = false; ///< whether the track is in the catalogue
    double speed = 1;   ///< as the truth has it: pitch and tempo that come on top
    double tempo = 1;
    double pitch = 1;
};

/// At most `limit` clips of known tracks and as many of strangers, of each kind.
std::vector<Clip> clips_of(const std::filesystem::path& folder, size_t limit);

kzcat::QueryBands query_of(const std::filesystem::path& file);

/// As many tracks as wanted: the real ones first, then again and again with the bits of their codes
/// rotated by an even number and, in every other turn of those, reversed in time. They have the
/// texture of music and are not the real tracks.
struct PseudoCatalogue {
    std::vector<kzcat::Code> codes;
    std::vector<kzcat::TrackSpan> tracks; ///< the id of real track i is i + 1

    kzcat::Corpus corpus() const { return {{kzcat::Segment{codes, tracks}}}; }
};

/// Each track takes the next `codes` of the trails in a row, so that all are as long; 0 leaves the
/// trails as they are.
PseudoCatalogue pseudo_catalogue(const std::vector<NamedTrail>& real, size_t tracks, size_t codes);

} // namespace kz::scale
