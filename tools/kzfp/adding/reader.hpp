/// @file
/// Reads the files that are to be added, as far as the catalogue does not have them.
#pragma once

#include <string>

#include "kzfp/adding/arrival.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/sound_options.hpp"

namespace kzfp {

/// May be used by several threads at once.
class Reader {
public:
    /// `path` is the catalogue's own. `documents`: tracks are to answer query documents too. All
    /// that is passed outlives the object.
    Reader(kzcat_catalogue& catalogue, const std::string& path, const SoundOptions& sound,
           bool documents)
        : catalogue_(catalogue), path_(path), sound_(sound), documents_(documents)
    {
    }

    /// What is wrong with a file is in the arrival. Once the user wants an end, files are left.
    Arrival read(const ListedFile& file) const;

private:
    void look_at(Arrival& arrival) const;
    bool serves(const Track& track) const;
    bool is_unchanged(Arrival& arrival) const;
    bool is_known_by_hash(Arrival& arrival) const;

    kzcat_catalogue& catalogue_;
    const std::string& path_;
    const SoundOptions& sound_;
    bool documents_;
};

} // namespace kzfp
