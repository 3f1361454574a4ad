/// @file
/// CRC-32C (Castagnoli), as RFC 3720 has it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "catalogue/model/processor.hpp"

namespace kzcat {

/// The checksum of bytes, `earlier` being that of what comes before them.
uint32_t crc32c(std::span<const std::byte> bytes, uint32_t earlier = 0);

/// The same by the instructions of one set; every set gives the same result.
uint32_t crc32c(std::span<const std::byte> bytes, uint32_t earlier, Instructions instructions);

} // namespace kzcat
