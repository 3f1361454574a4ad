// Every variant of the inner loops against the plain one.

#include <bit>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/match/scan_kernels.hpp"
#include "support/signals.hpp"

namespace {

using namespace kzcat;
using kz::test::Random;

class ScanVariants : public testing::TestWithParam<Instructions> {
protected:
    static const ScanKernels& variant() { return scan_kernels(GetParam()); }
    static const ScanKernels& plain() { return scan_kernels(Instructions::plain); }
};

std::vector<Code> random_codes(size_t count, uint64_t seed)
{
    Random random(seed);
    std::vector<Code> codes(count);
    for (Code& code : codes) {
        code = random.next64();
    }
    return codes;
}

std::vector<Probe> random_probes(size_t count, size_t spread, uint64_t seed)
{
    Random random(seed);
    std::vector<Probe> probes(count);
    for (size_t i = 0; i < count; ++i) {
        probes[i] = {.code = random.next64(), .mask = random.next64(), .offset = i * spread};
    }
    return probes;
}

TEST_P(ScanVariants, AgreeOnDistancesOfAllLengths)
{
    const auto codes = random_codes(400, 1);
    for (const size_t count : {0U, 1U, 2U, 30U, 31U, 32U, 63U, 90U}) {
        const auto probes = random_probes(count, 2, count);
        for (size_t positions = 0; positions <= 140; ++positions) {
            std::vector<uint16_t> expected(positions + 1, 7);
            auto actual = expected;
            plain().distances(codes.data(), positions, probes.data(), count, expected.data());
            variant().distances(codes.data(), positions, probes.data(), count, actual.data());
            ASSERT_EQ(expected, actual) << count << " probes at " << positions << " positions";
        }
    }
}

TEST_P(ScanVariants, CountEveryBitOfTheLongestSequence)
{
    const std::vector<Code> codes(kMostProbes + 20, 0);
    std::vector<Probe> probes(kMostProbes);
    for (size_t i = 0; i < probes.size(); ++i) {
        probes[i] = {.code = ~Code{0}, .mask = ~Code{0}, .offset = i};
    }
    std::vector<uint16_t> distances(20);
    variant().distances(codes.data(), distances.size(), probes.data(), probes.size(),
                        distances.data());
    EXPECT_EQ(std::vector<uint16_t>(20, kMostProbes * kPairs), distances);
}

TEST_P(ScanVariants, FindTheSamePlacesBelowALimit)
{
    const auto codes = random_codes(700, 2);
    const auto probes = random_probes(9, 3, 3);
    for (const size_t positions : {0U, 1U, 7U, 8U, 63U, 64U, 65U, 200U, 600U}) {
        for (const uint32_t limit : {0U, 120U, 140U, 150U, 600U}) {
            std::vector<uint32_t> expected(positions + 1);
            std::vector<uint32_t> actual(positions + 1);
            expected.resize(plain().near(codes.data(), positions, probes.data(), probes.size(),
                                         limit, expected.data()));
            actual.resize(variant().near(codes.data(), positions, probes.data(), probes.size(),
                                         limit, actual.data()));
            ASSERT_EQ(expected, actual) << positions << " positions, limit " << limit;
        }
    }
}

TEST_P(ScanVariants, AgreeOnTheDistanceAtOnePlace)
{
    const auto codes = random_codes(100, 4);
    const auto query = random_codes(100, 5);
    const auto masks = random_codes(100, 6);
    for (size_t count = 0; count <= 100; ++count) {
        ASSERT_EQ(plain().distance(codes.data(), query.data(), masks.data(), count),
                  variant().distance(codes.data(), query.data(), masks.data(), count))
            << count;
    }
}

TEST(PlainScan, CountsDifferingBitsThatCount)
{
    const auto codes = random_codes(50, 7);
    const auto probes = random_probes(20, 1, 8);
    std::vector<uint16_t> distances(30);
    const ScanKernels& plain = scan_kernels(Instructions::plain);
    plain.distances(codes.data(), distances.size(), probes.data(), probes.size(), distances.data());
    for (size_t p = 0; p < distances.size(); ++p) {
        int expected = 0;
        for (const Probe& probe : probes) {
            expected += std::popcount((codes[p + probe.offset] ^ probe.code) & probe.mask);
        }
        EXPECT_EQ(expected, distances[p]);
    }
}

INSTANTIATE_TEST_SUITE_P(All, ScanVariants, testing::ValuesIn(runnable_instructions()),
                         [](const auto& one) { return std::string(name_of(one.param)); });

} // namespace
