// Checksums for side files that a test has changed.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "catalogue/index/index_file.hpp"
#include "catalogue/model/crc32c.hpp"
#include "catalogue/store/little_endian.hpp"

namespace kzcat::test {

constexpr size_t kSectionsAt = 128;
constexpr size_t kSectionEntry = 24;
constexpr size_t kSectionCount = 10;

/// Sets the header's checksum to that of its bytes.
inline void seal_header(std::span<std::byte> bytes)
{
    constexpr size_t kChecksumAt = kIndexHeaderBytes - 4;
    put_little_endian(crc32c(bytes.first(kChecksumAt)), bytes.data() + kChecksumAt);
}

/// Sets the checksums of all sections that lie in the file, and the header's.
inline void seal(std::span<std::byte> bytes)
{
    for (size_t i = 0; i < kSectionCount; ++i) {
        std::byte* entry = bytes.data() + kSectionsAt + i * kSectionEntry;
        const auto offset = get_little_endian<uint64_t>(entry);
        const auto length = get_little_endian<uint64_t>(entry + 8);
        if (offset <= bytes.size() && length <= bytes.size() - offset) {
            put_little_endian(crc32c(bytes.subspan(offset, length)), entry + 16);
        }
    }
    seal_header(bytes);
}

} // namespace kzcat::test
