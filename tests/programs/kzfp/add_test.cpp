// `kzfp add` as a user sees it: music goes in, once, and what cannot be added is said.

#include "kzfp.hpp"

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <map>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sys/resource.h>

#include "recordings.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

/// A FLAC file as it was, with no tags but this title.
std::string with_title(const std::string& flac, const std::string& title)
{
    constexpr size_t kFirstBlock = 4 + 4 + 34; // marker, header and what is known of the sound
    const auto lowest_first = [](size_t number) {
        std::string bytes;
        for (int i = 0; i < 4; ++i, number >>= 8U) {
            bytes += static_cast<char>(number & 0xffU);
        }
        return bytes;
    };
    const auto byte = [&flac](size_t at) { return static_cast<uint8_t>(flac.at(at)); };
    size_t frames = 4;
    for (bool last = false; !last;) {
        last = byte(frames) >= 0x80;
        frames += 4 + (size_t{byte(frames + 1)} << 16U) + (size_t{byte(frames + 2)} << 8U) +
                  byte(frames + 3);
    }
    const std::string tag = "TITLE=" + title;
    const std::string tags = lowest_first(0) + lowest_first(1) + lowest_first(tag.size()) + tag;
    std::string header = lowest_first(tags.size());
    std::swap(header[0], header[2]);
    std::string begin = flac.substr(0, kFirstBlock);
    begin[4] = 0; // not the last block any more
    return begin + '\x84' + header.substr(0, 3) + tags + flac.substr(frames);
}

/// Works in a folder meanwhile.
class WorkingIn {
public:
    explicit WorkingIn(const std::string& folder) { fs::current_path(folder); }
    ~WorkingIn() { fs::current_path(before_); }
    WorkingIn(const WorkingIn&) = delete;
    WorkingIn& operator=(const WorkingIn&) = delete;

private:
    fs::path before_ = fs::current_path();
};

TEST(KzfpAdd, MakesTheCatalogueAndListsWhatItAdded)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("new.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("b.wav", wav(piece(2, 5)));
    EXPECT_EQ("added " + first + "\nadded " + second + "\n2 added\n",
              output_of({"add", catalogue, first, second}));
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(1, tracks[0]["track"]);
    EXPECT_EQ(first, tracks[0]["sources"][0]);
    EXPECT_EQ(json::array({"a"}), tracks[0]["tags"]["title"]);
    EXPECT_NEAR(5, tracks[0]["seconds"].get<double>(), 0.01);
    EXPECT_EQ(2, tracks[1]["track"]);
}

TEST(KzfpAdd, PassesOverWhatHasNotChanged)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, file});
    EXPECT_EQ("1 unchanged\n", output_of({"add", catalogue, file}));
    // Touched, but of the same bytes.
    fs::last_write_time(file, fs::last_write_time(file) + std::chrono::seconds(5));
    EXPECT_EQ("moved " + file + "\n1 moved\n", output_of({"add", catalogue, file}));
    EXPECT_EQ("1 unchanged\n", output_of({"add", catalogue, file}));
}

TEST(KzfpAdd, FilesThatMovedKeepTheirTracks)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string before = scratch.write("a.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, before});
    const std::string after = scratch.path("z.wav");
    fs::rename(before, after);
    EXPECT_EQ("moved " + after + "\n1 moved\n", output_of({"add", catalogue, after}));
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_EQ(1, tracks[0]["track"]);
    EXPECT_EQ(json::array({after}), tracks[0]["sources"]);
}

