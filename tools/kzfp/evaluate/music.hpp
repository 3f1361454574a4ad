/// @file
/// The reader's music, divided into what the catalogue has and strangers.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <tuple>
#include <vector>

#include "kzfp/catalogue/handles.hpp"

namespace kzfp::evaluate {

struct MusicTrack {
    std::string path;
    double seconds = 0;
    int64_t id = 0; ///< in the catalogue; 0 for a stranger

    bool is_known() const { return id != 0; }
};

/// Two files of the same recording.
struct SameRecording {
    std::string one;
    std::string other;

    bool operator<(const SameRecording& right) const
    {
        return std::tie(one, other) < std::tie(right.one, right.other);
    }
};

struct Music {
    std::vector<MusicTrack> tracks;
    std::vector<SameRecording> identical; ///< the second one is left out: its codes are the same
    std::vector<std::string> complaints;  ///< what was wrong with files, with their names
    size_t failed = 0;                    ///< files that could not be read

    size_t known() const;
    double seconds() const;
};

/// How far the work is: called after each file.
using FileDone = std::function<void(size_t done, const std::string& path)>;

/// Makes a catalogue of two tracks in three, drawn by the seed, at a path where there is none. The
/// work ends early when the user interrupts it. Throws CatalogueError.
Music make_catalogue(const std::vector<std::string>& files, const std::string& catalogue,
                     uint64_t seed, size_t jobs, const FileDone& done);

/// Finds out which files a catalogue has, by their paths or their bytes; the others are strangers.
Music look_up_files(const std::vector<std::string>& files, const std::string& catalogue,
                    size_t jobs, const FileDone& done);

} // namespace kzfp::evaluate
