// This tree keeps the rules of layers.hpp. A request falls through the library from top to bottom
// and never climbs back; what is built on the library sees only its public headers.

#include <algorithm>
#include <fstream>

#include <gtest/gtest.h>

#include "whole/layers/layers.hpp"

namespace {

using layers::Complaints;
using layers::Names;

class Layers : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        std::ifstream in(KZ_LAYERS);
        plan_ = layers::read_plan(in);
        tree_ = layers::read_tree(KZ_SOURCE_DIR);
        ASSERT_GT(plan_.rooms.size(), 8u) << "no plan of the rooms in " KZ_LAYERS;
        ASSERT_GT(tree_.files.size(), 200u) << "no sources in " KZ_SOURCE_DIR;
    }

    static inline layers::Plan plan_;
    static inline layers::Tree tree_;
};

TEST_F(Layers, AreDeclaredForEverySource)
{
    EXPECT_EQ(Complaints{}, layers::undeclared_folders(plan_, tree_))
        << "see kz_house in CMakeLists.txt and the list of rooms in the CMakeLists.txt of a "
           "library";
}

TEST_F(Layers, AreSeenOnlyByFoldersThatMay)
{
    EXPECT_EQ(Complaints{}, layers::folders_seeing_too_much(plan_, tree_))
        << "see kz_house in CMakeLists.txt";
}

TEST_F(Layers, IncludeOnlyWhatLiesBelow)
{
    EXPECT_EQ(Complaints{}, layers::rooms_including_upwards(plan_, tree_));
}

TEST_F(Layers, AreEnteredThroughTheirDoors)
{
    EXPECT_EQ(Complaints{}, layers::ways_around_doors(plan_, tree_))
        << "see DOOR in the room's CMakeLists.txt";
}

TEST_F(Layers, SpellIncludesFromTheRoot)
{
    EXPECT_EQ(Complaints{}, layers::includes_not_from_the_root(tree_));
}

TEST_F(Layers, KeepPrivateHeadersOutOfPublicOnes)
{
    EXPECT_EQ(Complaints{}, layers::private_headers_in_public_ones(tree_));
}

TEST_F(Layers, DeclareEveryPublicHeader)
{
    EXPECT_EQ(Complaints{}, layers::public_headers_not_declared(plan_, tree_))
        << "see HEADERS in the room's CMakeLists.txt; a private header is a .hpp";
}

TEST_F(Layers, UseNoStrangersHeaders) { EXPECT_EQ(Complaints{}, layers::foreign_headers(tree_)); }

// What the loops and the fingerprinters share is private to them.
TEST_F(Layers, ExportNothingFromSharedPlumbing)
{
    for (const auto* room : {"kzsdk/kernels", "kzsdk/qv"}) {
        EXPECT_EQ(Names{}, plan_.rooms.at(room).headers) << room;
    }
}

TEST_F(Layers, LetDiscsStandAlone)
{
    EXPECT_EQ(Names{"kzsdk/abs"}, plan_.rooms.at("kzsdk/disc").below);
    EXPECT_TRUE(std::ranges::none_of(
        plan_.rooms, [](const auto& room) { return room.second.below.contains("kzsdk/disc"); }));
}

// The fingerprinters share only qv and what lies below it; sound, text and discs are unrelated. How
// clips are recognised does not depend on where tracks are kept.
TEST_F(Layers, KeepIndependentRoomsApart)
{
    for (const auto& apart :
         {Names{"kzsdk/qvfixed", "kzsdk/qvfloat"}, Names{"kzsdk/dsp", "kzsdk/xml", "kzsdk/disc"},
          Names{"catalogue/match", "catalogue/store"}}) {
        for (const auto& room : apart) {
            for (const auto& below : plan_.rooms.at(room).below) {
                EXPECT_FALSE(apart.contains(below)) << room << " may include " << below;
            }
        }
    }
}

TEST_F(Layers, KeepTheBridgeOnTop)
{
    ASSERT_TRUE(plan_.rooms.contains("kzsdk/jni"));
    for (const auto& [name, room] : plan_.rooms) {
        EXPECT_FALSE(room.below.contains("kzsdk/jni")) << name;
    }
}

TEST_F(Layers, RestOnTheLowestRoom)
{
    for (const auto& [name, room] : plan_.rooms) {
        const std::string lowest = name.starts_with("kzsdk/") ? "kzsdk/abs" : "catalogue/model";
        EXPECT_EQ(name != lowest, room.below.contains(lowest)) << name;
    }
}

} // namespace
