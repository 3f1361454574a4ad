// What a corpus counts, over segments that lie apart.

#include <array>

#include <gtest/gtest.h>

#include "catalogue/match/corpus.hpp"

namespace {

using kzcat::Code;
using kzcat::TrackSpan;

TEST(Corpus, CountsOverAllItsSegments)
{
    const std::array<Code, 5> first{};
    const std::array<Code, 3> second{};
    const std::array spans{TrackSpan{1, 0, 2}, TrackSpan{2, 2, 3}};
    const std::array more{TrackSpan{7, 0, 3}};
    const kzcat::Corpus corpus{{{first, spans}, {second, more}}};
    EXPECT_EQ(8U, corpus.code_count());
    EXPECT_EQ(3U, corpus.track_count());
}

TEST(Corpus, CountsNoCodesBetweenItsTracks)
{
    const std::array<Code, 9> codes{};
    const std::array spans{TrackSpan{1, 0, 2}, TrackSpan{2, 5, 3}};
    const kzcat::Segment segment{codes, spans};
    EXPECT_EQ(5U, kzcat::Corpus{{segment}}.code_count());
}

TEST(Corpus, CountsNothingWithoutSegments)
{
    EXPECT_EQ(0U, kzcat::Corpus{}.code_count());
    EXPECT_EQ(0U, kzcat::Corpus{}.track_count());
}

TEST(Segment, GivesTheCodesOfItsTracks)
{
    const std::array<Code, 5> codes{10, 11, 12, 13, 14};
    const std::array spans{TrackSpan{1, 0, 2}, TrackSpan{2, 2, 3}};
    const auto found = kzcat::Segment{codes, spans}.of(spans[1]);
    ASSERT_EQ(3U, found.size());
    EXPECT_EQ(12U, found[0]);
    EXPECT_EQ(14U, found[2]);
}

} // namespace
