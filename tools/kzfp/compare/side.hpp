/// @file
/// One of the files that are compared, in all forms in which it can be.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "kzfp/catalogue/clip_inputs.hpp"

namespace kzfp {

struct Side {
    std::string path = {};
    bool is_sound = false;
    Trail trail = {};   ///< null for a document and for values
    double seconds = 0; ///< of the trail
    /// 30; empty for a trail file and for less than 14.22 s of sound.
    std::vector<int16_t> values = {};
    std::string warning = {}; ///< what was wrong with the file although it could be read
};

/// Reads a file once for its trail and its beginning once more for its values. Throws
/// audio::FileError and CatalogueError.
Side read_side(const std::string& path, const SoundOptions& options);

} // namespace kzfp
