#include <algorithm>
#include <iterator>
#include <vector>

#include "support/allocation.hpp"
#include "support/qvfixed_objects.hpp"

namespace kz::test {

namespace {

class Config : public MemoryOn {};

// floor(f * 65536 / 11025) of the band edges in hertz.
constexpr int32_t kTable[] = {0,    593,  593,  1188,  1188,  1782,  1782,  2377,  2377,  3031,
                              3031, 3744, 3744, 4576,  4576,  5468,  5468,  6419,  6419,  7548,
                              7548, 8797, 8797, 10223, 10223, 11888, 11888, 13790, 13790, 16049};

} // namespace

TEST_F(Config, HoldsTheDefaults)
{
    const auto config = make_config();
    ASSERT_TRUE(config);
    EXPECT_EQ(1, config->detect_signal);
    EXPECT_EQ(128U, config->detector_window);
    EXPECT_EQ(100U, config->detector_threshold);
    EXPECT_EQ(1000U, config->detector_max_deviation);
    EXPECT_EQ(256U, config->histogram_levels);
    EXPECT_EQ(45158400U, config->sample_rate);
    EXPECT_EQ(15U, config->frame_length_log2);
    EXPECT_EQ(11264U, config->frame_hop);
    EXPECT_EQ(12U, config->frame_limit);
    EXPECT_EQ(0U, config->skip_frames);
    EXPECT_EQ(32768U, config->fingerprint_scale);
    ASSERT_EQ(30U, config->freq_table_count);
    EXPECT_TRUE(std::equal(std::begin(kTable), std::end(kTable), config->freq_table));
}

TEST_F(Config, BandEdgesAreTruncatedBins)
{
    const double hertz[] = {0,   99.8, 200,    299.8, 400,    510,  630,  769.9,
                            920, 1080, 1269.8, 1480,  1719.8, 2000, 2320, 2700};
    const auto config = make_config();
    for (size_t band = 0; band < 15; ++band) {
        EXPECT_EQ(static_cast<int32_t>(hertz[band] * 65536 / 11025), config->freq_table[2 * band]);
        EXPECT_EQ(static_cast<int32_t>(hertz[band + 1] * 65536 / 11025),
                  config->freq_table[2 * band + 1]);
    }
}

TEST_F(Config, CreateRefusesANullResultAndAllocatesNothing)
{
    const uint64_t before = allocation_count();
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, kzqvfixed_config_create(nullptr));
    EXPECT_EQ(before, allocation_count());
}

TEST_F(Config, CreateReportsEveryFailedAllocation)
{
    for_every_failed_allocation([](auto fired) {
        kzqvfixed_config* made = nullptr;
        const kz_status status = kzqvfixed_config_create(&made);
        const Qvfixed<kzqvfixed_config> config(made);
        EXPECT_EQ(fired() ? KZ_QV_ERROR_MEMORY : KZ_OK, status);
        EXPECT_EQ(fired(), made == nullptr);
    });
}

TEST_F(Config, CopyBelongsToTheCaller)
{
    const auto config = make_config();
    int32_t* table = nullptr;
    uint32_t count = 0;
    EXPECT_EQ(KZ_OK, kzqvfixed_config_copy_freq_table(config.get(), &table, &count));
    ASSERT_EQ(30U, count);
    EXPECT_NE(config->freq_table, table);
    EXPECT_TRUE(std::equal(table, table + count, config->freq_table));
    _kzmem_free(table);
}

TEST_F(Config, ANullTableLeavesNone)
{
    const auto config = make_config();
    EXPECT_EQ(KZ_OK, kzqvfixed_config_set_freq_table(config.get(), nullptr, 30));
    EXPECT_EQ(nullptr, config->freq_table);
    EXPECT_EQ(0U, config->freq_table_count);
    int32_t untouched = 0;
    int32_t* table = &untouched;
    uint32_t count = 77;
    EXPECT_EQ(KZ_OK, kzqvfixed_config_copy_freq_table(config.get(), &table, &count));
    EXPECT_EQ(&untouched, table);
    EXPECT_EQ(77U, count);
    // Destroying it frees only the record: the fixture counts.
}

TEST_F(Config, AnOddCountIsAcceptedAndItsLastEntryIgnored)
{
    const auto config = make_config();
    const int32_t table[] = {1, 5, 6, 9, 10};
    EXPECT_EQ(KZ_OK, kzqvfixed_config_set_freq_table(config.get(), table, 5));
    EXPECT_EQ(5U, config->freq_table_count);
    const Qvfixed<kzqvfixed_frame_manager> manager(kzqvfixed_frame_manager_create(config.get()));
    ASSERT_TRUE(manager);
    EXPECT_EQ(2U, manager->band_count);
    EXPECT_EQ(8U, kzqvfixed_frame_manager_get_fingerprint_size(manager.get()));
}

TEST_F(Config, SettingItsOwnTableIsHarmless)
{
    const auto config = make_config();
    kzqvfixed_config_set_freq_table(config.get(), config->freq_table + 2, 28);
    ASSERT_EQ(28U, config->freq_table_count);
    EXPECT_TRUE(std::equal(std::begin(kTable) + 2, std::end(kTable), config->freq_table));
}

TEST_F(Config, AFailedCopyLeavesNoTable)
{
    const auto config = make_config();
    {
        const AllocationFault fault(1);
        const int32_t table[] = {1, 2};
        EXPECT_EQ(KZ_OK, kzqvfixed_config_set_freq_table(config.get(), table, 2));
    }
    EXPECT_EQ(nullptr, config->freq_table);
    EXPECT_EQ(0U, config->freq_table_count);
    EXPECT_EQ(nullptr, kzqvfixed_frame_manager_create(config.get()));
}

TEST_F(Config, NullsAreIgnored)
{
    int32_t* table = nullptr;
    uint32_t count = 0;
    const auto config = make_config();
    EXPECT_EQ(KZ_OK, kzqvfixed_config_destroy(nullptr));
    EXPECT_EQ(KZ_OK, kzqvfixed_config_copy_freq_table(nullptr, &table, &count));
    EXPECT_EQ(KZ_OK, kzqvfixed_config_copy_freq_table(config.get(), nullptr, &count));
    EXPECT_EQ(KZ_OK, kzqvfixed_config_copy_freq_table(config.get(), &table, nullptr));
    EXPECT_EQ(KZ_OK, kzqvfixed_config_set_freq_table(nullptr, kTable, 30));
    EXPECT_EQ(nullptr, table);
    EXPECT_EQ(0U, count);
}

} // namespace kz::test
