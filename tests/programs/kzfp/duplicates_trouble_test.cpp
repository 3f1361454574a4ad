// What `kzfp duplicates` does with what cannot be read, and when its results cannot be written.

#include "kzfp.hpp"

#include <algorithm>
#include <filesystem>

#include <sys/stat.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

/// The groups that are found.
std::vector<json> groups_in(const std::string& path)
{
    return lines_of(output_of({"duplicates", "--format", "json", path}));
}

TEST(DuplicatesTrouble, AreLookedForAmongTheFilesThatCanBeRead)
{
    const ScratchDirectory scratch;
    const std::string whole = wav(piece(1, 12));
    const std::vector<std::string> bad = {scratch.write("cut.wav", whole.substr(0, 30)),
                                          scratch.write("empty.wav", ""),
                                          scratch.write("short.wav", wav(piece(1, 0.2))),
                                          scratch.write("text.wav", "no sound at all")};
    scratch.write("a.wav", whole);
    scratch.write("b.wav", whole);
    const std::string missing = scratch.path("missing.wav");
    const ProcessResult result = kzfp({"duplicates", "-f", "json", scratch.path(), missing});
    EXPECT_EQ(1, result.status);
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(6u, lines.size());
    for (size_t i = 0; i < bad.size(); ++i) {
        EXPECT_EQ(bad[i], lines[i]["file"]);
        EXPECT_NE("", lines[i]["error"]);
        EXPECT_TRUE(contains(result.err, bad[i] + ": ")) << result.err;
    }
    EXPECT_EQ(missing, lines[4]["file"]);
    EXPECT_EQ(2u, lines[5]["files"].size());
}

TEST(DuplicatesTrouble, AScriptHasNoFormat)
{
    for (const char* format : {"human", "json", "csv"}) {
        const ProcessResult result = kzfp({"duplicates", "--script", "-f", format, "/dev"});
        EXPECT_EQ(2, result.status);
        EXPECT_EQ("", result.out);
        EXPECT_TRUE(contains(result.err, "--script: prints a shell script, which has no other "
                                         "form; leave --format out, or --script"))
            << result.err;
    }
    EXPECT_TRUE(contains(kzfp({"duplicates", "--script"}).err, "FILE is required"));
}

TEST(DuplicatesTrouble, PassOverWhatIsNoFileAnyMore)
{
    const ScratchDirectory scratch;
    const std::string a = scratch.write("a.wav", wav(piece(1, 12)));
    const std::string b = scratch.write("b.wav", wav(piece(1, 12)));
    const std::string catalogue = scratch.path("c.kzc");
    output_of({"add", catalogue, a, b});
    fs::remove(b);
    ASSERT_EQ(0, ::mkfifo(b.c_str(), 0600)); // would keep a reader waiting for ever
    const json file = groups_in(catalogue).at(0)["files"][1];
    EXPECT_EQ("unreadable", file["state"]);
    EXPECT_TRUE(contains(file["error"], "no regular file")) << file;
    scratch.write("a.wav", "no sound at all");
    EXPECT_EQ(false, groups_in(catalogue).at(0)["files"][0]["best"]);
}

TEST(DuplicatesTrouble, OfADamagedCatalogueAreThoseOfTheRest)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    for (uint64_t seed = 1; seed <= 2; ++seed) {
        const std::string name = std::to_string(seed);
        output_of({"add", catalogue, scratch.write(name + ".wav", wav(piece(seed, 12))),
                   scratch.write(name + "b.wav", wav(piece(seed, 12)))});
    }
    const std::string trail = trail_file(piece(2, 12));
    std::string bytes = contents(catalogue);
    const size_t codes = bytes.find(trail.substr(trail.size() - 100));
    ASSERT_NE(std::string::npos, codes);
    bytes[codes] = static_cast<char>(bytes[codes] ^ 1);
    scratch.write("c.kzc", bytes);
    const ProcessResult result = kzfp({"duplicates", "-f", "json", catalogue});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(result.err.starts_with("track 2: ")) << result.err;
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ(2u, lines[1]["files"].size());
}

TEST(DuplicatesTrouble, NeedACatalogueThatCanBeRead)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    output_of({"add", catalogue, scratch.write("a.wav", wav(piece(1, 9)))});
    std::string bytes = contents(catalogue);
    bytes[63] = 99; // the last byte of what SQLite calls the user version
    const std::string newer = scratch.write("newer.kzc", bytes);
    const ProcessResult result = kzfp({"duplicates", newer});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(result.err.starts_with(newer + ": ")) << result.err;
    EXPECT_TRUE(contains(result.err, "update")) << result.err;
    const std::string cut = scratch.write("cut.kzc", contents(catalogue).substr(0, 50));
    EXPECT_EQ(1, kzfp({"duplicates", cut}).status);
    EXPECT_EQ(1, kzfp({"duplicates", scratch.path("missing.kzc")}).status);
    EXPECT_EQ(1, kzfp({"duplicates", "-o", catalogue, catalogue}).status);
    EXPECT_EQ("no duplicates among 1 recording\n", output_of({"duplicates", catalogue}));
}

TEST(DuplicatesTrouble, ReportAFullDisk)
{
    const ScratchDirectory scratch;
    scratch.write("a.wav", wav(piece(1, 9)));
    ProcessSetup setup;
    setup.output_file = "/dev/full";
    const ProcessResult result = kzfp({"duplicates", scratch.path()}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "No space left")) << result.err;
}

TEST(DuplicatesTrouble, EndWhenTheReaderHasEnough)
{
    constexpr size_t kFiles = 3000; // whose lines no pipe holds
    ProcessSetup setup;
    setup.close_output_after = 1;
    std::vector<std::string> arguments = {"duplicates", "-f", "json"};
    arguments.insert(arguments.end(), kFiles, "missing.wav");
    const ProcessResult result = kzfp(arguments, setup);
    EXPECT_NE(0, result.status);
    EXPECT_LT(std::ranges::count(result.err, '\n'), static_cast<std::ptrdiff_t>(kFiles));
}

TEST(DuplicatesTrouble, NeedSomethingToLookAt)
{
    EXPECT_EQ(2, kzfp({"duplicates"}).status);
    const ScratchDirectory scratch;
    EXPECT_EQ(2, kzfp({"duplicates", "--format", "xml", scratch.path()}).status);
    EXPECT_EQ("no duplicates among 0 recordings\n", output_of({"duplicates", scratch.path()}));
}

} // namespace
