#include "kzsdk/abs/startup.h"

#include <cstddef>
#include <cstring>

#include "kzsdk/abs/memory.h"
#include "support/allocation.hpp"

namespace {

static_assert(offsetof(kzconf_configuration, memory_arg_text) == 0);
static_assert(offsetof(kzconf_configuration, memory_arg) == sizeof(void*));
static_assert(offsetof(kzconf_configuration, memory_args_present) == sizeof(void*) + 4);
static_assert(offsetof(kzconf_configuration, reserved) == sizeof(void*) + 8);
static_assert(sizeof(kzconf_configuration) == (sizeof(void*) == 4 ? 17 * 4 : 72));

class Startup : public ::testing::Test {
protected:
    void SetUp() override
    {
        ASSERT_EQ(KZ_MEM_NOT_ON, kzmem_query_availability());
        ASSERT_EQ(KZ_OK, kzconf_initialize_configuration(&record_));
    }
    void TearDown() override { static_cast<void>(kzmem_shutdown()); }

    static bool is_on() { return kzmem_query_availability() == KZ_MEM_ALREADY_ON; }

    kzconf_configuration record_;
};

TEST_F(Startup, TheRecordIsClearedWhole)
{
    std::memset(&record_, 0xa5, sizeof record_);
    EXPECT_EQ(KZ_OK, kzconf_initialize_configuration(&record_));
    unsigned char bytes[sizeof record_];
    std::memcpy(bytes, &record_, sizeof record_);
    for (const unsigned char byte : bytes) {
        EXPECT_EQ(0, byte);
    }
}

TEST_F(Startup, ClearingNoRecordIsRefused)
{
    EXPECT_EQ(KZ_ERROR_INVALID_ARGUMENT, kzconf_initialize_configuration(nullptr));
}

TEST_F(Startup, SwitchesMemoryOn)
{
    EXPECT_EQ(nullptr, _kzmem_malloc(16));
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    void* block = _kzmem_malloc(16);
    EXPECT_NE(nullptr, block);
    EXPECT_EQ(KZ_OK, _kzmem_free(block));
}

TEST_F(Startup, MayBeRepeated)
{
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk_safe(&record_, 1));
    EXPECT_TRUE(is_on());
}

TEST_F(Startup, WithoutARecordLeavesMemoryAsItWas)
{
    EXPECT_EQ(KZ_INIT_ERROR_NO_RECORD, kzinit_initialize_vesk(nullptr));
    EXPECT_EQ(KZ_INIT_ERROR_NO_RECORD, kzinit_initialize_vesk_safe(nullptr, 1));
    EXPECT_EQ(KZ_INIT_ERROR_NO_RECORD, kzinit_initialize_vesk_safe(nullptr, 0));
    EXPECT_FALSE(is_on());
    ASSERT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    EXPECT_EQ(KZ_INIT_ERROR_NO_RECORD, kzinit_initialize_vesk(nullptr));
    EXPECT_TRUE(is_on());
}

// The check comes after the memory manager: a caller who is refused has a shut-down to make.
TEST_F(Startup, AZeroCheckIsRefusedWithMemoryOn)
{
    EXPECT_EQ(KZ_ERROR_INVALID_ARGUMENT, kzinit_initialize_vesk_safe(&record_, 0));
    EXPECT_TRUE(is_on());
}

TEST_F(Startup, AnyOtherCheckIsAccepted)
{
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk_safe(&record_, 0xffffffffu));
    EXPECT_TRUE(is_on());
}

TEST_F(Startup, MemoryArgumentsAreAccepted)
{
    record_.memory_arg_text = "4096 bytes";
    record_.memory_arg = 0xffffffffu;
    record_.memory_args_present = 1;
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    EXPECT_TRUE(is_on());
}

TEST_F(Startup, ANullArgumentTextCountsAsZero)
{
    record_.memory_args_present = 1;
    EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    EXPECT_TRUE(is_on());
}

// Only the value 1 makes start-up read the text; here the text must not be touched.
TEST_F(Startup, ArgumentsAreReadOnlyWhenTheFlagIsOne)
{
    record_.memory_arg_text = reinterpret_cast<const char*>(uintptr_t{1});
    for (const uint8_t flag : {uint8_t{0}, uint8_t{2}, uint8_t{255}}) {
        record_.memory_args_present = flag;
        EXPECT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    }
}

TEST_F(Startup, ShutdownSwitchesMemoryOffAndMayBeRepeated)
{
    EXPECT_EQ(KZ_OK, kzinit_shutdown_vesk());
    ASSERT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    ASSERT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    EXPECT_EQ(KZ_OK, kzinit_shutdown_vesk());
    EXPECT_FALSE(is_on());
    EXPECT_EQ(KZ_OK, kzinit_shutdown_vesk());
    EXPECT_FALSE(is_on());
}

} // namespace
