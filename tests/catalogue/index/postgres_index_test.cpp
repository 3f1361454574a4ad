// Searching on PostgreSQL servers: the answers are those of an index in memory, however the tracks
// are spread.

#include <algorithm>
#include <memory>

#include <gtest/gtest.h>

#include "catalogue/index/clips.hpp"
#include "catalogue/index/fleet.hpp"
#include "catalogue/index/index.hpp"
#include "catalogue/index/scratch_folder.hpp"
#include "catalogue/match/search.hpp"
#include "catalogue/store/memory/memory_store.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {
namespace {

using test::add;
using test::clip_of;
using test::codes_of;
using test::Fleet;
using test::ScratchFolder;

constexpr uint64_t kTracks = 80;

using Places = std::vector<std::tuple<int64_t, uint32_t, int64_t>>;

Places places(const std::vector<Candidate>& candidates)
{
    Places places;
    for (const Candidate& one : candidates) {
        places.emplace_back(one.track, one.phase, one.position);
    }
    return places;
}

Places first_of(Places places) { return {places.begin(), places.begin() + !places.empty()}; }

/// The first five places at which the whole clip lies in its track. A clip that overhangs an end
/// is compared in part with the track that happens to be next, in a first pass that strangers may
/// fail: and tracks on servers have other neighbours.
Places within(const std::vector<Candidate>& candidates)
{
    Places all;
    for (const auto& [track, phase, position] : places(candidates)) {
        const auto codes = static_cast<int64_t>(codes_of(static_cast<uint64_t>(track)).size());
        if (position >= 0 && position + 70 <= codes && all.size() < 5) {
            all.emplace_back(track, phase, position);
        }
    }
    return all;
}

std::vector<Code> all_codes(const Corpus& corpus)
{
    std::vector<Code> codes;
    for (const auto& segment : corpus.segments) {
        for (const auto& run : segment.tracks) {
            const auto own = segment.of(run);
            codes.insert(codes.end(), own.begin(), own.end());
        }
    }
    return codes;
}

/// One server with everything.
struct OneServer {
    kz::test::PostgresServer server;
    std::string url() const { return server.url(); }
    std::string reader_url() const { return test::reader_of(server); }
};

/// A coordinator of two shards.
struct TwoShards {
    Fleet fleet;
    std::string url() const { return fleet.coordinator.url(); }
    std::string reader_url() const
    {
        const std::string reader = test::reader_of(fleet.coordinator);
        fleet.coordinator.sql("CREATE USER MAPPING FOR reader SERVER kzcat_shard_1 OPTIONS (user "
                              "'postgres', password_required 'false');"
                              "CREATE USER MAPPING FOR reader SERVER kzcat_shard_2 OPTIONS (user "
                              "'postgres', password_required 'false')");
        return reader;
    }
};

template <class Servers>
class EveryServer : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        if (!kz::test::postgres_obstacle().empty()) {
            return;
        }
        servers_ = std::make_unique<Servers>();
        store_ = open_postgres_store(url(), Access::create);
        memory_ = make_memory_store();
        ids_ = add(*store_, 1, kTracks);
        EXPECT_EQ(ids_, add(*memory_, 1, kTracks));
    }
    static void TearDownTestSuite()
    {
        store_.reset();
        servers_.reset();
    }
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
    }

    static std::string url() { return servers_->url(); }
    static IndexOptions options(std::optional<Plan> plan = {})
    {
        IndexOptions options;
        options.plan = plan;
        options.write_from = 1;
        options.server = url();
        return options;
    }
    std::unique_ptr<Index> embedded(Plan plan)
    {
        return open_index(*memory_, {.path = folder_.file("a.idx"), .plan = plan, .write_from = 1});
    }

    static inline std::unique_ptr<Servers> servers_;
    static inline std::unique_ptr<Store> store_;
    static inline std::unique_ptr<Store> memory_;
    static inline std::vector<int64_t> ids_;
    ScratchFolder folder_;
};

using AllServers = testing::Types<OneServer, TwoShards>;
TYPED_TEST_SUITE(EveryServer, AllServers);

TYPED_TEST(EveryServer, FindsByPartsWhatAFileFinds)
{
    const auto index = open_index(*this->store_, this->options());
    const auto file = this->embedded(Plan::parts);
    EXPECT_EQ(Plan::parts, index->facts().plan);
    EXPECT_EQ(0U, index->facts().tail_tracks);
    for (uint64_t number = 1; number <= kTracks; number += 7) {
        for (const int wrong : {4, 12}) {
            const Reading clip = clip_of(number, wrong);
            const auto found = places(index->find(clip, 5));
            EXPECT_EQ(first_of(places(file->find(clip, 5))), first_of(found)) << number;
            EXPECT_EQ(this->ids_[number - 1], std::get<0>(found.at(0)));
        }
    }
}

