// Each rule of layers.hpp reports the tree that breaks it, and nothing else: shown on a made-up
// tree with two libraries, a tool, a benchmark and a test.

#include <sstream>

#include <gtest/gtest.h>

#include "whole/layers/layers.hpp"

namespace {

using layers::Complaints;

layers::Plan made_up_plan()
{
    std::istringstream lines(
        "house kzsdk public= sees= inside=\n"
        "house catalogue public=kzsdk sees= inside=\n"
        "house examples public=kzsdk,catalogue sees= inside=\n"
        "house tools/kzfp public=kzsdk,catalogue sees= inside=\n"
        "house bench public= sees=kzsdk inside=\n"
        "house tests public= sees= inside=kzsdk\n"
        "room kzsdk/low below= door= headers=low.h\n"
        "room kzsdk/loops below=kzsdk/low door=door.hpp headers=\n"
        "room kzsdk/high below=kzsdk/loops,kzsdk/low door= headers=high.h,more.h\n"
        "room catalogue/plain below= door= headers=\n"
        "room catalogue below=catalogue/plain door= headers=kzcat.h\n"
        "test tests/library/low/low_test rooms=kzsdk/low\n");
    return layers::read_plan(lines);
}

/// A tree that keeps every rule.
layers::Tree made_up_tree()
{
    layers::Tree tree;
    const auto file = [&tree](const std::string& name, const std::string& text) {
        std::istringstream in(text);
        layers::read_includes(name, in, tree);
    };
    file("kzsdk/kzsdk.h", "#include \"kzsdk/high/high.h\"\n");
    file("kzsdk/kzsdk.hpp", "#include \"kzsdk/high/high.h\"\n#include <vector>\n");
    file("kzsdk/low/low.h", "#include <stdint.h>\n");
    file("kzsdk/low/low.cpp", "#include \"kzsdk/low/low.h\"\n#include <span>\n");
    file("kzsdk/loops/door.hpp", "#include \"kzsdk/low/low.h\"\n");
    file("kzsdk/loops/inner.hpp", "");
    file("kzsdk/high/high.h", "#include \"kzsdk/low/low.h\"\n");
    file("kzsdk/high/more.h", "");
    file("kzsdk/high/high.cpp", "#include \"kzsdk/loops/door.hpp\"\n");
    file("catalogue/kzcat.h", "");
    file("catalogue/kzcat.hpp", "#include \"kzcat.h\"\n#include \"kzsdk/kzsdk.hpp\"\n");
    file("examples/example.cpp", "#include \"kzcat.hpp\"\n#include \"kzsdk/kzsdk.hpp\"\n");
    file("catalogue/plain/plain.cpp", "#include \"kzsdk/high/high.h\"\n#include <vector>\n");
    file("catalogue/plain/plain.hpp", "#include <string>\n");
    file("catalogue/index.cpp",
         "#include \"kzsdk/kzsdk.h\"\n#include \"catalogue/plain/plain.hpp\"\n");
    file("tools/kzfp/main.cpp", "#include \"kzsdk/high/high.h\"\n#include \"kzcat.h\"\n");
    file("bench/bench.cpp", "#include \"kzsdk/loops/door.hpp\"\n");
    file("tests/loops_test.cpp", "#include \"kzsdk/loops/inner.hpp\"\n#include <gtest/gtest.h>\n");
    return tree;
}

Complaints all_complaints(const layers::Tree& tree)
{
    const auto plan = made_up_plan();
    Complaints all;
    for (const auto& found :
         {layers::undeclared_folders(plan, tree), layers::folders_seeing_too_much(plan, tree),
          layers::rooms_including_upwards(plan, tree), layers::ways_around_doors(plan, tree),
          layers::includes_not_from_the_root(tree), layers::private_headers_in_public_ones(tree),
          layers::public_headers_not_declared(plan, tree), layers::foreign_headers(tree)}) {
        all.insert(all.end(), found.begin(), found.end());
    }
    return all;
}

/// The made-up tree, in which this file includes one thing more.
layers::Tree tree_with(const std::string& file, const std::string& include)
{
    auto tree = made_up_tree();
    std::istringstream in("#include " + include + "\n");
    layers::read_includes(file, in, tree);
    return tree;
}

TEST(LayerRules, AcceptATreeThatKeepsThem)
{
    EXPECT_EQ(Complaints{}, all_complaints(made_up_tree()));
}

TEST(LayerRules, ReadNumberAndSpellingOfAnInclude)
{
    layers::Tree tree;
    std::istringstream in("// #include \"no.h\"\n  #  include <span> // why\n");
    layers::read_includes("a.cpp", in, tree);
    ASSERT_EQ(1u, tree.includes.size());
    EXPECT_EQ(2, tree.includes[0].line);
    EXPECT_EQ("span", tree.includes[0].what);
    EXPECT_FALSE(tree.includes[0].quoted);
}

TEST(LayerRules, RefuseASourceInNoDeclaredFolder)
{
    const auto tree = tree_with("elsewhere/new.cpp", "<span>");
    EXPECT_EQ(Complaints{"elsewhere/new.cpp"}, layers::undeclared_folders(made_up_plan(), tree));
}

TEST(LayerRules, RefuseASourceInNoDeclaredRoom)
{
    for (const std::string file : {"kzsdk/attic/new.cpp", "catalogue/attic/new.cpp"}) {
        const auto tree = tree_with(file, "<span>");
        EXPECT_EQ(Complaints{file}, layers::undeclared_folders(made_up_plan(), tree));
    }
}

TEST(LayerRules, RefuseALibraryThatLooksOutside)
{
    const auto tree = tree_with("kzsdk/high/high.cpp", "\"kzcat.h\"");
    const Complaints expected = {"kzsdk/high/high.cpp:1 includes kzcat.h"};
    EXPECT_EQ(expected, layers::folders_seeing_too_much(made_up_plan(), tree));
    EXPECT_EQ(expected, layers::rooms_including_upwards(made_up_plan(), tree));
    EXPECT_EQ(expected, layers::foreign_headers(tree));
}

TEST(LayerRules, RefuseAPrivateHeaderOfTheLibrary)
{
    for (const auto* file : {"catalogue/index.cpp", "tools/kzfp/main.cpp"}) {
        const auto tree = tree_with(file, "\"kzsdk/loops/door.hpp\"");
        EXPECT_EQ(Complaints{std::string(file) + ":1 includes kzsdk/loops/door.hpp"},
                  layers::folders_seeing_too_much(made_up_plan(), tree));
    }
}

TEST(LayerRules, RefuseAPrivateHeaderByADetour)
{
    const auto tree = tree_with("tools/kzfp/main.cpp", "\"../../kzsdk/loops/door.hpp\"");
    EXPECT_EQ(Complaints{"tools/kzfp/main.cpp:1 includes ../../kzsdk/loops/door.hpp"},
              layers::folders_seeing_too_much(made_up_plan(), tree));
}

TEST(LayerRules, RefuseAFolderThatIsNotAllowed)
{
    const auto tree = tree_with("catalogue/index.cpp", "\"tests/loops_test.cpp\"");
    EXPECT_EQ(Complaints{"catalogue/index.cpp:1 includes tests/loops_test.cpp"},
              layers::folders_seeing_too_much(made_up_plan(), tree));
}

TEST(LayerRules, RefuseAnIncludeUpwards)
{
    const auto tree = tree_with("kzsdk/low/low.cpp", "\"kzsdk/high/high.h\"");
    EXPECT_EQ(Complaints{"kzsdk/low/low.cpp:1 includes kzsdk/high/high.h"},
              layers::rooms_including_upwards(made_up_plan(), tree));
    const auto other = tree_with("catalogue/plain/plain.cpp", "\"kzcat.h\"");
    EXPECT_EQ(Complaints{"catalogue/plain/plain.cpp:1 includes kzcat.h"},
              layers::rooms_including_upwards(made_up_plan(), other));
}

TEST(LayerRules, RefuseARoomThatIncludesTheUmbrella)
{
    const auto tree = tree_with("kzsdk/low/low.cpp", "\"kzsdk/kzsdk.h\"");
    EXPECT_EQ(Complaints{"kzsdk/low/low.cpp:1 includes kzsdk/kzsdk.h"},
              layers::rooms_including_upwards(made_up_plan(), tree));
}

TEST(LayerRules, RefuseAWayAroundADoor)
{
    for (const auto* file : {"kzsdk/high/high.cpp", "bench/bench.cpp"}) {
        const auto tree = tree_with(file, "\"kzsdk/loops/inner.hpp\"");
        EXPECT_EQ(Complaints{std::string(file) + ":1 includes kzsdk/loops/inner.hpp"},
                  layers::ways_around_doors(made_up_plan(), tree));
    }
}

TEST(LayerRules, RefuseAnIncludeNotFromTheRoot)
{
    const auto tree = tree_with("kzsdk/low/low.cpp", "\"low.h\"");
    EXPECT_EQ(Complaints{"kzsdk/low/low.cpp:1 includes low.h"},
              layers::includes_not_from_the_root(tree));
}

TEST(LayerRules, RefuseAHeaderSpelledAsUsersCannot)
{
    for (const std::string file : {"catalogue/index.cpp", "tools/kzfp/main.cpp"}) {
        const auto tree = tree_with(file, "\"catalogue/kzcat.h\"");
        EXPECT_EQ(Complaints{file + ":1 includes catalogue/kzcat.h"},
                  layers::includes_not_from_the_root(tree));
    }
}

TEST(LayerRules, RefuseAPrivateHeaderInAPublicOne)
{
    const auto tree = tree_with("kzsdk/high/high.h", "\"kzsdk/loops/door.hpp\"");
    EXPECT_EQ(Complaints{"kzsdk/high/high.h:1 includes kzsdk/loops/door.hpp"},
              layers::private_headers_in_public_ones(tree));
}

TEST(LayerRules, RefuseAPublicHeaderNotDeclared)
{
    for (const std::string file : {"kzsdk/high/new.h", "catalogue/plain/new.h"}) {
        const auto tree = tree_with(file, "<stdint.h>");
        EXPECT_EQ(Complaints{file}, layers::public_headers_not_declared(made_up_plan(), tree));
    }
}

TEST(LayerRules, RefuseContainersAndStrangers)
{
    for (const std::string what : {"vector", "string", "sndfile.h", "unistd.h", "jni.h"}) {
        const auto tree = tree_with("kzsdk/high/high.cpp", "<" + what + ">");
        EXPECT_EQ(Complaints{"kzsdk/high/high.cpp:1 includes " + what},
                  layers::foreign_headers(tree));
    }
}

TEST(LayerRules, RefuseStrangersInTheHeadersForCxx)
{
    for (const std::string what : {"sndfile.h", "unistd.h", "sqlite3.h"}) {
        const auto tree = tree_with("kzsdk/kzsdk.hpp", "<" + what + ">");
        EXPECT_EQ(Complaints{"kzsdk/kzsdk.hpp:1 includes " + what}, layers::foreign_headers(tree));
    }
    const auto inward = tree_with("catalogue/kzcat.hpp", "\"kzsdk/loops/door.hpp\"");
    EXPECT_EQ(Complaints{"catalogue/kzcat.hpp:1 includes kzsdk/loops/door.hpp"},
              layers::folders_seeing_too_much(made_up_plan(), inward));
    const auto upwards = tree_with("kzsdk/low/low.cpp", "\"kzsdk/kzsdk.hpp\"");
    EXPECT_EQ(Complaints{"kzsdk/low/low.cpp:1 includes kzsdk/kzsdk.hpp"},
              layers::rooms_including_upwards(made_up_plan(), upwards));
}

TEST(LayerRules, LetTheCatalogueUseTheCxxLibraryOnly)
{
    for (const std::string what : {"iostream", "sndfile.h", "boost/regex.hpp", "unistd.h"}) {
        const auto tree = tree_with("catalogue/index.cpp", "<" + what + ">");
        EXPECT_EQ(Complaints{"catalogue/index.cpp:1 includes " + what},
                  layers::foreign_headers(tree));
    }
}

TEST(LayerRules, LetOneRoomAloneMeetTheDatabase)
{
    EXPECT_EQ(Complaints{},
              layers::foreign_headers(tree_with("catalogue/store/file.cpp", "<sqlite3.h>")));
    EXPECT_EQ(Complaints{"catalogue/plain/plain.cpp:1 includes sqlite3.h"},
              layers::foreign_headers(tree_with("catalogue/plain/plain.cpp", "<sqlite3.h>")));
}

TEST(LayerRules, LetOneFolderAloneMeetServers)
{
    const std::string inside = "catalogue/store/postgresql/file.cpp";
    EXPECT_EQ(Complaints{}, layers::foreign_headers(tree_with(inside, "<libpq-fe.h>")));
    EXPECT_EQ(Complaints{"catalogue/store/file.cpp:1 includes libpq-fe.h"},
              layers::foreign_headers(tree_with("catalogue/store/file.cpp", "<libpq-fe.h>")));
}

TEST(LayerRules, RefuseAFileThatIsNotThere)
{
    const auto tree = tree_with("kzsdk/high/high.cpp", "\"generated.hpp\"");
    EXPECT_EQ(Complaints{"kzsdk/high/high.cpp:1 includes generated.hpp"},
              layers::foreign_headers(tree));
}

} // namespace
