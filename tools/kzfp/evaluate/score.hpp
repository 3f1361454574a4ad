/// @file
/// What became of the clips, and what follows for a series of them.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/evaluate/music.hpp"

namespace kzfp::evaluate {

/// What became of one clip.
struct Outcome {
    enum class State {
        looked_up,
        silent,     ///< the track is, wherever it was tried
        failed,     ///< the clip could not be made or looked up
        interrupted ///< the user wants an end
    };

    State state = State::interrupted;
    std::string trouble;     ///< why it failed
    bool known = false;      ///< the catalogue has its track
    double seconds = 0;      ///< place in the track where it was cut
    std::string found;       ///< source of the track that was named; empty: there was no match
    bool accepted = false;   ///< the verdict is a match
    bool first = false;      ///< the best candidate is its track, whatever the score
    bool right = false;      ///< accepted, and its track was named
    bool same_sound = false; ///< another track was named that has the same sound in it
    double place_error = 0;  ///< seconds, when right
    double milliseconds = 0; ///< processor time from samples to answer
    double score = 0;
    std::optional<bool> by_scan;     ///< right when looked up by scan
    std::optional<bool> by_parts;    ///< right when looked up by the index alone
    std::vector<SameRecording> same; ///< pairs that were found to have the same sound
};

/// An interval of shares.
struct Interval {
    double low = 0;
    double high = 1;
};

/// The interval of Wilson (1927) at 95 % for `hits` of `count`; 0 to 1 when there are none.
Interval confidence(size_t hits, size_t count);

/// The value below which a part of some values lies; nothing when there are none.
std::optional<double> quantile(std::vector<double> values, double part);

/// What is said of a series of clips.
struct Tally {
    size_t clips = 0; ///< of tracks in the catalogue
    size_t first = 0;
    size_t right = 0;
    size_t wrong = 0; ///< another track was named
    size_t strangers = 0;
    size_t false_matches = 0; ///< of strangers
    size_t same_sound = 0;    ///< clips that count neither way
    size_t silent = 0;
    size_t failed = 0;
    size_t scanned = 0;  ///< clips that were found by scan, where both plans were tried
    size_t by_parts = 0; ///< and of these, those that the index alone found
    std::vector<double> place_errors; ///< seconds
    std::vector<double> milliseconds;

    void add(const Outcome& outcome);
    void add(const Tally& other);
};

} // namespace kzfp::evaluate
