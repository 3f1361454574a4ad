#include "kzsdk/abs/dyn_buf.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <limits>
#include <memory>
#include <numeric>
#include <string>
#include <vector>

#include "kzsdk/abs/memory.h"
#include "support/allocation.hpp"
#include "support/signals.hpp"

using namespace kz::test;

namespace {

static_assert(offsetof(kz_dyn_buf, data) == 0);
static_assert(offsetof(kz_dyn_buf, length) == sizeof(void*));
static_assert(offsetof(kz_dyn_buf, capacity) == sizeof(void*) + 4);
static_assert(offsetof(kz_dyn_buf, grow_by) == sizeof(void*) + 8);
static_assert(sizeof(void*) != 4 || sizeof(kz_dyn_buf) == 16);

struct Dispose {
    void operator()(kz_dyn_buf* buffer) const { EXPECT_EQ(KZ_OK, kz_dyn_buf_dispose(buffer)); }
};
using Buffer = std::unique_ptr<kz_dyn_buf, Dispose>;

Buffer make(uint32_t capacity, uint32_t grow_by)
{
    return Buffer(kz_dyn_buf_create(capacity, grow_by));
}

kz_status append(const Buffer& buffer, const std::string& bytes)
{
    return kz_dyn_buf_append_buf(buffer.get(), bytes.data(), static_cast<uint32_t>(bytes.size()));
}

std::string contents(const kz_dyn_buf* buffer)
{
    return {reinterpret_cast<const char*>(kz_dyn_buf_get_data(buffer)),
            kz_dyn_buf_get_length(buffer)};
}

class DynBuf : public MemoryOn {};

TEST_F(DynBuf, StartsEmptyWithItsCapacity)
{
    const Buffer buffer = make(256, 128);
    ASSERT_TRUE(buffer);
    EXPECT_EQ(0u, buffer->length);
    EXPECT_EQ(256u, buffer->capacity);
    EXPECT_EQ(128u, buffer->grow_by);
}

TEST_F(DynBuf, GrowsByItsStepOrByWhatIsMissing)
{
    const Buffer a = make(256, 128);
    EXPECT_EQ(KZ_OK, append(a, std::string(300, 'x')));
    EXPECT_EQ(384u, a->capacity);
    EXPECT_EQ(300u, a->length);
    const Buffer b = make(256, 128);
    EXPECT_EQ(KZ_OK, append(b, std::string(500, 'x')));
    EXPECT_EQ(500u, b->capacity);
    EXPECT_EQ(500u, b->length);
}

TEST_F(DynBuf, WhatFitsExactlyDoesNotGrow)
{
    const Buffer buffer = make(4, 128);
    const uint64_t before = allocation_count();
    EXPECT_EQ(KZ_OK, append(buffer, "abcd"));
    EXPECT_EQ(before, allocation_count());
    EXPECT_EQ(4u, buffer->capacity);
    EXPECT_EQ(KZ_OK, append(buffer, "e"));
    EXPECT_EQ(132u, buffer->capacity);
}

// One step for each 128 bytes, never a factor: a large document is moved again and again.
TEST_F(DynBuf, GrowthIsLinear)
{
    const Buffer buffer = make(256, 128);
    const uint64_t before = allocation_count();
    for (int i = 0; i < 256 + 128 * 100; ++i) {
        ASSERT_EQ(KZ_OK, append(buffer, "x"));
    }
    EXPECT_EQ(before + 100, allocation_count());
    EXPECT_EQ(256u + 128u * 100u, buffer->capacity);
}

TEST_F(DynBuf, NothingAppendedChangesNothing)
{
    const Buffer buffer = make(0, 0);
    EXPECT_EQ(KZ_OK, kz_dyn_buf_append_buf(buffer.get(), "x", 0));
    EXPECT_EQ(KZ_OK, kz_dyn_buf_append_str(buffer.get(), ""));
    EXPECT_EQ(0u, buffer->length);
    EXPECT_EQ(0u, buffer->capacity);
}

TEST_F(DynBuf, NullPointersAreRefused)
{
    const Buffer buffer = make(8, 8);
    EXPECT_EQ(KZ_DYN_BUF_ERROR_INVALID_ARGUMENT, kz_dyn_buf_append_buf(nullptr, "x", 1));
    EXPECT_EQ(KZ_DYN_BUF_ERROR_INVALID_ARGUMENT, kz_dyn_buf_append_buf(buffer.get(), nullptr, 1));
    EXPECT_EQ(KZ_DYN_BUF_ERROR_INVALID_ARGUMENT, kz_dyn_buf_append_buf(buffer.get(), nullptr, 0));
    EXPECT_EQ(KZ_DYN_BUF_ERROR_INVALID_ARGUMENT, kz_dyn_buf_append_str(nullptr, "x"));
    EXPECT_EQ(KZ_DYN_BUF_ERROR_INVALID_ARGUMENT, kz_dyn_buf_append_str(buffer.get(), nullptr));
    EXPECT_EQ(KZ_DYN_BUF_ERROR_INVALID_ARGUMENT, kz_dyn_buf_compact(nullptr));
    EXPECT_EQ(nullptr, kz_dyn_buf_clone(nullptr));
    EXPECT_EQ(nullptr, kz_dyn_buf_get_data(nullptr));
    EXPECT_EQ(0u, kz_dyn_buf_get_length(nullptr));
    EXPECT_EQ(nullptr, kz_dyn_buf_dispose_and_return_buffer(nullptr));
    EXPECT_EQ(KZ_OK, kz_dyn_buf_dispose(nullptr));
    EXPECT_EQ(0u, buffer->length);
}

TEST_F(DynBuf, ATextGoesInWithoutItsNul)
{
    const Buffer buffer = make(2, 1);
    EXPECT_EQ(KZ_OK, kz_dyn_buf_append_str(buffer.get(), "abc"));
    EXPECT_EQ(KZ_OK, kz_dyn_buf_append_str(buffer.get(), "de"));
    EXPECT_EQ("abcde", contents(buffer.get()));
}

TEST_F(DynBuf, CompactingGivesBackWhatIsNotInUse)
{
    const Buffer buffer = make(256, 128);
    ASSERT_EQ(KZ_OK, append(buffer, "0123456789"));
    EXPECT_EQ(KZ_OK, kz_dyn_buf_compact(buffer.get()));
    EXPECT_EQ(10u, buffer->capacity);
    EXPECT_EQ("0123456789", contents(buffer.get()));
}

// A resize to nothing would free the block that the buffer still holds.
TEST_F(DynBuf, AnEmptyBufferStaysUsableWhenCompacted)
{
    const Buffer buffer = make(256, 4);
    EXPECT_EQ(KZ_OK, kz_dyn_buf_compact(buffer.get()));
    EXPECT_EQ(0u, buffer->capacity);
    EXPECT_NE(nullptr, kz_dyn_buf_get_data(buffer.get()));
    EXPECT_EQ(KZ_OK, kz_dyn_buf_compact(buffer.get()));
    EXPECT_EQ(KZ_OK, append(buffer, "ab"));
    EXPECT_EQ(4u, buffer->capacity);
    EXPECT_EQ("ab", contents(buffer.get()));
}

TEST_F(DynBuf, AFailedCompactionChangesNothing)
{
    const Buffer buffer = make(256, 128);
    ASSERT_EQ(KZ_OK, append(buffer, "abc"));
    {
        AllocationFault fault(1);
        EXPECT_EQ(KZ_DYN_BUF_ERROR_MEMORY, kz_dyn_buf_compact(buffer.get()));
    }
    EXPECT_EQ(256u, buffer->capacity);
    EXPECT_EQ("abc", contents(buffer.get()));
}

TEST_F(DynBuf, TheBlockIsHandedOverAsItIs)
{
    Buffer buffer = make(16, 16);
    ASSERT_EQ(KZ_OK, append(buffer, "abc"));
    uint8_t* data = kz_dyn_buf_get_data(buffer.get());
    EXPECT_EQ(data, kz_dyn_buf_dispose_and_return_buffer(buffer.release()));
    EXPECT_EQ(0, std::memcmp(data, "abc", 3));
    EXPECT_EQ(KZ_OK, _kzmem_free(data));
}

TEST_F(DynBuf, ACloneOfAnEmptyBufferIsEmpty)
{
    const Buffer buffer = make(16, 4);
    const Buffer clone(kz_dyn_buf_clone(buffer.get()));
    ASSERT_TRUE(clone);
    EXPECT_EQ("", contents(clone.get()));
    EXPECT_EQ(16u, clone->capacity);
    ASSERT_EQ(KZ_OK, append(clone, "d"));
    EXPECT_EQ("d", contents(clone.get()));
}

TEST_F(DynBuf, ACloneHasItsOwnBytes)
{
    const Buffer buffer = make(16, 4);
    ASSERT_EQ(KZ_OK, append(buffer, "abc"));
    const Buffer clone(kz_dyn_buf_clone(buffer.get()));
    ASSERT_TRUE(clone);
    EXPECT_EQ("abc", contents(clone.get()));
    EXPECT_EQ(16u, clone->capacity);
    EXPECT_EQ(4u, clone->grow_by);
    EXPECT_NE(buffer->data, clone->data);
    ASSERT_EQ(KZ_OK, append(clone, "d"));
    EXPECT_EQ("abc", contents(buffer.get()));
}

TEST_F(DynBuf, ACapacityThatWouldWrapIsOutOfMemory)
{
    const Buffer buffer = make(256, std::numeric_limits<uint32_t>::max());
    const uint64_t before = allocation_count();
    EXPECT_EQ(KZ_DYN_BUF_ERROR_MEMORY, append(buffer, std::string(300, 'x')));
    EXPECT_EQ(before, allocation_count());
    EXPECT_EQ(256u, buffer->capacity);
    EXPECT_EQ(0u, buffer->length);
    EXPECT_EQ(KZ_OK, append(buffer, std::string(256, 'x')));
    const Buffer small = make(16, 1);
    ASSERT_EQ(KZ_OK, append(small, "x"));
    EXPECT_EQ(KZ_DYN_BUF_ERROR_MEMORY, kz_dyn_buf_append_buf(small.get(), "x", 0xffffffffu));
    EXPECT_EQ("x", contents(small.get()));
}

// Growth moves the block, and the bytes to append lie in it. The sanitizer detects a read of the
// old block.
TEST_F(DynBuf, ItsOwnBytesCanBeAppended)
{
    for (uint32_t offset = 0; offset < 10; ++offset) {
        const Buffer buffer = make(10, 1);
        ASSERT_EQ(KZ_OK, append(buffer, "0123456789"));
        std::string expected = contents(buffer.get());
        for (int round = 0; round < 8; ++round) {
            const uint32_t count = buffer->length - offset;
            expected += expected.substr(offset, count);
            ASSERT_EQ(KZ_OK, kz_dyn_buf_append_buf(buffer.get(), buffer->data + offset, count));
            ASSERT_EQ(expected, contents(buffer.get()));
        }
    }
}

TEST_F(DynBuf, RandomAppendsAgainstAVector)
{
    Random random(5);
    for (int run = 0; run < 200; ++run) {
        const uint32_t grow_by = random.below(200);
        uint32_t capacity = random.below(300);
        Buffer buffer = make(capacity, grow_by);
        std::vector<uint8_t> model;
        for (int step = 0; step < 100; ++step) {
            std::vector<uint8_t> bytes(random.below(random.below(20) == 0 ? 2000 : 40));
            std::generate(bytes.begin(), bytes.end(),
                          [&] { return static_cast<uint8_t>(random.next()); });
            const uint8_t nothing = 0;
            ASSERT_EQ(KZ_OK,
                      kz_dyn_buf_append_buf(buffer.get(), bytes.empty() ? &nothing : bytes.data(),
                                            static_cast<uint32_t>(bytes.size())));
            model.insert(model.end(), bytes.begin(), bytes.end());
            if (model.size() > capacity) {
                capacity = std::max(static_cast<uint32_t>(model.size()), capacity + grow_by);
            }
            if (random.below(30) == 0) {
                ASSERT_EQ(KZ_OK, kz_dyn_buf_compact(buffer.get()));
                capacity = static_cast<uint32_t>(model.size());
            }
            if (random.below(30) == 0) {
                buffer.reset(kz_dyn_buf_clone(buffer.get()));
                ASSERT_TRUE(buffer);
            }
            ASSERT_EQ(capacity, buffer->capacity);
            ASSERT_EQ(model.size(), kz_dyn_buf_get_length(buffer.get()));
            ASSERT_TRUE(std::equal(model.begin(), model.end(), buffer->data));
        }
    }
}

TEST_F(DynBuf, EveryFailedAllocationIsReported)
{
    for_every_failed_allocation([](auto fired) {
        const Buffer buffer = make(16, 16);
        EXPECT_EQ(fired(), buffer == nullptr);
        if (!buffer) {
            return;
        }
        const kz_status status = append(buffer, std::string(40, 'x'));
        EXPECT_EQ(fired() ? KZ_DYN_BUF_ERROR_MEMORY : 0u, status);
        EXPECT_EQ(fired() ? 16u : 40u, buffer->capacity);
        EXPECT_EQ(fired() ? 0u : 40u, buffer->length);
        if (status == KZ_OK) {
            const Buffer clone(kz_dyn_buf_clone(buffer.get()));
            EXPECT_EQ(fired(), clone == nullptr);
        }
    });
}

TEST_F(DynBuf, WithMemoryOffOnlyGrowthFails)
{
    Buffer buffer = make(4, 4);
    ASSERT_EQ(KZ_OK, kzmem_shutdown());
    EXPECT_EQ(KZ_OK, append(buffer, "abcd"));
    EXPECT_EQ(KZ_DYN_BUF_ERROR_MEMORY, append(buffer, "e"));
    EXPECT_EQ("abcd", contents(buffer.get()));
    EXPECT_EQ(nullptr, kz_dyn_buf_clone(buffer.get()));
    EXPECT_EQ(nullptr, kz_dyn_buf_create(4, 4));
    ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
}

} // namespace
