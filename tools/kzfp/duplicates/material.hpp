/// @file
/// The recordings among which duplicates are looked for, and the files that hold them.
#pragma once

#include <array>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/output_options.hpp"
#include "kzfp/command_line/sound_options.hpp"

namespace kzfp {

/// A file, as it was when it was read.
struct HeldFile {
    std::string path;
    int64_t size = -1;
    std::optional<FileHash> hash;
};

/// Receives what could not be read, and why.
using Complain = std::function<void(const std::string& what, const std::string& why)>;

/// Sound that is there once, or several times with codes that are equal to the bit.
struct HeldRecording {
    int64_t track = 0; ///< its id in the catalogue
    Trail trail;
    uint64_t codes = 0;
    double seconds = 0;
    double sounding = 0; ///< seconds that are not silence
    std::vector<HeldFile> files;
};

/// Everything in a catalogue, in the order of the ids. Tracks whose trails cannot be read are
/// passed to `complain` and left out.
std::vector<HeldRecording> recordings_of(kzcat_catalogue& catalogue, const Complain& complain);

/// A catalogue in memory of the sound files that were named and those below folders that were.
/// Files that cannot be read are passed to `complain`. What was read is complete when the user
/// wanted an end, which interrupted() says.
Catalogue catalogue_of_files(const std::vector<std::string>& named, const SoundOptions& sound,
                             size_t jobs, ProgressMode mode, const Complain& complain);

} // namespace kzfp
