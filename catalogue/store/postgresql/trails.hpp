/// @file
/// Reading codes and document bands from wherever they lie.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <span>

#include "catalogue/store/postgresql/rows.hpp"
#include "catalogue/store/postgresql/shards.hpp"

namespace kzcat::postgresql {

/// Tracks that are read at once.
constexpr int64_t kBatch = 256;

/// The next tracks after an id, at most kBatch.
std::vector<TrackRow> next_track_rows(Connection& own, int64_t after);

std::optional<TrackRow> find_track_row(Connection& own, int64_t track);

/// Reads the trails of tracks, some at a time, and visits them in the order of the rows. A trail is
/// null where the track has gone meanwhile. Throws StoreError::Kind::damaged for one that is not as
/// it was stored, unless `damaged` takes that.
void read_trails(Connection& own, Shards& shards, std::span<const TrackRow> tracks, Profile profile,
                 const std::function<bool(const TrackRow&, const Trail*)>& visit,
                 const std::function<void(int64_t, const StoreError&)>& damaged = {});

/// None where the track has no bands, or has gone meanwhile.
std::optional<DocumentBands> read_document_bands(Connection& own, Shards& shards,
                                                 const TrackRow& track);

} // namespace kzcat::postgresql
