// The checksum of stored codes, against the values that RFC 3720 prints in its appendix B.4.

#include <string_view>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/model/crc32c.hpp"

namespace {

std::vector<std::byte> bytes_of(std::string_view text)
{
    std::vector<std::byte> bytes;
    for (const char character : text) {
        bytes.push_back(static_cast<std::byte>(character));
    }
    return bytes;
}

std::vector<std::byte> rising(size_t count)
{
    std::vector<std::byte> bytes(count);
    for (size_t i = 0; i < count; ++i) {
        bytes[i] = static_cast<std::byte>(i);
    }
    return bytes;
}

TEST(Crc32c, AgreesWithTheStandardsExamples)
{
    EXPECT_EQ(0x8A9136AAU, kzcat::crc32c(std::vector<std::byte>(32, std::byte{0})));
    EXPECT_EQ(0x62A8AB43U, kzcat::crc32c(std::vector<std::byte>(32, std::byte{0xFF})));
    EXPECT_EQ(0x46DD794EU, kzcat::crc32c(rising(32)));
    EXPECT_EQ(0xE3069283U, kzcat::crc32c(bytes_of("123456789")));
}

TEST(Crc32c, IsTheSameWithEveryInstructionSet)
{
    const auto bytes = rising(300);
    const std::span all(bytes);
    for (const kzcat::Instructions one : kzcat::runnable_instructions()) {
        for (size_t begin = 0; begin < 9; ++begin) {
            for (size_t count = 0; begin + count <= all.size(); ++count) {
                const auto part = all.subspan(begin, count);
                EXPECT_EQ(kzcat::crc32c(part, 7, kzcat::Instructions::plain),
                          kzcat::crc32c(part, 7, one))
                    << name_of(one) << ' ' << begin << ' ' << count;
            }
        }
    }
}

TEST(Crc32c, OfNothingIsZero) { EXPECT_EQ(0U, kzcat::crc32c({})); }

TEST(Crc32c, GoesOnFromWhatCameBefore)
{
    const auto bytes = rising(100);
    const std::span all(bytes);
    const uint32_t whole = kzcat::crc32c(all);
    for (size_t cut = 0; cut <= bytes.size(); ++cut) {
        EXPECT_EQ(whole, kzcat::crc32c(all.subspan(cut), kzcat::crc32c(all.first(cut)))) << cut;
    }
}

} // namespace
