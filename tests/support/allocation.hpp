/// @file
/// Counts the blocks that the library holds and makes its n-th allocation fail.
///
/// Test programs are linked with the heap functions wrapped (`ld --wrap`), so the library's own
/// code is tested as it is shipped. Only calls from objects of the test program itself are seen:
/// the library's, not those of the C++ run-time library.
#pragma once

#include <cstdint>

#include <gtest/gtest.h>

#include "kzsdk/abs/memory.h"

namespace kz::test {

/// Blocks that were allocated and not yet freed.
int64_t live_blocks();

/// Allocations made so far, failed ones included.
uint64_t allocation_count();

/// While it lives, the n-th allocation from now (1 is the next) fails: that one only, or with
/// `FromThenOn` every later one too.
class AllocationFault {
public:
    enum Mode { Once, FromThenOn };
    explicit AllocationFault(uint64_t nth, Mode mode = Once);
    ~AllocationFault();
    AllocationFault(const AllocationFault&) = delete;
    AllocationFault& operator=(const AllocationFault&) = delete;

    /// True once an allocation has been made to fail.
    bool fired() const;
};

/// Runs `attempt` with the first allocation failing, then only the second, and so on until a run
/// meets no failure, then the same with all later ones failing too. `attempt(fired)` receives a
/// function that reports whether the failure has occurred. After each run no block may be left.
template <class Attempt>
void for_every_failed_allocation(Attempt attempt)
{
    for (const auto mode : {AllocationFault::Once, AllocationFault::FromThenOn}) {
        for (uint64_t nth = 1;; ++nth) {
            const int64_t before = live_blocks();
            bool fired = false;
            {
                AllocationFault fault(nth, mode);
                attempt([&fault] { return fault.fired(); });
                fired = fault.fired();
            }
            EXPECT_EQ(before, live_blocks()) << "left over after failed allocation " << nth;
            if (!fired || ::testing::Test::HasFatalFailure()) {
                break;
            }
        }
    }
}

/// The memory manager is on during each test, and every block is back at its end.
class MemoryOn : public ::testing::Test {
protected:
    void SetUp() override
    {
        ASSERT_EQ(KZ_OK, kzmem_initialize(0, 0));
        before_ = live_blocks();
    }
    void TearDown() override
    {
        EXPECT_EQ(before_, live_blocks()) << "blocks were leaked";
        EXPECT_EQ(KZ_OK, kzmem_shutdown());
    }

private:
    int64_t before_ = 0;
};

} // namespace kz::test
