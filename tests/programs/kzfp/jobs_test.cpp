// Workers as they are run, on a real server: each file becomes a track once, whoever dies.

#include "kzfp.hpp"

#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <map>
#include <thread>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "recordings.hpp"
#include "support/postgres.hpp"

extern char** environ;

namespace {

using namespace kz::test;
using nlohmann::json;

PostgresServer& server()
{
    static PostgresServer server;
    return server;
}

/// `kzfp worker` beside the test.
class RunningWorker {
public:
    explicit RunningWorker(const std::string& url, std::vector<std::string> more = {})
        : log_(scratch_.path("log"))
    {
        std::vector<std::string> words = {KZFP_PROGRAM, "worker", "--jobs", url};
        words.insert(words.end(), more.begin(), more.end());
        std::vector<char*> pointers;
        for (std::string& word : words) {
            pointers.push_back(word.data());
        }
        pointers.push_back(nullptr);
        posix_spawn_file_actions_t actions = {};
        ::posix_spawn_file_actions_init(&actions);
        for (const int descriptor : {STDOUT_FILENO, STDERR_FILENO}) {
            ::posix_spawn_file_actions_addopen(&actions, descriptor, log_.c_str(),
                                               O_WRONLY | O_CREAT | O_APPEND, 0644);
        }
        EXPECT_EQ(0, ::posix_spawn(&process_, pointers.front(), &actions, nullptr, pointers.data(),
                                   environ));
        ::posix_spawn_file_actions_destroy(&actions);
    }
    ~RunningWorker() { signal_and_wait(SIGKILL); }
    RunningWorker(const RunningWorker&) = delete;
    RunningWorker& operator=(const RunningWorker&) = delete;

    /// Its exit status, as a shell reports it.
    int signal_and_wait(int number)
    {
        if (process_ > 0) {
            ::kill(process_, number);
        }
        return wait();
    }

    int wait()
    {
        if (process_ > 0) {
            int state = 0;
            ::waitpid(process_, &state, 0);
            status_ = WIFEXITED(state) ? WEXITSTATUS(state) : 128 + WTERMSIG(state);
            process_ = -1;
        }
        return status_;
    }

    std::string log() const { return contents(log_); }

private:
    ScratchDirectory scratch_;
    std::string log_;
    pid_t process_ = -1;
    int status_ = -1;
};

class KzfpJobs : public testing::Test {
protected:
    void SetUp() override
    {
        if (!postgres_obstacle().empty()) {
            GTEST_SKIP() << postgres_obstacle();
        }
        url_ = server().new_database();
    }

    json status() const
    {
        return lines_of(output_of({"jobs", "status", url_, "--format", "json"})).at(0);
    }

    /// What psql prints for statements in the test's database.
    std::string sql(const std::string& statements) const
    {
        const size_t name = url_.find("test_");
        return server().sql(statements, url_.substr(name, url_.find('?') - name));
    }

