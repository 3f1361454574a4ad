// What happens to `kzfp add` in the midst of its work, and what is left when it starts again.

#include "kzfp.hpp"

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <random>
#include <set>
#include <thread>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sys/stat.h>
#include <unistd.h>

#include "catalogue/store/rounds.hpp"
#include "recordings.hpp"
#include "running.hpp"

namespace {

using namespace kz::test;
using nlohmann::json;
namespace fs = std::filesystem;

class KzfpReliability : public ::testing::Test {
protected:
    /// Pieces of music in a folder, named by their seeds.
    std::string make_music(const std::string& name, uint64_t first, uint64_t count)
    {
        for (uint64_t seed = first; seed < first + count; ++seed) {
            scratch_.write(name + "/" + std::to_string(seed) + ".wav", wav(piece(seed, 4)));
        }
        return scratch_.path(name);
    }

    std::string make_pipe()
    {
        std::string path = scratch_.path("pipe");
        EXPECT_EQ(0, mkfifo(path.c_str(), 0666));
        return path;
    }

    ProcessResult finish(Running& running)
    {
        ProcessResult result;
        result.status = running.wait();
        result.out = contents(out_);
        result.err = contents(err_);
        return result;
    }

    /// Of lines of JSON; the last one may have been cut off.
    std::set<std::string> reported_files()
    {
        std::set<std::string> files;
        std::ifstream out(out_);
        for (std::string line; std::getline(out, line) && line.ends_with('}');) {
            files.insert(json::parse(line)["file"]);
        }
        return files;
    }

    std::vector<json> tracks() { return lines_of(output_of({"list", "-f", "json", catalogue_})); }

    /// Every source of the catalogue; each must be there once, and each with a track of its own.
    std::set<std::string> sources()
    {
        std::set<std::string> paths;
        for (const json& track : tracks()) {
            EXPECT_EQ(1u, track["sources"].size()) << track;
            for (const json& path : track["sources"]) {
                EXPECT_TRUE(paths.insert(path).second) << path;
            }
        }
        return paths;
    }

    void expect_whole()
    {
        const ProcessResult result = kzfp({"verify", catalogue_});
        EXPECT_EQ(0, result.status) << result.err;
    }

