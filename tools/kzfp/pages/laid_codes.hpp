/// @file
/// The codes of a clip, read where the codes of the track lie that it was found in.
#pragma once

#include <cstdint>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "report/report.hpp"

namespace kzfp {

/// Lays the sound of a clip on a track's codes. The pitch of the clip is undone by reading it at
/// another rate, its tempo by reading it at other times. `clip.begin` is in seconds of the clip, as
/// are the times of `found`. Throws CatalogueError.
report::Trails lay_sound(const report::Sound& clip, std::vector<uint64_t> track,
                         const FoundTrack& found);

/// The same for the codes of a clip of which there is no sound: nothing is undone but its tempo.
report::Trails lay_codes(const std::vector<uint64_t>& clip, std::vector<uint64_t> track,
                         const FoundTrack& found);

} // namespace kzfp
