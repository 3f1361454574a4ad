// Volume identifiers: ISO 9660 fills 32 bytes up with spaces; UDF (ECMA-167 1/7.2.12, OSTA CS0) has
// a byte for the width of its characters, the characters, and in its last byte how many bytes are
// used.

#include "kzsdk/disc/volume.hpp"

#include <algorithm>
#include <cstring>

#include "kzsdk/disc/read_at.hpp"
#include "kzsdk/disc/volume_label.hpp"

namespace kz::disc {

namespace {

constexpr uint32_t kIso9660Field = 40;
constexpr uint32_t kUdfField = 24;
constexpr uint32_t kLongestBeginning = kIso9660Field + kLabelField;
static_assert(kLongestBeginning >= kUdfField + kLabelField);

constexpr uint8_t kNarrow = 8;
constexpr uint8_t kWide = 16;

/// Writes a character of at most 16 bits; returns its bytes, 1 to 3.
uint32_t write_utf8(uint32_t character, char* text) noexcept
{
    if (character >= 0xd800 && character < 0xe000) {
        character = 0xfffd; // half a pair: the set has none
    }
    if (character < 0x80) {
        text[0] = static_cast<char>(character);
        return 1;
    }
    if (character < 0x800) {
        text[0] = static_cast<char>(0xc0 | (character >> 6));
        text[1] = static_cast<char>(0x80 | (character & 0x3f));
        return 2;
    }
    text[0] = static_cast<char>(0xe0 | (character >> 12));
    text[1] = static_cast<char>(0x80 | ((character >> 6) & 0x3f));
    text[2] = static_cast<char>(0x80 | (character & 0x3f));
    return 3;
}

uint32_t without_trailing_spaces(const char* text, uint32_t length) noexcept
{
    while (length > 0 && text[length - 1] == ' ') {
        --length;
    }
    return length;
}

uint32_t iso9660_text(const uint8_t* field, char* text) noexcept
{
    uint32_t length = 0;
    while (length < kLabelField && field[length] != 0) {
        text[length] = static_cast<char>(field[length]);
        ++length;
    }
    return without_trailing_spaces(text, length);
}

/// Empty for characters of any other width.
uint32_t udf_text(const uint8_t* field, char* text) noexcept
{
    if (field[0] != kNarrow && field[0] != kWide) {
        return 0;
    }
    const uint32_t step = field[0] / 8;
    const uint32_t end = std::min<uint32_t>(field[kLabelField - 1], kLabelField - 1);
    uint32_t length = 0;
    for (uint32_t i = 1; i + step <= end; i += step) {
        const uint32_t character = step == 1 ? field[i] : field[i] * 256u + field[i + 1];
        if (character == 0) {
            break;
        }
        length += write_utf8(character, text + length);
    }
    return without_trailing_spaces(text, length);
}

} // namespace

const VolumeKind kIso9660Volume = {.descriptor = 16 * kSector,
                                   .mark = "\1CD001",
                                   .mark_size = 6,
                                   .field = kIso9660Field,
                                   .to_text = iso9660_text};

const VolumeKind kUdfVolume = {.descriptor = 32 * kSector,
                               .mark = "\1\0",
                               .mark_size = 2,
                               .field = kUdfField,
                               .to_text = udf_text};

VolumeSearch read_whole_label(int descriptor, const VolumeKind& kind, WholeLabel& label) noexcept
{
    label = {};
    uint8_t bytes[kLongestBeginning] = {};
    const int32_t count = read_at(descriptor, kind.descriptor, bytes, kLongestBeginning);
    if (count < 0) {
        return VolumeSearch::failed;
    }
    if (static_cast<uint32_t>(count) < kLongestBeginning ||
        std::memcmp(bytes, kind.mark, kind.mark_size) != 0) {
        return VolumeSearch::missing;
    }
    label.length = kind.to_text(bytes + kind.field, label.text);
    label.text[label.length] = '\0';
    return VolumeSearch::found;
}

} // namespace kz::disc
