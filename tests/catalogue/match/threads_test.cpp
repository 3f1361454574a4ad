// Several threads make queries and look them up in one catalogue at once; scripts/check_threads.sh
// runs this under the thread sanitizer.

#include <thread>

#include <gtest/gtest.h>

#include "musical_corpus.hpp"

namespace {

using namespace kzcat;
using namespace kzcat::test;

constexpr size_t kThreads = 4;

// What a thread finds: the first is its own track, the second one it shares with the others, the
// third no track at all.
std::vector<MatchAnswer> answers(size_t thread, Searcher& searcher)
{
    std::vector<MatchAnswer> found;
    for (const size_t number : {thread, size_t{kPieces - 1}, kPieces + thread}) {
        found.push_back(recognise(query_of(part_of(piece(number), 20, 8)), searcher, {}));
    }
    return found;
}

void expect_equal(const std::vector<MatchAnswer>& expected, const std::vector<MatchAnswer>& found)
{
    ASSERT_EQ(expected.size(), found.size());
    for (size_t i = 0; i < found.size(); ++i) {
        EXPECT_EQ(expected[i].verdict, found[i].verdict);
        ASSERT_EQ(expected[i].candidates.size(), found[i].candidates.size());
        for (size_t k = 0; k < found[i].candidates.size(); ++k) {
            EXPECT_EQ(expected[i].candidates[k].track, found[i].candidates[k].track);
            EXPECT_EQ(expected[i].candidates[k].score, found[i].candidates[k].score);
            EXPECT_EQ(expected[i].candidates[k].offset, found[i].candidates[k].offset);
        }
    }
}

TEST(Recognise, SeveralThreadsSearchOneCatalogue)
{
    ScanSearcher shared(pieces().corpus());
    std::vector<std::vector<MatchAnswer>> found(kThreads);
    std::vector<std::thread> threads;
    for (size_t thread = 0; thread < kThreads; ++thread) {
        threads.emplace_back(
            [thread, &found, &shared] { found[thread] = answers(thread, shared); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    ScanSearcher alone(pieces().corpus());
    for (size_t thread = 0; thread < kThreads; ++thread) {
        SCOPED_TRACE(thread);
        expect_equal(answers(thread, alone), found[thread]);
        EXPECT_EQ(Verdict::match, found[thread][0].verdict);
        EXPECT_EQ(static_cast<int64_t>(thread) + 1, found[thread][0].matches.at(0).track);
    }
}

} // namespace
