/// @file
/// Volumes of a disc: recognised by their descriptors, with their labels as a whole.
#pragma once

#include <cstdint>

#include "kzsdk/disc/disc.h"

namespace kz::disc {

constexpr uint32_t kLabelField = 32; ///< bytes of a volume identifier

/// A kind of volume: how its descriptor is recognised, and where and how it holds the label.
struct VolumeKind {
    int64_t descriptor; ///< bytes from the beginning of the disc
    const char* mark;   ///< what the descriptor begins with
    uint32_t mark_size;
    uint32_t field; ///< of `kLabelField` bytes, from the beginning of the descriptor
    /// Writes the label without a NUL and returns its bytes, below KZ_DISC_LABEL_SIZE.
    uint32_t (*to_text)(const uint8_t* field, char* text) noexcept;
};

extern const VolumeKind kIso9660Volume;
extern const VolumeKind kUdfVolume;

/// A label with its NUL.
struct WholeLabel {
    char text[KZ_DISC_LABEL_SIZE];
    uint32_t length;
};

enum class VolumeSearch { found, missing, failed };

/// Looks for a volume on an open disc and reads its label. `failed` leaves the reason in `errno`.
VolumeSearch read_whole_label(int descriptor, const VolumeKind& kind, WholeLabel& label) noexcept;

} // namespace kz::disc
