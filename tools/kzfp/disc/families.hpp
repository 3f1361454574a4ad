/// @file
/// The library's disc families as the program uses them.
#pragma once

#include <string>

#include "audio/source.hpp"
#include "kzfp/library.hpp"
#include "kzsdk/disc/disc.h"

namespace kzfp {

/// Both families are on for as long as it lives.
class DiscFamilies {
public:
    DiscFamilies()
    {
        kzbdfs_initialize();
        kzdvdfs_initialize();
    }
    ~DiscFamilies()
    {
        kzdvdfs_shutdown();
        kzbdfs_shutdown();
    }
    DiscFamilies(const DiscFamilies&) = delete;
    DiscFamilies& operator=(const DiscFamilies&) = delete;
};

/// What cannot be done with a disc, with the library's reason.
inline audio::FileError disc_error(const std::string& what, kz_status status)
{
    return audio::FileError(what + ": " + status_text(status));
}

} // namespace kzfp
