/// @file
/// The volume labels of a disc that is not mounted.
#pragma once

#include <optional>
#include <string>

namespace kzfp {

struct DiscLabels {
    std::optional<std::string> iso9660; ///< nothing when there is no such volume
    std::optional<std::string> udf;
};

/// Reads the labels of a device or an image. The disc families are on. Throws audio::FileError,
/// also when there is no volume.
DiscLabels labels_of(const std::string& path);

} // namespace kzfp
