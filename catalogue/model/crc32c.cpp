/// @file
/// CRC-32C a byte at a time, from a table of the reflected polynomial, and eight bytes at a time
/// where the processor has an instruction for it.

#include "catalogue/model/crc32c.hpp"

#include <array>
#include <cstring>

#if defined(__x86_64__)
#include <nmmintrin.h>
#elif defined(__aarch64__) && !defined(__AARCH64EB__) && defined(__linux__)
#include <sys/auxv.h>
#define KZCAT_CRC_ARM 1
#endif

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

constexpr std::array<uint32_t, 256> remainders()
{
    std::array<uint32_t, 256> table{};
    for (uint32_t byte = 0; byte < table.size(); ++byte) {
        table[byte] = remainder(byte);
    }
    return table;
}

constexpr auto kRemainders = remainders();

uint32_t add_bytes(uint32_t sum, std::span<const std::byte> bytes)
{
    for (const std::byte byte : bytes) {
        sum = (sum >> 8) ^ kRemainders[(sum ^ std::to_integer<uint32_t>(byte)) & 0xFF];
    }
    return sum;
}

#if defined(__x86_64__)

constexpr bool has_instruction() { return true; } // every processor with AVX2 has SSE4.2

__attribute__((target("sse4.2"))) uint32_t add_words(uint32_t sum, const std::byte* bytes,
                                                     size_t words)
{
    uint64_t wide = sum;
    for (size_t i = 0; i < words; ++i) {
        uint64_t word = 0;
        std::memcpy(&word, bytes + i * sizeof word, sizeof word);
        wide = _mm_crc32_u64(wide, word);
    }
    return static_cast<uint32_t>(wide);
}

#elif defined(KZCAT_CRC_ARM)

bool has_instruction()
{
    constexpr unsigned long kCrc32 = 1UL << 7;
    static const bool has = (getauxval(AT_HWCAP) & kCrc32) != 0;
    return has;
}

uint32_t add_words(uint32_t sum, const std::byte* bytes, size_t words)
{
    for (size_t i = 0; i < words; ++i) {
        uint64_t word = 0;
        std::memcpy(&word, bytes + i * sizeof word, sizeof word);
        __asm__(".arch_extension crc\n\tcrc32cx %w0, %w0, %x1" : "+r"(sum) : "r"(word));
    }
    return sum;
}

#else

constexpr bool has_instruction() { return false; }

uint32_t add_words(uint32_t sum, const std::byte* bytes, size_t words)
{
    return add_bytes(sum, {bytes, words * sizeof(uint64_t)});
}

#endif

} // namespace

uint32_t crc32c(std::span<const std::byte> bytes, uint32_t earlier, Instructions instructions)
{
    uint32_t sum = ~earlier;
    if (instructions != Instructions::plain && has_instruction()) {
        const size_t words = bytes.size() / sizeof(uint64_t);
        sum = add_words(sum, bytes.data(), words);
        bytes = bytes.subspan(words * sizeof(uint64_t));
    }
    return ~add_bytes(sum, bytes);
}

uint32_t crc32c(std::span<const std::byte> bytes, uint32_t earlier)
{
    return crc32c(bytes, earlier, chosen_instructions());
}

} // namespace kzcat
