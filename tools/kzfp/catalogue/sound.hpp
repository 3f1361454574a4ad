/// @file
/// From files to what is kept and looked up: trails and queries.
#pragma once

#include <string>
#include <vector>

#include "audio/input.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/sound_options.hpp"

namespace kzfp {

/// The library's number for an encoding.
uint32_t to_stream_format(audio::Encoding encoding);

/// What a file holds, by its first bytes.
enum class Content { sound, trail, document };

Content content_of_file(const std::string& path);

/// A recording as it is added.
struct Recording {
    Trail trail;
    std::vector<audio::Tag> tags; ///< the title at least
    std::string warning;          ///< what was wrong with the file; empty when nothing was
    double seconds = 0;           ///< of sound that were read; 0 for a trail file
};

/// Reads a sound file, or a trail file (.kzt), to its end or that of the section. `documents`: it
/// is to answer query documents too. Sound without a title takes it from `name`, which is the path
/// unless another is given. Throws audio::FileError and CatalogueError.
Recording read_recording(const std::string& path, const SoundOptions& options, bool documents,
                         const std::string& name = {});

/// A clip as it is looked up.
struct Clip {
    Query query;
    std::string warning;
    double seconds = 0; ///< of sound that were read; 0 for a trail or a document
};

/// Reads a sound file, a trail file or a query document. Throws as read_recording() does.
Clip read_clip(const std::string& path, const SoundOptions& options);

/// The same of a file that is taken for sound whatever it begins with.
Clip read_sound_clip(const std::string& path, const SoundOptions& options);

} // namespace kzfp
