#include <algorithm>
#include <cmath>
#include <memory>
#include <numbers>
#include <vector>

#include "kzsdk/dsp/dct.h"
#include "kzsdk/kernels/butterfly.hpp"
#include "support/allocation.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

struct Destroy {
    void operator()(KZDSP_DCT* dct) const { KZDSP_DestroyDCT(dct); }
};
using Dct = std::unique_ptr<KZDSP_DCT, Destroy>;

using Floats = std::vector<float>;

Floats transform(int32_t order, Floats data, int32_t normalise = 0)
{
    const Dct dct(KZDSP_CreateDCT(order));
    KZDSP_ComputeDCT(dct.get(), data.data(), normalise);
    return data;
}

Floats random_input(int32_t order, uint64_t seed)
{
    Random random(seed);
    Floats x(size_t{1} << order);
    std::generate(x.begin(), x.end(), [&] { return static_cast<float>(random.unit()); });
    return x;
}

// The transform by its definition. All its cosines are those of whole multiples of pi / 2L.
class NaiveDct {
public:
    explicit NaiveDct(size_t length) : cosines_(4 * length)
    {
        for (size_t i = 0; i < cosines_.size(); ++i) {
            cosines_[i] = std::cos(std::numbers::pi_v<long double> * static_cast<long double>(i) /
                                   (2.0L * static_cast<long double>(length)));
        }
    }

    long double cosine(size_t n, size_t k) const
    {
        return cosines_[(2 * n + 1) * k % cosines_.size()];
    }

    long double bin(const Floats& x, size_t k) const
    {
        long double sum = 0;
        for (size_t n = 0; n < x.size(); ++n) {
            sum += static_cast<long double>(x[n]) * cosine(n, k);
        }
        return k == 0 ? sum / std::numbers::sqrt2_v<long double> : sum;
    }

    // Sample n of the signal that has these coefficients.
    long double sample(const Floats& bins, size_t n) const
    {
        long double sum = static_cast<long double>(bins[0]) / std::numbers::sqrt2_v<long double>;
        for (size_t k = 1; k < bins.size(); ++k) {
            sum += static_cast<long double>(bins[k]) * cosine(n, k);
        }
        return 2 * sum / static_cast<long double>(bins.size());
    }

private:
    std::vector<long double> cosines_;
};

long double energy(const Floats& x)
{
    long double sum = 0;
    for (const float value : x) {
        sum += static_cast<long double>(value) * value;
    }
    return sum;
}

class DctFloat : public MemoryOn {};

} // namespace

TEST_F(DctFloat, ExistsForEveryOrderFromOneOn)
{
    for (int32_t order = 1; order <= 18; ++order) {
        const Dct dct(KZDSP_CreateDCT(order));
        ASSERT_TRUE(dct) << order;
        EXPECT_EQ(order, dct->order);
        EXPECT_EQ(1U << order, dct->length);
        EXPECT_EQ(order <= 15 ? 0U : 1U, dct->owns_coefficients);
    }
}

TEST_F(DctFloat, BadOrdersAndHugeTablesAreRefusedUntried)
{
    const uint64_t before = allocation_count();
    for (const int32_t order : {INT32_MIN, -32, -1, 0, 30, 31, 32, 33, 64, INT32_MAX}) {
        EXPECT_EQ(nullptr, KZDSP_CreateDCT(order)) << order;
    }
    EXPECT_EQ(before, allocation_count());
}

// The largest tables are tried; whether they can be had depends on the machine.
TEST_F(DctFloat, TheLargestOrderAsksForItsTable)
{
    const uint64_t before = allocation_count();
    const AllocationFault fault(2);
    EXPECT_EQ(nullptr, KZDSP_CreateDCT(29));
    EXPECT_TRUE(fault.fired());
    EXPECT_EQ(before + 2, allocation_count());
}

