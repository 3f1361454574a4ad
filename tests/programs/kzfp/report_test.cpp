// `kzfp match --report`: the page that shows why.

#include "kzfp.hpp"

#include <algorithm>
#include <cstdlib>
#include <filesystem>

#include <gtest/gtest.h>

#include "programs/report/xml.hpp"
#include "recordings.hpp"

namespace {

using namespace kz::test;
using report::test::Element;
using report::test::elements_of;

/// A catalogue of two pieces of 30 s, made once; tests only read it.
class MatchReports : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        const std::string one = scratch_->write("one.wav", wav(piece(1)));
        const std::string two = scratch_->write("two.wav", wav(piece(2)));
        const ProcessResult result = kzfp({"add", catalogue(), one, two});
        ASSERT_EQ(0, result.status) << result.err;
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static std::string catalogue() { return scratch_->path("music.kzc"); }
    static std::string page_path() { return scratch_->path("page.html"); }

    /// A clip out of a piece, `faster` times as fast.
    static std::string clip_of(const std::string& name, uint64_t seed, double from,
                               double faster = 1)
    {
        const std::vector<int16_t> samples = part(piece(seed), from, 15);
        const std::string bytes = wav(samples).substr(wav_header(kPieceRate, 1, 0).size());
        const auto rate = static_cast<uint32_t>(kPieceRate * faster);
        return scratch_->write(name,
                               wav_header(rate, 1, static_cast<uint32_t>(bytes.size())) + bytes);
    }

    static ProcessResult match(std::vector<std::string> arguments, const ProcessSetup& setup = {})
    {
        arguments.insert(arguments.begin(), {"match", "--report", page_path(), catalogue()});
        return kzfp(arguments, setup);
    }

    /// The page of a run that succeeds.
    static std::string page_of(const std::vector<std::string>& arguments)
    {
        const ProcessResult result = match(arguments);
        EXPECT_EQ(0, result.status) << result.err;
        return contents(page_path());
    }

    static ScratchDirectory* scratch_;
};

ScratchDirectory* MatchReports::scratch_ = nullptr;

/// Pictures of the codes' strips and of spectrograms.
size_t pictures_in(const std::string& page, const std::string& kind)
{
    const auto images = elements_of(page, "image");
    return static_cast<size_t>(
        std::count_if(images.begin(), images.end(), [&kind](const Element& image) {
            return image.attributes.at("class") == kind;
        }));
}

/// The first "4.8 % differ" of a page.
double differing_bits(const std::string& page)
{
    const size_t end = page.find(" % differ;");
    if (end == std::string::npos) {
        ADD_FAILURE() << "the page has no share of differing bits";
        return 100;
    }
    return std::atof(page.c_str() + page.rfind(' ', end - 1));
}

TEST_F(MatchReports, ShowCodesSpectrogramsAndValues)
{
    const std::string page = page_of({clip_of("clip.wav", 1, 8.3)});
    EXPECT_EQ(3u, pictures_in(page, "picture"));
    EXPECT_EQ(2u, pictures_in(page, "smooth"));
    EXPECT_TRUE(contains(page, "The 30 values"));
    EXPECT_TRUE(contains(page, "The clip was recognised."));
    EXPECT_LT(differing_bits(page), 12);
}

TEST_F(MatchReports, UndoTheSpeedOfAClip)
{
    const std::string page = page_of({clip_of("fast.wav", 1, 8.3, 1.03)});
    EXPECT_TRUE(contains(page, "3.0 % faster"));
    EXPECT_LT(differing_bits(page), 12);
}

TEST_F(MatchReports, ShowASetList)
{
    std::vector<int16_t> mix = part(piece(2), 5, 20);
    for (const uint64_t seed : {uint64_t{1}, uint64_t{2}}) {
        const std::vector<int16_t> more = part(piece(seed), 2, 20);
        mix.insert(mix.end(), more.begin(), more.end());
    }
    const std::string page = page_of({"--all", scratch_->write("mix.wav", wav(mix))});
    EXPECT_TRUE(contains(page, "What ran when"));
    EXPECT_TRUE(contains(page, "two (2), 0:"));
    EXPECT_EQ(9u, pictures_in(page, "picture"));
}

