// Hashes are SHA-256 of bytes in a stated order.

#include <array>
#include <string>

#include <gtest/gtest.h>

#include "catalogue/store/hash.hpp"
#include "catalogue/store/little_endian.hpp"

namespace kzcat {
namespace {

std::string hexadecimal(std::span<const uint8_t> bytes)
{
    std::string text;
    for (const uint8_t byte : bytes) {
        text += "0123456789abcdef"[byte >> 4U];
        text += "0123456789abcdef"[byte & 0xfU];
    }
    return text;
}

std::span<const std::byte> bytes_of(const std::string& text)
{
    return std::as_bytes(std::span(text));
}

TEST(FileHasher, HashesTheExamplesOfItsStandard)
{
    FileHasher hasher;
    EXPECT_EQ("e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855",
              hexadecimal(hasher.finish()));
    hasher.update(bytes_of("abc"));
    EXPECT_EQ("ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad",
              hexadecimal(hasher.finish()));
}

TEST(FileHasher, PiecesDoNotShow)
{
    const std::string text(1000, 'x');
    FileHasher whole;
    whole.update(bytes_of(text));
    FileHasher pieces;
    for (size_t at = 0; at < text.size(); at += 7) {
        pieces.update(bytes_of(text.substr(at, 7)));
    }
    EXPECT_EQ(whole.finish(), pieces.finish());
}

/// The bytes that are hashed, written here one by one.
TEST(ContentKey, HashesProfileSamplesAndCodes)
{
    for (const size_t count : {0U, 1U, 511U, 512U, 513U, 2000U}) {
        Trail trail{.profile = Profile::standard, .samples = 0x1122334455667788, .codes = {}};
        std::string bytes("\x01\x00\x00\x00\x88\x77\x66\x55\x44\x33\x22\x11", 12);
        for (uint64_t i = 0; i < count; ++i) {
            trail.codes.push_back(i * 0x9e3779b97f4a7c15U);
            for (unsigned shift = 0; shift < 64; shift += 8) {
                bytes += static_cast<char>((trail.codes.back() >> shift) & 0xffU);
            }
        }
        FileHasher hasher;
        hasher.update(bytes_of(bytes));
        const FileHash hash = hasher.finish();
        EXPECT_EQ(hexadecimal(std::span(hash).first(16)), hexadecimal(content_key(trail))) << count;
    }
}

TEST(LittleEndian, TheLowestByteComesFirst)
{
    std::array<std::byte, 4> bytes{};
    put_little_endian(uint32_t{0x01020304}, bytes.data());
    EXPECT_EQ(std::byte{4}, bytes[0]);
    EXPECT_EQ(std::byte{1}, bytes[3]);
    EXPECT_EQ(0x01020304U, get_little_endian<uint32_t>(bytes.data()));
    std::vector<uint16_t> numbers;
    get_little_endian(std::span<const std::byte>(bytes), numbers);
    EXPECT_EQ((std::vector<uint16_t>{0x0304, 0x0102}), numbers);
}

} // namespace
} // namespace kzcat
