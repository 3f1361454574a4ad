// A built library, its map and its headers must have the same names. A name that is only in the
// library was exported by accident and would have to be kept; one that is only in a header does not
// link for users.

#include <algorithm>
#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include <elf.h>

#include <gtest/gtest.h>

#include "whole/abi/shared_library.hpp"

namespace {

using kz::test::Names;
using kz::test::SharedLibrary;
using kz::test::text_of;

Names names_of_library()
{
    Names names;
    for (const auto& exported : SharedLibrary(KZ_LIBRARY).exports()) {
        names.insert(exported.name);
    }
    return names;
}

Names all_matches(const std::string& text, const std::regex& pattern)
{
    Names found;
    for (std::sregex_iterator match(text.begin(), text.end(), pattern), end; match != end;
         ++match) {
        found.insert((*match)[1]);
    }
    return found;
}

Names names_of_map()
{
    std::string map = std::regex_replace(text_of(KZ_MAP), std::regex("#[^\n]*"), "");
    map.erase(map.find("local:"));
    return all_matches(map, std::regex(R"((\w+)\s*;)"));
}

std::vector<std::string> public_headers()
{
    std::ifstream in(KZ_HEADER_LIST);
    return {std::istream_iterator<std::string>(in), {}};
}

std::string without_comments(const std::string& source)
{
    std::string out;
    for (size_t i = 0; i < source.size();) {
        if (source.compare(i, 2, "/*") == 0) {
            i = source.find("*/", i) + 2;
        } else if (source.compare(i, 2, "//") == 0) {
            i = source.find('\n', i);
        } else {
            out += source[i++];
        }
    }
    return out;
}

/// A Java VM looks for these: its own jni.h declares the first, and a Java class the others.
bool is_called_by_java(const std::string& name)
{
    return name == "JNI_OnLoad" || name.starts_with("Java_");
}

/// What stands between KZ_API and the first bracket ends in the function's name.
Names names_of_headers()
{
    Names names;
    for (const auto& path : public_headers()) {
        const auto source = without_comments(text_of(path));
        names.merge(all_matches(source, std::regex(R"(\n\s*KZ_API\b[^(;]*?(\w+)\s*\()")));
    }
    return names;
}

Names only_in_first(const Names& first, const Names& second)
{
    Names rest;
    std::ranges::set_difference(first, second, std::inserter(rest, rest.end()));
    return rest;
}

TEST(ExportedNames, OfTheLibraryAreThoseOfTheMap)
{
    EXPECT_EQ(Names{}, only_in_first(names_of_library(), names_of_map())) << "leaked";
    EXPECT_EQ(Names{}, only_in_first(names_of_map(), names_of_library())) << "not in the library";
}

TEST(ExportedNames, OfTheMapAreThoseOfTheHeaders)
{
    auto of_map = names_of_map();
    std::erase_if(of_map, is_called_by_java);
    EXPECT_EQ(Names{}, only_in_first(of_map, names_of_headers())) << "in no header";
    EXPECT_EQ(Names{}, only_in_first(names_of_headers(), names_of_map())) << "not in the map";
}

TEST(ExportedNames, AreAllFunctions)
{
    for (const auto& exported : SharedLibrary(KZ_LIBRARY).exports()) {
        EXPECT_EQ(unsigned{STT_FUNC}, exported.type) << exported.name;
    }
}

// A program that was linked with this library requests this version, so that a later library may
// change what a name does under a new version and still serve the program.
TEST(ExportedNames, BearTheVersionOfTheInterface)
{
    Names versions;
    for (const auto& exported : SharedLibrary(KZ_LIBRARY).exports()) {
        versions.insert(exported.version);
    }
    EXPECT_EQ(Names{KZ_VERSION_NODE}, versions);
}

// Otherwise any program or library that happens to export the same name, for example sq_root, would
// be called instead.
TEST(ExportedNames, AreNotLookedUpFromWithin)
{
    EXPECT_EQ(Names{}, SharedLibrary(KZ_LIBRARY).own_names_looked_up());
}

// A name that is listed twice is an editing mistake.
TEST(ExportedNames, StandInTheMapOnce)
{
    const auto map = std::regex_replace(text_of(KZ_MAP), std::regex("#[^\n]*"), "");
    EXPECT_EQ(names_of_map().size() + 1, static_cast<size_t>(std::ranges::count(map, ';') - 1))
        << "names and the closing of `local: *;`";
}

TEST(SharedLibraryFile, BearsTheMajorVersionInItsName)
{
    EXPECT_EQ(Names{KZ_SONAME}, SharedLibrary(KZ_LIBRARY).dynamic_texts(DT_SONAME));
}

// Pages of 16 KiB are found on Android and on ARM servers.
TEST(SharedLibraryFile, LoadsWherePagesHaveSixteenKibibytes)
{
    const auto segments = SharedLibrary(KZ_LIBRARY).loaded_segments();
    EXPECT_FALSE(segments.empty());
    for (const auto& segment : segments) {
        EXPECT_EQ(0U, segment.p_align % 16384);
        EXPECT_EQ(segment.p_offset % 16384, segment.p_vaddr % 16384);
    }
}

// Whatever else it needed would have to be there in the right version wherever the library loads.
TEST(SharedLibraryFile, NeedsNothingButWhatIsNamed)
{
    if (KZ_SANITIZED) {
        GTEST_SKIP() << "sanitizers bring their own libraries";
    }
    const Names allowed{KZ_MAY_NEED};
    EXPECT_EQ(Names{}, only_in_first(SharedLibrary(KZ_LIBRARY).dynamic_texts(DT_NEEDED), allowed));
}

} // namespace