TEST_F(DctFloat, FactorsFollowTheirFormula)
{
    const Dct dct(KZDSP_CreateDCT(15));
    ASSERT_TRUE(dct);
    EXPECT_EQ(0.0F, dct->coefficients[0]);
    for (uint32_t h = 1; h < dct->length; h *= 2) {
        for (uint32_t j = 0; j < h; ++j) {
            const long double angle = (4.0L * j + 1) * std::numbers::pi_v<long double> / (4.0L * h);
            const auto exact = static_cast<double>(1 / (2 * std::cos(angle)));
            // Pi is taken with 15 digits, which shows where the cosine is small.
            ASSERT_NEAR(exact, dct->coefficients[h + j],
                        std::abs(exact) * (0x1p-24 + std::abs(exact) * 2e-14))
                << h << ' ' << j;
        }
    }
}

TEST_F(DctFloat, AgreesWithTheDefinitionInEveryBin)
{
    for (int32_t order = 1; order <= 12; ++order) {
        const Floats input = random_input(order, static_cast<uint64_t>(order));
        const Floats x = transform(order, input);
        const NaiveDct naive(x.size());
        const auto root = static_cast<double>(std::sqrt(energy(input)));
        for (size_t k = 0; k < x.size(); ++k) {
            // The butterflies with the largest factors, up to about L, feed the lowest bins; later
            // additions restore the value and keep the rounding.
            const double bound = 1e-6 * root * std::sqrt(static_cast<double>(x.size()));
            ASSERT_NEAR(static_cast<double>(naive.bin(input, k)), x[k], bound)
                << "bin " << k << " of order " << order;
        }
    }
}

TEST_F(DctFloat, AgreesWithTheDefinitionInBinsOfAWholeFrame)
{
    const Floats input = random_input(15, 15);
    const Floats x = transform(15, input);
    const NaiveDct naive(x.size());
    std::vector<size_t> bins = {0, 1, 2, 3, 592, 593, 594, 1024, 16383, 16384, 32766, 32767};
    Random random(1);
    for (int i = 0; i < 100; ++i) {
        bins.push_back(random.below(32768));
    }
    const auto root = static_cast<double>(std::sqrt(energy(input)));
    for (const size_t k : bins) {
        EXPECT_NEAR(static_cast<double>(naive.bin(input, k)), x[k], 1e-4 * root) << k;
    }
}

TEST_F(DctFloat, KeepsTheEnergyOfTheSignal)
{
    for (const int32_t order : {1, 2, 7, 12, 15}) {
        const Floats input = random_input(order, 7);
        const long double before = energy(input) * static_cast<long double>(input.size()) / 2;
        EXPECT_NEAR(1.0, static_cast<double>(energy(transform(order, input)) / before), 1e-5)
            << order;
    }
}

TEST_F(DctFloat, ComesBackByTheInverse)
{
    const Floats input = random_input(15, 9);
    const Floats x = transform(15, input);
    const NaiveDct naive(x.size());
    for (size_t n = 0; n < x.size(); n += 331) {
        EXPECT_NEAR(input[n], static_cast<double>(naive.sample(x, n)), 2e-4) << n;
    }
}

TEST_F(DctFloat, ConstantInputLeavesOnlyTheDcTerm)
{
    for (int32_t order = 1; order <= 15; ++order) {
        const auto length = size_t{1} << order;
        const Floats x = transform(order, Floats(length, 3.0F));
        EXPECT_EQ(3.0F * static_cast<float>(length) * 0.70710678F, x[0]) << order;
        for (size_t k = 1; k < length; ++k) {
            ASSERT_EQ(0.0F, x[k]) << "bin " << k << " of order " << order;
        }
    }
}

// 2 / L is a power of two: nothing is rounded.
TEST_F(DctFloat, NormalisingScalesEveryBinByTwoOverTheLength)
{
    for (const int32_t order : {1, 5, 15}) {
        const Floats input = random_input(order, 3);
        const Floats plain = transform(order, input);
        for (const int32_t normalise : {1, -1, 256}) {
            const Floats normalised = transform(order, input, normalise);
            for (size_t k = 0; k < plain.size(); ++k) {
                ASSERT_EQ(std::ldexp(plain[k], 1 - order), normalised[k]) << k;
            }
        }
    }
}

