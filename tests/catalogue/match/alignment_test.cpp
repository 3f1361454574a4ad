// Two trails beside each other: planted agreements are found where they were planted.

#include <algorithm>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/match/alignment.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using kz::test::Random;
using Codes = std::vector<Code>;

Codes random_codes(size_t count, uint64_t seed)
{
    Random random(seed);
    Codes codes(count);
    for (Code& code : codes) {
        code = random.next64();
    }
    return codes;
}

Codes part_of(const Codes& codes, size_t begin, size_t count)
{
    const auto first = codes.begin() + static_cast<std::ptrdiff_t>(begin);
    return {first, first + static_cast<std::ptrdiff_t>(count)};
}

Codes joined(const Codes& one, const Codes& other)
{
    Codes all = one;
    all.insert(all.end(), other.begin(), other.end());
    return all;
}

// So many of the 64 bits of each code turned at random; some of them twice.
Codes with_errors(Codes codes, uint32_t wrong)
{
    Random random(17);
    for (Code& code : codes) {
        for (uint32_t i = 0; i < wrong; ++i) {
            code ^= Code{1} << random.below(64);
        }
    }
    return codes;
}

size_t agreeing_codes(const Alignment& alignment)
{
    size_t codes = 0;
    for (const AlignedBlock& block : alignment.blocks) {
        codes += block.agrees() ? block.compared : 0;
    }
    return codes;
}

TEST(Alignment, OfATrailWithItselfHasNoErrors)
{
    const Codes codes = random_codes(300, 1);
    const auto found = align(codes, codes);
    ASSERT_TRUE(found);
    EXPECT_EQ(0, found->lag);
    EXPECT_NEAR(0, found->offset, 0.01);
    EXPECT_EQ(300u, agreeing_codes(*found));
    for (const auto& errors : bit_errors(codes, codes, *found)) {
        EXPECT_EQ(std::optional<uint8_t>(0), errors);
    }
}

TEST(Alignment, FindsShortTrailsThatBeginWithSilence)
{
    Codes codes = random_codes(60, 2);
    std::fill_n(codes.begin(), 24, 0);
    const auto found = align(codes, codes);
    ASSERT_TRUE(found);
    EXPECT_EQ(0, found->lag);
}

TEST(Alignment, FindsAnExcerptWhicheverComesFirst)
{
    const Codes whole = random_codes(1000, 2);
    const Codes excerpt = with_errors(part_of(whole, 417, 107), 12);
    const auto found = align(whole, excerpt);
    ASSERT_TRUE(found);
    EXPECT_EQ(417, found->lag);
    EXPECT_EQ(107u, agreeing_codes(*found));
    const auto turned = align(excerpt, whole);
    ASSERT_TRUE(turned);
    EXPECT_EQ(-417, turned->lag);
}

TEST(Alignment, FindsWhereTheOneGoesOnBeyondTheOther)
{
    const Codes shared = random_codes(200, 3);
    const Codes first = joined(random_codes(150, 4), shared);
    const Codes second = joined(shared, random_codes(170, 5));
    const auto found = align(first, second);
    ASSERT_TRUE(found);
    EXPECT_EQ(150, found->lag);
    EXPECT_NEAR(200, static_cast<double>(agreeing_codes(*found)), kAlignedCodes);
}

TEST(Alignment, OfStrangersIsNotFound)
{
    EXPECT_FALSE(align(random_codes(900, 6), random_codes(800, 7)));
}

TEST(Alignment, OfSilenceIsNotFound)
{
    const Codes silence(400, 0);
    EXPECT_FALSE(align(silence, silence));
    EXPECT_FALSE(align(silence, random_codes(400, 8)));
    EXPECT_EQ(0u, sounding_codes(silence));
}

TEST(Alignment, OfNothingIsNotFound)
{
    EXPECT_FALSE(align({}, {}));
    EXPECT_FALSE(align(random_codes(400, 8), {}));
    EXPECT_FALSE(align(random_codes(3, 8), random_codes(3, 8)));
}

TEST(Alignment, DoesNotCompareSilence)
{
    Codes codes = random_codes(320, 9);
    std::fill(codes.begin() + 100, codes.begin() + 150, 0);
    const auto found = align(codes, codes);
    ASSERT_TRUE(found);
    EXPECT_EQ(270u, agreeing_codes(*found));
    EXPECT_FALSE(bit_errors(codes, codes, *found)[120]);
    EXPECT_EQ(270u, sounding_codes(codes));
}

TEST(Alignment, FollowsADrift)
{
    const Codes codes = random_codes(640, 10);
    Codes slower; // one code is repeated now and then
    for (size_t i = 0; i < codes.size(); ++i) {
        slower.push_back(codes[i]);
        if (i % 160 == 80) {
            slower.push_back(codes[i]);
        }
    }
    const auto found = align(codes, slower);
    ASSERT_TRUE(found);
    EXPECT_EQ(0, found->blocks.front().lag);
    EXPECT_EQ(-4, found->blocks.back().lag);
    EXPECT_GT(agreeing_codes(*found), 600u);
}

TEST(Alignment, ComparesOnlyWhatAgreesOfASharedLoop)
{
    const Codes loop = random_codes(96, 11);
    const Codes first = joined(random_codes(300, 12), joined(loop, random_codes(300, 13)));
    const Codes second = joined(random_codes(100, 14), joined(loop, random_codes(500, 15)));
    const auto found = align(first, second);
    ASSERT_TRUE(found);
    EXPECT_EQ(200, found->lag);
    EXPECT_NEAR(96, static_cast<double>(agreeing_codes(*found)), kAlignedCodes);
}

TEST(Alignment, LiesBetweenTwoCodesWhereBothAgreeAlike)
{
    const Codes codes = random_codes(400, 16);
    Codes between(codes.size());
    Random random(17);
    for (size_t i = 0; i < codes.size(); ++i) { // half of the bits are the next code's
        const Code mask = random.next64();
        const Code next = codes[std::min(i + 1, codes.size() - 1)];
        between[i] = (codes[i] & mask) | (next & ~mask);
    }
    const auto found = align(codes, between);
    ASSERT_TRUE(found);
    EXPECT_NEAR(0.5, found->offset, 0.1);
}

} // namespace
