/// @file
/// Which recordings of a catalogue are the same, or parts of each other.
#pragma once

#include <cstddef>
#include <vector>

#include "kzfp/command_line/output_options.hpp"
#include "kzfp/duplicates/grouping.hpp"
#include "kzfp/duplicates/material.hpp"

namespace kzfp {

/// Looks passages of every recording up among all of them, and compares it as a whole with what is
/// found. Links come in the order of the recordings, whatever the number of threads. Gives fewer
/// when the user wanted an end, which interrupted() says. Throws CatalogueError.
std::vector<Link> find_links(kzcat_catalogue& catalogue,
                             const std::vector<HeldRecording>& recordings, size_t jobs,
                             ProgressMode mode);

/// How the second lies on the first.
kzcat_alignment align(const HeldRecording& first, const HeldRecording& second);

} // namespace kzfp
