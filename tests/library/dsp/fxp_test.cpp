#include "kzsdk/dsp/fxp.h"

#include <bit>
#include <cstdint>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/kernels/fxp_ops.hpp"
#include "support/signals.hpp"
#include "support/wide.hpp"

namespace {

using kz::test::Random;
using kz::test::Wide;

constexpr int32_t kLeast = std::numeric_limits<int32_t>::min();
constexpr int32_t kMax = std::numeric_limits<int32_t>::max();

constexpr uint32_t kEdgeWords[] = {
    0x00000000, 0x00000001, 0x00000002, 0x00000003, 0x00007fff, 0x00008000, 0x00008001, 0x0000fffe,
    0x0000ffff, 0x00010000, 0x00010001, 0x0002d413, 0x00ffffff, 0x3fffffff, 0x40000000, 0x40000001,
    0x55555555, 0x58b90bfb, 0x7fff0000, 0x7fff7fff, 0x7fff8000, 0x7fffffff, 0x80000000, 0x80000001,
    0x80007fff, 0x80008000, 0x8000ffff, 0xaaaaaaaa, 0xbfffffff, 0xc0000000, 0xc0000001, 0xfffeffff,
    0xffff0000, 0xffff0001, 0xffff7fff, 0xffff8000, 0xffff8001, 0xfffffffd, 0xfffffffe, 0xffffffff};

constexpr int32_t kEdgeExponents[] = {kLeast, kLeast + 1, -64, -33, -32, -31,      -30, -1,
                                      0,      1,          30,  31,  32,  kMax - 1, kMax};

int32_t as_signed(uint32_t word) { return std::bit_cast<int32_t>(word); }
uint32_t as_unsigned(int32_t word) { return std::bit_cast<uint32_t>(word); }
int32_t wrapped(int64_t value) { return as_signed(static_cast<uint32_t>(value)); }

int64_t value_of(FxpTypeLong x)
{
    return std::bit_cast<int64_t>(uint64_t{as_unsigned(x.hi)} << 32 | x.lo);
}
uint64_t value_of(FxpUTypeLong x) { return uint64_t{x.hi} << 32 | x.lo; }

/// A word of random length, positive or with leading ones, so that small magnitudes occur as well.
uint32_t any_word(Random& random)
{
    const uint32_t word = random.next() >> random.below(32);
    return random.below(4) == 0 ? 0 - word : word;
}

/// Calls `visit` with all pairs of edge words and then with random pairs, until something fails.
template <class Visit>
void for_pairs(uint64_t seed, Visit visit)
{
    for (const uint32_t a : kEdgeWords) {
        for (const uint32_t b : kEdgeWords) {
            visit(a, b);
        }
    }
    Random random(seed);
    for (int i = 0; i < 2'000'000 && !::testing::Test::HasFailure(); ++i) {
        const uint32_t a = any_word(random);
        visit(a, any_word(random));
    }
}

TEST(FxpProducts, AreExact)
{
    for_pairs(1, [](uint32_t a, uint32_t b) {
        const int32_t sa = as_signed(a);
        const int32_t sb = as_signed(b);
        EXPECT_EQ(int64_t{sa} * sb, value_of(KZDSP_SMUL_FxpTypeLong(sa, sb))) << sa << " * " << sb;
        EXPECT_EQ(uint64_t{a} * b, value_of(KZDSP_UMUL_FxpUTypeLong(a, b))) << a << " * " << b;
    });
}

TEST(FxpProducts, HighWordOfUnsignedIsTheFloor)
{
    for_pairs(2, [](uint32_t a, uint32_t b) {
        EXPECT_EQ((uint64_t{a} * b) >> 32, KZDSP_UMUL_HIGH_FxpUType(a, b)) << a << " * " << b;
    });
}

TEST(FxpProducts, HighWordOfSignedTruncatesTowardsZero)
{
    EXPECT_EQ(0, KZDSP_SMUL_HIGH_FxpType(-1, 1)) << "the floor would be -1";
    EXPECT_EQ(0x40000000, KZDSP_SMUL_HIGH_FxpType(kLeast, kLeast));
    for_pairs(3, [](uint32_t a, uint32_t b) {
        const int64_t product = int64_t{as_signed(a)} * as_signed(b);
        EXPECT_EQ(product / (int64_t{1} << 32), KZDSP_SMUL_HIGH_FxpType(as_signed(a), as_signed(b)))
            << as_signed(a) << " * " << as_signed(b);
    });
}

TEST(FxpProducts, Upper64Of96BitsAreTruncated)
{
    Random random(4);
    for_pairs(5, [&random](uint32_t hi, uint32_t b) {
        for (const uint32_t lo : {any_word(random), 0u, ~0u}) {
            const Wide product = static_cast<Wide>(uint64_t{hi} << 32 | lo) * b;
            EXPECT_EQ(static_cast<uint64_t>(product >> 32),
                      value_of(KZDSP_UMUL_FxpUTypeLong2(hi, lo, b)))
                << hi << ' ' << lo << ' ' << b;
        }
    });
}

TEST(FxpProducts, WordTimesHalfwordIsTheFloorOf48Bits)
{
    for_pairs(6, [](uint32_t a, uint32_t b) {
        const int32_t sa = as_signed(a);
        const int32_t sb = as_signed(b);
        const auto low = static_cast<int16_t>(b & 0xffff);
        const auto high = static_cast<int16_t>(b >> 16);
        EXPECT_EQ((int64_t{sa} * low) >> 16, KZDSP_SmulWLo_SW_SL(sa, sb)) << sa << ' ' << sb;
        EXPECT_EQ((int64_t{sa} * high) >> 16, KZDSP_SmulWHi_SW_SL(sa, sb)) << sa << ' ' << sb;
    });
}

TEST(FxpProducts, AccumulatedHalfwordProductsWrap)
{
    EXPECT_EQ(kLeast, KZDSP_SmulAddWLo_SW_SL(0x10000, 1, kMax));
    EXPECT_EQ(kLeast, KZDSP_SmulAddWHi_SW_SL(0x10000, 0x10000, kMax));
    Random random(7);
    for_pairs(8, [&random](uint32_t a, uint32_t b) {
        const int32_t sa = as_signed(a);
        const int32_t sb = as_signed(b);
        const int32_t acc = as_signed(random.next());
        EXPECT_EQ(wrapped(int64_t{KZDSP_SmulWLo_SW_SL(sa, sb)} + acc),
                  KZDSP_SmulAddWLo_SW_SL(sa, sb, acc));
        EXPECT_EQ(wrapped(int64_t{KZDSP_SmulWHi_SW_SL(sa, sb)} + acc),
                  KZDSP_SmulAddWHi_SW_SL(sa, sb, acc));
    });
}

TEST(FxpSums, OfWordsWrap)
{
    EXPECT_EQ(kLeast, KZDSP_ADD_FxpType(kMax, 1));
    EXPECT_EQ(kMax, KZDSP_SUB_FxpType(kLeast, 1));
    for_pairs(9, [](uint32_t a, uint32_t b) {
        const int64_t sa = as_signed(a);
        const int64_t sb = as_signed(b);
        EXPECT_EQ(wrapped(sa + sb), KZDSP_ADD_FxpType(as_signed(a), as_signed(b)));
        EXPECT_EQ(wrapped(sa - sb), KZDSP_SUB_FxpType(as_signed(a), as_signed(b)));
    });
}

TEST(FxpSums, OfDoubleWordsCarryAndWrap)
{
    Random random(10);
    for_pairs(11, [&random](uint32_t lo1, uint32_t lo2) {
        const uint32_t hi1 = any_word(random);
        const uint32_t hi2 = any_word(random);
        const uint64_t sum = (uint64_t{hi1} << 32 | lo1) + (uint64_t{hi2} << 32 | lo2);
        EXPECT_EQ(sum, value_of(KZDSP_ADD_FxpUTypeLong(hi1, lo1, hi2, lo2)));
        EXPECT_EQ(std::bit_cast<int64_t>(sum),
                  value_of(KZDSP_ADD_FxpTypeLong(as_signed(hi1), lo1, as_signed(hi2), lo2)));
    });
}

// ---- Shifts ---------------------------------------------------------------------------------

int32_t modulo_256(int64_t count) { return static_cast<int32_t>(count & 0xff); }

/// Up to 32 a double word is shifted as a whole; beyond, nothing crosses the middle.
int64_t model_right(int64_t x, int64_t count)
{
    const int32_t n = modulo_256(count);
    const int64_t fill = x < 0 ? -1 : 0;
    return n <= 32 ? x >> n : std::bit_cast<int64_t>(static_cast<uint64_t>(fill) << 32);
}

uint64_t model_right(uint64_t x, int64_t count)
{
    const int32_t n = modulo_256(count);
    return n <= 32 ? x >> n : 0;
}

uint64_t model_left(uint64_t x, int64_t count)
{
    const int32_t n = modulo_256(count);
    return n <= 32 ? x << n : 0;
}

std::vector<int32_t> shift_counts()
{
    std::vector<int32_t> counts{kLeast, kLeast + 1, kLeast + 7, kLeast + 32, kMax - 1, kMax};
    for (int32_t count = -600; count <= 600; ++count) {
        counts.push_back(count);
    }
    return counts;
}

TEST(FxpShifts, ACountOf0ChangesNothing)
{
    EXPECT_EQ(-5, value_of(KZDSP_RSHFT_FxpTypeLong(-1, 0xfffffffb, 0)));
    EXPECT_EQ(-5, value_of(KZDSP_LSHFT_FxpTypeLong(-1, 0xfffffffb, 0)));
    EXPECT_EQ(-5, value_of(KZDSP_SHFT_FxpTypeLong(-1, 0xfffffffb, 0)));
}

TEST(FxpShifts, ACountOf32MovesOneWordIntoTheOther)
{
    EXPECT_EQ(-2, value_of(KZDSP_RSHFT_FxpTypeLong(-2, 7, 32)));
    EXPECT_EQ(9u, value_of(KZDSP_RSHFT_FxpUTypeLong(9, 7, 32)));
    EXPECT_EQ(uint64_t{7} << 32, value_of(KZDSP_LSHFT_FxpUTypeLong(9, 7, 32)));
    EXPECT_EQ(int64_t{7} << 32, value_of(KZDSP_LSHFT_FxpTypeLong(-2, 7, 32)));
}

TEST(FxpShifts, CountsBeyond32MoveNothingOverTheMiddle)
{
    const FxpTypeLong shifted = KZDSP_RSHFT_FxpTypeLong(-1, 0, 40);
    EXPECT_EQ(-1, shifted.hi);
    EXPECT_EQ(0u, shifted.lo);
    for (int32_t count = 33; count < 64; ++count) {
        EXPECT_EQ(0u, value_of(KZDSP_RSHFT_FxpUTypeLong(~0u, ~0u, count))) << count;
        EXPECT_EQ(0u, value_of(KZDSP_LSHFT_FxpUTypeLong(~0u, ~0u, count))) << count;
    }
}

TEST(FxpShifts, OfDoubleWordsFollowTheRuleForEveryCount)
{
    const std::vector<int32_t> counts = shift_counts();
    Random random(12);
    for (const uint32_t hi : kEdgeWords) {
        const uint32_t lo = any_word(random) | 0x80000001;
        const uint64_t x = uint64_t{hi} << 32 | lo;
        const auto sx = std::bit_cast<int64_t>(x);
        const int32_t shi = as_signed(hi);
        for (const int32_t n : counts) {
            const int64_t back = -int64_t{n};
            ASSERT_EQ(model_right(x, n), value_of(KZDSP_RSHFT_FxpUTypeLong(hi, lo, n))) << n;
            ASSERT_EQ(model_left(x, n), value_of(KZDSP_LSHFT_FxpUTypeLong(hi, lo, n))) << n;
            ASSERT_EQ(n < 0 ? model_right(x, back) : model_left(x, n),
                      value_of(KZDSP_SHFT_FxpUTypeLong(hi, lo, n)))
                << n;
            const auto left = std::bit_cast<int64_t>(model_left(x, n));
            ASSERT_EQ(model_right(sx, n), value_of(KZDSP_RSHFT_FxpTypeLong(shi, lo, n))) << n;
            ASSERT_EQ(left, value_of(KZDSP_LSHFT_FxpTypeLong(shi, lo, n))) << n;
            ASSERT_EQ(n < 0 ? model_right(sx, back) : left,
                      value_of(KZDSP_SHFT_FxpTypeLong(shi, lo, n)))
                << n;
        }
    }
}

TEST(FxpShifts, OfWordsGive0OrTheSignFillFrom32On)
{
    for (const uint32_t word : kEdgeWords) {
        const int32_t sword = as_signed(word);
        for (const int32_t count : shift_counts()) {
            const int32_t n = modulo_256(count);
            const uint32_t left = n < 32 ? word << n : 0;
            ASSERT_EQ(as_signed(left), KZDSP_MUL_POW2_FxpType(sword, count)) << count;
            ASSERT_EQ(left, kz::fxp::shift_left(word, count)) << count;
            ASSERT_EQ(as_signed(left), kz::fxp::shift_left(sword, count)) << count;
            ASSERT_EQ(n < 32 ? word >> n : 0, kz::fxp::shift_right(word, count)) << count;
            ASSERT_EQ(n < 32 ? sword >> n : (sword < 0 ? -1 : 0),
                      kz::fxp::shift_right(sword, count))
                << count;
        }
    }
}

// ---- Magnitudes and bits --------------------------------------------------------------------

TEST(FxpMagnitude, SaturatesOnlyWhereItSaysSo)
{
    EXPECT_EQ(kMax, KZDSP_SaturateAbsFxpType(kLeast));
    EXPECT_EQ(kLeast, kz_abs(kLeast));
    for_pairs(13, [](uint32_t a, uint32_t) {
        const int64_t size = std::abs(int64_t{as_signed(a)});
        EXPECT_EQ(std::min(size, int64_t{kMax}), KZDSP_SaturateAbsFxpType(as_signed(a)));
        EXPECT_EQ(wrapped(size), kz_abs(as_signed(a)));
        EXPECT_EQ(size, kz::fxp::magnitude(as_signed(a)));
    });
}

TEST(FxpBits, LeadingZerosAreThoseAboveTheTopBit)
{
    EXPECT_EQ(32, KZDSP_CountLeadingZeros(0));
    for_pairs(14, [](uint32_t x, uint32_t) {
        int32_t zeros = 32;
        for (uint32_t rest = x; rest != 0; rest /= 2) {
            --zeros;
        }
        EXPECT_EQ(zeros, KZDSP_CountLeadingZeros(x)) << x;
    });
}

TEST(FxpBits, NextPowerOfTwoIs0AboveItsRange)
{
    EXPECT_EQ(0u, KZDSP_clp2(0));
    EXPECT_EQ(1u, KZDSP_clp2(1));
    EXPECT_EQ(1024u, KZDSP_clp2(1000));
    EXPECT_EQ(0u, KZDSP_clp2(0x80000001));
    for_pairs(15, [](uint32_t x, uint32_t) {
        uint64_t power = x == 0 ? 0 : 1;
        while (power < x) {
            power *= 2;
        }
        EXPECT_EQ(static_cast<uint32_t>(power), KZDSP_clp2(x)) << x;
    });
}

// ---- Pairs of mantissa and exponent ---------------------------------------------------------

struct ModelPair {
    uint32_t mantissa;
    int32_t exponent;
};

/// One shift at a time, as the rule states it.
ModelPair model_normalised(uint32_t m, int32_t e)
{
    while (m != 0 && (m >> 31) == (m >> 30 & 1)) {
        m <<= 1;
        e = wrapped(int64_t{e} - 1);
    }
    return {m, e};
}

struct ModelAligned {
    int32_t first;
    int32_t second;
    int32_t exponent;
};

ModelAligned model_aligned(ModelPair a, ModelPair b)
{
    a = model_normalised(a.mantissa, a.exponent);
    b = model_normalised(b.mantissa, b.exponent);
    int64_t first = as_signed(a.mantissa);
    int64_t second = as_signed(b.mantissa);
    const int64_t apart = wrapped(int64_t{a.exponent} - b.exponent);
    if (apart < 0) {
        first = apart > -31 ? first >> -apart : 0;
    } else {
        second = apart < 31 ? second >> apart : 0;
    }
    return {wrapped(first), wrapped(second), apart < 0 ? b.exponent : a.exponent};
}

/// Words with exponents near each other, with edge exponents and with any at all.
template <class Visit>
void for_pairs_with_exponents(uint64_t seed, Visit visit)
{
    Random random(seed);
    for (const int32_t e1 : kEdgeExponents) {
        for (const int32_t e2 : kEdgeExponents) {
            for (const uint32_t m1 : kEdgeWords) {
                visit(m1, e1, any_word(random), e2);
                visit(any_word(random), e1, m1, e2);
            }
        }
    }
    for_pairs(seed, [&](uint32_t m1, uint32_t m2) {
        if (random.below(16) == 0) {
            visit(m1, as_signed(random.next()), m2, as_signed(random.next()));
        } else {
            visit(m1, static_cast<int32_t>(random.below(91)) - 45, m2,
                  static_cast<int32_t>(random.below(91)) - 45);
        }
    });
}

TEST(FxpPairs, NormaliseUntilTheTopBitsDiffer)
{
    Random random(16);
    for_pairs(17, [&random](uint32_t m, uint32_t) {
        const int32_t e = as_signed(any_word(random));
        const ModelPair model = model_normalised(m, e);
        const kz::fxp::Pair pair = kz::fxp::normalised({as_signed(m), e});
        EXPECT_EQ(as_signed(model.mantissa), pair.mantissa) << m;
        EXPECT_EQ(model.exponent, pair.exponent) << m << ' ' << e;
    });
}

TEST(FxpComparison, FollowsItsStepsForAnyExponents)
{
    for_pairs_with_exponents(18, [](uint32_t m1, int32_t e1, uint32_t m2, int32_t e2) {
        const int32_t s1 = as_signed(m1);
        const int32_t s2 = as_signed(m2);
        const bool signs_differ = (s1 < 0) != (s2 < 0);
        const ModelAligned model = model_aligned({m1, e1}, {m2, e2});
        EXPECT_EQ(signs_differ ? s1 < s2 : model.first < model.second,
                  KZDSP_LESS_FxpType(s1, e1, s2, e2))
            << s1 << ' ' << e1 << ' ' << s2 << ' ' << e2;
        EXPECT_EQ(signs_differ ? s1 <= s2 : model.first <= model.second,
                  KZDSP_LESSEQ_FxpType(s1, e1, s2, e2))
            << s1 << ' ' << e1 << ' ' << s2 << ' ' << e2;
    });
}

TEST(FxpComparison, IsExactUnlessAZeroIsInvolved)
{
    const auto exact = [](int64_t m, int32_t e) {
        return static_cast<Wide>(m) * (Wide{1} << (e + 45));
    };
    for_pairs_with_exponents(19, [exact](uint32_t m1, int32_t e1, uint32_t m2, int32_t e2) {
        if (m1 == 0 || m2 == 0 || std::abs(int64_t{e1}) > 45 || std::abs(int64_t{e2}) > 45) {
            return;
        }
        const Wide a = exact(as_signed(m1), e1);
        const Wide b = exact(as_signed(m2), e2);
        EXPECT_EQ(a < b, KZDSP_LESS_FxpType(as_signed(m1), e1, as_signed(m2), e2));
        EXPECT_EQ(a <= b, KZDSP_LESSEQ_FxpType(as_signed(m1), e1, as_signed(m2), e2));
        EXPECT_EQ(exact(m1, e1) < exact(m2, e2), KZDSP_LESS_FxpUType(m1, e1, m2, e2));
    });
}

TEST(FxpComparison, OfOppositeSignsIgnoresTheExponents)
{
    EXPECT_EQ(1, KZDSP_LESS_FxpType(-1, 100, 1, -100));
    EXPECT_EQ(0, KZDSP_LESS_FxpType(1, -100, -1, 100));
    EXPECT_EQ(1, KZDSP_LESSEQ_FxpType(-1, kMax, 0, kLeast));
}

TEST(FxpComparison, ASmallValueIsNotAboveAZeroWithALargeExponent)
{
    // 2^30 with exponent -30 is the 1 below, normalised; 30 octaves leave its last bit, 31 nothing.
    EXPECT_EQ(1, KZDSP_LESS_FxpType(0, 0, 1, 0));
    EXPECT_EQ(0, KZDSP_LESS_FxpType(0, 1, 1, 0));
    EXPECT_EQ(1, KZDSP_LESSEQ_FxpType(1, 0, 0, 1));
    EXPECT_EQ(1, KZDSP_LESS_FxpUType(0, 0, 1, 0));
    EXPECT_EQ(0, KZDSP_LESS_FxpUType(0, 1, 1, 0));
}

TEST(FxpComparison, OfUnsignedPairsAlignsUpTo31Octaves)
{
    for_pairs_with_exponents(20, [](uint32_t m1, int32_t e1, uint32_t m2, int32_t e2) {
        const auto normalised = [](uint32_t m, int32_t e) {
            while (m != 0 && m >> 31 == 0) {
                m <<= 1;
                e = wrapped(int64_t{e} - 1);
            }
            return ModelPair{m, e};
        };
        const ModelPair a = normalised(m1, e1);
        const ModelPair b = normalised(m2, e2);
        const int64_t apart = wrapped(int64_t{a.exponent} - b.exponent);
        const uint64_t first = apart >= 0 ? a.mantissa : apart > -32 ? a.mantissa >> -apart : 0;
        const uint64_t second = apart < 0 ? b.mantissa : apart < 32 ? b.mantissa >> apart : 0;
        EXPECT_EQ(first < second, KZDSP_LESS_FxpUType(m1, e1, m2, e2))
            << m1 << ' ' << e1 << ' ' << m2 << ' ' << e2;
    });
}

TEST(FxpAlignedDifference, FollowsItsStepsForAnyExponents)
{
    for_pairs_with_exponents(21, [](uint32_t m1, int32_t e1, uint32_t m2, int32_t e2) {
        const ModelAligned model = model_aligned({m1, e1}, {m2, e2});
        int32_t exponent = 12345;
        EXPECT_EQ(wrapped(int64_t{model.first} - model.second),
                  KZDSP_ALIGNED_SUB_FxpType(as_signed(m1), e1, as_signed(m2), e2, &exponent));
        EXPECT_EQ(model.exponent, exponent);
    });
}

TEST(FxpAlignedDifference, ANegativeValue31OctavesBelowCountsAsZero)
{
    int32_t exponent = 0;
    EXPECT_EQ(0x50000000 + 2, KZDSP_ALIGNED_SUB_FxpType(0x50000000, 0, kLeast, -30, &exponent));
    EXPECT_EQ(0x50000000, KZDSP_ALIGNED_SUB_FxpType(0x50000000, 0, kLeast, -31, &exponent))
        << "the sign fill would add 1";
    EXPECT_EQ(0, exponent);
}

TEST(FxpAlignedDifference, OfLargeValuesOfOppositeSignWraps)
{
    int32_t exponent = 0;
    EXPECT_EQ(-1, KZDSP_ALIGNED_SUB_FxpType(kMax, 5, kLeast, 5, &exponent));
    EXPECT_EQ(5, exponent);
}

// ---- Reciprocal and ratio -------------------------------------------------------------------

uint32_t model_reciprocal(uint32_t x)
{
    const uint64_t segment = x >> 25 & 63;
    uint64_t y = (uint64_t{1} << 39) / (2 * segment + 129);
    for (int step = 0; step < 3; ++step) {
        const uint64_t xy = (uint64_t{x} * y) >> 32;
        const uint64_t two_minus_xy = ((uint64_t{1} << 32) - xy) & 0xffffffff;
        y = 2 * ((two_minus_xy * y) >> 32) & 0xffffffff;
    }
    return static_cast<uint32_t>(y);
}

TEST(FxpReciprocal, GivesTheStatedWords)
{
    EXPECT_EQ(0xfffffffe, KZDSP_Reciprocal(0x80000000));
    EXPECT_EQ(0xaaaaaaaa, KZDSP_Reciprocal(0xc0000000));
    EXPECT_EQ(0x80000000, KZDSP_Reciprocal(0xffffffff));
}

TEST(FxpReciprocal, FollowsNewtonStepForStep)
{
    for_pairs(22, [](uint32_t a, uint32_t b) {
        EXPECT_EQ(model_reciprocal(a | 0x80000000), KZDSP_Reciprocal(a | 0x80000000)) << a;
        EXPECT_EQ(model_reciprocal(b), KZDSP_Reciprocal(b)) << b << ", normalised or not";
    });
}

TEST(FxpReciprocal, LiesWithin2UnitsOfTheTruthOnEitherSide)
{
    uint64_t above = 0;
    for_pairs(23, [&above](uint32_t a, uint32_t b) {
        const uint32_t x = (a ^ b << 16) | 0x80000000;
        const Wide error = static_cast<Wide>(KZDSP_Reciprocal(x)) * x - (Wide{1} << 63);
        EXPECT_TRUE(-2 * Wide{x} <= error && error < 2 * Wide{x}) << x;
        above += error > 0;
    });
    EXPECT_GT(above, 0u) << "truncation alone does not keep it below";
}

TEST(FxpReciprocal, WithScalingTakesAnyWord)
{
    int32_t shift = -1;
    EXPECT_EQ(0u, KZDSP_ReciprocalWithScaling(0, &shift));
    EXPECT_EQ(32, shift);
    EXPECT_EQ(0xaaaaaaaa, KZDSP_ReciprocalWithScaling(12, &shift));
    EXPECT_EQ(28, shift);
    for_pairs(24, [](uint32_t x, uint32_t) {
        int32_t zeros = -1;
        const uint32_t r = KZDSP_ReciprocalWithScaling(x, &zeros);
        EXPECT_EQ(KZDSP_CountLeadingZeros(x), zeros);
        EXPECT_EQ(x == 0 ? 0 : KZDSP_Reciprocal(x << zeros), r);
    });
}

struct Ratio {
    uint32_t mantissa;
    int32_t exponent;
    bool operator==(const Ratio&) const = default;
};

Ratio ratio(uint32_t a, uint32_t b)
{
    int32_t exponent = 0;
    const uint32_t mantissa = KZDSP_UIntRatio_FxpUType(a, b, &exponent);
    return {mantissa, exponent};
}

TEST(FxpRatio, GivesTheStatedPairs)
{
    EXPECT_EQ((Ratio{0xbffffffe, 0}), ratio(3, 4));
    EXPECT_EQ((Ratio{0x55555555, 0}), ratio(1, 3));
    EXPECT_EQ((Ratio{0x7fffffff, -1}), ratio(11025, 44100));
}

TEST(FxpRatio, WithAZeroIsZero)
{
    EXPECT_EQ(0u, ratio(0, 7).mantissa);
    EXPECT_EQ(0u, ratio(7, 0).mantissa);
    EXPECT_EQ(0u, ratio(0, 0).mantissa);
}

TEST(FxpRatio, LiesWithin3UnitsOfTheTruth)
{
    for_pairs(25, [](uint32_t a, uint32_t b) {
        if (a == 0 || b == 0) {
            return;
        }
        const Ratio r = ratio(a, b);
        const Wide error = static_cast<Wide>(r.mantissa) * b - (Wide{a} << (32 - r.exponent));
        EXPECT_LT(error < 0 ? -error : error, 3 * Wide{b}) << a << " / " << b;
    });
}

// ---- Inline forms ---------------------------------------------------------------------------

TEST(FxpInlineForms, GiveTheWordsOfTheExportedOperations)
{
    for_pairs(26, [](uint32_t a, uint32_t b) {
        const int32_t sa = as_signed(a);
        const int32_t sb = as_signed(b);
        EXPECT_EQ(KZDSP_ADD_FxpType(sa, sb), kz::fxp::wrap_add(sa, sb));
        EXPECT_EQ(KZDSP_SUB_FxpType(sa, sb), kz::fxp::wrap_sub(sa, sb));
        EXPECT_EQ(KZDSP_SUB_FxpType(0, sa), kz::fxp::wrap_negate(sa));
        EXPECT_EQ(wrapped(value_of(KZDSP_SMUL_FxpTypeLong(sa, sb))), kz::fxp::wrap_mul(sa, sb));
        EXPECT_EQ(value_of(KZDSP_SMUL_FxpTypeLong(sa, sb)), kz::fxp::smul(sa, sb));
        EXPECT_EQ(as_signed(KZDSP_SMUL_FxpTypeLong(sa, sb).lo),
                  kz::fxp::low_word(kz::fxp::smul(sa, sb)));
        EXPECT_EQ(KZDSP_UMUL_HIGH_FxpUType(a, b), kz::fxp::umul_high(a, b));
        EXPECT_EQ(KZDSP_SMUL_HIGH_FxpType(sa, sb), kz::fxp::smul_high(sa, sb));
        EXPECT_EQ(kz_abs(sa), as_signed(kz::fxp::magnitude(sa)));
        EXPECT_EQ(KZDSP_SaturateAbsFxpType(sa), kz::fxp::saturate_abs(sa));
        EXPECT_EQ(KZDSP_CountLeadingZeros(a), kz::fxp::leading_zeros(a));
        EXPECT_EQ(KZDSP_clp2(a), kz::fxp::next_power_of_two(a));
    });
}

} // namespace
