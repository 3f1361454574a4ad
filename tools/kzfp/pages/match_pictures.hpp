/// @file
/// Why a clip matches, in pictures.
#pragma once

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/catalogue/clip_inputs.hpp"
#include "kzfp/pages/gather.hpp"
#include "report/report.hpp"

namespace kzfp {

/// Adds the codes of the clip laid on each track's, the spectrograms and the 30 values of the clip
/// and of the passage of the track. What cannot be read is noted; nothing is thrown but
/// std::bad_alloc.
void add_pictures(report::MatchedClip& clip, const Answer& answer, const ClipInput& input,
                  const SoundOptions& options, kzcat_catalogue& catalogue);

} // namespace kzfp
