/// @file
/// A group of duplicates as it is reported: its files, the best one first.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/duplicates/grouping.hpp"
#include "kzfp/duplicates/material.hpp"
#include "kzfp/duplicates/quality.hpp"

namespace kzfp {

/// What a file is to the best one of its group.
enum class Kinship {
    best,
    same_file,       ///< another name of it: a link
    identical_bytes, ///< as they were when the files were read
    identical_sound, ///< the same samples, decoded now, in another container or with other tags
    same_recording,
    excerpt
};

/// "best", "same file", "identical bytes", "identical sound", "same recording" or "excerpt".
const char* word_of(Kinship kinship);

struct FoundFile {
    int64_t track = 0;
    HeldFile file;
    double seconds = 0; ///< of its trail
    Quality quality;
    Kinship kinship = Kinship::best;
    double offset = 0;             ///< seconds of the best one at which it begins
    double error_rate = 0;         ///< share of differing bits where they agree
    std::optional<size_t> copy_of; ///< the first file of the finding that has the same bytes
};

/// The best file comes first, then its equals by kinship and quality, then excerpts.
struct Finding {
    std::vector<FoundFile> files;
};

/// Two or more files that are a group: looks at each file, as far as it is there.
Finding finding_of(const std::vector<HeldRecording>& recordings, const Group& group,
                   const SoundOptions& sound);

/// Groups with two files or more. Recordings that are silent are grouped by their bytes alone: all
/// silence sounds the same.
std::vector<Group> groups_of(std::vector<HeldRecording>& recordings,
                             const std::vector<Link>& links);

} // namespace kzfp
