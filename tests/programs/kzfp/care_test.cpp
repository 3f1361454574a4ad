// What the owner of a catalogue does with it: listing, removing, verifying, merging.

#include "kzfp.hpp"

#include <algorithm>
#include <functional>
#include <iterator>
#include <random>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "catalogue/model/trail_file.hpp"
#include "kzcat.h"
#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;

TEST(KzfpRemove, TakesIdsAndPaths)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    std::vector<std::string> files;
    std::vector<std::string> arguments = {"add", catalogue};
    for (uint64_t seed = 1; seed <= 3; ++seed) {
        files.push_back(scratch.write(std::to_string(seed) + ".wav", wav(piece(seed, 4))));
        arguments.push_back(files.back());
    }
    output_of(arguments);
    EXPECT_EQ("removed 2\nremoved " + files[0] + "\n",
              output_of({"remove", catalogue, "2", files[0]}));
    const ProcessResult again = kzfp({"remove", catalogue, "2", files[2]});
    EXPECT_EQ(1, again.status);
    EXPECT_EQ("removed " + files[2] + "\n", again.out);
    EXPECT_TRUE(again.err.starts_with("2: no track with the id 2")) << again.err;
    EXPECT_EQ("", output_of({"list", "-f", "json", catalogue}));
    // An id is never given out again.
    output_of({"add", catalogue, files[0]});
    EXPECT_EQ(4, lines_of(output_of({"list", "-f", "json", catalogue}))[0]["track"]);
}

TEST(KzfpMerge, BringsTracksWithTheirTags)
{
    const ScratchDirectory scratch;
    const std::string first = scratch.write("1.wav", wav(piece(1, 4)));
    const std::string second = scratch.write("2.wav", wav(piece(2, 4)));
    const std::string into = scratch.path("into.kzc");
    const std::string other = scratch.path("other.kzc");
    output_of({"add", into, first});
    output_of({"add", "--documents", other, first, second});
    EXPECT_EQ(other + ": 1 added, 1 known\n", output_of({"merge", into, other}));
    EXPECT_EQ(other + ": 0 added, 2 known\n", output_of({"merge", into, other}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", into}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(json::array({"2"}), tracks[1]["tags"]["title"]);
    EXPECT_EQ(true, tracks[0]["documents"]);
    EXPECT_EQ(true, tracks[1]["documents"]);
}

TEST(KzfpMerge, TakesWhatIsWholeOfADamagedCatalogue)
{
    const ScratchDirectory scratch;
    const std::string other = scratch.path("other.kzc");
    const std::string into = scratch.path("into.kzc");
    for (uint64_t seed = 1; seed <= 3; ++seed) {
        output_of(
            {"add", other, scratch.write(std::to_string(seed) + ".wav", wav(piece(seed, 9)))});
    }
    const std::string trail = trail_file(piece(2, 9));
    std::string bytes = contents(other);
    const size_t codes = bytes.find(trail.substr(trail.size() - 100));
    ASSERT_NE(std::string::npos, codes);
    bytes[codes] = static_cast<char>(bytes[codes] ^ 1);
    scratch.write("other.kzc", bytes);
    const ProcessResult result = kzfp({"merge", into, other});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ(other + ": 2 added, 0 known\n", result.out);
    EXPECT_EQ(other + ": 1 track is damaged and left out; verify names what to add again\n",
              result.err);
    EXPECT_EQ(2u, lines_of(output_of({"list", "-f", "json", into})).size());
}

TEST(KzfpVerify, NoticesDamage)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    output_of({"add", catalogue, scratch.write("a.wav", wav(piece(1, 20)))});
    EXPECT_EQ(catalogue + ": 1 track, whole\n", output_of({"verify", catalogue}));
    std::string bytes = contents(catalogue);
    // The codes are the longest run of bytes without zeros in a row: change one in the middle.
    const std::string codes = output_of({"list", "-f", "json", catalogue});
    ASSERT_GT(json::parse(codes)["codes"], 100);
    const size_t last = bytes.find_last_not_of('\0');
    bytes[last] = static_cast<char>(bytes[last] ^ 1);
    bytes[last - 100] = static_cast<char>(bytes[last - 100] ^ 1);
    const std::string damaged = scratch.write("damaged.kzc", bytes);
    const ProcessResult result = kzfp({"verify", damaged});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("", result.out);
    EXPECT_TRUE(contains(result.err, damaged)) << result.err;
}

TEST(KzfpList, SaysHowClipsAreLookedUp)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 75)));
    output_of({"add", catalogue, file});
    EXPECT_EQ("     1    1:15.0  " + file + "\n1 track, 0.0 hours; looked up by scan\n",
              output_of({"list", catalogue}));
    const json summary = json::parse(output_of({"list", "--summary", "-f", "json", catalogue}));
    EXPECT_EQ(catalogue, summary["catalogue"]);
    EXPECT_EQ(1, summary["tracks"]);
    EXPECT_EQ("scan", summary["plan"]);
}