    ScratchDirectory scratch_;
    std::string catalogue_ = scratch_.path("c.kzc");
    std::string out_ = scratch_.path("out");
    std::string err_ = scratch_.path("err");
};

TEST_F(KzfpReliability, AKillLosesNothingThatWasReported)
{
    const std::string music = make_music("m", 1, 12);
    std::mt19937 random(7);
    for (uint64_t round = 0; round < kzcat::test::rounds(3); ++round) {
        for (const char* ending : {"", "-wal", "-shm"}) {
            fs::remove(catalogue_ + ending);
        }
        std::set<std::string> reported;
        for (int kill = 0; kill < 4; ++kill) {
            Running add({"add", "-f", "json", catalogue_, music}, out_, err_);
            std::this_thread::sleep_for(std::chrono::milliseconds(random() % 120));
            add.send(SIGKILL);
            add.wait();
            reported.merge(reported_files());
        }
        const ProcessResult last = kzfp({"add", catalogue_, music});
        ASSERT_EQ(0, last.status) << last.err;
        expect_whole();
        const std::set<std::string> there = sources();
        EXPECT_EQ(12u, there.size());
        EXPECT_TRUE(std::ranges::includes(there, reported));
        EXPECT_EQ("12 unchanged\n", output_of({"add", catalogue_, music}));
    }
}

// The pipe is a file that the program waits for, at a known place of its work.
TEST_F(KzfpReliability, CtrlCKeepsWhatIsDone)
{
    const std::string music = make_music("m", 1, 1);
    const std::string later = make_music("n", 2, 1);
    const std::string pipe = make_pipe();
    Running add({"add", "-j", "1", catalogue_, music, pipe, later}, out_, err_);
    const int writer = open(pipe.c_str(), O_WRONLY | O_CLOEXEC);
    ASSERT_GE(writer, 0);
    add.send(SIGINT);
    const ProcessResult result = finish(add);
    close(writer);
    EXPECT_EQ(130, result.status);
    EXPECT_TRUE(contains(result.out, "added " + music + "/1.wav\n")) << result.out;
    EXPECT_FALSE(contains(result.out, later)) << result.out;
    EXPECT_TRUE(contains(result.err, "interrupted")) << result.err;
    expect_whole();
    EXPECT_EQ("added " + later + "/2.wav\n1 added, 1 unchanged\n",
              output_of({"add", catalogue_, music, later}));
}

TEST_F(KzfpReliability, FilesThatVanishMeanwhileAreReported)
{
    const std::string music = make_music("m", 1, 2);
    const std::string pipe = make_pipe();
    Running add({"add", "-j", "1", catalogue_, pipe, music}, out_, err_);
    {
        std::ofstream writer(pipe, std::ios::binary); // waits until the folder was looked through
        fs::remove(music + "/1.wav");
        writer << wav(piece(3, 4));
    }
    const ProcessResult result = finish(add);
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("added " + pipe + "\nadded " + music + "/2.wav\n2 added, 1 failed\n", result.out);
    EXPECT_EQ(music + "/1.wav: cannot be opened (No such file or directory)\n", result.err);
}

TEST_F(KzfpReliability, TwoAtOnceAddAllFilesOnce)
{
    const std::string music = make_music("m", 1, 12);
    const std::string out = scratch_.path("out2");
    const std::string err = scratch_.path("err2");
    Running first({"add", catalogue_, music}, out_, err_);
    Running second({"add", catalogue_, music}, out, err);
    EXPECT_EQ(0, first.wait()) << contents(err_);
    EXPECT_EQ(0, second.wait()) << contents(err);
    expect_whole();
    EXPECT_EQ(12u, sources().size());
}

TEST_F(KzfpReliability, AClosedPipeLosesNothing)
{
    const std::string music = make_music("m", 1, 3);
    ProcessSetup setup;
    setup.close_output_after = 0;
    const ProcessResult result = kzfp({"add", catalogue_, music}, setup);
    EXPECT_TRUE(result.status == 0 || result.status == 1) << result.status;
    EXPECT_EQ("", result.err);
    const ProcessResult again = kzfp({"add", catalogue_, music});
    EXPECT_EQ(0, again.status) << again.err;
    expect_whole();
    EXPECT_EQ(3u, sources().size());
}

TEST_F(KzfpReliability, ACatalogueThatMayNotBeWrittenIsNamed)
{
    const std::string music = make_music("m", 1, 2);
    output_of({"add", catalogue_, music + "/1.wav"});
    fs::permissions(scratch_.path(), fs::perms::all);
    fs::permissions(catalogue_,
                    fs::perms::owner_read | fs::perms::group_read | fs::perms::others_read);
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"add", catalogue_, music},
          std::vector<std::string>{"remove", catalogue_, "1"},
          std::vector<std::string>{"merge", catalogue_, catalogue_},
          std::vector<std::string>{"import", catalogue_, "/dev/null"}}) {
        Running running(arguments, out_, err_, {.without_rights = true});
        const ProcessResult result = finish(running);
        if (result.status == Running::kMayNotRun) {
            GTEST_SKIP() << "the program may not be run without rights from where it is";
        }
        EXPECT_EQ(1, result.status) << arguments.front();
        EXPECT_EQ("", result.out) << arguments.front();
        EXPECT_TRUE(contains(result.err, "permissions")) << arguments.front() << result.err;
    }
    Running list({"list", catalogue_}, out_, err_, {.without_rights = true});
    EXPECT_EQ(0, finish(list).status) << contents(err_);
    EXPECT_EQ(1u, sources().size());
}

