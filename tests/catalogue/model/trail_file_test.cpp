// Trails as bytes and back, and bytes that are no trail.

#include <algorithm>
#include <array>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/model/trail_file.hpp"
#include "support/signals.hpp"

namespace {

using kzcat::Trail;
using Bytes = std::vector<std::byte>;

Trail trail_of(uint64_t samples)
{
    Trail trail{kzcat::Profile::standard, samples, {}};
    kz::test::Random random(samples);
    for (uint64_t i = 0; i < kzcat::code_count(samples); ++i) {
        trail.codes.push_back(random.next64());
    }
    return trail;
}

// Why bytes are refused; empty when they are read.
std::string refusal(const Bytes& bytes)
{
    try {
        static_cast<void>(kzcat::read_trail(bytes));
    } catch (const kzcat::TrailError& error) {
        return error.what();
    }
    return "";
}

void put(Bytes& bytes, size_t at, uint64_t number, size_t size)
{
    for (size_t i = 0; i < size; ++i) {
        bytes[at + i] = static_cast<std::byte>(number >> (8 * i));
    }
}

// A file with a field of its header changed and the header's checksum made right.
std::string refusal_with(size_t at, uint64_t number, size_t size)
{
    Bytes bytes = kzcat::write_trail(trail_of(10000));
    put(bytes, at, number, size);
    put(bytes, 60, kzcat::crc32c(std::span(bytes).first(60)), 4);
    return refusal(bytes);
}

TEST(TrailFile, GivesBackWhatWasWritten)
{
    for (const uint64_t samples : {0U, 4095U, 4096U, 6143U, 6144U, 1000000U}) {
        const Trail trail = trail_of(samples);
        EXPECT_EQ(trail, kzcat::read_trail(kzcat::write_trail(trail))) << samples;
    }
}

TEST(TrailFile, HasTheBytesOnRecord)
{
    const Trail trail{kzcat::Profile::standard, 6145, {0x0123456789ABCDEF, 1}};
    constexpr std::array<uint8_t, 80> kExpected = {
        0x89, 0x4B, 0x5A, 0x54, 0x0D, 0x0A, 0x1A, 0x0A,
        0x01, 0x00, 0x00, 0x00, 0x01, 0x00, 0x00, 0x00, //
        0x01, 0x18, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00,
        0x02, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, //
        0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00,
        0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, //
        0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00,
        0xA6, 0xBC, 0xA2, 0xE3, 0x6E, 0x9B, 0xF3, 0xB6, //
        0xEF, 0xCD, 0xAB, 0x89, 0x67, 0x45, 0x23, 0x01,
        0x01, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, //
    };
    const Bytes bytes = kzcat::write_trail(trail);
    ASSERT_EQ(kExpected.size(), bytes.size());
    for (size_t i = 0; i < bytes.size(); ++i) {
        EXPECT_EQ(kExpected[i], std::to_integer<uint8_t>(bytes[i])) << i;
    }
}

TEST(TrailFile, IsRefusedWhenAnyBitIsFlipped)
{
    const Bytes whole = kzcat::write_trail(trail_of(20000));
    for (size_t bit = 0; bit < 8 * whole.size(); ++bit) {
        Bytes bytes = whole;
        bytes[bit / 8] ^= static_cast<std::byte>(1U << (bit % 8));
        EXPECT_NE("", refusal(bytes)) << bit;
    }
}

TEST(TrailFile, IsRefusedWhenItEndsEarlyOrLate)
{
    const Bytes whole = kzcat::write_trail(trail_of(20000));
    for (size_t size = 0; size < whole.size(); ++size) {
        EXPECT_NE("", refusal({whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(size)}))
            << size;
    }
    Bytes longer = whole;
    longer.resize(whole.size() + 8);
    EXPECT_NE("", refusal(longer));
}

TEST(TrailFile, IsRefusedWithASentence)
{
    EXPECT_EQ("This is no trail file.", refusal({}));
    EXPECT_EQ("This is no trail file.", refusal(Bytes(100)));
    const Bytes whole = kzcat::write_trail(trail_of(10000));
    EXPECT_EQ("The trail file ends after 20 bytes, inside its header; make it again.",
              refusal({whole.begin(), whole.begin() + 20}));
    EXPECT_EQ("The trail file has 16 bytes of codes instead of 8 times 3; make it again.",
              refusal({whole.begin(), whole.begin() + 80}));
    Bytes damaged = whole;
    damaged[13] ^= std::byte{1};
    EXPECT_EQ("The header of the trail file is damaged; make the file again.", refusal(damaged));
    damaged = whole;
    damaged[8] ^= std::byte{2};
    EXPECT_EQ("The header of the trail file is damaged; make the file again.", refusal(damaged));
    Bytes longer = whole;
    longer.resize(whole.size() + 3);
    EXPECT_EQ("The trail file has 27 bytes of codes instead of 8 times 3; make it again.",
              refusal(longer));
    damaged = whole;
    damaged[64] ^= std::byte{1};
    EXPECT_EQ("The codes of the trail file are damaged; make the file again.", refusal(damaged));
    EXPECT_EQ("The trail file is of version 2, which takes a newer program; this one reads "
              "version 1.",
              refusal_with(8, 2, 4));
    EXPECT_EQ("The trail file is of version 0, which does not exist.", refusal_with(8, 0, 4));
    EXPECT_EQ("The codes of the trail file are of profile 7, which this program does not have; "
              "make the trail again with this one.",
              refusal_with(12, 7, 4));
    EXPECT_EQ("Reserved bytes of the trail file are not zero.", refusal_with(55, 1, 1));
    EXPECT_EQ("The trail file has 3 codes, but its 18446744073709551615 samples have "
              "9007199254740990.",
              refusal_with(16, UINT64_MAX, 8));
}

// The number of codes is believed only when the bytes are there.
TEST(TrailFile, AllocatesNoMoreThanItsBytes)
{
    Bytes bytes = kzcat::write_trail(trail_of(10000));
    put(bytes, 16, UINT64_MAX, 8);
    put(bytes, 24, kzcat::code_count(UINT64_MAX), 8);
    put(bytes, 60, kzcat::crc32c(std::span(bytes).first(60)), 4);
    EXPECT_EQ("The trail file has 24 bytes of codes instead of 8 times 9007199254740990; make it "
              "again.",
              refusal(bytes));
}

TEST(TrailFile, IsNotWrittenOfPartOfATrail)
{
    Trail trail = trail_of(10000);
    trail.codes.pop_back();
    EXPECT_THROW(kzcat::write_trail(trail), kzcat::TrailError);
}

} // namespace