TEST(KzfpAdd, RelativePathsAreKeptFromElsewhere)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    scratch.write("here/a.wav", wav(piece(1, 5)));
    scratch.write("there/b.wav", wav(piece(1, 5)));
    {
        const WorkingIn here(scratch.path("here"));
        output_of({"add", catalogue, "a.wav"});
    }
    const WorkingIn there(scratch.path("there"));
    EXPECT_EQ("moved b.wav\n1 moved\n", output_of({"add", catalogue, "b.wav"}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_EQ((json{"a.wav", "b.wav"}), tracks[0]["sources"]);
}

TEST(KzfpAdd, FilesThatTookOthersNamesAreAllThere)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("b.wav", wav(piece(2, 6)));
    output_of({"add", catalogue, first, second});
    fs::rename(first, scratch.path("x"));
    fs::rename(second, first);
    fs::rename(scratch.path("x"), second);
    EXPECT_EQ("moved " + first + "\nadded " + second + "\n1 added, 1 moved\n",
              output_of({"add", catalogue, first, second}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", catalogue}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(json::array({first}), tracks[0]["sources"]);
    EXPECT_EQ(json::array({second}), tracks[1]["sources"]);
    EXPECT_NEAR(6, tracks[0]["seconds"].get<double>(), 0.01);
    EXPECT_NEAR(5, tracks[1]["seconds"].get<double>(), 0.01);
}

TEST(KzfpAdd, AMovedFileKeepsItsTrackFromItsSuccessor)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string name = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string after = scratch.path("b.wav");
    output_of({"add", catalogue, name});
    fs::rename(name, after);
    scratch.write("a.wav", wav(piece(2, 6)));
    EXPECT_EQ("added " + name + "\nmoved " + after + "\n1 added, 1 moved\n",
              output_of({"add", catalogue, name, after}));
    const std::vector<json> tracks = lines_of(output_of({"list", "-f", "json", catalogue}));
    ASSERT_EQ(2u, tracks.size());
    EXPECT_EQ(json::array({after}), tracks[0]["sources"]);
    EXPECT_EQ(json::array({name}), tracks[1]["sources"]);
}

TEST(KzfpAdd, ALimitOnTheSizeOfFilesIsAnError)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 5)));
    rlimit usual = {};
    ASSERT_EQ(0, getrlimit(RLIMIT_FSIZE, &usual));
    const rlimit low = {.rlim_cur = 40'000, .rlim_max = usual.rlim_max};
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &low));
    const ProcessResult result = kzfp({"add", catalogue, file});
    ASSERT_EQ(0, setrlimit(RLIMIT_FSIZE, &usual));
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "make room")) << result.err;
    EXPECT_EQ("added " + file + "\n1 added\n", output_of({"add", catalogue, file}));
}

TEST(KzfpAdd, CopiesAreSourcesOfOneTrack)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("b.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, first});
    output_of({"add", catalogue, second});
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_EQ(json::array({first, second}), tracks[0]["sources"]);
}

TEST(KzfpAdd, FilesThatChangedAreReadAgain)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 5)));
    output_of({"add", catalogue, file});
    scratch.write("a.wav", wav(piece(2, 6)));
    EXPECT_EQ("added " + file + "\n1 added\n", output_of({"add", catalogue, file}));
    const std::vector<json> tracks = lines_of(output_of({"list", "--format", "json", catalogue}));
    ASSERT_EQ(1u, tracks.size());
    EXPECT_NEAR(6, tracks[0]["seconds"].get<double>(), 0.01);
}

TEST(KzfpAdd, BadFilesDoNotStopTheOthers)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string good = scratch.write("good.wav", wav(piece(1, 5)));
    const std::string text = scratch.write("bad.wav", "words");
    const std::string brief = scratch.write("short.wav", wav(piece(1, 0.2)));
    const ProcessResult result = kzfp({"add", catalogue, text, "/nonexistent", brief, good, "-"});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("added " + good + "\n1 added, 4 failed\n", result.out);
    EXPECT_TRUE(contains(result.err, text + ": is not a sound file")) << result.err;
    EXPECT_TRUE(contains(result.err, "/nonexistent: cannot be opened")) << result.err;
    EXPECT_TRUE(contains(result.err, brief + ": is too short: 0.20 s of sound")) << result.err;
    EXPECT_EQ(4, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
}

TEST(KzfpAdd, ARefusedTrackDoesNotStopTheOthers)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string first = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string second = scratch.write("c.wav", wav(piece(2, 5)));
    const std::string refused =
        scratch.write("b.flac", with_title(contents(clip("music.flac")),
                                           std::string((size_t{1} << 20) + 1, 'x')));
    const ProcessResult result = kzfp({"add", catalogue, first, refused, second});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("added " + first + "\nadded " + second + "\n2 added, 1 failed\n", result.out);
    EXPECT_TRUE(contains(result.err, refused + ": the value of a tag")) << result.err;
    EXPECT_TRUE(contains(result.err, "is too long")) << result.err;
    EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n')) << result.err;
    EXPECT_EQ("2 unchanged\n", output_of({"add", catalogue, first, second}));
}

