#include "kzsdk/abs/memory.h"

#include <array>
#include <limits>
#include <numeric>

#include "kzsdk/abs/owned.hpp"
#include "support/allocation.hpp"

using namespace kz::test;

namespace {

class MemoryOff : public ::testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(KZ_MEM_NOT_ON, kzmem_query_availability()); }
    void TearDown() override { static_cast<void>(kzmem_shutdown()); }
};

class Memory : public MemoryOn {};

TEST_F(MemoryOff, NothingIsAllocated)
{
    const uint64_t before = allocation_count();
    EXPECT_EQ(nullptr, _kzmem_malloc(16));
    EXPECT_EQ(nullptr, _kzmem_calloc(4, 4));
    EXPECT_EQ(nullptr, _kzmem_realloc(nullptr, 16));
    EXPECT_EQ(before, allocation_count());
}

TEST_F(MemoryOff, FreeRefusesEvenNull) { EXPECT_EQ(KZ_MEM_NOT_ON, _kzmem_free(nullptr)); }

TEST_F(MemoryOff, TheSwitchReportsWhatItFound)
{
    EXPECT_EQ(KZ_MEM_NOT_ON, kzmem_shutdown());
    EXPECT_EQ(KZ_MEM_NOT_ON, kzmem_query_availability());
    EXPECT_EQ(0u, kzmem_initialize(7, -7));
    EXPECT_EQ(KZ_MEM_ALREADY_ON, kzmem_query_availability());
    EXPECT_EQ(KZ_MEM_ALREADY_ON, kzmem_initialize(0, 0));
    EXPECT_EQ(0u, kzmem_shutdown());
    EXPECT_EQ(KZ_MEM_NOT_ON, kzmem_query_availability());
}

// One user's shut-down affects every user: the blocks wait until memory is on again.
TEST_F(MemoryOff, OneShutdownEndsAnyNumberOfStarts)
{
    ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
    EXPECT_EQ(KZ_MEM_ALREADY_ON, kzmem_initialize(0, 0));
    const int64_t before = live_blocks();
    auto* block = static_cast<uint8_t*>(_kzmem_malloc(16));
    ASSERT_NE(nullptr, block);
    block[15] = 42;

    EXPECT_EQ(KZ_OK, kzmem_shutdown());
    EXPECT_EQ(KZ_MEM_NOT_ON, _kzmem_free(block));
    EXPECT_EQ(nullptr, _kzmem_realloc(block, 32));
    EXPECT_EQ(before + 1, live_blocks());
    EXPECT_EQ(42, block[15]);

    ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
    EXPECT_EQ(KZ_OK, _kzmem_free(block));
    EXPECT_EQ(before, live_blocks());
}

TEST_F(MemoryOff, BytesCanBeMovedAndComparedWithoutTheManager)
{
    std::array<uint8_t, 8> bytes{};
    EXPECT_EQ(bytes.data(), kzmem_memset(bytes.data(), 0x1ff, 4));
    EXPECT_EQ((std::array<uint8_t, 8>{0xff, 0xff, 0xff, 0xff}), bytes);
    std::iota(bytes.begin(), bytes.end(), uint8_t{1});
    EXPECT_EQ(bytes.data() + 1, kzmem_memmove(bytes.data() + 1, bytes.data(), 7));
    EXPECT_EQ((std::array<uint8_t, 8>{1, 1, 2, 3, 4, 5, 6, 7}), bytes);
    std::array<uint8_t, 8> copy{};
    EXPECT_EQ(copy.data(), kzmem_memcpy(copy.data(), bytes.data(), 8));
    EXPECT_EQ(bytes, copy);
    EXPECT_EQ(0, kzmem_memcmp(bytes.data(), copy.data(), 8));
}

TEST_F(MemoryOff, NoBytesAreMovedWhereverTheyAre)
{
    uint8_t byte = 7;
    EXPECT_EQ(nullptr, kzmem_memset(nullptr, 1, 0));
    EXPECT_EQ(nullptr, kzmem_memmove(nullptr, nullptr, 0));
    EXPECT_EQ(nullptr, kzmem_memcpy(nullptr, nullptr, 0));
    EXPECT_EQ(&byte, kzmem_memset(&byte, 1, 0));
    EXPECT_EQ(&byte, kzmem_memmove(&byte, nullptr, 0));
    EXPECT_EQ(&byte, kzmem_memcpy(&byte, nullptr, 0));
    EXPECT_EQ(7, byte);
}

