/// @file
/// A line: a track, its speed, and where in the stream each of its moments is expected. What a
/// stream agrees with along a line shows where the track begins and ends.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "catalogue/match/hypothesis.hpp"
#include "catalogue/monitor/history.hpp"

namespace kzcat {

struct Line {
    int64_t track = 0;
    Hypothesis hypothesis;
    double pitch = 1;
    double time = 0;    ///< a moment, in seconds of the stream
    double at_time = 0; ///< the moment of the track that is heard then, in seconds of it

    double place(double seconds) const { return at_time + (seconds - time) * hypothesis.stretch; }
    /// When a place of the track is heard.
    double time_of(double seconds) const { return time + (seconds - at_time) / hypothesis.stretch; }
};

/// How one code of the stream agrees with the track.
struct CodeAgreement {
    double time = 0;     ///< of the middle of its frame, seconds of the stream
    int32_t weight = 0;  ///< bits that count
    int32_t surplus = 0; ///< those that agree less those that differ
};

/// The codes of a stretch of the stream that lie on the track, oldest first.
using Agreements = std::vector<CodeAgreement>;

/// Compares `count` frames of the stream from `first` on along a line. Where the codes agree better
/// up to a tenth of a second beside it, and `follow` is set, the line moves there.
Agreements compare(const FrameHistory& history, uint64_t first, size_t count,
                   std::span<const Code> track, Line& line, bool follow);

/// The surplus of the codes from a time on as a share of their weight, and that weight.
struct Level {
    double share = 0; ///< 1 where all bits agree, 0 by chance
    int32_t weight = 0;
};
Level level_of(const Agreements& agreements, double from, double to);

/// Between which times a track is heard, if it is, and how well it agrees there.
struct Stretch {
    double begin = 0;
    double end = 0;
    double share = 0;
};

/// The stretch that stands out best from what is beside it. Nothing when there is none.
std::optional<Stretch> heard_stretch(const Agreements& agreements);

/// The time before which the codes agree with a track that is known to agree by `share` up to
/// `sure`; at least that.
double heard_until(const Agreements& agreements, double sure, double share);

} // namespace kzcat
