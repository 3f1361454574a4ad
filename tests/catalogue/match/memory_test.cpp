// What is allocated for a long clip.

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <new>

#include <gtest/gtest.h>

#include "musical_corpus.hpp"

namespace {

int64_t live = 0; // blocks of operator new
int64_t most = 0;

} // namespace

void* operator new(size_t bytes)
{
    void* block = std::malloc(bytes == 0 ? 1 : bytes);
    if (block == nullptr) {
        throw std::bad_alloc();
    }
    most = std::max(most, ++live);
    return block;
}

void operator delete(void* block) noexcept
{
    live -= block == nullptr ? 0 : 1;
    std::free(block);
}

void operator delete(void* block, size_t) noexcept { operator delete(block); }

namespace {

using namespace kzcat;
using namespace kzcat::test;

// The most blocks at a time that passages in music take that the catalogue does not have.
int64_t blocks_for(const Samples& sound)
{
    const QueryBands query = query_of(sound);
    ScanSearcher searcher(pieces().corpus());
    const int64_t before = live;
    most = live;
    EXPECT_EQ(Verdict::no_match, recognise(query, searcher, {.passages = true}).verdict);
    return most - before;
}

TEST(Passages, TakeNoMoreMemoryInALongerClip)
{
    const Samples once = part_of(piece(21), 0, 50);
    Samples often = once;
    for (int i = 0; i < 3; ++i) {
        often.insert(often.end(), once.begin(), once.end());
    }
    const int64_t windows = 3 * 50 / 17;
    EXPECT_LT(blocks_for(often), blocks_for(once) + windows * 20);
}

} // namespace