    void await(const std::string& member, int count) const
    {
        while (status().at(member) != count) { // CTest's limit of time ends a failure
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
    }

    /// How many tracks have this file as a source.
    std::map<std::string, int> tracks_by_file() const
    {
        std::map<std::string, int> all;
        for (const json& track : lines_of(output_of({"list", "--format", "json", url_}))) {
            for (const json& source : track["sources"]) {
                ++all[source.get<std::string>()];
            }
        }
        return all;
    }

    std::string write_piece(const std::string& name, uint64_t seed, double seconds = 3) const
    {
        return scratch_.write(name, wav(piece(seed, seconds)));
    }

    ScratchDirectory scratch_;
    std::string url_;
};

TEST_F(KzfpJobs, QueuedFilesBecomeTracks)
{
    write_piece("music/a.wav", 1);
    write_piece("music/b/c.wav", 2);
    scratch_.write("music/notes.txt", "no sound");
    EXPECT_EQ("2 files to fingerprint\n", output_of({"jobs", "add", url_, scratch_.path("music")}));
    EXPECT_EQ("2 waiting, 0 running, 0 done, 0 failed\n", output_of({"jobs", "status", url_}));
    const ProcessResult worked = kzfp({"worker", "--jobs", url_, "-j", "1"});
    EXPECT_EQ(0, worked.status) << worked.err;
    EXPECT_EQ("added " + scratch_.path("music/a.wav") + "\nadded " +
                  scratch_.path("music/b/c.wav") + "\n2 added\n",
              worked.out);
    EXPECT_EQ(2, status()["done"]);
    EXPECT_EQ(2u, tracks_by_file().size());
    EXPECT_TRUE(contains(output_of({"match", url_, scratch_.path("music/a.wav")}), "a.wav"));
    EXPECT_EQ("0 files to fingerprint; 2 were there before\n",
              output_of({"jobs", "add", url_, scratch_.path("music")}));
    EXPECT_EQ("nothing to do\n", output_of({"worker", "--jobs", url_}));
    EXPECT_EQ("2 files to fingerprint\n",
              output_of({"jobs", "add", "--again", url_, scratch_.path("music")}));
    EXPECT_EQ("2 unchanged\n", output_of({"worker", "--jobs", url_}));
}

TEST_F(KzfpJobs, PathsAreKeptInFull)
{
    write_piece("a.wav", 1);
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(scratch_.path());
    output_of({"jobs", "add", url_, "./a.wav"});
    std::filesystem::current_path(before);
    output_of({"worker", "--jobs", url_});
    EXPECT_EQ(1, tracks_by_file()[scratch_.path("a.wav")]);
}

/// The pipe gives nothing until the test writes to it, so the first worker has that job for sure
/// when it is killed.
TEST_F(KzfpJobs, AKilledWorkersJobIsDoneByAnotherOnce)
{
    std::vector<std::string> files;
    const std::string pipe = scratch_.path("0.wav");
    ASSERT_EQ(0, ::mkfifo(pipe.c_str(), 0600));
    for (uint64_t i = 1; i < 12; ++i) {
        files.push_back(write_piece(std::to_string(i) + ".wav", i));
    }
    output_of({"jobs", "add", url_, pipe});
    RunningWorker first(url_, {"-j", "1"});
    await("running", 1);
    files.insert(files.begin(), pipe);
    std::vector<std::string> add = {"jobs", "add", url_};
    add.insert(add.end(), files.begin(), files.end());
    output_of(add);
    RunningWorker second(url_, {"-j", "2"});
    await("done", 11);
    EXPECT_EQ(137, first.signal_and_wait(SIGKILL));
    await("running", 1); // the second one has it now
    std::ofstream(pipe, std::ios::binary) << wav(piece(100, 3));
    EXPECT_EQ(0, second.wait()) << second.log();
    EXPECT_EQ(12, status()["done"]);
    EXPECT_EQ(0, status()["failed"]);
    const auto tracks = tracks_by_file();
    EXPECT_EQ(12u, tracks.size());
    for (const std::string& file : files) {
        EXPECT_EQ(1, tracks.count(file) == 1 ? tracks.at(file) : 0) << file;
    }
    EXPECT_EQ("t\n", sql("SELECT attempt > 1 FROM kzcat.job ORDER BY id LIMIT 1"));
}

TEST_F(KzfpJobs, TwoWorkersDoTwoHundredJobsOnce)
{
    for (uint64_t i = 0; i < 200; ++i) {
        write_piece("music/" + std::to_string(i) + ".wav", i + 1, 1);
    }
    output_of({"jobs", "add", url_, scratch_.path("music")});
    RunningWorker first(url_, {"-j", "2", "--quiet"});
    RunningWorker second(url_, {"-j", "2", "--quiet"});
    EXPECT_EQ(0, first.wait()) << first.log();
    EXPECT_EQ(0, second.wait()) << second.log();
    const auto tracks = tracks_by_file();
    EXPECT_EQ(200u, tracks.size());
    const std::string all = first.log() + second.log();
    for (const auto& [file, count] : tracks) {
        EXPECT_EQ(1, count) << file;
        const size_t line = all.find("added " + file + '\n');
        ASSERT_NE(std::string::npos, line) << file;
        EXPECT_EQ(std::string::npos, all.find("added " + file + '\n', line + 1)) << file;
    }
    EXPECT_EQ(200, status()["done"]);
}

TEST_F(KzfpJobs, CtrlCFinishesTheFileAtHand)
{
    for (uint64_t i = 0; i < 20; ++i) {
        write_piece("music/" + std::to_string(i) + ".wav", i, 2);
    }
    output_of({"jobs", "add", url_, scratch_.path("music")});
    RunningWorker worker(url_, {"-j", "1", "--wait"});
    while (status()["done"] == 0) {
    }
    EXPECT_EQ(130, worker.signal_and_wait(SIGINT)) << worker.log();
    const json counts = status();
    EXPECT_EQ(20, counts["done"].get<int>() + counts["waiting"].get<int>()) << worker.log();
    EXPECT_EQ(counts["done"], tracks_by_file().size());
}

TEST_F(KzfpJobs, CtrlCLeavesAPipeThatIsSilentToOthers)
{
    const std::string pipe = scratch_.path("0.wav");
    ASSERT_EQ(0, ::mkfifo(pipe.c_str(), 0600));
    output_of({"jobs", "add", url_, pipe});
    RunningWorker worker(url_, {"-j", "1", "--attempts", "1"});
    await("running", 1);
    const std::ofstream sound(pipe); // returns once the worker reads
    EXPECT_EQ(130, worker.signal_and_wait(SIGINT)) << worker.log();
    EXPECT_EQ(1, status()["waiting"]);
}

TEST_F(KzfpJobs, AWaitingWorkerDoesWhatComesLater)
{
    output_of({"jobs", "add", url_, write_piece("1.wav", 1)});
    RunningWorker worker(url_, {"--wait"});
    await("done", 1);
    output_of({"jobs", "add", url_, write_piece("2.wav", 2)});
    await("done", 2);
    EXPECT_EQ(130, worker.signal_and_wait(SIGTERM)) << worker.log();
}

TEST_F(KzfpJobs, FailuresAreListedAndTriedAgainWhenWanted)
{
    const std::string bad = scratch_.write("bad.wav", "no sound at all");
    const std::string gone = scratch_.path("gone.wav");
    write_piece("gone.wav", 1);
    output_of({"jobs", "add", url_, bad, gone});
    std::filesystem::remove(gone);
    const ProcessResult worked = kzfp({"worker", "--jobs", url_, "--attempts", "2"});
    EXPECT_EQ(1, worked.status);
    EXPECT_TRUE(contains(worked.err, "gone.wav: cannot be opened")) << worked.err;
    EXPECT_TRUE(contains(worked.err, "(attempt 1 of 2)")) << worked.err;
    EXPECT_EQ("2 failed\n", worked.out);
    EXPECT_EQ(2, status()["failed"]);
    const auto failed =
        lines_of(output_of({"jobs", "status", url_, "--failed", "--format", "json"}));
    ASSERT_EQ(2u, failed.size());
    EXPECT_EQ(2, failed[0]["attempts"]);
    EXPECT_FALSE(failed[0]["error"].get<std::string>().empty());
    EXPECT_TRUE(contains(output_of({"jobs", "status", url_, "--failed"}), gone + ": "));
    write_piece("gone.wav", 1);
    EXPECT_EQ("2 files to be tried again\n", output_of({"jobs", "retry", url_}));
    EXPECT_EQ(1, kzfp({"worker", "--jobs", url_}).status);
    EXPECT_EQ(1, status()["done"]);
    EXPECT_EQ(1, status()["failed"]);
}

TEST_F(KzfpJobs, WorkGoesOnWhenTheServerComesBack)
{
    PostgresServer own;
    url_ = own.new_database();
    output_of({"jobs", "add", url_, write_piece("1.wav", 1)});
    RunningWorker worker(url_, {"--wait", "-j", "1"});
    await("done", 1);
    own.kill9();
    while (!contains(worker.log(), "trying again")) {
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    own.start();
    output_of({"jobs", "add", url_, write_piece("2.wav", 2)});
    await("done", 2);
    EXPECT_EQ(130, worker.signal_and_wait(SIGINT)) << worker.log();
    EXPECT_EQ(2u, tracks_by_file().size());
}

TEST_F(KzfpJobs, AServersFailureIsNoAttemptOfTheFile)
{
    output_of({"jobs", "add", url_, write_piece("1.wav", 1)});
    sql("CREATE FUNCTION kzcat.refuse() RETURNS trigger LANGUAGE plpgsql AS "
        "$$ BEGIN RAISE EXCEPTION 'no space' USING ERRCODE = 'disk_full'; END $$; "
        "CREATE TRIGGER refuse BEFORE INSERT ON kzcat.track FOR EACH ROW "
        "EXECUTE FUNCTION kzcat.refuse()");
    RunningWorker worker(url_, {"-j", "1", "--attempts", "1"});
    while (!contains(worker.log(), "trying again")) {
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    sql("DROP TRIGGER refuse ON kzcat.track");
    EXPECT_EQ(0, worker.wait()) << worker.log();
    EXPECT_EQ(1, status()["done"]) << worker.log();
}

TEST_F(KzfpJobs, TracksCanGoIntoAnotherCatalogue)
{
    const std::string catalogue = scratch_.path("music.kzc");
    const std::string file = write_piece("1.wav", 1);
    output_of({"jobs", "add", url_, file, write_piece("2.wav", 2)});
    EXPECT_TRUE(
        contains(output_of({"worker", "--jobs", url_, "--catalogue", catalogue}), "2 added"));
    EXPECT_EQ(2u, lines_of(output_of({"list", "--format", "json", catalogue})).size());
    EXPECT_TRUE(tracks_by_file().empty());
    EXPECT_EQ(2, status()["done"]);
}

TEST_F(KzfpJobs, MistakesGetASentence)
{
    const auto expect = [](int status, const std::vector<std::string>& words,
                           const std::string& part) {
        const ProcessResult result = kzfp(words);
        EXPECT_EQ(status, result.status) << result.err;
        EXPECT_TRUE(contains(result.err, part)) << result.err;
    };
    expect(2, {"jobs", "ad", url_}, "it is one of add, status, retry");
    expect(2, {"jobs", "add", url_}, "FILE is required");
    expect(2, {"jobs", "status", url_, "a.wav"}, "goes with 'kzfp jobs add'");
    expect(2, {"jobs", "add", url_, "a.wav", "--failed"}, "goes with 'kzfp jobs status'");
    expect(2, {"worker"}, "--jobs is required");
    expect(1, {"jobs", "status", "music.kzc"}, "jobs are kept on a PostgreSQL server");
    expect(1, {"worker", "--jobs", "postgresql:///none?host=/nowhere"}, "/nowhere");
    expect(1, {"jobs", "add", url_, scratch_.path("gone.wav")}, "gone.wav: ");
}

} // namespace
