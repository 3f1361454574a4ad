/// @file
/// What is asked and changed about the tracks of a catalogue. All throw a Refusal, and
/// CatalogueError when the catalogue has failed.
#pragma once

#include <string>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/serve/message.hpp"
#include "kzfp/serve/plan.hpp"

namespace kzfp::serve {

/// Tracks in the order of their numbers, or those of a source.
Reply list_tracks(kzcat_catalogue& catalogue, const Plan& plan, bool hide_sources);

Reply show_track(kzcat_catalogue& catalogue, const Plan& plan, bool hide_sources);

/// The bytes of a .kzt file.
Reply show_trail(kzcat_catalogue& catalogue, const Plan& plan);

struct Addition {
    Reply reply;
    bool was_there; ///< the recording was there already
};

/// Adds what a body holds.
Addition add_track(kzcat_catalogue& catalogue, const Plan& plan, std::string& body);

Reply remove_track(kzcat_catalogue& catalogue, const Plan& plan);

} // namespace kzfp::serve
