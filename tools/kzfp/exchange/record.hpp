/// @file
/// The lines of an exported catalogue; docs/catalogue_export.md describes them.
#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <variant>
#include <vector>

#include "kzfp/catalogue/handles.hpp"

namespace kzfp {

/// Of the lines: grows when older programs could not read them any more.
inline constexpr int64_t kExportSchema = 1;

/// What is wrong with a line, and what cures it.
struct LineError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

struct ExportedSource {
    std::string path;
    int64_t size = -1;
    int64_t mtime_ns = -1;
    std::string hash; ///< KZCAT_HASH_SIZE bytes, or none
};

struct ExportedTag {
    std::string name;
    std::string value;
};

struct ExportedTrack {
    Trail trail;
    std::vector<ExportedSource> sources;
    std::vector<ExportedTag> tags;
    int64_t added = 0;
};

struct ExportBegin {
    uint64_t tracks = 0; ///< about how many follow; 0 when that is not known
};

struct ExportEnd {
    uint64_t tracks = 0;
};

using ExportLine = std::variant<ExportBegin, ExportedTrack, ExportEnd>;

/// The first line; `tracks` is about how many follow, or 0.
std::string begin_line(uint64_t tracks);

/// The line of a track. Throws CatalogueError.
std::string line_of(const Track& track, const Trail& trail);

/// The last line.
std::string end_line(uint64_t tracks);

/// Throws LineError.
ExportLine read_line(const std::string& line);

} // namespace kzfp
