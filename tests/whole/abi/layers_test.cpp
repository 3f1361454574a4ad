// A request falls through the house from top to bottom and never climbs back: a room includes only
// rooms below it.

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace {

namespace fs = std::filesystem;

const fs::path kRoot = KZ_SOURCE_DIR;

/// Each room with the rooms that it may include besides itself.
const std::map<std::string, std::set<std::string>> kBelow = {
    {"abs", {}},
    {"kernels", {"abs"}},
    {"xml", {"abs"}},
    {"dsp", {"abs", "kernels"}},
    {"disc", {"abs"}},
    {"qv", {"abs", "kernels", "xml", "dsp"}},
    {"qvfixed", {"abs", "kernels", "xml", "dsp", "qv"}},
    {"qvfloat", {"abs", "kernels", "xml", "dsp", "qv"}},
    {"fpx", {"abs", "kernels", "xml", "dsp", "qv", "qvfixed", "qvfloat"}},
    {"jni", {"abs", "kernels", "xml", "dsp", "qv", "qvfixed", "qvfloat", "fpx"}},
};

struct Include {
    std::string where; ///< file and line
    fs::path file;     ///< the file that includes, below the root
    std::string what;
    bool quoted;
};

std::vector<Include> includes_of(const fs::path& path)
{
    static const std::regex kInclude(R"(^\s*#\s*include\s*([<"])([^>"]+)[>"])");
    std::vector<Include> found;
    std::ifstream in(path);
    std::string line;
    for (int number = 1; std::getline(in, line); ++number) {
        std::smatch match;
        if (std::regex_search(line, match, kInclude)) {
            const auto file = fs::relative(path, kRoot);
            found.push_back(
                {file.string() + ":" + std::to_string(number), file, match[2], match[1] == "\""});
        }
    }
    return found;
}

std::vector<Include> library_includes()
{
    std::vector<Include> found;
    for (const auto& entry : fs::recursive_directory_iterator(kRoot / "kzsdk")) {
        const auto extension = entry.path().extension();
        if (extension == ".h" || extension == ".hpp" || extension == ".cpp") {
            std::ranges::move(includes_of(entry.path()), std::back_inserter(found));
        }
    }
    return found;
}

/// kzsdk/<room>/... gives the room; the umbrella header lies in none.
std::string room_of(const fs::path& path)
{
    const auto parent = path.parent_path();
    return parent == "kzsdk" ? "" : std::next(parent.begin())->string();
}

TEST(Layers, AreAllNamedHere)
{
    for (const auto& entry : fs::directory_iterator(kRoot / "kzsdk")) {
        if (entry.is_directory()) {
            EXPECT_TRUE(kBelow.contains(entry.path().filename().string())) << entry.path();
        }
    }
}

TEST(Layers, IncludeOnlyWhatLiesBelow)
{
    const auto includes = library_includes();
    ASSERT_GT(includes.size(), 50u) << "the files were not found";
    for (const auto& include : includes) {
        const auto room = room_of(include.file);
        if (!include.quoted || room.empty()) {
            continue;
        }
        const auto included = room_of(include.what);
        EXPECT_TRUE(included == room || kBelow.at(room).contains(included))
            << include.where << " includes " << include.what;
    }
}

// One spelling of a name serves in the tree and once installed.
TEST(Layers, SpellIncludesFromTheRoot)
{
    for (const auto& include : library_includes()) {
        if (include.quoted) {
            EXPECT_TRUE(include.what.starts_with("kzsdk/")) << include.where;
        }
    }
}

// A private header is not installed, so a public one that includes it does not compile for users.
TEST(Layers, KeepPrivateHeadersOutOfPublicOnes)
{
    for (const auto& include : library_includes()) {
        if (include.file.extension() == ".h") {
            EXPECT_TRUE(include.what.ends_with(".h")) << include.where;
        }
    }
}

// What the fingerprinters share is nobody else's business.
TEST(Layers, ExportNothingFromTheSharedPlumbing)
{
    for (const auto& entry : fs::directory_iterator(kRoot / "kzsdk" / "qv")) {
        EXPECT_NE(".h", entry.path().extension()) << entry.path();
    }
}

// Containers, strings and streams would allocate behind the allocator's back and need the C++
// run-time library where the library loads.
TEST(Layers, UseNoContainersOrStreams)
{
    const std::set<std::string> refused = {
        "deque",    "exception",     "fstream",       "functional", "iostream", "istream",
        "list",     "map",           "mutex",         "ostream",    "queue",    "regex",
        "set",      "sstream",       "stack",         "stdexcept",  "string",   "thread",
        "typeinfo", "unordered_map", "unordered_set", "vector",
    };
    for (const auto& include : library_includes()) {
        EXPECT_FALSE(refused.contains(include.what))
            << include.where << " includes " << include.what;
    }
}

} // namespace
