// Searching a store with a side file: whatever has become of the file, the answers are those of a
// scan of what the store has.

#include <algorithm>
#include <memory>
#include <optional>
#include <random>
#include <thread>

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "catalogue/index/clips.hpp"
#include "catalogue/index/forwarding_store.hpp"
#include "catalogue/index/index.hpp"
#include "catalogue/index/scratch_folder.hpp"
#include "catalogue/index/sealing.hpp"
#include "catalogue/match/scan.hpp"
#include "catalogue/store/memory/memory_store.hpp"

namespace kzcat {
namespace {

using test::add;
using test::Bytes;
using test::clip_of;
using test::ScratchFolder;

IndexOptions options_for(const std::string& path, std::optional<Plan> plan = Plan::parts)
{
    return {.path = path, .write = true, .fall_back = true, .plan = plan, .write_from = 1};
}

/// The track that has the best place for a clip; 0 when there is none, or it is not the clip's.
int64_t found(Searcher& searcher, uint64_t number)
{
    const auto places = searcher.find(clip_of(number), 5);
    return places.empty() || places.front().position != 50 ? 0 : places.front().track;
}

class SideFile : public testing::Test {
protected:
    static constexpr uint64_t kTracks = 60;

    std::unique_ptr<Index> open(std::optional<Plan> plan = Plan::parts)
    {
        return open_index(*store_, options_for(path_, plan));
    }

    /// Opens the index and expects that all tracks are found, and those of no other catalogue.
    IndexFacts expect_right_answers(std::optional<Plan> plan = Plan::parts)
    {
        const auto index = open(plan);
        for (uint64_t number = 1; number <= kTracks; number += 7) {
            EXPECT_EQ(ids_[number - 1], found(*index, number));
        }
        EXPECT_NE(ids_[6], found(*index, 1007));
        EXPECT_EQ(store_->code_count(), index->code_count());
        return index->facts();
    }

