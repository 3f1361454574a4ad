/// @file
/// Makes a clip, looks it up and compares the answer with the truth.
#pragma once

#include <span>
#include <string>

#include "kzfp/evaluate/plan.hpp"
#include "kzfp/evaluate/score.hpp"

namespace kzfp::evaluate {

/// The catalogue that clips are looked up in, opened once or for each of two plans.
struct Catalogues {
    kzcat_catalogue* usual = nullptr;
    kzcat_catalogue* scan = nullptr;  ///< null unless plans are compared
    kzcat_catalogue* parts = nullptr; ///< likewise
};

/// What all clips have in common.
struct Context {
    const Music& music;
    std::span<const Series> series;
    const Toolbox& toolbox;
    Catalogues catalogues;
    std::string folder; ///< for the files of clips
    uint64_t seed = 1;
    bool keep = false; ///< clips stay in the folder
};

/// A clip that was examined.
struct Examined {
    Outcome outcome;
    std::string file; ///< where it is kept, within the folder
};

/// Any number of threads may do this at once.
Examined examine(const Context& context, const PlannedClip& planned);

} // namespace kzfp::evaluate
