/// @file
/// The decoded samples of a sound file.
#pragma once

#include <functional>
#include <span>
#include <string>
#include <vector>

#include "audio/input.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/command_line/sound_options.hpp"

namespace kzfp {

/// Opens part of a regular file, at its own rate. The opened input is only valid during the call of
/// `use`. Throws audio::FileError.
void with_sound_of(const std::string& path, const SoundOptions& sound,
                   const audio::Section& section,
                   const std::function<void(const audio::OpenedInput&)>& use);

/// Reads at most `frames` frames: interleaved, full scale at 1. Empty for the 8-bit encodings.
std::vector<float> read_floats(audio::Source& source, size_t frames);

/// The SHA-256 of all samples of a file, with their rate and channels: equal for files that decode
/// to the same sound, whatever their format and tags. Throws audio::FileError.
FileHash hash_of_sound(const std::string& path, const SoundOptions& sound);

} // namespace kzfp
