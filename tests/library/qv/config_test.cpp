/// The rules of the configuration, for both twins.

#include <algorithm>
#include <vector>

#include "support/twins.hpp"

namespace kz::test {

template <class T>
class Config : public TwinTest<T> {
};
TYPED_TEST_SUITE(Config, Twins, TwinNames);

TYPED_TEST(Config, HoldsTheDefaults)
{
    const auto config = make_config<TypeParam>();
    ASSERT_TRUE(config);
    EXPECT_EQ(1U, config->detect_signal);
    EXPECT_EQ(128U, config->detector_window);
    EXPECT_EQ(100U, config->detector_threshold);
    EXPECT_EQ(1000U, config->detector_max_deviation);
    EXPECT_EQ(256U, config->histogram_levels);
    EXPECT_EQ(15U, config->frame_length_log2);
    EXPECT_EQ(11264U, config->frame_hop);
    EXPECT_EQ(30U, config->freq_table_count);
    EXPECT_NE(nullptr, config->freq_table);
    EXPECT_EQ(12U, config->frame_limit);
    EXPECT_EQ(0U, config->skip_frames);
    EXPECT_EQ(32768U, config->fingerprint_scale);
}

TYPED_TEST(Config, CreateRefusesANullResultAndAllocatesNothing)
{
    const uint64_t before = allocation_count();
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT, TypeParam::create_config(nullptr));
    EXPECT_EQ(before, allocation_count());
}

TYPED_TEST(Config, CreateReportsEveryFailedAllocation)
{
    for_every_failed_allocation([](auto fired) {
        typename TypeParam::Config* made = nullptr;
        const kz_status status = TypeParam::create_config(&made);
        const OwnedConfig<TypeParam> config(made);
        EXPECT_EQ(fired() ? KZ_QV_ERROR_MEMORY : KZ_OK, status);
        EXPECT_EQ(fired(), made == nullptr);
    });
}

TYPED_TEST(Config, CopyBelongsToTheCaller)
{
    const auto config = make_config<TypeParam>();
    typename TypeParam::Edge* table = nullptr;
    uint32_t count = 0;
    EXPECT_EQ(KZ_OK, TypeParam::copy_freq_table(config.get(), &table, &count));
    ASSERT_EQ(30U, count);
    EXPECT_NE(config->freq_table, table);
    EXPECT_TRUE(std::equal(table, table + count, config->freq_table));
    _kzmem_free(table);
}

TYPED_TEST(Config, ANullTableLeavesNone)
{
    const auto config = make_config<TypeParam>();
    EXPECT_EQ(KZ_OK, TypeParam::set_freq_table(config.get(), nullptr, 30));
    EXPECT_EQ(nullptr, config->freq_table);
    EXPECT_EQ(0U, config->freq_table_count);
    typename TypeParam::Edge untouched = 0;
    auto* table = &untouched;
    uint32_t count = 77;
    EXPECT_EQ(KZ_OK, TypeParam::copy_freq_table(config.get(), &table, &count));
    EXPECT_EQ(&untouched, table);
    EXPECT_EQ(77U, count);
    // Destroying it frees only the record: the fixture counts.
}

TYPED_TEST(Config, AnOddCountIsAcceptedAndItsLastEntryIgnored)
{
    const auto config = make_config<TypeParam>();
    const typename TypeParam::Edge table[] = {1, 5, 6, 9, 10};
    EXPECT_EQ(KZ_OK, TypeParam::set_freq_table(config.get(), table, 5));
    EXPECT_EQ(5U, config->freq_table_count);
    const OwnedManager<TypeParam> manager(TypeParam::create_frame_manager(config.get()));
    ASSERT_TRUE(manager);
    EXPECT_EQ(2U, manager->band_count);
    EXPECT_EQ(8U, TypeParam::get_fingerprint_size(manager.get()));
}

TYPED_TEST(Config, SettingItsOwnTableIsHarmless)
{
    const auto config = make_config<TypeParam>();
    const std::vector before(config->freq_table, config->freq_table + 30);
    TypeParam::set_freq_table(config.get(), config->freq_table + 2, 28);
    ASSERT_EQ(28U, config->freq_table_count);
    EXPECT_TRUE(std::equal(before.begin() + 2, before.end(), config->freq_table));
}

TYPED_TEST(Config, AFailedCopyLeavesNoTable)
{
    const auto config = make_config<TypeParam>();
    {
        const AllocationFault fault(1);
        const typename TypeParam::Edge table[] = {1, 2};
        EXPECT_EQ(KZ_OK, TypeParam::set_freq_table(config.get(), table, 2));
    }
    EXPECT_EQ(nullptr, config->freq_table);
    EXPECT_EQ(0U, config->freq_table_count);
    EXPECT_EQ(nullptr, TypeParam::create_frame_manager(config.get()));
}

TYPED_TEST(Config, ATableMayBeEmpty)
{
    const int64_t before = live_blocks();
    {
        const auto config = make_config<TypeParam>();
        const typename TypeParam::Edge table[] = {1, 2};
        EXPECT_EQ(KZ_OK, TypeParam::set_freq_table(config.get(), table, 0));
        EXPECT_EQ(0U, config->freq_table_count);
        const OwnedManager<TypeParam> manager(TypeParam::create_frame_manager(config.get()));
        EXPECT_TRUE(manager) << "of frames without bands";
    }
    EXPECT_EQ(before, live_blocks());
}

TYPED_TEST(Config, NullsAreIgnored)
{
    typename TypeParam::Edge* table = nullptr;
    uint32_t count = 0;
    const auto config = make_config<TypeParam>();
    EXPECT_EQ(KZ_OK, TypeParam::destroy_config(nullptr));
    EXPECT_EQ(KZ_OK, TypeParam::copy_freq_table(nullptr, &table, &count));
    EXPECT_EQ(KZ_OK, TypeParam::copy_freq_table(config.get(), nullptr, &count));
    EXPECT_EQ(KZ_OK, TypeParam::copy_freq_table(config.get(), &table, nullptr));
    EXPECT_EQ(KZ_OK, TypeParam::set_freq_table(nullptr, config->freq_table, 30));
    EXPECT_EQ(nullptr, table);
    EXPECT_EQ(0U, count);
}

} // namespace kz::test
