/// @file
/// What clips are looked up by: sound, trails, query documents, or lines of values.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "kzfp/catalogue/sound.hpp"
#include "kzfp/command_line/choice.hpp"

namespace kzfp {

enum class ClipKind { by_content, sound, trail, document, values };

inline constexpr Choice<ClipKind> kClipKinds[] = {
    {"auto", ClipKind::by_content, "whatever a file begins like; standard input is sound"},
    {"sound", ClipKind::sound, "a sound file"},
    {"trail", ClipKind::trail, "a trail file (.kzt)"},
    {"document", ClipKind::document, "a query document, as kzfp prints it"},
    {"values", ClipKind::values, "lines of 30 values, as kzfp --format values prints them"},
};

/// One thing to be looked up. A file of values has one of them for each of its lines.
struct ClipInput {
    std::string path;
    ClipKind kind = ClipKind::sound;
    std::string values = {};  ///< the line of values
    size_t line = 0;          ///< its number, when the file has several; otherwise 0
    std::string trouble = {}; ///< why it cannot be read, when that is known already
};

/// The inputs of some files, in this order. A file that cannot be read is one input.
std::vector<ClipInput> clip_inputs(const std::vector<std::string>& files, ClipKind kind);

/// "path", or "path:3" for a line of a file.
std::string name_of(const ClipInput& input);

/// Throws audio::FileError and CatalogueError.
Clip read_clip(const ClipInput& input, const SoundOptions& options);

/// The 30 values of a line, which may have one word before them. Throws audio::FileError.
std::vector<int16_t> values_in(const std::string& line);

} // namespace kzfp
