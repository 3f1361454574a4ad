/// @file
/// The Blu-ray family's state and records.
#pragma once

#include <dirent.h>

#include "kzsdk/disc/disc.h"
#include "kzsdk/disc/disc_family.hpp"

struct kzbdfs_dir {
    char* path; ///< owned; ends in "/"
    DIR* stream;
};

struct kzbdfs_dirent {
    char* path;           ///< owned; with "//" before the name
    const dirent* record; ///< the stream's
};

namespace kz::disc {

inline constinit Family bluray(kUdfLabel, kUdfVolume);

} // namespace kz::disc
