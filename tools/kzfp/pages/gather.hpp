/// @file
/// What pages show of files: their sound, their 30 values, their codes.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "report/report.hpp"

namespace kzfp {

/// The most of a file that is drawn, seconds.
inline constexpr double kDrawnSeconds = 600;

/// A page's heading with the program and the present time at its foot.
report::Heading heading_of(const std::string& title, const std::string& subtitle);

/// Whether a file can be read once more for its pictures: a pipe cannot.
bool can_be_drawn(const std::string& path);

/// The same options for a part of the section that they have: `begin` seconds behind its start.
SoundOptions part_of(const SoundOptions& options, double begin, double seconds);

/// The sound of a file, of at most kDrawnSeconds. Throws audio::FileError.
report::Sound drawn_sound(const std::string& name, const std::string& path,
                          const SoundOptions& options);

/// The 30 values with which a file begins, as `kzfp fingerprint` prints them. Nothing when there is
/// too little sound. Throws audio::FileError when the file cannot be opened.
std::optional<report::Fingerprint> drawn_values(const std::string& name, const std::string& path,
                                                const SoundOptions& options);

/// The codes of a trail. Throws CatalogueError.
std::vector<uint64_t> codes_of(const kzcat_trail& trail);

/// Two trails that were aligned, the second one laid on the first one. Throws CatalogueError.
report::Trails laid_trails(const kzcat_trail& first, const std::string& first_name,
                           const kzcat_trail& second, const std::string& second_name,
                           const kzcat_alignment& alignment);

} // namespace kzfp
