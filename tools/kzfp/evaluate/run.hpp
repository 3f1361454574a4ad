/// @file
/// A whole evaluation: from files to the table.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "kzfp/command_line/output_options.hpp"
#include "kzfp/evaluate/table.hpp"

namespace kzfp::evaluate {

/// How clips are looked up.
enum class Plan { measured, scan, parts, both };

struct Settings {
    std::vector<std::string> files; ///< sound files and folders
    std::string catalogue;          ///< one that is there; empty: one is made for the run
    std::vector<const Kind*> kinds; ///< in the order of the table
    std::vector<double> lengths;    ///< seconds
    size_t clips = 30;              ///< of each kind
    uint64_t seed = 1;
    Plan plan = Plan::measured;
    std::string keep; ///< a folder for the clips; empty: they are not kept
    size_t jobs = 1;
    ProgressMode progress = ProgressMode::terminal;
};

struct Evaluation {
    Table table;
    bool complete = true; ///< no file and no clip failed
};

/// Reports files and clips that failed on standard error. After Ctrl-C it returns the table so far.
/// Throws CatalogueError and audio::FileError.
Evaluation evaluate(const Settings& settings);

} // namespace kzfp::evaluate
