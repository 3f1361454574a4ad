// Jobs as workers meet them. A worker that dies is one whose connection ends: its object goes, or
// the server ends its session.

#include <cstring>
#include <memory>
#include <set>
#include <thread>

#include <gtest/gtest.h>

#include "catalogue/store/postgresql/jobs.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"
#include "tests/catalogue/store/databases.hpp"
#include "tests/catalogue/store/tracks.hpp"

namespace kzcat::test {
namespace {

constexpr uint32_t kAttempts = 3;

class JobsTest : public testing::Test {
protected:
    void SetUp() override
    {
        if (!kz::test::postgres_obstacle().empty()) {
            GTEST_SKIP() << kz::test::postgres_obstacle();
        }
        databases_ = std::make_unique<Databases>(1);
    }

    std::unique_ptr<Jobs> open(Access access = Access::create) const
    {
        return open_jobs(databases_->url(), access);
    }

    std::unique_ptr<Store> store() const
    {
        return open_postgres_store(databases_->url(), Access::write);
    }

    /// As when the worker's machine loses its network.
    void end_other_sessions() const
    {
        postgresql::Connection(databases_->url())
            .execute("SELECT pg_terminate_backend(pid, 5000) FROM pg_stat_activity "
                     "WHERE datname = current_database() AND pid <> pg_backend_pid()");
    }

