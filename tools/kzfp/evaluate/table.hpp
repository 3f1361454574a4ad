/// @file
/// The table of robustness, and its forms.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "kzfp/evaluate/plan.hpp"
#include "kzfp/evaluate/score.hpp"

namespace kzfp::evaluate {

/// Everything that a run found out.
struct Table {
    struct Row {
        std::string name;
        std::string explanation;
        double seconds = 0;   ///< of the clips
        std::string not_made; ///< why there are none; empty when they were made
        Curve curve;
        Tally tally;
    };

    std::vector<Row> rows;
    size_t tracks = 0;    ///< that clips of known tracks were cut from
    size_t strangers = 0; ///< tracks that are not in the catalogue
    size_t catalogue_tracks = 0;
    double hours = 0; ///< of music, strangers included
    uint64_t seed = 1;
    bool partial = false; ///< the user ended the run
    bool both_plans = false;
    bool without_index = false; ///< both were asked for, but the catalogue has no index
    std::vector<SameRecording> identical;
    std::map<SameRecording, size_t> same_sound; ///< clips for which the other track was named

    /// All rows together.
    Tally all() const;
};

/// Lines for people.
std::string to_text(const Table& table);

/// An object for each row, and one for the whole.
std::string to_json(const Table& table);

/// A line of names, one for each row, and one for all.
std::string to_csv(const Table& table);

} // namespace kzfp::evaluate
