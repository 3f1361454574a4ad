// What makes two recordings duplicates, and which file of a group is the best one: without files
// that sound.

#include <cmath>
#include <numbers>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzfp/duplicates/bandwidth.hpp"
#include "kzfp/duplicates/grouping.hpp"
#include "kzfp/duplicates/quality.hpp"

namespace {

using namespace kzfp;
using State = Quality::State;

/// Recordings with so many seconds of sound, of which so many agree.
kzcat_alignment alignment_of(double first, double second, double agreeing)
{
    kzcat_alignment alignment = {};
    alignment.found = agreeing > 0 ? 1 : 0;
    alignment.first_sounding = first;
    alignment.second_sounding = second;
    alignment.agreeing = agreeing;
    return alignment;
}

TEST(DuplicatesRelation, NeedsMostOfTheShorterOne)
{
    EXPECT_EQ(Relation::same, relation_of(alignment_of(200, 200, 141)));
    EXPECT_EQ(Relation::different, relation_of(alignment_of(200, 200, 139)));
    EXPECT_EQ(Relation::second_in_first, relation_of(alignment_of(200, 20, 15)));
    EXPECT_EQ(Relation::first_in_second, relation_of(alignment_of(20, 200, 15)));
    // A loop of 60 s that two tunes share.
    EXPECT_EQ(Relation::different, relation_of(alignment_of(200, 100, 60)));
}

TEST(DuplicatesRelation, IsNotBuiltOnAFewSeconds)
{
    EXPECT_EQ(Relation::different, relation_of(alignment_of(5.9, 5.9, 5.9)));
    EXPECT_EQ(Relation::same, relation_of(alignment_of(6, 6, 6)));
    EXPECT_EQ(Relation::different, relation_of(alignment_of(0, 0, 0)));
}

TEST(DuplicatesGroups, JoinCopiesOfCopies)
{
    const std::vector<Link> links = {{4, 1, Relation::same}, {1, 3, Relation::same}};
    const std::vector<Group> groups = group_recordings(5, links);
    ASSERT_EQ(3u, groups.size());
    EXPECT_EQ((std::vector<size_t>{0}), groups[0].whole);
    EXPECT_EQ((std::vector<size_t>{1, 3, 4}), groups[1].whole);
    EXPECT_EQ((std::vector<size_t>{2}), groups[2].whole);
}

TEST(DuplicatesGroups, AreNotJoinedByAMixOfBoth)
{
    // 0 and 1 are parts of 2; 3 is the same as 0.
    const std::vector<Link> links = {{2, 0, Relation::second_in_first},
                                     {1, 2, Relation::first_in_second},
                                     {0, 3, Relation::same}};
    const std::vector<Group> groups = group_recordings(4, links);
    ASSERT_EQ(3u, groups.size());
    EXPECT_EQ((std::vector<size_t>{0, 3}), groups[0].whole);
    EXPECT_TRUE(groups[0].excerpts.empty());
    EXPECT_EQ((std::vector<size_t>{2}), groups[2].whole);
    EXPECT_EQ((std::vector<size_t>{0, 1}), groups[2].excerpts);
}

TEST(DuplicatesGroups, HoldNoExcerptOfThemselves)
{
    const std::vector<Link> links = {{0, 1, Relation::same}, {1, 0, Relation::second_in_first}};
    const std::vector<Group> groups = group_recordings(2, links);
    ASSERT_EQ(1u, groups.size());
    EXPECT_TRUE(groups[0].excerpts.empty());
}

Quality lossless_file()
{
    Quality quality;
    quality.state = State::there;
    quality.lossless = true;
    quality.rate = 44100;
    quality.channels = 2;
    quality.seconds = quality.sounding = 180;
    quality.bit_rate = 900'000;
    quality.bandwidth = 20'500;
    return quality;
}

/// A file that differs from lossless_file() by what `change` does.
template <class Change>
Quality changed(Change change)
{
    Quality quality = lossless_file();
    change(quality);
    return quality;
}

TEST(DuplicatesQuality, PrefersByTheseRulesInThisOrder)
{
    const std::vector<Quality> falling = {
        lossless_file(),
        changed([](Quality& q) { q.silent = 3; }),
        changed([](Quality& q) { q.channels = 1; }),
        changed([](Quality& q) { q.wide = false, q.channels = 6; }),
        changed([](Quality& q) { q.wide = false, q.bandwidth = 16'000, q.channels = 6; }),
        changed([](Quality& q) { q.complete = false; }),
        changed([](Quality& q) { q.lossless = false, q.bit_rate = 128'000; }),
        changed([](Quality& q) { q.lossless = false, q.bit_rate = 96'000; }),
        changed([](Quality& q) { q.rate = 0; }),
        changed([](Quality& q) { q.state = State::unreadable; }),
    };
    for (size_t i = 0; i + 1 < falling.size(); ++i) {
        EXPECT_TRUE(is_better(falling[i], falling[i + 1])) << i;
        EXPECT_FALSE(is_better(falling[i + 1], falling[i])) << i;
    }
    EXPECT_FALSE(is_better(falling[0], falling[0]));
}

TEST(DuplicatesQuality, IsComparedWithTheRestOfTheGroup)
{
    std::vector<Quality> group = {lossless_file(), lossless_file(), lossless_file(),
                                  lossless_file(), lossless_file()};
    group[1].sounding = 178;
    group[2].bandwidth = 17'500;
    group[3].bandwidth = 24'000; // what a rate converter made of the first one
    group[4].bandwidth = 17'500;
    group[4].lossless = false; // no lossy one reaches higher
    std::vector<Quality*> places;
    for (Quality& quality : group) {
        places.push_back(&quality);
    }
    compare_among(places);
    std::string complete;
    std::string wide;
    for (const Quality& quality : group) {
        complete += quality.complete ? '1' : '0';
        wide += quality.wide ? '1' : '0';
    }
    EXPECT_EQ("10111", complete);
    EXPECT_EQ("11011", wide);
}

TEST(DuplicatesQuality, LossyIsInferiorIfNothingIsBetter)
{
    const Quality best = lossless_file();
    const auto lossy = [](auto change) {
        return changed([&](Quality& q) { q.lossless = false, change(q); });
    };
    EXPECT_TRUE(is_clearly_inferior(lossy([](Quality&) {}), best));
    EXPECT_FALSE(is_clearly_inferior(best, best));
    EXPECT_FALSE(is_clearly_inferior(lossy([](Quality& q) { q.channels = 6; }), best));
    EXPECT_FALSE(is_clearly_inferior(lossy([](Quality& q) { q.sounding = 190; }), best));
    EXPECT_FALSE(is_clearly_inferior(lossy([](Quality& q) { q.state = State::gone; }), best));
    // What came from a lossy file is no better for being kept without loss.
    const Quality transcoded = changed([](Quality& q) { q.bandwidth = 15'500; });
    EXPECT_FALSE(is_clearly_inferior(lossy([](Quality&) {}), transcoded));
}

/// The start of a file of Sony's Wave64, which names a chunk in 16 bytes.
std::string wave64(char form)
{
    return "riff" + std::string(36, '\0') + "fmt " + std::string(20, '\0') + form +
           std::string(1, '\0');
}

std::string mp4(const std::string& form, const std::string& title)
{
    return std::string("\0\0\0\x10"
                       "ftypM4A \0\0\0\0stsd",
                       20) +
           std::string(12, '\0') + form + title;
}

TEST(DuplicatesQuality, KnowsWhatKeepsAllOfTheSound)
{
    EXPECT_TRUE(is_lossless("fLaC"));
    EXPECT_TRUE(is_lossless(std::string("RIFF\0\0\0\0WAVEfmt \x10\0\0\0\1\0", 22)));
    EXPECT_FALSE(is_lossless(std::string("RIFF\0\0\0\0WAVEfmt \x10\0\0\0\x55\0", 22)));
    EXPECT_TRUE(is_lossless(std::string("OggS") + std::string(24, '\0') +
                            "\x7f"
                            "FLAC"));
    EXPECT_FALSE(is_lossless(std::string("OggS") + std::string(24, '\0') + "\1vorbis"));
    EXPECT_FALSE(is_lossless("ID3"));
    EXPECT_TRUE(is_lossless(std::string("ID3\4\0\0\0\0\0\3***fLaC", 17)));
    EXPECT_TRUE(is_lossless(std::string("RIFX\0\0\0\0WAVEfmt \0\0\0\x10\0\1", 22)));
    EXPECT_TRUE(is_lossless(wave64(1)));
    EXPECT_FALSE(is_lossless(wave64(0x11)));
    EXPECT_TRUE(is_lossless(std::string(".snd\0\0\0\x18\0\0\0\0\0\0\0\3", 16)));
    EXPECT_FALSE(is_lossless(std::string(".snd\0\0\0\x18\0\0\0\0\0\0\0\1", 16)));
    EXPECT_TRUE(is_lossless(mp4("alac", "")));
    EXPECT_FALSE(is_lossless(mp4("mp4a", "Palace")));
    EXPECT_FALSE(is_lossless("RIFF"));
    EXPECT_FALSE(is_lossless(""));
}

TEST(DuplicatesBandwidth, IsWhereTheSoundEnds)
{
    constexpr uint32_t kRate = 44100;
    std::vector<float> samples(kRate);
    for (size_t i = 0; i < samples.size(); ++i) {
        const double turns = 2 * std::numbers::pi * static_cast<double>(i) / kRate;
        samples[i] =
            static_cast<float>(0.5 * std::sin(100 * turns) + 0.01 * std::sin(9000 * turns));
    }
    EXPECT_NEAR(9000, bandwidth_of(samples, kRate), 500);
    EXPECT_EQ(0, bandwidth_of(std::vector<float>(kRate), kRate));
    EXPECT_EQ(0, bandwidth_of(std::vector<float>(100, 0.5F), kRate));
}

} // namespace
