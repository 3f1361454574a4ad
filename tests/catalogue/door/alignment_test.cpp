// Trails beside each other through the C interface.

#include "music.hpp"

#include <algorithm>
#include <vector>

#include <gtest/gtest.h>

namespace {

using namespace kz::test;

std::vector<int16_t> part_of(const std::vector<int16_t>& sound, double begin, double seconds)
{
    const auto first = sound.begin() + static_cast<std::ptrdiff_t>(begin * kRate);
    return {first, first + static_cast<std::ptrdiff_t>(seconds * kRate)};
}

uint64_t code_count(const Trail& trail)
{
    kzcat_trail_facts facts;
    EXPECT_EQ(KZCAT_OK, kzcat_trail_get_facts(trail.get(), &facts));
    return facts.code_count;
}

TEST(DoorAlignment, PlacesAnExcerptInItsRecording)
{
    const std::vector<int16_t> sound = piece(1, 40);
    const Trail whole = trail_of(sound);
    const Trail excerpt = trail_of(part_of(sound, 11.37, 20));
    kzcat_alignment found;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_align(whole.get(), excerpt.get(), &found));
    EXPECT_EQ(1u, found.found);
    EXPECT_NEAR(11.37, found.offset, 0.1);
    EXPECT_NEAR(20, found.agreeing, 1);
    EXPECT_NEAR(40, found.first_sounding, 1);
    EXPECT_NEAR(20, found.second_sounding, 1);
    EXPECT_LT(found.error_rate, 0.36);
    EXPECT_EQ(0, found.begin);
    EXPECT_NEAR(20, found.end, 1);
}

TEST(DoorAlignment, OfDifferentPiecesHasOnlyTheirLengths)
{
    const Trail one = trail_of(piece(2, 20));
    const Trail other = trail_of(piece(3, 25));
    kzcat_alignment found;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_align(one.get(), other.get(), &found));
    EXPECT_LT(found.agreeing, 8);
    EXPECT_NEAR(20, found.first_sounding, 1);
    EXPECT_NEAR(25, found.second_sounding, 1);
}

TEST(DoorAlignment, ReportsTheErrorsOfEachCode)
{
    const Trail trail = trail_of(piece(4, 15));
    uint64_t count = 0;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_get_bit_errors(trail.get(), trail.get(), nullptr, 0, &count));
    ASSERT_EQ(code_count(trail), count);
    std::vector<uint8_t> errors(count, 7);
    EXPECT_EQ(KZCAT_ERROR_ROOM, kzcat_trail_get_bit_errors(trail.get(), trail.get(), errors.data(),
                                                           count - 1, &count));
    ASSERT_EQ(KZCAT_OK, kzcat_trail_get_bit_errors(trail.get(), trail.get(), errors.data(),
                                                   errors.size(), &count));
    EXPECT_EQ(static_cast<ptrdiff_t>(count), std::ranges::count(errors, 0));
}

TEST(DoorAlignment, CodesThatLieOnNothingHaveNoErrors)
{
    const std::vector<int16_t> sound = piece(4, 20);
    const Trail whole = trail_of(sound);
    const Trail part = trail_of(part_of(sound, 10, 10));
    std::vector<uint8_t> errors(code_count(whole));
    uint64_t count = 0;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_get_bit_errors(part.get(), whole.get(), errors.data(),
                                                   errors.size(), &count));
    EXPECT_EQ(KZCAT_NOT_COMPARED, errors.front());
    EXPECT_NE(KZCAT_NOT_COMPARED, errors[errors.size() * 3 / 4]);
}

TEST(DoorAlignment, PartsOfTrailsAreCut)
{
    const Trail trail = trail_of(piece(5, 25));
    kzcat_trail* part = nullptr;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_cut(trail.get(), 20, 60, &part));
    const Trail owned(part);
    EXPECT_EQ(60u, code_count(owned));
    kzcat_alignment found;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_align(trail.get(), part, &found));
    EXPECT_EQ(20, found.lag);
    EXPECT_EQ(0, found.error_rate);
    ASSERT_EQ(KZCAT_OK, kzcat_trail_cut(trail.get(), 100, 100000, &part));
    EXPECT_EQ(code_count(trail) - 100, code_count(Trail(part)));
}

TEST(DoorAlignment, ArgumentsThatCannotBeUsedAreRefused)
{
    const Trail trail = trail_of(piece(4, 10));
    kzcat_alignment found;
    uint64_t count = 1;
    kzcat_trail* part = nullptr;
    const auto refused = KZCAT_ERROR_INVALID_ARGUMENT;
    EXPECT_EQ(refused, kzcat_trail_align(nullptr, trail.get(), &found));
    EXPECT_EQ(refused, kzcat_trail_align(trail.get(), nullptr, &found));
    EXPECT_EQ(refused, kzcat_trail_align(trail.get(), trail.get(), nullptr));
    EXPECT_EQ(refused, kzcat_trail_get_bit_errors(nullptr, trail.get(), nullptr, 0, &count));
    EXPECT_EQ(0u, count);
    EXPECT_EQ(refused, kzcat_trail_get_bit_errors(trail.get(), trail.get(), nullptr, 5, &count));
    EXPECT_EQ(refused, kzcat_trail_get_bit_errors(trail.get(), trail.get(), nullptr, 0, nullptr));
    EXPECT_EQ(refused, kzcat_trail_cut(nullptr, 0, 1, &part));
    EXPECT_EQ(refused, kzcat_trail_cut(trail.get(), 0, 0, &part));
    EXPECT_EQ(refused, kzcat_trail_cut(trail.get(), code_count(trail), 1, &part));
    EXPECT_EQ(refused, kzcat_trail_cut(trail.get(), 0, 1, nullptr));
}

} // namespace