    std::unique_ptr<Databases> databases_;
};

void add(Jobs& jobs, const std::vector<std::string>& uris, bool again = false)
{
    jobs.add(uris, again);
}

std::string uri_of(const std::optional<Job>& job) { return job ? job->uri : "none"; }

TEST_F(JobsTest, AreTakenInTheirOrderByOneWorkerEach)
{
    const auto first = open();
    const auto second = open();
    EXPECT_EQ(2u, first->add(std::vector<std::string>{"a", "b"}, false));
    EXPECT_EQ("a", uri_of(first->take("one", kAttempts)));
    EXPECT_EQ("b", uri_of(second->take("two", kAttempts)));
    const auto third = open();
    EXPECT_EQ("none", uri_of(third->take("three", kAttempts)));
    EXPECT_TRUE(third->are_left());
    EXPECT_EQ(2u, third->counts().running);
    EXPECT_EQ(0u, third->counts().lost);
    first->finish({}, 7);
    second->finish({}, 8);
    EXPECT_FALSE(third->are_left());
    EXPECT_EQ(2u, third->counts().done);
}

TEST_F(JobsTest, FilesAreNotAddedTwiceUnlessWanted)
{
    const auto jobs = open();
    const std::vector<std::string> files = {"a", "\xff not UTF-8", "a"};
    EXPECT_EQ(2u, jobs->add(files, false));
    EXPECT_EQ(0u, jobs->add(files, true)); // they wait already
    jobs->take("one", kAttempts);
    jobs->finish({}, 0);
    EXPECT_EQ(0u, jobs->add(files, false));
    EXPECT_EQ(1u, jobs->add(files, true));
    EXPECT_EQ(2u, jobs->counts().waiting);
    EXPECT_EQ("\xff not UTF-8", uri_of(jobs->take("one", kAttempts)));
    jobs->finish({}, 0);
    EXPECT_EQ("a", uri_of(jobs->take("one", kAttempts)));
}

TEST_F(JobsTest, TheTrackAndTheEndAreKeptTogether)
{
    const auto jobs = open();
    add(*jobs, {"a"});
    jobs->take("one", kAttempts);
    const NewTrack track = make_track(1);
    const Added added = jobs->finish({&track, 1}, 0).at(0);
    EXPECT_TRUE(added.is_new);
    EXPECT_EQ(std::vector<int64_t>{added.track}, track_ids(*store()));
    EXPECT_EQ(1u, jobs->counts().done);
}

TEST_F(JobsTest, NothingIsKeptWhenTheEndIsNotReached)
{
    const auto jobs = open();
    add(*jobs, {"a"});
    jobs->take("one", kAttempts);
    end_other_sessions();
    const NewTrack track = make_track(1);
    EXPECT_THROW(jobs->finish({&track, 1}, 0), StoreError);
    EXPECT_TRUE(track_ids(*store()).empty());
    const auto other = open();
    EXPECT_EQ("a", uri_of(other->take("two", kAttempts)));
    EXPECT_FALSE(jobs->fail("too late", 1)); // another has it now
    other->finish({&track, 1}, 0);
    EXPECT_EQ(1u, track_ids(*store()).size());
    EXPECT_EQ(1u, other->counts().done);
}

TEST_F(JobsTest, NoTrackIsKeptWhenTheEndIsRefused)
{
    const auto jobs = open();
    add(*jobs, {"a"});
    jobs->take("one", kAttempts);
    postgresql::Connection other(databases_->url());
    other.execute("CREATE FUNCTION refuse() RETURNS trigger LANGUAGE plpgsql AS "
                  "$$ BEGIN RAISE EXCEPTION 'no'; END $$; CREATE TRIGGER refused BEFORE UPDATE ON "
                  "job FOR EACH ROW WHEN (NEW.state = 'done') EXECUTE FUNCTION refuse()");
    const NewTrack track = make_track(1);
    EXPECT_THROW(jobs->finish({&track, 1}, 0), StoreError);
    EXPECT_TRUE(track_ids(*store()).empty());
    other.execute("DROP TRIGGER refused ON job; DROP FUNCTION refuse()");
}

TEST_F(JobsTest, LongOnesAreHeldByTheirWorkersAlone)
{
    const auto jobs = open();
    add(*jobs, {"a"});
    postgresql::Connection other(databases_->url());
    other.execute("CREATE FUNCTION backdate() RETURNS trigger LANGUAGE plpgsql AS $$ BEGIN "
                  "NEW.started = NEW.started - interval '1 hour'; RETURN NEW; END $$; "
                  "CREATE TRIGGER old BEFORE UPDATE ON job FOR EACH ROW EXECUTE FUNCTION "
                  "backdate()");
    jobs->take("one", kAttempts);
    EXPECT_EQ("none", uri_of(open()->take("two", kAttempts))) << "nor waited for";
    jobs->finish({}, 0);
    EXPECT_EQ(1u, jobs->counts().done);
    other.execute("DROP TRIGGER old ON job; DROP FUNCTION backdate()");
}

TEST_F(JobsTest, AreLeftToTheirSessionsForAMinute)
{
    const auto jobs = open();
    add(*jobs, {"a"});
    postgresql::Connection other(databases_->url());
    const std::string taken = "UPDATE job SET state = 'running', attempt = 1, backend = "
                              "pg_backend_pid(), started = clock_timestamp()";
    other.execute(taken); // as between the two transactions of a worker
    EXPECT_EQ("none", uri_of(jobs->take("one", kAttempts)));
    other.execute(taken + " - interval '2 minutes'"); // the process may be another's by now
    EXPECT_EQ("a", uri_of(jobs->take("one", kAttempts)));
}

TEST_F(JobsTest, AJobThatWasRefusedCanStillFail)
{
    const auto jobs = open();
    add(*jobs, {"a"});
    jobs->take("one", kAttempts);
    NewTrack track = make_track(1);
    track.tags = {{"", "a tag without a name"}};
    EXPECT_THROW(jobs->finish({&track, 1}, 0), StoreError);
    EXPECT_TRUE(jobs->fail("a bad tag", 1));
    EXPECT_EQ(1u, jobs->counts().failed);
    const auto failed = jobs->next_failed(0);
    ASSERT_TRUE(failed);
    EXPECT_EQ("a", failed->uri);
    EXPECT_EQ("a bad tag", failed->error);
    EXPECT_EQ("one", failed->worker);
    EXPECT_FALSE(jobs->next_failed(failed->id));
}

TEST_F(JobsTest, ALostWorkersJobIsTakenAtOnce)
{
    auto lost = open();
    add(*lost, {"a"});
    lost->take("one", kAttempts);
    lost.reset();
    const auto other = open();
    const auto job = other->take("two", kAttempts);
    ASSERT_EQ("a", uri_of(job));
    EXPECT_EQ(2, job->attempt);
}

TEST_F(JobsTest, AFileThatEndsItsWorkersFailsInTheEnd)
{
    add(*open(), {"a"});
    for (uint32_t attempt = 1; attempt <= kAttempts; ++attempt) {
        EXPECT_EQ("a", uri_of(open()->take("one", kAttempts))) << attempt;
    }
    const auto jobs = open();
    EXPECT_EQ("none", uri_of(jobs->take("two", kAttempts)));
    EXPECT_FALSE(jobs->are_left());
    ASSERT_TRUE(jobs->next_failed(0));
    EXPECT_EQ("the worker ended before the file was done, at attempt 3",
              jobs->next_failed(0)->error);
}

TEST_F(JobsTest, FailuresAreTriedAgainBehindTheOthers)
{
    const auto jobs = open();
    add(*jobs, {"a", "b"});
    EXPECT_EQ("a", uri_of(jobs->take("one", 2)));
    EXPECT_FALSE(jobs->fail("no", 2));
    EXPECT_EQ("b", uri_of(jobs->take("one", 2)));
    jobs->finish({}, 0);
    EXPECT_EQ("a", uri_of(jobs->take("one", 2)));
    EXPECT_TRUE(jobs->fail("no", 2));
    EXPECT_EQ("none", uri_of(jobs->take("one", 2)));
    EXPECT_EQ(1u, jobs->retry());
    const auto job = jobs->take("one", 2);
    ASSERT_EQ("a", uri_of(job));
    EXPECT_EQ(1, job->attempt);
}

TEST_F(JobsTest, WhatWasGivenBackIsAsItWas)
{
    const auto jobs = open();
    add(*jobs, {"a"});
    for (int i = 0; i < 2; ++i) {
        const auto job = jobs->take("one", 1);
        ASSERT_EQ("a", uri_of(job));
        EXPECT_EQ(1, job->attempt);
        jobs->give_back();
    }
    EXPECT_EQ(1u, jobs->counts().waiting);
}

TEST_F(JobsTest, OnlyOneAtATimeIsTakenWithAnObject)
{
    const auto jobs = open();
    add(*jobs, {"a", "b"});
    EXPECT_THROW(jobs->finish({}, 0), StoreError);
    jobs->take("one", kAttempts);
    EXPECT_THROW(jobs->take("one", kAttempts), StoreError);
}

TEST_F(JobsTest, ManyWorkersGetEachJobOnce)
{
    std::vector<std::string> files;
    for (int i = 0; i < 60; ++i) {
        files.push_back(std::to_string(i));
    }
    add(*open(), files);
    std::multiset<std::string> done;
    std::vector<std::unique_ptr<Jobs>> workers;
    for (int i = 0; i < 4; ++i) {
        workers.push_back(open());
    }
    // In turns: each takes one while the others hold theirs.
    for (bool any = true; any;) {
        any = false;
        std::vector<std::optional<Job>> taken;
        for (const auto& worker : workers) {
            taken.push_back(worker->take("one", kAttempts));
        }
        for (size_t i = 0; i < workers.size(); ++i) {
            if (taken[i]) {
                any = true;
                done.insert(taken[i]->uri);
                workers[i]->finish({}, 0);
            }
        }
    }
    EXPECT_EQ(std::multiset<std::string>(files.begin(), files.end()), done);
}

TEST_F(JobsTest, WorkersAtOnceLeaveNoJobTakenByNone)
{
    std::vector<std::string> files;
    for (int i = 0; i < 400; ++i) {
        files.push_back(std::to_string(i));
    }
    add(*open(), files);
    {
        std::vector<std::jthread> workers;
        for (int i = 0; i < 8; ++i) {
            workers.emplace_back([jobs = std::shared_ptr(open())] {
                while (jobs->take("one", kAttempts)) {
                    jobs->finish({}, 0);
                }
            });
        }
    }
    const JobCounts counts = open()->counts();
    EXPECT_EQ(0u, counts.waiting + counts.running);
    EXPECT_EQ(400u, counts.done);
    EXPECT_EQ("400", postgresql::Connection(databases_->url())
                         .query("SELECT sum(attempt)::text FROM kzcat.job")
                         .text(0, 0));
}

TEST(Jobs, AFileIsRefusedAsThePlaceOfJobs)
{
    try {
        open_jobs("music.kzc", Access::create);
        FAIL();
    } catch (const StoreError& error) {
        EXPECT_EQ(StoreError::Kind::invalid, error.kind());
        EXPECT_STREQ("music.kzc: jobs are kept on a PostgreSQL server; name its database, as "
                     "postgresql://HOST/DATABASE",
                     error.what());
    }
    try {
        open_jobs("host=h password=secret", Access::create);
        FAIL();
    } catch (const StoreError& error) {
        EXPECT_EQ(nullptr, std::strstr(error.what(), "secret")) << error.what();
    }
}

} // namespace
} // namespace kzcat::test
