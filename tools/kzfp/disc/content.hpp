/// @file
/// What is on a mounted disc.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace kzfp {

/// A file by its path below the root.
struct ControlFile {
    std::string name;
    bool found = false;
};

struct DiscContent {
    bool is_bluray = false;
    bool is_dvd = false; ///< a disc may be both
    std::vector<ControlFile> control_files;
    std::vector<std::string> playlists; ///< names of files, sorted
    std::vector<int32_t> title_sets;    ///< numbers, rising
};

/// Examines the disc that is mounted at `root`, or a directory laid out like one. The disc families
/// are on. Throws audio::FileError, also when it is no disc.
DiscContent content_of(const std::string& root);

} // namespace kzfp
