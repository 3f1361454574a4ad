/// @file
/// The clips of a run, kept with what is true of them.
#pragma once

#include <fstream>
#include <string>

#include "kzfp/evaluate/examiner.hpp"

namespace kzfp::evaluate {

/// Writes truth.jsonl beside the clips: one object for each, with the members that
/// evaluation/clips.py writes and what was concluded.
class Keeper {
public:
    /// `folder` is made, or empty. Throws audio::FileError.
    explicit Keeper(const std::string& folder);

    /// Throws audio::FileError.
    void note(const Series& series, const MusicTrack& track, const Examined& examined);

private:
    std::string path_;
    std::ofstream file_;
};

} // namespace kzfp::evaluate
