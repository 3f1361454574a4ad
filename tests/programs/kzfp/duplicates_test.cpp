// `kzfp duplicates`: which files it groups.

#include "duplicates_fixture.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

TEST_F(Duplicates, AreFoundWithWhatTheyAreToTheBestOne)
{
    const std::vector<json> groups = groups_in(music());
    ASSERT_EQ(1u, groups.size());
    EXPECT_EQ(1, groups[0]["schema"]);
    EXPECT_EQ(1, groups[0]["group"]);
    EXPECT_EQ((std::map<std::string, std::string>{{"original.wav", "best"},
                                                  {"copy.wav", "identical bytes"},
                                                  {"same.flac", "identical sound"},
                                                  {"quieter.wav", "same recording"},
                                                  {"late.wav", "same recording"},
                                                  {"lossy.ogg", "same recording"},
                                                  {"excerpt.wav", "excerpt"}}),
              relations_in(groups[0]));
}

TEST_F(Duplicates, SayWhereAnExcerptBegins)
{
    const json files = groups_in(music()).at(0)["files"];
    EXPECT_EQ("excerpt.wav", name_in(files.back()));
    EXPECT_NEAR(8, files.back()["offset"].get<double>(), 0.2);
    EXPECT_NEAR(12, files.back()["seconds"].get<double>(), 0.2);
    EXPECT_TRUE(contains(output_of({"duplicates", music()}), "excerpt.wav, from 0:08.")) << music();
}

TEST_F(Duplicates, AreNotTunesThatShareAPassage)
{
    const ScratchDirectory scratch;
    const Samples shared = part(piece(3), 5, 12);
    scratch.write("a.wav", wav(piece(4) + shared));
    scratch.write("b.wav", wav(shared + piece(5)));
    EXPECT_EQ("no duplicates among 2 recordings\n", output_of({"duplicates", scratch.path()}));
}

TEST_F(Duplicates, DoNotJoinTunesThatAMixHolds)
{
    const ScratchDirectory scratch;
    scratch.write("a.wav", wav(piece(4)));
    scratch.write("b.wav", wav(piece(5)));
    scratch.write("mix.wav", wav(piece(4) + piece(5) + piece(6)));
    const std::vector<json> groups = groups_in(scratch.path());
    ASSERT_EQ(1u, groups.size());
    EXPECT_EQ((std::map<std::string, std::string>{
                  {"mix.wav", "best"}, {"a.wav", "excerpt"}, {"b.wav", "excerpt"}}),
              relations_in(groups[0]));
}

TEST_F(Duplicates, OfSilenceAreCopiesOnly)
{
    const ScratchDirectory scratch;
    scratch.write("a.wav", wav(silence(9)));
    encode(scratch, "b.flac", kFlac, silence(9));
    scratch.write("c.wav", wav(silence(20)));
    EXPECT_EQ("no duplicates among 2 recordings\n", output_of({"duplicates", scratch.path()}));
    scratch.write("copy.wav", wav(silence(9)));
    const std::vector<json> groups = groups_in(scratch.path());
    ASSERT_EQ(1u, groups.size());
    EXPECT_EQ(
        (std::map<std::string, std::string>{{"a.wav", "best"}, {"copy.wav", "identical bytes"}}),
        relations_in(groups[0]));
}

TEST_F(Duplicates, WithEqualTrailsMayStillSoundDifferent)
{
    const ScratchDirectory scratch;
    const Samples half = scaled(piece(8), 0.5);
    scratch.write("a.wav", wav(half));
    scratch.write("b.wav", wav(scaled(half, 2)));
    const json files = groups_in(scratch.path()).at(0)["files"];
    EXPECT_EQ(files[0]["track"], files[1]["track"]);
    EXPECT_EQ(0, files[1]["error_rate"]);
    EXPECT_EQ("same recording", files[1]["relation"]);
}

TEST_F(Duplicates, MayBeOtherNamesOfOneFile)
{
    const ScratchDirectory scratch;
    const std::string file = scratch.write("a.wav", wav(piece(8)));
    fs::create_symlink(file, scratch.path("b.wav"));
    fs::create_hard_link(file, scratch.path("c.wav"));
    EXPECT_EQ((std::map<std::string, std::string>{
                  {"a.wav", "best"}, {"b.wav", "same file"}, {"c.wav", "same file"}}),
              relations_in(groups_in(scratch.path()).at(0)));
    const std::string script = output_of({"duplicates", "--script", scratch.path()});
    EXPECT_FALSE(contains(script, "b.wav")) << script;
}

} // namespace
