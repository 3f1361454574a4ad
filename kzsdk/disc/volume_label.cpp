/// @file
/// Reads the volume label of a disc: up to 32 bytes at a fixed offset, cut at the first white
/// space.
///
/// Nothing checks that a volume descriptor lies there; any bytes are taken for a label.
#include "kzsdk/disc/volume_label.hpp"

#include "kzsdk/abs/text.h"
#include "kzsdk/disc/read_at.hpp"

bool kz::disc::read_label(int descriptor, int64_t offset, VolumeLabel& label) noexcept
{
    label = {};
    if (read_at(descriptor, offset, label.text, kLongestLabel) < 0) {
        return false;
    }
    const char* byte = label.text;
    while (*byte != '\0' && kz_isspace(static_cast<uint8_t>(*byte)) == 0) {
        ++byte;
    }
    label.length = static_cast<uint32_t>(byte - label.text);
    label.text[label.length] = '\0';
    return true;
}
