#include <algorithm>
#include <cmath>

#include <gtest/gtest.h>

#include "kzsdk/qvfixed/qvfixed.h"
#include "support/signals.hpp"

namespace kz::test {

namespace {

// floor(sqrt(value * 2^30)), by correcting an estimate.
uint64_t exact_root(uint64_t value)
{
    const uint64_t target = value << 30;
    auto root = static_cast<uint64_t>(std::sqrt(static_cast<long double>(target)));
    while (root * root > target) {
        --root;
    }
    while ((root + 1) * (root + 1) <= target) {
        ++root;
    }
    return root;
}

} // namespace

TEST(SquareRoot, KnownValues)
{
    EXPECT_EQ(0U, sq_root(0));
    EXPECT_EQ(32768U, sq_root(1));
    EXPECT_EQ(65536U, sq_root(4));
    EXPECT_EQ(1U << 30, sq_root(1U << 30));
    EXPECT_EQ(1518500248U, sq_root(1U << 31)); // one less than the exact root
}

TEST(SquareRoot, IsExactUpToTwoToThe30)
{
    Random random(1);
    for (int i = 0; i < 1000000; ++i) {
        const uint32_t value = (random.next() >> 2) >> random.below(30);
        ASSERT_EQ(exact_root(value), sq_root(value)) << value;
    }
    for (uint32_t value = 0; value < 100000; ++value) {
        ASSERT_EQ(exact_root(value), sq_root(value)) << value;
        ASSERT_EQ(exact_root((1U << 30) - value), sq_root((1U << 30) - value)) << value;
    }
}

// Above, the remainder of the last round can pass 32 bits and wrap.
TEST(SquareRoot, IsAtMostOneLessAbove)
{
    Random random(2);
    int less = 0;
    for (int i = 0; i < 1000000; ++i) {
        const uint32_t value = std::max(random.next(), 1U << 30);
        const uint64_t exact = exact_root(value);
        const uint32_t root = sq_root(value);
        ASSERT_TRUE(root == exact || root + 1 == exact) << value;
        less += root != exact;
    }
    EXPECT_GT(less, 0);
    EXPECT_EQ(exact_root(1358603442) - 1, sq_root(1358603442));
}

} // namespace kz::test