json summary_of(const std::string& catalogue)
{
    return json::parse(output_of({"list", "--summary", "-f", "json", catalogue}));
}

/// Opens the index, which is made from this many codes on.
void make_index(const std::string& catalogue, uint32_t from)
{
    kzcat_settings settings;
    kzcat_facts facts;
    kzcat_catalogue* opened = nullptr;
    kzcat_initialize_settings(&settings);
    settings.index_from = from;
    ASSERT_EQ(KZCAT_OK, kzcat_open(catalogue.c_str(), KZCAT_ACCESS_READ, &settings, &opened));
    EXPECT_EQ(KZCAT_OK, kzcat_get_facts(opened, 1, &facts));
    EXPECT_EQ(KZCAT_INDEX_CURRENT, facts.index_state);
    kzcat_close(&opened);
}

TEST(KzfpList, ReportsAStaleOrUnusableIndex)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    output_of({"add", catalogue, scratch.write("a.wav", wav(piece(1, 20)))});
    EXPECT_EQ("none", summary_of(catalogue)["index"]);
    make_index(catalogue, 1);
    EXPECT_EQ("current", summary_of(catalogue)["index"]);
    EXPECT_FALSE(contains(output_of({"list", catalogue}), "the index"));
    output_of({"add", catalogue, scratch.write("b.wav", wav(piece(2, 20)))});
    EXPECT_EQ("stale", summary_of(catalogue)["index"]);
    const std::string listed = output_of({"list", catalogue});
    EXPECT_TRUE(contains(listed, "the index " + catalogue + ".idx is stale")) << listed;
    EXPECT_TRUE(contains(listed, "make its folder writable")) << listed;
    scratch.write("c.kzc.idx", "damaged");
    EXPECT_EQ("unusable", summary_of(catalogue)["index"]);
    EXPECT_TRUE(
        contains(output_of({"list", catalogue}), "cannot be used, which costs time; delete"));
    EXPECT_TRUE(contains(output_of({"list", "--summary", "-f", "csv", catalogue}),
                         "plan,index_bytes,index\n"));
}

/// Adds a track with so many codes.
void add_codes(const std::string& catalogue, size_t count)
{
    kzcat::Trail noise;
    noise.samples = kzcat::kFrameLength + (count - 1) * kzcat::kCodeHop;
    std::mt19937_64 random(1);
    std::generate_n(std::back_inserter(noise.codes), count, std::ref(random));
    const std::vector<std::byte> bytes = kzcat::write_trail(noise);
    kzcat_trail* trail = nullptr;
    kzcat_catalogue* opened = nullptr;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_read(bytes.data(), bytes.size(), &trail));
    ASSERT_EQ(KZCAT_OK, kzcat_open(catalogue.c_str(), KZCAT_ACCESS_CREATE, nullptr, &opened));
    const kzcat_new_track track = {
        .trail = trail, .source = {"a", -1, -1, nullptr}, .tags = nullptr, .tag_count = 0};
    EXPECT_EQ(KZCAT_OK, kzcat_add(opened, &track, 1, nullptr));
    kzcat_close(&opened);
    kzcat_trail_free(&trail);
}

TEST(KzfpList, ReportsAMissingIndex)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    add_codes(catalogue, 4'000'000);
    scratch.write("c.kzc.idx.new/file", "in the way of the index");
    EXPECT_EQ("missing", summary_of(catalogue)["index"]);
    const std::string listed = output_of({"list", catalogue});
    EXPECT_TRUE(contains(listed, "the index " + catalogue + ".idx is missing")) << listed;
    EXPECT_TRUE(contains(listed, "make its folder writable")) << listed;
}

TEST(KzfpList, ShowsEveryTagOfOneName)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string bytes = trail_file(piece(1, 5));
    const kzcat_tag tags[] = {{"artist", "One"}, {"title", "Song"}, {"artist", "Two"}};
    kzcat_trail* trail = nullptr;
    kzcat_catalogue* opened = nullptr;
    ASSERT_EQ(KZCAT_OK, kzcat_trail_read(bytes.data(), bytes.size(), &trail));
    ASSERT_EQ(KZCAT_OK, kzcat_open(catalogue.c_str(), KZCAT_ACCESS_CREATE, nullptr, &opened));
    const kzcat_new_track track = {
        .trail = trail, .source = {"a", -1, -1, nullptr}, .tags = tags, .tag_count = 3};
    EXPECT_EQ(KZCAT_OK, kzcat_add(opened, &track, 1, nullptr));
    kzcat_close(&opened);
    kzcat_trail_free(&trail);
    const json listed = json::parse(output_of({"list", "-f", "json", catalogue}));
    EXPECT_EQ((json{{"artist", {"One", "Two"}}, {"title", json::array({"Song"})}}), listed["tags"]);
}

} // namespace
