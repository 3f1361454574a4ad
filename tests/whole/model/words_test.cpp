// The model's few arithmetic rules against plain laws, and the library's square root against them.
#include "whole/model/words.hpp"

#include <gtest/gtest.h>

#include "kzsdk/dsp/fxp.h"
#include "kzsdk/qvfixed/qvfixed.h"
#include "support/signals.hpp"

using namespace kz::model;

namespace {

/// By how much the square root falls short of floor(sqrt(value * 2^30)).
uint64_t shortfall(uint32_t value)
{
    const uint64_t scaled = uint64_t{value} << 30;
    uint64_t exact = square_root(value);
    EXPECT_LE(exact * exact, scaled) << value;
    while ((exact + 1) * (exact + 1) <= scaled) {
        ++exact;
    }
    return exact - square_root(value);
}

} // namespace

TEST(ModelWords, SquareRootIsTheFloorUpToAQuarterOfTheRange)
{
    kz::test::Random random(1);
    for (int i = 0; i < 100000; ++i) {
        const uint32_t value = random.next() >> (2 + random.below(30));
        ASSERT_EQ(0u, shortfall(value)) << value;
    }
    for (uint32_t beyond = 0; beyond < 4; ++beyond) {
        ASSERT_EQ(0u, shortfall((1u << 30) + beyond)) << beyond;
    }
}

TEST(ModelWords, SquareRootIsAtMostOneLessAbove)
{
    EXPECT_EQ(1u, shortfall((1u << 30) + 4));
    kz::test::Random random(4);
    for (int i = 0; i < 100000; ++i) {
        ASSERT_LE(shortfall(random.next()), 1u);
    }
}

TEST(ModelWords, LibrarySquareRootAgreesOverTheWholeRange)
{
    kz::test::Random random(2);
    for (int i = 0; i < 300000; ++i) {
        const uint32_t value = random.next() >> random.below(32);
        ASSERT_EQ(square_root(value), sq_root(value)) << value;
    }
    for (const uint32_t value : {0u, 1u, 0x7fffffffu, 0x80000000u, 0x80000001u, 0xffffffffu}) {
        EXPECT_EQ(square_root(value), sq_root(value)) << value;
    }
}

TEST(ModelWords, LibraryReciprocalAndHighProductAgree)
{
    kz::test::Random random(3);
    for (int i = 0; i < 300000; ++i) {
        const uint32_t x = random.next() | 0x80000000u;
        ASSERT_EQ(reciprocal(x), KZDSP_Reciprocal(x)) << x;
        const auto a = static_cast<int32_t>(random.next());
        const int32_t b = static_cast<int32_t>(random.next()) >> random.below(32);
        ASSERT_EQ(high_product(a, b), KZDSP_SMUL_HIGH_FxpType(a, b)) << a << " * " << b;
    }
}

TEST(ModelWords, LibraryReciprocalOfAFrameCountAgrees)
{
    for (uint32_t count = 0; count < 1000; ++count) {
        int32_t shift = 0;
        EXPECT_EQ(scaled_reciprocal(count),
                  static_cast<int32_t>(KZDSP_ReciprocalWithScaling(count, &shift) >> 1))
            << count;
        EXPECT_EQ(leading_zeros(count), shift);
    }
}
