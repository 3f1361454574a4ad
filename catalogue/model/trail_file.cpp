/// @file
/// A header of 64 bytes, and the codes. Everything is little-endian, and every byte is covered by a
/// checksum.

#include "catalogue/model/trail_file.hpp"

#include <algorithm>
#include <array>
#include <string>

#include "catalogue/model/crc32c.hpp"

namespace kzcat {

namespace {

using Bytes = std::span<const std::byte>;

// The first byte is no text, and line ends would not survive being converted as text.
constexpr std::array<uint8_t, 8> kMagic = {0x89, 'K', 'Z', 'T', 0x0D, 0x0A, 0x1A, 0x0A};
constexpr uint32_t kVersion = 1;

constexpr size_t kVersionAt = 8;
constexpr size_t kProfileAt = 12;
constexpr size_t kSamplesAt = 16;
constexpr size_t kCountAt = 24;
constexpr size_t kReservedAt = 32;
constexpr size_t kCodesSumAt = 56;
constexpr size_t kHeaderSumAt = 60;
constexpr size_t kHeaderSize = 64;

template <class Number>
void store(std::span<std::byte> bytes, size_t at, Number number)
{
    for (size_t i = 0; i < sizeof number; ++i) {
        bytes[at + i] = static_cast<std::byte>(number >> (8 * i));
    }
}

template <class Number>
Number load(Bytes bytes, size_t at)
{
    Number number = 0;
    for (size_t i = 0; i < sizeof number; ++i) {
        number |= static_cast<Number>(std::to_integer<Number>(bytes[at + i]) << (8 * i));
    }
    return number;
}

void require(bool holds, const std::string& sentence)
{
    if (!holds) {
        throw TrailError(sentence);
    }
}

bool is_magic(std::byte byte, uint8_t magic) { return byte == static_cast<std::byte>(magic); }

// What can be said before the rest of the header is trusted: another format, and a newer version.
void require_header(Bytes bytes)
{
    const Bytes magic = bytes.first(std::min(bytes.size(), kMagic.size()));
    require(!bytes.empty() && std::equal(magic.begin(), magic.end(), kMagic.begin(), is_magic),
            "This is no trail file.");
    require(bytes.size() >= kHeaderSize, "The trail file ends after " +
                                             std::to_string(bytes.size()) +
                                             " bytes, inside its header; make it again.");
    const auto version = load<uint32_t>(bytes, kVersionAt);
    const bool intact = crc32c(bytes.first(kHeaderSumAt)) == load<uint32_t>(bytes, kHeaderSumAt);
    require(!intact || version <= kVersion,
            "The trail file is of version " + std::to_string(version) +
                ", which takes a newer program; this one reads version 1.");
    require(intact, "The header of the trail file is damaged; make the file again.");
    require(version == kVersion,
            "The trail file is of version " + std::to_string(version) + ", which does not exist.");
}

// What an intact header may say.
void require_sense(Bytes bytes)
{
    const auto profile = load<uint32_t>(bytes, kProfileAt);
    require(profile == static_cast<uint32_t>(Profile::standard),
            "The codes of the trail file are of profile " + std::to_string(profile) +
                ", which this program does not have; make the trail again with this one.");
    const Bytes reserved = bytes.subspan(kReservedAt, kCodesSumAt - kReservedAt);
    require(std::count(reserved.begin(), reserved.end(), std::byte{0}) ==
                static_cast<std::ptrdiff_t>(reserved.size()),
            "Reserved bytes of the trail file are not zero.");
    const auto samples = load<uint64_t>(bytes, kSamplesAt);
    const auto count = load<uint64_t>(bytes, kCountAt);
    require(count == code_count(samples), "The trail file has " + std::to_string(count) +
                                              " codes, but its " + std::to_string(samples) +
                                              " samples have " +
                                              std::to_string(code_count(samples)) + ".");
    const size_t rest = bytes.size() - kHeaderSize;
    require(rest % sizeof(Code) == 0 && rest / sizeof(Code) == count,
            "The trail file has " + std::to_string(rest) + " bytes of codes instead of 8 times " +
                std::to_string(count) + "; make it again.");
}

} // namespace

std::vector<std::byte> write_trail(const Trail& trail)
{
    require(trail.codes.size() == code_count(trail.samples),
            "The trail has " + std::to_string(trail.codes.size()) + " codes, but its " +
                std::to_string(trail.samples) + " samples have " +
                std::to_string(code_count(trail.samples)) + ".");
    std::vector<std::byte> bytes(kHeaderSize + trail.codes.size() * sizeof(Code));
    const std::span<std::byte> all(bytes);
    std::transform(kMagic.begin(), kMagic.end(), bytes.begin(),
                   [](uint8_t byte) { return static_cast<std::byte>(byte); });
    store(all, kVersionAt, kVersion);
    store(all, kProfileAt, static_cast<uint32_t>(trail.profile));
    store(all, kSamplesAt, trail.samples);
    store(all, kCountAt, uint64_t{trail.codes.size()});
    for (size_t i = 0; i < trail.codes.size(); ++i) {
        store(all, kHeaderSize + i * sizeof(Code), trail.codes[i]);
    }
    store(all, kCodesSumAt, crc32c(all.subspan(kHeaderSize)));
    store(all, kHeaderSumAt, crc32c(all.first(kHeaderSumAt)));
    return bytes;
}

Trail read_trail(std::span<const std::byte> bytes)
{
    require_header(bytes);
    require_sense(bytes);
    const Bytes codes = bytes.subspan(kHeaderSize);
    require(crc32c(codes) == load<uint32_t>(bytes, kCodesSumAt),
            "The codes of the trail file are damaged; make the file again.");
    Trail trail{Profile::standard, load<uint64_t>(bytes, kSamplesAt), {}};
    trail.codes.resize(codes.size() / sizeof(Code));
    for (size_t i = 0; i < trail.codes.size(); ++i) {
        trail.codes[i] = load<Code>(codes, i * sizeof(Code));
    }
    return trail;
}

} // namespace kzcat
