// Several processes at one catalogue: killed at any moment, and reading while others write.

#include <chrono>
#include <csignal>
#include <filesystem>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/catalogue/store/files.hpp"
#include "tests/catalogue/store/rounds.hpp"

namespace kzcat::test {
namespace {

using namespace std::chrono_literals;

/// A process that writes a number for everything that it has done.
class Child {
public:
    template <class Work>
    explicit Child(Work work)
    {
        int ends[2];
        if (pipe(ends) != 0) {
            throw std::runtime_error("pipe");
        }
        process_ = fork();
        if (process_ == 0) {
            close(ends[0]);
            _exit(run(work, ends[1]));
        }
        close(ends[1]);
        reports_ = ends[0];
    }
    ~Child()
    {
        die();
        wait();
        close(reports_);
    }
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;

    void die()
    {
        if (process_ > 0) {
            kill(process_, SIGKILL);
        }
    }

    /// The next report; none when the process has ended.
    std::optional<uint64_t> report() const
    {
        uint64_t number = 0;
        const bool whole = read(reports_, &number, sizeof number) == sizeof number;
        return whole ? std::optional(number) : std::nullopt;
    }

    /// The exit status; -1 when a signal ended it.
    int wait()
    {
        if (process_ > 0) {
            int status = 0;
            waitpid(process_, &status, 0);
            status_ = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
            process_ = 0;
        }
        return status_;
    }

private:
    template <class Work>
    static int run(Work work, int reports)
    {
        try {
            work([&](uint64_t number) {
                if (write(reports, &number, sizeof number) != sizeof number) {
                    _exit(2);
                }
            });
        } catch (const std::exception& error) {
            std::fprintf(stderr, "%s\n", error.what());
            return 1;
        }
        return 0;
    }

    pid_t process_ = 0;
    int reports_ = -1;
    int status_ = -1;
};

constexpr uint64_t kBatch = 2;

/// Adds the tracks from `first` on until it is killed, and reports each batch that add() returned.
template <class Report>
void add_without_end(const std::string& path, uint64_t first, Report report)
{
    const auto store = open_sqlite_store(path, Access::create);
    for (uint64_t number = first;; number += kBatch) {
        add_tracks(*store, number, kBatch);
        report(number + kBatch - 1);
    }
}

void expect_whole(Store& store, uint64_t count, uint64_t round)
{
    ASSERT_EQ(std::vector<std::string>(), faults(store)) << "round " << round;
    uint64_t number = 0;
    store.visit_trails(0, [&](int64_t, const Trail& trail) {
        EXPECT_TRUE(make_trail(++number) == trail) << "round " << round;
        return true;
    });
    EXPECT_EQ(count, number) << "round " << round;
}

TEST(Processes, AKillAtAnyMomentLosesNothing)
{
    std::unique_ptr<kz::test::ScratchDirectory> folder;
    std::mt19937_64 random(1);
    uint64_t present = 0;
    uint64_t all_acknowledged = 0;
    for (uint64_t round = 0; round < rounds(200); ++round) {
        if (round % 20 == 0) { // creation is killed too
            folder = std::make_unique<kz::test::ScratchDirectory>();
            present = 0;
        }
        const std::string path = folder->path("a.kzc");
        Child child([&](auto report) { add_without_end(path, present + 1, report); });
        std::this_thread::sleep_for(std::chrono::microseconds(random() % 30'000));
        child.die();
        uint64_t acknowledged = present;
        while (const auto number = child.report()) {
            acknowledged = *number;
        }
        child.wait();
        all_acknowledged += acknowledged - present;
        const auto store = open_sqlite_store(path, Access::create);
        present = store->track_count();
        EXPECT_LE(acknowledged, present) << "round " << round << ": acknowledged tracks are lost";
        EXPECT_GE(acknowledged + kBatch, present) << "round " << round;
        EXPECT_EQ(0U, present % kBatch) << "round " << round << ": half a batch";
        expect_whole(*store, present, round);
        if (::testing::Test::HasFailure()) {
            break;
        }
    }
    RecordProperty("acknowledged", std::to_string(all_acknowledged));
}

/// Numbers of tracks that no other writer uses.
constexpr uint64_t kOfWriter = 1'000'000;

TEST(Processes, WritersAndReadersWorkAtOnce)
{
    const kz::test::ScratchDirectory folder;
    const std::string path = folder.path("a.kzc");
    make_catalogue(path, 10);
    const uint64_t batches = 2 * rounds(20);
    std::vector<std::unique_ptr<Child>> writers;
    for (uint64_t writer = 1; writer <= 2; ++writer) {
        writers.push_back(std::make_unique<Child>([&, writer](auto report) {
            const auto store = open_sqlite_store(path, Access::write);
            for (uint64_t batch = 0; batch < batches; ++batch) {
                add_tracks(*store, writer * kOfWriter + batch * kBatch, kBatch);
                report(batch);
            }
        }));
    }
    std::vector<std::unique_ptr<Child>> readers;
    for (int reader = 0; reader < 3; ++reader) {
        readers.push_back(std::make_unique<Child>([&](auto report) {
            for (uint64_t seen = 0; seen < 10 + 2 * batches * kBatch;) {
                const auto store = open_sqlite_store(path, Access::read);
                const uint64_t before = store->track_count();
                const auto found = faults(*store);
                if (!found.empty() || before < seen || before % kBatch != 0) {
                    throw std::runtime_error(found.empty() ? "tracks vanished" : found.front());
                }
                seen = before;
                report(seen);
            }
        }));
    }
    for (const auto& process : writers) {
        EXPECT_EQ(0, process->wait());
    }
    for (const auto& process : readers) {
        EXPECT_EQ(0, process->wait());
    }
    const auto store = open_sqlite_store(path, Access::read);
    EXPECT_EQ(10 + 2 * batches * kBatch, store->track_count());
    EXPECT_TRUE(faults(*store).empty());
}

TEST(Processes, ManyMayMakeTheSameFileAtOnce)
{
    for (uint64_t round = 0; round < rounds(20); ++round) {
        const kz::test::ScratchDirectory folder;
        const std::string path = folder.path("a.kzc");
        std::vector<std::unique_ptr<Child>> children;
        for (uint64_t number = 1; number <= 4; ++number) {
            children.push_back(std::make_unique<Child>([&, number](auto) {
                add_tracks(*open_sqlite_store(path, Access::create), number, 1);
            }));
        }
        for (const auto& child : children) {
            EXPECT_EQ(0, child->wait()) << "round " << round;
        }
        EXPECT_EQ(4U, open_sqlite_store(path, Access::read)->track_count());
    }
}

TEST(Processes, AStoreMayMoveToAnotherThread)
{
    const kz::test::ScratchDirectory folder;
    const auto store = open_sqlite_store(folder.path("a.kzc"), Access::create);
    std::thread([&] { add_tracks(*store, 1, 3); }).join();
    std::thread([&] { EXPECT_TRUE(faults(*store).empty()); }).join();
    EXPECT_EQ(3U, store->track_count());
}

} // namespace
} // namespace kzcat::test
