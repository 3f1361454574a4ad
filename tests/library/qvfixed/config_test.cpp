#include <algorithm>
#include <iterator>

#include "support/allocation.hpp"
#include "support/fixed_twin.hpp"

namespace kz::test {

namespace {

class FixedConfig : public MemoryOn {};

// floor(f * 65536 / 11025) of the band edges in hertz.
constexpr int32_t kTable[] = {0,    593,  593,  1188,  1188,  1782,  1782,  2377,  2377,  3031,
                              3031, 3744, 3744, 4576,  4576,  5468,  5468,  6419,  6419,  7548,
                              7548, 8797, 8797, 10223, 10223, 11888, 11888, 13790, 13790, 16049};

} // namespace

TEST_F(FixedConfig, HoldsTheRateInQ12AndTheBandsAsBins)
{
    const auto config = make_config<Fixed>();
    ASSERT_TRUE(config);
    EXPECT_EQ(45158400U, config->sample_rate);
    ASSERT_EQ(30U, config->freq_table_count);
    EXPECT_TRUE(std::equal(std::begin(kTable), std::end(kTable), config->freq_table));
}

TEST_F(FixedConfig, BandEdgesAreTruncatedBins)
{
    const double hertz[] = {0,   99.8, 200,    299.8, 400,    510,  630,  769.9,
                            920, 1080, 1269.8, 1480,  1719.8, 2000, 2320, 2700};
    const auto config = make_config<Fixed>();
    for (size_t band = 0; band < 15; ++band) {
        EXPECT_EQ(static_cast<int32_t>(hertz[band] * 65536 / 11025), config->freq_table[2 * band]);
        EXPECT_EQ(static_cast<int32_t>(hertz[band + 1] * 65536 / 11025),
                  config->freq_table[2 * band + 1]);
    }
}

} // namespace kz::test
