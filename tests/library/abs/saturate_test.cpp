#include "kzsdk/abs/saturate.hpp"

#include <cmath>
#include <cstdint>
#include <limits>

#include <gtest/gtest.h>

#include "support/signals.hpp"

namespace kz::test {

namespace {

template <class Real>
class Saturate : public ::testing::Test {
};

using Reals = ::testing::Types<float, double>;
TYPED_TEST_SUITE(Saturate, Reals);

} // namespace

TYPED_TEST(Saturate, NotANumberGivesZero)
{
    for (const TypeParam nan : {std::numeric_limits<TypeParam>::quiet_NaN(),
                                -std::numeric_limits<TypeParam>::quiet_NaN()}) {
        EXPECT_EQ(0, to_int32(nan));
        EXPECT_EQ(0U, to_uint32(nan));
    }
}

TYPED_TEST(Saturate, InfinitiesAndHugeValuesGiveTheEndsOfTheRange)
{
    for (const TypeParam huge :
         {std::numeric_limits<TypeParam>::infinity(), std::numeric_limits<TypeParam>::max()}) {
        EXPECT_EQ(INT32_MAX, to_int32(huge));
        EXPECT_EQ(UINT32_MAX, to_uint32(huge));
        EXPECT_EQ(INT32_MIN, to_int32(-huge));
        EXPECT_EQ(0U, to_uint32(-huge));
    }
}

// The last value inside and the first outside, on either side of each end.
TYPED_TEST(Saturate, TheEndsThemselvesAreExact)
{
    using Limits = std::numeric_limits<TypeParam>;
    const auto power31 = static_cast<TypeParam>(0x1p31);
    const auto power32 = static_cast<TypeParam>(0x1p32);
    const TypeParam below31 = std::nextafter(power31, TypeParam{0});
    const TypeParam below32 = std::nextafter(power32, TypeParam{0});
    EXPECT_EQ(static_cast<int64_t>(below31), to_int32(below31));
    EXPECT_EQ(static_cast<int64_t>(below32), to_uint32(below32));
    EXPECT_EQ(INT32_MAX, to_int32(power31));
    EXPECT_EQ(UINT32_MAX, to_uint32(power32));
    EXPECT_EQ(2147483648U, to_uint32(power31));
    EXPECT_EQ(INT32_MIN, to_int32(-power31));
    EXPECT_EQ(INT32_MIN, to_int32(std::nextafter(-power31, -Limits::infinity())));
    EXPECT_EQ(-static_cast<int64_t>(below31), to_int32(-below31));
    EXPECT_EQ(0U, to_uint32(std::nextafter(TypeParam{0}, TypeParam{-1})));
    EXPECT_EQ(0U, to_uint32(TypeParam{-1}));
}

TYPED_TEST(Saturate, TruncatesTowardsZero)
{
    EXPECT_EQ(0, to_int32(TypeParam(-0.0)));
    EXPECT_EQ(0, to_int32(TypeParam(0.99)));
    EXPECT_EQ(0, to_int32(TypeParam(-0.99)));
    EXPECT_EQ(0U, to_uint32(TypeParam(-0.99)));
    EXPECT_EQ(-2, to_int32(TypeParam(-2.5)));
    EXPECT_EQ(2, to_int32(TypeParam(2.5)));
    EXPECT_EQ(2U, to_uint32(TypeParam(2.5)));
    Random random(1);
    for (int i = 0; i < 100000; ++i) {
        const auto x = static_cast<TypeParam>(random.unit() * 0x1.ffp30);
        ASSERT_EQ(static_cast<int64_t>(x), to_int32(x));
        ASSERT_EQ(x < 0 ? 0 : static_cast<int64_t>(x), to_uint32(x));
    }
}

static_assert(to_int32(-1.5F) == -1 && to_uint32(1e30) == UINT32_MAX);

} // namespace kz::test