    ScratchFolder folder_;
    std::string path_ = folder_.file("music.kzc.idx");
    std::unique_ptr<Store> store_ = make_memory_store();
    std::vector<int64_t> ids_ = add(*store_, 1, kTracks);
};

TEST_F(SideFile, IsWrittenAndThenMapped)
{
    const IndexFacts facts = expect_right_answers();
    EXPECT_EQ(Plan::parts, facts.plan);
    EXPECT_EQ(kTracks, facts.tracks);
    EXPECT_EQ(store_->code_count(), facts.codes);
    EXPECT_EQ(0U, facts.tail_tracks);
    EXPECT_EQ(std::filesystem::file_size(path_), facts.file_bytes);
    EXPECT_EQ(IndexState::current, facts.state);
    EXPECT_LT(0, facts.scan_ms);
    EXPECT_LT(0, facts.parts_ms);
    EXPECT_EQ("", facts.note);
    const Bytes written = test::read_file(path_);
    EXPECT_EQ(facts.parts_ms, expect_right_answers().parts_ms);
    EXPECT_EQ(written, test::read_file(path_));
    EXPECT_EQ(1U, folder_.files());
}

TEST_F(SideFile, FollowsTheFasterPlanUnlessOneIsNamed)
{
    const IndexFacts facts = open(std::nullopt)->facts();
    EXPECT_EQ(facts.parts_ms < facts.scan_ms ? Plan::parts : Plan::scan, facts.plan);
    EXPECT_EQ(Plan::scan, expect_right_answers(Plan::scan).plan);
    EXPECT_EQ(Plan::parts, expect_right_answers(Plan::parts).plan);
}

TEST_F(SideFile, IsNotWrittenForFewCodes)
{
    IndexOptions options = options_for(path_);
    options.write_from = store_->code_count() + 1;
    const auto index = open_index(*store_, options);
    EXPECT_EQ(Plan::scan, index->facts().plan);
    EXPECT_EQ(IndexState::none, index->facts().state);
    EXPECT_EQ(0U, index->facts().file_bytes);
    EXPECT_EQ(ids_[3], found(*index, 4));
    EXPECT_EQ(0U, folder_.files());
}

TEST_F(SideFile, IsNeitherNeededNorWrittenWithoutAPath)
{
    const auto index = open_index(*store_, {.path = "", .write_from = 1});
    EXPECT_EQ(ids_[3], found(*index, 4));
    EXPECT_EQ("", index->facts().note);
    EXPECT_EQ(IndexState::none, index->facts().state);
    EXPECT_EQ(0U, folder_.files());
}

TEST_F(SideFile, IsNotWrittenWhenThatIsNotWanted)
{
    IndexOptions options = options_for(path_);
    options.write = false;
    EXPECT_EQ(ids_[3], found(*open_index(*store_, options), 4));
    EXPECT_EQ(0U, folder_.files());
    open();
    EXPECT_EQ(Plan::parts, open_index(*store_, options)->facts().plan);
}

TEST_F(SideFile, IsMadeAgainWhenItIsDeleted)
{
    open();
    std::filesystem::remove(path_);
    EXPECT_EQ("", expect_right_answers().note);
    EXPECT_TRUE(std::filesystem::exists(path_));
}

TEST_F(SideFile, IsMadeAgainWhereverItWasCut)
{
    open();
    const Bytes whole = test::read_file(path_);
    for (const size_t cut : {size_t{0}, size_t{7}, size_t{4000}, kIndexHeaderBytes, size_t{5000},
                             size_t{90000}, whole.size() / 2, whole.size() - 1}) {
        test::write_file(path_, std::span(whole).first(cut));
        EXPECT_NE("", expect_right_answers().note) << cut;
        EXPECT_EQ(whole.size(), test::read_file(path_).size());
    }
}

TEST_F(SideFile, ChangesNoAnswerWhicheverByteIsFlipped)
{
    open();
    const Bytes whole = test::read_file(path_);
    std::mt19937 random(4);
    for (int i = 0; i < 60; ++i) {
        Bytes bytes = whole;
        // A third in the header, a third in tracks and codes, the others anywhere.
        const size_t sizes[] = {4096, 4096 + 8 * store_->code_count(), whole.size()};
        const size_t at = random() % sizes[i % 3];
        bytes[at] ^= static_cast<std::byte>(1 + random() % 255);
        test::write_file(path_, bytes);
        expect_right_answers();
    }
}

TEST_F(SideFile, OfAnotherCatalogueIsNotUsed)
{
    const auto other = make_memory_store();
    add(*other, 1001, kTracks);
    open_index(*other, options_for(path_));
    EXPECT_NE(std::string::npos, expect_right_answers().note.find("belongs to another catalogue"));
}

TEST_F(SideFile, OfAnotherProfileIsNotUsed)
{
    open();
    Bytes bytes = test::read_file(path_);
    bytes[12] = std::byte{9};
    test::seal_header(bytes);
    test::write_file(path_, bytes);
    EXPECT_NE(std::string::npos, expect_right_answers().note.find("another profile"));
}

TEST_F(SideFile, TakesInWhatWasAddedAndRemovedSince)
{
    open();
    const Bytes earlier = test::read_file(path_);
    const auto more = add(*store_, kTracks + 1, 3);
    ASSERT_TRUE(store_->remove(ids_[10]));
    ASSERT_TRUE(store_->remove(more[1]));
    const auto index = open();
    EXPECT_EQ(2U, index->facts().tail_tracks);
    EXPECT_EQ(kTracks + 1, index->facts().tracks);
    EXPECT_EQ(more[0], found(*index, kTracks + 1));
    EXPECT_EQ(more[2], found(*index, kTracks + 3));
    EXPECT_NE(ids_[10], found(*index, 11));
    EXPECT_TRUE(index->codes(ids_[10]).empty());
    EXPECT_EQ(store_->code_count(), index->code_count());
    EXPECT_EQ(earlier, test::read_file(path_));
}

TEST_F(SideFile, IsWrittenAgainWhenATenthIsNew)
{
    open();
    add(*store_, kTracks + 1, kTracks / 8);
    EXPECT_EQ(0U, open()->facts().tail_tracks);
    for (size_t i = 0; i < kTracks / 6; ++i) {
        ASSERT_TRUE(store_->remove(ids_[i]));
    }
    const uint64_t before = std::filesystem::file_size(path_);
    open();
    EXPECT_GT(before, std::filesystem::file_size(path_));
}

/// Says that it is another catalogue than it is.
class Renamed : public test::ForwardingStore {
public:
    Renamed(Store& to, std::string id) : ForwardingStore(to), id_(std::move(id)) {}
    std::string catalogue_id() override { return id_; }

private:
    std::string id_;
};

TEST_F(SideFile, OfALaterCopyOfTheCatalogueIsNotUsed)
{
    // The catalogue is restored from a copy with half of the tracks, and others are added to it.
    open();
    const auto copy = make_memory_store();
    Renamed restored(*copy, store_->catalogue_id());
    const auto half = add(restored, 1, kTracks / 2);
    const std::string with_half = open_index(restored, options_for(path_))->facts().note;
    EXPECT_NE(std::string::npos, with_half.find("is newer than the catalogue")) << with_half;
    open();
    const auto others = add(restored, 2001, kTracks);
    const auto index = open_index(restored, options_for(path_));
    EXPECT_EQ(half[4], found(*index, 5));
    EXPECT_EQ(others[4], found(*index, 2005));
    const std::string note = index->facts().note;
    EXPECT_NE(std::string::npos, note.find("does not have what the catalogue has")) << note;
}

TEST_F(SideFile, ThatCannotBeWrittenIsDoneWithout)
{
    std::filesystem::create_directory(path_ + ".new");
    const IndexFacts facts = expect_right_answers();
    EXPECT_EQ(Plan::scan, facts.plan);
    EXPECT_EQ(IndexState::missing, facts.state);
    EXPECT_NE(std::string::npos, facts.note.find("was not written")) << facts.note;
}

TEST_F(SideFile, OnAFullDiskIsDoneWithout)
{
    open();
    const Bytes earlier = test::read_file(path_);
    const auto more = add(*store_, kTracks + 1, kTracks);
    {
        const test::FileLimit limit(100'000);
        const auto index = open();
        EXPECT_NE(std::string::npos, index->facts().note.find("was not written"));
        EXPECT_EQ(IndexState::stale, index->facts().state);
        EXPECT_EQ(more[8], found(*index, kTracks + 9));
        EXPECT_EQ(ids_[8], found(*index, 9));
    }
    EXPECT_EQ(earlier, test::read_file(path_));
    EXPECT_EQ(1U, folder_.files());
}

TEST_F(SideFile, ThatIsAFolderIsDoneWithout)
{
    std::filesystem::create_directory(path_);
    const IndexFacts facts = expect_right_answers();
    EXPECT_NE("", facts.note);
    EXPECT_EQ(IndexState::unusable, facts.state);
}

TEST_F(SideFile, IsLeftToTheProcessThatIsWritingIt)
{
    FileReplacement other(path_);
    ASSERT_TRUE(other.is_ours());
    EXPECT_NE(std::string::npos, expect_right_answers().note.find("another process"));
    EXPECT_FALSE(std::filesystem::exists(path_));
}

TEST_F(SideFile, MayBeWrittenBySeveralProcessesAtOnce)
{
    std::vector<pid_t> children;
    for (int i = 0; i < 4; ++i) {
        const pid_t child = fork();
        if (child == 0) {
            bool right = true;
            for (int round = 0; round < 10; ++round) {
                std::filesystem::remove(path_);
                right = right && found(*open(), 8) == ids_[7];
            }
            _exit(right ? 0 : 1);
        }
        children.push_back(child);
    }
    for (const pid_t child : children) {
        int status = 0;
        waitpid(child, &status, 0);
        EXPECT_EQ(0, status);
    }
    EXPECT_EQ("", expect_right_answers().note);
    EXPECT_EQ(1U, folder_.files());
}

TEST_F(SideFile, StaysInUseWhenItIsReplaced)
{
    const auto index = open();
    std::filesystem::remove(path_);
    test::write_file(path_, Bytes(10));
    EXPECT_EQ(ids_[20], found(*index, 21));
}

TEST_F(SideFile, OffersAScanForWhatItsPartsDoNotFind)
{
    const auto index = open();
    Searcher* thorough = index->thorough();
    ASSERT_NE(nullptr, thorough);
    EXPECT_EQ(ids_[5], found(*thorough, 6));
    EXPECT_EQ(nullptr, open(Plan::scan)->thorough());
    IndexOptions options = options_for(path_);
    options.fall_back = false;
    EXPECT_EQ(nullptr, open_index(*store_, options)->thorough());
}

TEST_F(SideFile, IsSearchedBySeveralThreads)
{
    add(*store_, kTracks + 1, 2);
    const auto index = open();
    std::vector<std::thread> threads;
    for (uint64_t first = 1; first <= 4; ++first) {
        threads.emplace_back([&, first] {
            for (uint64_t number = first; number <= kTracks; number += 4) {
                EXPECT_EQ(ids_[number - 1], found(*index, number));
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
}

TEST_F(SideFile, GivesThePopulationOfAScan)
{
    add(*store_, kTracks + 1, 2);
    ASSERT_TRUE(store_->remove(ids_[10]));
    const auto index = open();
    const auto scan = open_index(*store_, {.write_from = UINT64_MAX});
    const auto all_codes = [](const Corpus& corpus) {
        std::vector<Code> codes;
        for (const auto& segment : corpus.segments) {
            for (const auto& run : segment.tracks) {
                const auto own = segment.of(run);
                codes.insert(codes.end(), own.begin(), own.end());
            }
        }
        return codes;
    };
    EXPECT_EQ(all_codes(scan->population()), all_codes(index->population()));
    EXPECT_EQ(scan->code_count(), index->code_count());
}

class Refresh : public SideFile {};

TEST_F(Refresh, TakesInWhatHasChanged)
{
    for (const bool with_file : {true, false}) {
        const auto index = with_file ? open() : open_index(*store_, {});
        const auto more = add(*store_, with_file ? 2001 : 3001, 2);
        EXPECT_NE(more[0], found(*index, with_file ? 2001 : 3001));
        ASSERT_TRUE(store_->remove(more[1]));
        index->refresh(*store_);
        EXPECT_EQ(more[0], found(*index, with_file ? 2001 : 3001));
        EXPECT_NE(more[1], found(*index, with_file ? 2002 : 3002));
        EXPECT_EQ(store_->track_count(), index->facts().tracks);
    }
}

TEST_F(Refresh, WritesTheSideFileWhenATenthIsNew)
{
    const auto index = open();
    const auto more = add(*store_, kTracks + 1, kTracks);
    index->refresh(*store_);
    EXPECT_EQ(0U, index->facts().tail_tracks);
    EXPECT_EQ(more[30], found(*index, kTracks + 31));
}

TEST_F(Refresh, OfManyTracksOneByOneFindsThemAll)
{
    const auto index = open_index(*store_, {});
    for (uint64_t number = kTracks + 1; number <= kTracks + 20; ++number) {
        const auto ids = add(*store_, number, 1);
        index->refresh(*store_);
        EXPECT_EQ(ids[0], found(*index, number));
    }
    EXPECT_EQ(ids_[0], found(*index, 1));
}

/// Fails at the n-th trail that it is asked for.
class Failing : public test::ForwardingStore {
public:
    Failing(Store& to, int good) : ForwardingStore(to), good_(good) {}
    std::optional<Trail> trail(int64_t track) override
    {
        if (good_-- == 0) {
            throw StoreError(StoreError::Kind::failed, "cannot read");
        }
        return ForwardingStore::trail(track);
    }

private:
    int good_;
};

/// A store in which the trails of some tracks are damaged.
class Damaged : public test::ForwardingStore {
public:
    Damaged(Store& to, std::vector<int64_t> ids) : ForwardingStore(to), ids_(std::move(ids)) {}
    void visit_trails(int64_t after,
                      const std::function<bool(int64_t, const Trail&)>& visit) override
    {
        ForwardingStore::visit_trails(after, [&](int64_t id, const Trail& trail) {
            check(id);
            return visit(id, trail);
        });
    }
    std::optional<Trail> trail(int64_t track) override
    {
        check(track);
        return ForwardingStore::trail(track);
    }

private:
    void check(int64_t id) const
    {
        if (std::ranges::find(ids_, id) != ids_.end()) {
            throw StoreError(StoreError::Kind::damaged, "damaged");
        }
    }
    std::vector<int64_t> ids_;
};

TEST_F(SideFile, IsNotWrittenWhileTracksAreLeftOut)
{
    Damaged damaged(*store_, {ids_[7], ids_[20]});
    const auto index = open_index(damaged, options_for(path_));
    EXPECT_EQ(2U, index->facts().left_out);
    EXPECT_EQ(IndexState::missing, index->facts().state);
    EXPECT_EQ(kTracks - 2, index->facts().tracks);
    EXPECT_EQ(0U, index->facts().file_bytes);
    EXPECT_EQ(ids_[8], found(*index, 9));
    EXPECT_EQ(0, found(*index, 8));
}

TEST_F(SideFile, AnswersForTracksThatWereDamagedSince)
{
    open();
    Damaged damaged(*store_, {ids_[7]});
    const auto index = open_index(damaged, options_for(path_));
    EXPECT_EQ(0U, index->facts().left_out);
    EXPECT_EQ(ids_[7], found(*index, 8));
}

TEST_F(SideFile, WithNothingWholeLeftReportsTheDamage)
{
    Damaged damaged(*store_, ids_);
    EXPECT_THROW(open_index(damaged, options_for(path_)), StoreError);
}

TEST_F(Refresh, PassesOverDamagedTracks)
{
    const auto index = open();
    const auto more = add(*store_, kTracks + 1, 3);
    Damaged damaged(*store_, {more[1]});
    index->refresh(damaged);
    EXPECT_EQ(1U, index->facts().left_out);
    EXPECT_EQ(more[2], found(*index, kTracks + 3));
    EXPECT_EQ(0, found(*index, kTracks + 2));
    ASSERT_TRUE(store_->remove(more[1]));
    index->refresh(damaged);
    EXPECT_EQ(0U, index->facts().left_out);
}

TEST_F(Refresh, ThatFailsChangesNothing)
{
    const auto index = open();
    const auto more = add(*store_, kTracks + 1, 4);
    ASSERT_TRUE(store_->remove(ids_[0]));
    for (int good = 0; good < 4; ++good) {
        Failing failing(*store_, good);
        EXPECT_THROW(index->refresh(failing), StoreError);
        EXPECT_EQ(ids_[0], found(*index, 1));
        EXPECT_EQ(kTracks, index->facts().tracks);
    }
    index->refresh(*store_);
    EXPECT_NE(ids_[0], found(*index, 1));
    EXPECT_EQ(more[3], found(*index, kTracks + 4));
}

} // namespace
} // namespace kzcat