TEST(KzfpAdd, FoldersAreWalkedInTheOrderOfNames)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    scratch.write("m/b/2.wav", wav(piece(2, 4)));
    scratch.write("m/b/1.WAV", wav(piece(1, 4)));
    scratch.write("m/a.wav", wav(piece(3, 4)));
    scratch.write("m/cover.jpg", "picture");
    fs::create_directory_symlink(scratch.path("m"), scratch.path("m/loop"));
    const std::string folder = scratch.path("m");
    EXPECT_EQ("added " + folder + "/a.wav\nadded " + folder + "/b/1.WAV\nadded " + folder +
                  "/b/2.wav\n3 added; 1 file passed over that is not sound; 1 link to a folder not "
                  "followed (name the folder to add what is below it)\n",
              output_of({"add", "-j", "3", catalogue, folder}));
}

TEST(KzfpAdd, IdsDoNotDependOnTheNumberOfThreads)
{
    const ScratchDirectory scratch;
    for (uint64_t seed = 1; seed <= 6; ++seed) {
        // Of very different lengths, so that they are not ready in their order.
        scratch.write("m/" + std::to_string(seed) + ".wav",
                      wav(piece(seed, seed % 2 == 1 ? 30 : 2)));
    }
    const auto tracks = [&scratch](const std::string& jobs) {
        const std::string catalogue = scratch.path(jobs + ".kzc");
        output_of({"add", "-j", jobs, catalogue, scratch.path("m")});
        std::map<std::string, int> ids;
        for (const json& track : lines_of(output_of({"list", "--format", "json", catalogue}))) {
            ids[track["sources"][0]] = track["track"];
        }
        return ids;
    };
    EXPECT_EQ(tracks("1"), tracks("6"));
}

TEST(KzfpAdd, TheCataloguesOwnFilesAreNotRead)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string file = scratch.write("a.wav", wav(piece(1, 4)));
    output_of({"add", catalogue, file});
    const std::string link = scratch.path("link.kzc");
    fs::create_symlink(catalogue, link);
    fs::create_hard_link(catalogue, scratch.path("hard.wav"));
    // Closing one of them would give up the locks that the program holds on it.
    for (const std::string& name : {catalogue, catalogue + "-wal", catalogue + "-shm",
                                    catalogue + "-journal", link, scratch.path("hard.wav")}) {
        for (const std::string& opened : {catalogue, link}) {
            for (const char* command : {"add", "match"}) {
                const ProcessResult result = kzfp({command, opened, name});
                EXPECT_EQ(1, result.status);
                EXPECT_EQ(name + ": belongs to the catalogue itself\n", result.err) << command;
            }
        }
    }
    EXPECT_EQ(catalogue + ": 1 track, whole\n", output_of({"verify", catalogue}));
}

TEST(KzfpAdd, TrailFilesAreAddedAsTheyAre)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string sound = scratch.write("a.wav", wav(piece(1, 5)));
    const std::string trail = scratch.write("a.kzt", trail_file(piece(1, 5)));
    EXPECT_EQ("added " + sound + "\nknown " + trail + "\n1 added, 1 known\n",
              output_of({"add", catalogue, sound, trail}));
    const std::string bytes = contents(trail);
    const std::string cut = scratch.write("cut.kzt", bytes.substr(0, bytes.size() - 3));
    const ProcessResult result = kzfp({"add", catalogue, cut});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(result.err.starts_with(cut + ": ")) << result.err;
}

TEST(KzfpAdd, JsonTellsWhatBecameOfEachFile)
{
    const ScratchDirectory scratch;
    const std::string catalogue = scratch.path("c.kzc");
    const std::string good = scratch.write("good.wav", wav(piece(1, 5)));
    const ProcessResult result = kzfp({"add", "-f", "json", catalogue, good, "/nonexistent"});
    const std::vector<json> lines = lines_of(result.out);
    ASSERT_EQ(2u, lines.size());
    EXPECT_EQ((json{{"schema", 1}, {"file", good}, {"outcome", "added"}, {"track", 1}}), lines[0]);
    EXPECT_EQ("error", lines[1]["outcome"]);
    EXPECT_TRUE(contains(lines[1]["error"], "cannot be opened")) << lines[1];
}

} // namespace
