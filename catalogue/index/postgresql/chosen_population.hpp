/// @file
/// The population of a catalogue on a server, which is kept there for the next client.
#pragma once

#include "catalogue/index/postgresql/lookups.hpp"
#include "catalogue/match/population.hpp"

namespace kzcat::postgresql {

/// The very population that a client with all codes in memory would choose, or one that was chosen
/// when the catalogue was almost the same: up to one in a thousand tracks have come or gone since.
/// Keeps it on the server where `keep` and the user's rights allow it.
Population chosen_population(Lookups& lookups, bool keep);

} // namespace kzcat::postgresql
