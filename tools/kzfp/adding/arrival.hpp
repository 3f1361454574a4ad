/// @file
/// A file on its way into a catalogue, and the lines that report on it.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/command_line/output_options.hpp"

namespace kzfp {

/// What became of a file.
enum class Outcome {
    added,
    known,     ///< another file has the same sound already: one track has both as sources
    moved,     ///< the same bytes were added from another path
    unchanged, ///< since it was added
    failed,
    left ///< not reached, since the user wanted an end
};

inline constexpr size_t kOutcomeCount = 6;

struct Arrival {
    std::string path;
    Outcome outcome = Outcome::failed;
    std::string error;   ///< why it failed
    std::string warning; ///< what was wrong with it although it did not
    int64_t track = 0;   ///< 0 when it has none
    FileState state;
    std::optional<FileHash> hash;
    Recording recording; ///< of one that is to be added
};

/// The file as the source of a track; valid as long as the arrival is.
kzcat_source source_of(const Arrival& arrival);

/// What is reported of a file; empty when there is nothing to say in this format.
std::string line_of(const Arrival& arrival, Format format);

/// The line before the first one; empty when the format has none.
std::string first_line_of_arrivals(Format format);

/// "12 added, 1 failed": how many files came to which end. Empty when there were none.
std::string counts_text(const std::array<uint64_t, kOutcomeCount>& counts);

} // namespace kzfp
