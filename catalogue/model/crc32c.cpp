/// @file
/// CRC-32C a byte at a time, from a table of the reflected polynomial.

#include "catalogue/model/crc32c.hpp"

#include <array>

namespace kzcat {
namespace {

constexpr uint32_t kPolynomial = 0x82F63B78; // 0x1EDC6F41, lowest bit first

constexpr uint32_t remainder(uint32_t byte)
{
    for (int bit = 0; bit < 8; ++bit) {
        byte = (byte >> 1) ^ ((byte & 1) != 0 ? kPolynomial : 0);
    }
    return byte;
}

constexpr auto kRemainders = [] {
    std::array<uint32_t, 256> table{};
    for (uint32_t byte = 0; byte < table.size(); ++byte) {
        table[byte] = remainder(byte);
    }
    return table;
}();

} // namespace

uint32_t crc32c(std::span<const std::byte> bytes, uint32_t earlier)
{
    uint32_t sum = ~earlier;
    for (const std::byte byte : bytes) {
        sum = (sum >> 8) ^ kRemainders[(sum ^ std::to_integer<uint32_t>(byte)) & 0xFF];
    }
    return ~sum;
}

} // namespace kzcat