TEST_F(KzfpReliability, ACatalogueOfANewerVersionIsRefused)
{
    output_of({"add", catalogue_, make_music("m", 1, 1)});
    std::string bytes = contents(catalogue_);
    constexpr size_t kUserVersion = 60; // in the header of the file, highest byte first
    ++bytes[kUserVersion + 3];
    scratch_.write("c.kzc", bytes);
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"add", catalogue_, scratch_.path("m")},
          std::vector<std::string>{"list", catalogue_},
          std::vector<std::string>{"remove", catalogue_, "1"},
          std::vector<std::string>{"verify", catalogue_},
          std::vector<std::string>{"merge", catalogue_, scratch_.path("other.kzc")},
          std::vector<std::string>{"merge", scratch_.path("other.kzc"), catalogue_},
          std::vector<std::string>{"export", catalogue_, "-"},
          std::vector<std::string>{"import", catalogue_, "/dev/null"}}) {
        const ProcessResult result = kzfp(arguments);
        EXPECT_EQ(1, result.status) << arguments.front();
        EXPECT_EQ("", result.out) << arguments.front();
        EXPECT_TRUE(contains(result.err, "update")) << arguments.front() << ": " << result.err;
    }
    EXPECT_EQ(bytes, contents(catalogue_));
}

TEST_F(KzfpReliability, AFifoInAFolderIsPassedOver)
{
    const std::string music = make_music("m", 1, 1);
    ASSERT_EQ(0, mkfifo((music + "/0.wav").c_str(), 0666)); // would keep a reader waiting for ever
    EXPECT_EQ("added " + music + "/1.wav\n1 added; 1 file passed over that is not sound\n",
              output_of({"add", catalogue_, music}));
}

TEST_F(KzfpReliability, FoldersThatMayNotBeReadAreReported)
{
    const std::string music = make_music("m", 1, 1);
    const std::string secret = make_music("m/secret", 2, 1);
    fs::permissions(scratch_.path(), fs::perms::all);
    fs::permissions(secret, fs::perms::none);
    for (const std::string command : {"add", "duplicates", "evaluate"}) {
        std::vector<std::string> arguments = {command, music};
        if (command == "add") {
            arguments.insert(arguments.begin() + 1, catalogue_);
        }
        Running running(arguments, out_, err_, {.without_rights = true});
        const ProcessResult result = finish(running);
        if (result.status == Running::kMayNotRun) {
            fs::permissions(secret, fs::perms::owner_all);
            GTEST_SKIP() << "the program may not be run without rights from where it is";
        }
        EXPECT_EQ(1, result.status) << command;
        EXPECT_TRUE(
            contains(result.err, secret + ": the folder cannot be read (Permission denied)"))
            << command << ": " << result.err;
    }
    fs::permissions(secret, fs::perms::owner_all);
    EXPECT_EQ(std::set<std::string>{music + "/1.wav"}, sources()) << "the rest was added";
}

TEST_F(KzfpReliability, FilesOfNoUseGetASentenceEach)
{
    const std::string good = scratch_.write("m/good.wav", wav(piece(1, 4)));
    const std::string whole = contents(clip("music.flac"));
    const std::string cut = scratch_.write("m/cut.flac", whole.substr(0, whole.size() * 3 / 4));
    const std::string empty = scratch_.write("m/empty.wav", "");
    const std::string silent = scratch_.write("m/silent.wav", wav(std::vector<int16_t>(64000)));
    const std::string loop = scratch_.path("m/loop.wav");
    fs::create_symlink("loop.wav", loop);
    const ProcessResult result = kzfp({"add", catalogue_, scratch_.path("m")});
    EXPECT_EQ(1, result.status);
    EXPECT_EQ("added " + cut + "\nadded " + good + "\nadded " + silent + "\n3 added, 2 failed\n",
              result.out);
    EXPECT_TRUE(contains(result.err, empty + ": ")) << result.err;
    EXPECT_TRUE(contains(result.err, cut + ": is damaged after ")) << result.err;
    EXPECT_TRUE(contains(result.err, loop + ": ")) << result.err;
    EXPECT_EQ(3, std::ranges::count(result.err, '\n')) << result.err;
    const ProcessResult strict = kzfp({"add", "--strict", scratch_.path("s.kzc"), cut});
    EXPECT_EQ(1, strict.status);
    EXPECT_EQ("1 failed\n", strict.out);
}

} // namespace
