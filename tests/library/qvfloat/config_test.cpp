#include <iterator>
#include <type_traits>

#include "support/allocation.hpp"
#include "support/twins.hpp"

namespace kz::test {

namespace {

class FloatConfig : public MemoryOn {};

constexpr double kHertz[] = {0,   99.8, 200,    299.8, 400,    510,  630,  769.9,
                             920, 1080, 1269.8, 1480,  1719.8, 2000, 2320, 2700};

} // namespace

TEST_F(FloatConfig, HoldsTheRateInHertzAndAWholeWordForTheSearch)
{
    const auto config = make_config<Float>();
    ASSERT_TRUE(config);
    static_assert(std::is_same_v<uint32_t, decltype(config->detect_signal)>);
    static_assert(std::is_same_v<float, decltype(config->sample_rate)>);
    EXPECT_EQ(1U, config->detect_signal);
    EXPECT_EQ(11025.0F, config->sample_rate);
}

TEST_F(FloatConfig, BandEdgesAreTheNearestSinglesInHertz)
{
    const auto config = make_config<Float>();
    ASSERT_EQ(2 * (std::size(kHertz) - 1), config->freq_table_count);
    for (size_t band = 0; band < 15; ++band) {
        EXPECT_EQ(static_cast<float>(kHertz[band]), config->freq_table[2 * band]);
        EXPECT_EQ(static_cast<float>(kHertz[band + 1]), config->freq_table[2 * band + 1]);
    }
}

// Both twins sum over the same bins, although one has a table of them and the other divides.
TEST_F(FloatConfig, EdgesFallIntoTheBinsOfTheFixedTwin)
{
    const auto config = make_config<Float>();
    const auto fixed = make_config<Fixed>();
    const auto manager = make_manager<Float>();
    EXPECT_EQ(11025.0F / 65536.0F, manager->bin_width);
    for (uint32_t i = 0; i < config->freq_table_count; ++i) {
        EXPECT_EQ(fixed->freq_table[i],
                  static_cast<int32_t>(config->freq_table[i] / manager->bin_width));
    }
}

} // namespace kz::test
