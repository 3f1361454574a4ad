/// @file
/// A track of a catalogue, as it is listed.
#pragma once

#include <string>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/output_options.hpp"

namespace kzfp {

/// The line before the first track; empty when the format has none.
std::string first_line_of_tracks(Format format);

/// For people, a line for each source; in CSV too, with everything else repeated. In JSON one
/// object.
std::string lines_of(const Track& track, Format format);

} // namespace kzfp
