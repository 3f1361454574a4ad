/// @file
/// The numbers by which recognising decides. All that is measured rather than derived is here.
#pragma once

#include <cstddef>
#include <cstdint>

namespace kzcat {

/// What a clip's score has to reach in a catalogue of kReferenceCodes codes or fewer, when it is
/// read as it is, and how much more when it had to be read at another speed, tempo or pitch: each
/// of those readings is one more chance for a stranger.
constexpr double kBaseThreshold = 7.3;
constexpr double kFurtherMargin = 1.0;

/// The highest score of strangers grows by this much whenever the number of places that are
/// compared doubles, and so does the threshold.
constexpr double kThresholdGrowth = 0.12;
constexpr double kReferenceCodes = 216000;

/// A short clip resembles strangers less: what two recordings have in common by their style adds up
/// over time, as what they have in common by chance does not. So windows shorter than kFullWindow
/// need less, and those of kShortWindow or less need kShortAllowance less; in seconds.
constexpr double kFullWindow = 14.2;
constexpr double kShortWindow = 6.0;
constexpr double kShortAllowance = 0.2;

/// A score this far below its threshold is "not sure" rather than "no match".
constexpr double kUnsureBelow = 0.5;

/// From here on the clip as it is has been recognised beyond doubt, and further readings are not
/// tried.
constexpr double kBeyondDoubt = 9.0;

/// The share of a window's bits that are masked because they are the weakest, and the change, in
/// octaves of energy, up to which a bit says nothing whatever its neighbours do.
constexpr double kMaskedShare = 0.25;
constexpr float kNoChange = 0.02F;

/// The energy of a fine band, as a share of its frame's, below which it is taken for noise: a sine
/// and hum are nothing else in most bands.
constexpr float kBandFloor = 3e-5F;

/// Codes with bits that count which a window must have; fewer are "too quiet". 2.2 s.
constexpr size_t kFewestCodes = 12;

/// The share of a clip, or of a track that is shorter, that must lie within the other.
constexpr double kFewestOverlap = 0.8;

/// A track is compared with its own other places when it has more of them than this; a shorter one
/// with the clip turned in a circle.
constexpr size_t kOwnPlaces = 50;

/// The spread of a track's own places counts at least as this share of the catalogue's.
constexpr double kLeastOwnSpread = 0.3;

/// Music of loops resembles itself in many places, so that no place stands out among its own: this
/// share of how it stands out in the catalogue is kept, up to so many times how it stands out in
/// the track. Rhythm without melody stands out in the catalogue only: drum loops, metronomes and
/// hum reach 20 to 50 there and hardly more than 4.6 among their own places.
constexpr double kLoopShare = 0.6;
constexpr double kMostOverOwn = 1.5;

/// The longest window that is searched at once, in codes, 16.7 s: over longer ones a small error of
/// the tempo adds up. Longer clips are cut.
constexpr size_t kLongestWindow = 90;

/// The threshold of a catalogue for a clip of some windows that are searched one by one, each of
/// so many seconds.
double threshold_for(uint64_t codes, size_t windows, double seconds);

} // namespace kzcat