TEST_F(Memory, ComparisonIsFoldedToASign)
{
    EXPECT_EQ(-1, kzmem_memcmp("ab1", "ab9", 3));
    EXPECT_EQ(1, kzmem_memcmp("ab9", "ab1", 3));
    EXPECT_EQ(0, kzmem_memcmp("ab1", "ab1", 3));
    EXPECT_EQ(0, kzmem_memcmp("ab1", "xyz", 0));
    EXPECT_EQ(1, kzmem_memcmp("\xff", "\x01", 1)) << "bytes are unsigned";
}

TEST_F(Memory, CallocClearsTheBlock)
{
    auto* block = static_cast<uint8_t*>(_kzmem_calloc(3, 5));
    ASSERT_NE(nullptr, block);
    EXPECT_EQ(0, std::accumulate(block, block + 15, 0));
    EXPECT_EQ(KZ_OK, _kzmem_free(block));
}

// 65536 times 65537 is 65536 modulo 2^32. The block is that large and no larger; the sanitizer's
// view of the heap would show if more were cleared.
TEST_F(Memory, CallocTakesItsProductModulo32Bits)
{
    auto* block = static_cast<uint8_t*>(_kzmem_calloc(65536, 65537));
    ASSERT_NE(nullptr, block);
    EXPECT_EQ(0, block[65535]);
    EXPECT_EQ(KZ_OK, _kzmem_free(block));
}

TEST_F(Memory, AZeroSizeIsPassedToTheHeap)
{
    const uint64_t before = allocation_count();
    void* a = _kzmem_malloc(0);
    void* b = _kzmem_calloc(0, 8);
    EXPECT_EQ(before + 2, allocation_count());
    EXPECT_EQ(KZ_OK, _kzmem_free(a));
    EXPECT_EQ(KZ_OK, _kzmem_free(b));
}

// Whether the heap then gives null (most do) or an empty block, the old block is gone.
TEST_F(Memory, ResizingToNothingFreesTheBlock)
{
    const int64_t before = live_blocks();
    void* resized = _kzmem_realloc(_kzmem_malloc(8), 0);
    EXPECT_EQ(before + (resized != nullptr ? 1 : 0), live_blocks());
    EXPECT_EQ(KZ_OK, _kzmem_free(resized));
}

TEST_F(Memory, FreeingNullSucceeds) { EXPECT_EQ(KZ_OK, _kzmem_free(nullptr)); }

TEST_F(Memory, AFailedReallocLeavesTheOldBlock)
{
    auto* block = static_cast<uint8_t*>(_kzmem_malloc(4));
    ASSERT_NE(nullptr, block);
    block[3] = 9;
    {
        AllocationFault fault(1);
        EXPECT_EQ(nullptr, _kzmem_realloc(block, 4096));
    }
    EXPECT_EQ(9, block[3]);
    block = static_cast<uint8_t*>(_kzmem_realloc(block, 4096));
    ASSERT_NE(nullptr, block);
    EXPECT_EQ(9, block[3]);
    EXPECT_EQ(KZ_OK, _kzmem_free(block));
}

TEST_F(Memory, AnArrayTooLargeFor32BitsIsNotTried)
{
    const uint64_t before = allocation_count();
    EXPECT_FALSE(kz::make_array<uint32_t>(uint64_t{1} << 30));
    EXPECT_FALSE(kz::make_array<uint8_t>(uint64_t{1} << 32));
    EXPECT_FALSE(kz::make_array<uint64_t>(std::numeric_limits<uint64_t>::max()));
    EXPECT_EQ(before, allocation_count());
}

TEST_F(Memory, OwnedBlocksAreClearedCopiedAndGivenBack)
{
    const auto cleared = kz::make_array<int16_t>(5);
    ASSERT_TRUE(cleared);
    EXPECT_EQ(0, std::accumulate(cleared.get(), cleared.get() + 5, 0));
    const std::array<int16_t, 3> source{1, -2, 3};
    const auto copy = kz::copy_array(source.data(), source.size());
    ASSERT_TRUE(copy);
    EXPECT_TRUE(std::equal(source.begin(), source.end(), copy.get()));
}

} // namespace
