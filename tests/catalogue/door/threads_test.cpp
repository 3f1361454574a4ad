// One handle, many threads: recognising goes on while tracks come and go.

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/door/music.hpp"
#include "support/scratch_directory.hpp"

namespace {

using namespace kz::test;

/// The source of the best match; empty when there is none.
std::string best_of(kzcat_catalogue* catalogue, const Query& query)
{
    const auto result =
        make<Result>(kzcat_recognise, catalogue, static_cast<const kzcat_query*>(query.get()),
                     static_cast<const kzcat_match_options*>(nullptr));
    kzcat_match match;
    if (result.status != KZCAT_OK ||
        kzcat_result_get_match(result.handle.get(), 0, &match) != KZCAT_OK) {
        return kzcat_get_error_text();
    }
    return match.source;
}

void recognise_while_tracks_change(kzcat_catalogue* catalogue)
{
    const auto samples = piece(1, 20);
    ASSERT_EQ(1, add(catalogue, trail_of(samples).get(), "piece1"));
    const Query query = query_of({samples.begin() + 5 * kRate, samples.begin() + 15 * kRate});
    std::atomic<int> found{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < 3; ++i) {
        threads.emplace_back([&] {
            for (int round = 0; round < 4; ++round) {
                found += best_of(catalogue, query) == "piece1" ? 1 : 0;
            }
        });
    }
    threads.emplace_back([catalogue] {
        for (uint64_t seed = 2; seed <= 5; ++seed) {
            const int64_t id =
                add(catalogue, trail_of(piece(seed, 4)).get(), "piece" + std::to_string(seed));
            EXPECT_GT(id, 1);
            EXPECT_EQ(KZCAT_OK, kzcat_remove_track(catalogue, id));
        }
    });
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(12, found);
}

TEST(DoorThreads, ShareACatalogueInMemory) { recognise_while_tracks_change(open_memory().get()); }

TEST(DoorThreads, ShareACatalogueFile)
{
    const ScratchDirectory scratch;
    recognise_while_tracks_change(open_file(scratch.path("c.kzc")).get());
}

TEST(DoorThreads, HaveTheirOwnErrorTexts)
{
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_close(nullptr));
    const std::string mine = kzcat_get_error_text();
    std::string others = "?";
    std::thread([&others] { others = kzcat_get_error_text(); }).join();
    EXPECT_EQ("", others);
    EXPECT_EQ(mine, kzcat_get_error_text());
    EXPECT_NE("", mine);
}

} // namespace