TYPED_TEST(EveryServer, ScansAsMemoryIsScanned)
{
    const auto index = open_index(*this->store_, this->options(Plan::scan));
    const auto file = this->embedded(Plan::scan);
    EXPECT_EQ(Plan::scan, index->facts().plan);
    for (uint64_t number = 1; number <= kTracks; number += 7) {
        const Reading clip = clip_of(number, 20);
        EXPECT_EQ(within(file->find(clip, 10)), within(index->find(clip, 10))) << number;
    }
}

TYPED_TEST(EveryServer, HasThePopulationOfMemory)
{
    const auto index = open_index(*this->store_, this->options());
    const auto file = this->embedded(Plan::scan);
    EXPECT_EQ(all_codes(file->population()), all_codes(index->population()));
    EXPECT_EQ(file->code_count(), index->code_count());
    // The second time it is read from where it is kept.
    const auto again = open_index(*this->store_, this->options());
    EXPECT_EQ(all_codes(file->population()), all_codes(again->population()));
}

TYPED_TEST(EveryServer, ReadsTheCodesOfATrack)
{
    const auto index = open_index(*this->store_, this->options());
    EXPECT_TRUE(std::ranges::equal(codes_of(3), index->codes(this->ids_[2])));
    EXPECT_TRUE(index->codes(1'000'000).empty());
}

TYPED_TEST(EveryServer, ScansWhatIsNotPostedYet)
{
    IndexOptions options = this->options();
    auto index = open_index(*this->store_, options);
    const auto more = add(*this->store_, 1001, 3);
    index->refresh(*this->store_);
    EXPECT_EQ(3U, index->facts().tail_tracks); // less than a tenth
    EXPECT_EQ(more[1], index->find(clip_of(1002, 8), 5).at(0).track);
    EXPECT_EQ(50, index->find(clip_of(1002, 8), 5).at(0).position);
    EXPECT_EQ(this->ids_[8], index->find(clip_of(9, 8), 5).at(0).track);
    ASSERT_TRUE(this->store_->remove(more[1]));
    index->refresh(*this->store_);
    const auto found = index->find(clip_of(1002, 8), 5);
    EXPECT_TRUE(
        std::ranges::none_of(found, [&](const Candidate& one) { return one.track == more[1]; }));
    this->store_->remove(more[0]);
    this->store_->remove(more[2]);
}

TYPED_TEST(EveryServer, PostsTogetherWhatCameInPieces)
{
    std::vector<int64_t> more;
    for (uint64_t round = 0; round < 2; ++round) {
        const auto some = add(*this->store_, 2001 + 30 * round, 30);
        more.insert(more.end(), some.begin(), some.end());
        EXPECT_EQ(0U, open_index(*this->store_, this->options())->facts().tail_tracks);
    }
    const auto index = open_index(*this->store_, this->options());
    EXPECT_EQ(more[40], index->find(clip_of(2041, 8), 5).at(0).track);
    EXPECT_EQ(this->ids_[20], index->find(clip_of(21, 8), 5).at(0).track);
    for (const int64_t track : more) {
        this->store_->remove(track);
    }
    index->refresh(*this->store_);
    EXPECT_EQ(this->ids_[20], index->find(clip_of(21, 8), 5).at(0).track);
}

TYPED_TEST(EveryServer, OffersAScanForWhatPartsDoNotFind)
{
    const auto index = open_index(*this->store_, this->options());
    ASSERT_NE(nullptr, index->thorough());
    EXPECT_EQ(this->ids_[5], index->thorough()->find(clip_of(6, 8), 5).at(0).track);
    EXPECT_EQ(nullptr, open_index(*this->store_, this->options(Plan::scan))->thorough());
}

TYPED_TEST(EveryServer, IsReadByWhoMayNotWrite)
{
    add(*this->store_, 3001, 1);
    IndexOptions options = this->options();
    options.server = this->servers_->reader_url();
    const auto reader = open_postgres_store(options.server, Access::read);
    const auto index = open_index(*reader, options);
    EXPECT_LE(1U, index->facts().tail_tracks);
    EXPECT_EQ(this->ids_[20], index->find(clip_of(21, 8), 5).at(0).track);
}

} // namespace
} // namespace kzcat