// Products and sums of small whole numbers are exact, so two points can be worked out by hand.
TEST_F(DctFloat, TwoPointsByHand)
{
    const Floats x = transform(1, {5, 3});
    EXPECT_EQ(8.0F * 0.70710678F, x[0]);
    EXPECT_EQ(2.0F * kz::kernels::butterfly_factor(1, 0), x[1]);
}

TEST_F(DctFloat, TonesStandInTheirBin)
{
    constexpr size_t kLength = 32768;
    for (const size_t bin : {1U, 100U, 594U, 8192U, 32000U}) {
        Floats tone(kLength);
        for (size_t n = 0; n < kLength; ++n) {
            tone[n] = static_cast<float>(
                std::cos(std::numbers::pi * static_cast<double>((2 * n + 1) * bin % (4 * kLength)) /
                         (2.0 * kLength)));
        }
        const Floats x = transform(15, tone);
        EXPECT_NEAR(kLength / 2.0, x[bin], 1.0) << bin;
        for (size_t k = 0; k < kLength; ++k) {
            if (k != bin) {
                ASSERT_NEAR(0, x[k], 1.0) << bin << ' ' << k;
            }
        }
    }
}

TEST_F(DctFloat, InfinitiesAndNansAreOnlyNumbers)
{
    Floats input = random_input(10, 4);
    input[17] = std::numeric_limits<float>::infinity();
    input[400] = std::numeric_limits<float>::quiet_NaN();
    const Floats x = transform(10, input);
    EXPECT_TRUE(std::isnan(x[0]));
}

TEST_F(DctFloat, NullsDoNothing)
{
    KZDSP_DestroyDCT(nullptr);
    const Dct dct(KZDSP_CreateDCT(4));
    Floats data(16, 3);
    KZDSP_ComputeDCT(dct.get(), nullptr, 0);
    KZDSP_ComputeDCT(nullptr, data.data(), 0);
    EXPECT_EQ(Floats(16, 3), data);
}

// The table is freed with the transform only when it exists and the transform owns it.
TEST_F(DctFloat, DestroyFreesATableThatItOwns)
{
    const int64_t before = live_blocks();
    auto* dct = KZDSP_CreateDCT(14);
    dct->coefficients = static_cast<const float*>(_kzmem_malloc(16));
    dct->owns_coefficients = 1;
    KZDSP_DestroyDCT(dct);
    EXPECT_EQ(before, live_blocks());

    dct = KZDSP_CreateDCT(14);
    dct->coefficients = nullptr;
    dct->owns_coefficients = 1;
    KZDSP_DestroyDCT(dct);
    EXPECT_EQ(before, live_blocks());

    dct = KZDSP_CreateDCT(14);
    void* const table = _kzmem_malloc(16);
    dct->coefficients = static_cast<const float*>(table);
    dct->owns_coefficients = 0;
    KZDSP_DestroyDCT(dct);
    EXPECT_EQ(before + 1, live_blocks());
    _kzmem_free(table);
}

TEST_F(DctFloat, FailedAllocationsMakeNoTransform)
{
    for_every_failed_allocation([](auto fired) {
        const Dct dct(KZDSP_CreateDCT(9));
        EXPECT_EQ(fired(), dct == nullptr);
    });
}

TEST_F(DctFloat, ComputingAllocatesNothing)
{
    const Dct dct(KZDSP_CreateDCT(10));
    Floats data = random_input(10, 5);
    const uint64_t before = allocation_count();
    KZDSP_ComputeDCT(dct.get(), data.data(), 1);
    EXPECT_EQ(before, allocation_count());
}

} // namespace kz::test
