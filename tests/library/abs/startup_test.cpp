#include "kzsdk/abs/startup.h"

#include <cstddef>
#include <cstring>
#include <thread>
#include <vector>

#include "kzsdk/abs/memory.h"
#include "kzsdk/abs/memory_state.hpp"
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

// The check comes after the memory manager: a caller that is refused still has to shut down.
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

// ---- Counted start-up

TEST_F(Startup, LastsFromTheFirstHolderToTheLast)
{
    EXPECT_EQ(KZ_OK, kzinit_acquire());
    EXPECT_EQ(KZ_OK, kzinit_acquire());
    EXPECT_TRUE(is_on());
    EXPECT_EQ(KZ_OK, kzinit_release());
    EXPECT_TRUE(is_on()) << "another holder is left";
    EXPECT_EQ(KZ_OK, kzinit_release());
    EXPECT_FALSE(is_on());
}

TEST_F(Startup, ReleaseWithoutAHolderChangesNothing)
{
    EXPECT_EQ(KZ_INIT_ERROR_NOT_HELD, kzinit_release());
    EXPECT_FALSE(is_on());
    ASSERT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    EXPECT_EQ(KZ_INIT_ERROR_NOT_HELD, kzinit_release());
    EXPECT_TRUE(is_on());
}

TEST_F(Startup, PlainStartOutlastsCountedReleases)
{
    ASSERT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    ASSERT_EQ(KZ_OK, kzinit_release());
    EXPECT_TRUE(is_on()) << "started before";
    ASSERT_EQ(KZ_OK, kzinit_shutdown_vesk());
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    ASSERT_EQ(KZ_OK, kzinit_initialize_vesk(&record_));
    ASSERT_EQ(KZ_OK, kzinit_release());
    EXPECT_TRUE(is_on()) << "started while held";
}

// A plain shut-down does not count holders: it switches the library off for all of them.
TEST_F(Startup, PlainShutdownEndsItForHoldersToo)
{
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    ASSERT_EQ(KZ_OK, kzinit_shutdown_vesk());
    EXPECT_FALSE(is_on());
    EXPECT_EQ(nullptr, _kzmem_malloc(1));
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    EXPECT_TRUE(is_on()) << "a new holder starts it again";
    EXPECT_EQ(KZ_OK, kzinit_release());
    EXPECT_TRUE(is_on()) << "the first holder is still counted";
    EXPECT_EQ(KZ_OK, kzinit_release());
    EXPECT_FALSE(is_on());
}

TEST_F(Startup, PlainShutdownLeavesReleasesDue)
{
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    ASSERT_EQ(KZ_OK, kzinit_shutdown_vesk());
    EXPECT_EQ(KZ_OK, kzinit_release());
    EXPECT_FALSE(is_on());
    EXPECT_EQ(KZ_INIT_ERROR_NOT_HELD, kzinit_release());
}

// Each holder finds the library on however the others come and go.
TEST_F(Startup, HoldersOnThreadsDoNotEndEachOther)
{
    std::vector<std::thread> threads;
    std::vector<int> failed(4, 0);
    for (int& count : failed) {
        threads.emplace_back([&count] {
            for (int round = 0; round < 20000; ++round) {
                count += kzinit_acquire() != KZ_OK;
                void* const block = _kzmem_malloc(8);
                count += block == nullptr || _kzmem_free(block) != KZ_OK;
                count += kzinit_release() != KZ_OK;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(std::vector<int>(4, 0), failed);
    EXPECT_FALSE(is_on());
}

TEST(MemoryState, HolderCountNeitherWrapsNorSpills)
{
    using kz::MemoryState;
    constexpr MemoryState kFull((MemoryState::kMaxHolders << 2) | 1);
    static_assert(kFull.holders() == MemoryState::kMaxHolders);
    static_assert(kFull.released().acquired().word() == kFull.word());
    static_assert(kFull.shut_down().holders() == kFull.holders());
    static_assert(!kFull.shut_down().is_on());
    static_assert(!MemoryState().acquired().released().is_on());
    static_assert(MemoryState().acquired().started().released().is_on());
    EXPECT_EQ(MemoryState::kMaxHolders, kFull.started().holders());
}

TEST_F(Startup, FailedAllocationsAreCounted)
{
    const uint32_t before = kz::failed_allocations();
    EXPECT_EQ(nullptr, _kzmem_malloc(1));
    EXPECT_EQ(nullptr, _kzmem_realloc(nullptr, 1));
    EXPECT_EQ(nullptr, _kzmem_calloc(1, 1));
    EXPECT_EQ(before + 3, kz::failed_allocations()) << "while it is off";
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    {
        const kz::test::AllocationFault fault(1);
        EXPECT_EQ(nullptr, _kzmem_malloc(1));
    }
    static_cast<void>(_kzmem_free(_kzmem_malloc(0)));
    EXPECT_EQ(before + 4, kz::failed_allocations());
    EXPECT_EQ(KZ_OK, kzinit_release());
}

TEST_F(Startup, FailedAllocationsCountByThread)
{
    const uint32_t before = kz::failed_allocations();
    std::thread([] {
        EXPECT_EQ(nullptr, _kzmem_malloc(1));
        EXPECT_EQ(1U, kz::failed_allocations());
    }).join();
    EXPECT_EQ(before, kz::failed_allocations());
}

TEST_F(Startup, OwnersMayFreeWhileItIsOff)
{
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    void* const block = _kzmem_malloc(1);
    ASSERT_EQ(KZ_OK, kzinit_release());
    EXPECT_EQ(KZ_MEM_NOT_ON, _kzmem_free(block));
    {
        const kz::FreesWhileOff frees;
        EXPECT_FALSE(is_on());
        EXPECT_EQ(nullptr, _kzmem_malloc(1)) << "it allocates nothing";
        std::thread([] { EXPECT_EQ(KZ_MEM_NOT_ON, _kzmem_free(nullptr)); }).join();
        EXPECT_EQ(KZ_OK, _kzmem_free(block));
    }
    EXPECT_EQ(KZ_MEM_NOT_ON, _kzmem_free(nullptr));
}

} // namespace