TEST_F(MatchReports, ShowWhatWasNotRecognised)
{
    const std::string page = page_of({clip_of("stranger.wav", 77, 3)});
    EXPECT_TRUE(contains(page, "no match"));
    EXPECT_EQ(0u, pictures_in(page, "picture"));
    EXPECT_EQ(1u, pictures_in(page, "smooth"));
}

TEST_F(MatchReports, OfTrailsShowCodesAlone)
{
    const std::string page =
        page_of({scratch_->write("clip.kzt", trail_file(part(piece(2), 6, 15)))});
    EXPECT_EQ(3u, pictures_in(page, "picture"));
    EXPECT_EQ(0u, pictures_in(page, "smooth"));
    EXPECT_LT(differing_bits(page), 35);
}

TEST_F(MatchReports, ListAllClipsAndWhatFailed)
{
    const ProcessResult result =
        match({clip_of("clip.wav", 1, 8), scratch_->path("nothing.wav"), clip_of("b.wav", 2, 8)});
    EXPECT_EQ(1, result.status);
    const std::string page = contents(page_path());
    EXPECT_EQ(3u, elements_of(page, "section").size());
    EXPECT_TRUE(contains(page, "2 of 3 clips were recognised."));
    EXPECT_TRUE(contains(page, "No such file or directory"));
}

TEST_F(MatchReports, TimesAreThoseOfTheFile)
{
    const std::string clip = scratch_->write("long.wav", wav(piece(1)));
    const std::string page = page_of({"--start", "12", "--length", "10", clip});
    EXPECT_FALSE(contains(page, ">0:02<"));
    EXPECT_TRUE(contains(page, ">0:14<"));
}

TEST_F(MatchReports, SayThatATrackIsNotAtHand)
{
    const std::string gone = scratch_->write("gone.wav", wav(piece(3)));
    const std::string other = scratch_->path("other.kzc");
    ASSERT_EQ(0, kzfp({"add", other, gone}).status);
    std::filesystem::remove(gone);
    const ProcessResult result =
        kzfp({"match", "--report", page_path(), other, clip_of("clip.wav", 3, 8)});
    EXPECT_EQ(0, result.status) << result.err;
    const std::string page = contents(page_path());
    EXPECT_TRUE(contains(page, "gone.wav is not at hand."));
    EXPECT_EQ(1u, pictures_in(page, "smooth"));
}

TEST_F(MatchReports, SayThatAPipeIsReadOnce)
{
    const std::string bytes = wav(part(piece(1), 8, 15));
    const ProcessResult result = match({"-"}, fed_with(bytes));
    EXPECT_EQ(0, result.status) << result.err;
    EXPECT_TRUE(contains(contents(page_path()), "what comes through a pipe is read once"));
}

TEST_F(MatchReports, ReplaceNoFileThatIsRead)
{
    const std::string clip = clip_of("clip.wav", 1, 8);
    const std::string before = contents(clip);
    for (const std::string& path : {clip, catalogue()}) {
        const ProcessResult result = kzfp({"match", "--report", path, catalogue(), clip});
        EXPECT_EQ(1, result.status);
        EXPECT_TRUE(contains(result.err, "--report needs another file")) << result.err;
    }
    EXPECT_EQ(before, contents(clip));
    EXPECT_EQ(0, kzfp({"match", catalogue(), clip}).status);
}

TEST_F(MatchReports, AFullDiskIsReported)
{
    const ProcessResult result =
        kzfp({"match", "--report", "/dev/full", catalogue(), clip_of("clip.wav", 1, 8)});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "No space left on device")) << result.err;
    EXPECT_TRUE(contains(result.out, "one.wav")) << result.out;
}

} // namespace
