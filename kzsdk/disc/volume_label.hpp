/// @file
/// Volume labels, read from the bytes of a disc.
#pragma once

#include <cstdint>

namespace kz::disc {

constexpr int64_t kSector = 2048;

/// The volume identifier of the UDF primary volume descriptor, behind its compression identifier,
/// on a disc whose volume descriptors begin in sector 32.
constexpr int64_t kUdfLabel = 32 * kSector + 25;

/// The volume identifier of the ISO 9660 primary volume descriptor.
constexpr int64_t kIso9660Label = 16 * kSector + 40;

constexpr uint32_t kLongestLabel = 32;

struct VolumeLabel {
    char text[kLongestLabel + 1]; ///< NUL-terminated
    uint32_t length;
};

/// Reads the label at an offset of an open disc, up to its first white space. What lies there is
/// not checked; where the disc ends earlier, the label does. False when reading fails, with `errno`
/// set.
bool read_label(int descriptor, int64_t offset, VolumeLabel& label) noexcept;

} // namespace kz::disc
