// Jobs through the C interface; tests/catalogue/store/jobs_test.cpp has their rules.

#include "music.hpp"

#include <array>
#include <cstring>
#include <string>

#include <gtest/gtest.h>

#include "support/postgres.hpp"

namespace {

using namespace kz::test;

using Jobs = std::unique_ptr<kzcat_jobs, FreeHandle<kzcat_jobs_close>>;

class DoorJobs : public testing::Test {
protected:
    void SetUp() override
    {
        if (!postgres_obstacle().empty()) {
            GTEST_SKIP() << postgres_obstacle();
        }
        static PostgresServer server;
        url_ = server.new_database();
        jobs_ = open(KZCAT_ACCESS_CREATE);
        ASSERT_NE(nullptr, jobs_) << kzcat_get_error_text();
    }

    Jobs open(uint32_t access) const
    {
        return make<Jobs>(kzcat_jobs_open, url_.c_str(), access).handle;
    }

    void add(const std::vector<const char*>& files) const
    {
        uint64_t added = 0;
        ASSERT_EQ(KZCAT_OK, kzcat_jobs_add(jobs_.get(), files.data(), files.size(), 0, &added));
        ASSERT_EQ(files.size(), added);
    }

    kzcat_job_counts counts() const
    {
        kzcat_job_counts counts;
        EXPECT_EQ(KZCAT_OK, kzcat_jobs_get_counts(jobs_.get(), &counts));
        return counts;
    }

    std::string url_;
    Jobs jobs_;
};

TEST_F(DoorJobs, AFileBecomesATrack)
{
    add({"a.wav"});
    kzcat_job job;
    uint8_t are_left = 0;
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_take(jobs_.get(), "me", 3, &job, &are_left));
    EXPECT_STREQ("a.wav", job.uri);
    EXPECT_EQ(1u, job.attempt);
    EXPECT_EQ(1u, are_left);
    const Trail trail = trail_of(piece(1, 3));
    const kzcat_tag title = {.name = "title", .value = "A"};
    const kzcat_new_track track = {
        .trail = trail.get(),
        .source = {.uri = "a.wav", .size = -1, .mtime_ns = -1, .hash = nullptr},
        .tags = &title,
        .tag_count = 1};
    kzcat_added added;
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_finish(jobs_.get(), &track, 0, &added));
    EXPECT_EQ(1u, added.is_new);
    EXPECT_EQ(1u, counts().done);
    EXPECT_EQ(KZCAT_ERROR_NOT_FOUND, kzcat_jobs_take(jobs_.get(), "me", 3, &job, &are_left));
    EXPECT_EQ(0u, are_left);
    EXPECT_EQ(0, job.job);
    const auto catalogue = make<Catalogue>(kzcat_open, url_.c_str(), uint32_t{KZCAT_ACCESS_READ},
                                           static_cast<const kzcat_settings*>(nullptr));
    EXPECT_EQ(KZCAT_OK, make<Track>(kzcat_get_track, catalogue.handle.get(), added.track).status);
}

TEST_F(DoorJobs, FailuresAreReportedAndTriedAgain)
{
    add({"a.wav", "b.wav"});
    kzcat_job job;
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_take(jobs_.get(), "me", 1, &job, nullptr));
    uint8_t for_good = 0;
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_fail(jobs_.get(), "no sound", 1, &for_good));
    EXPECT_EQ(1u, for_good);
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_take(jobs_.get(), "me", 1, &job, nullptr));
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_give_back(jobs_.get()));
    EXPECT_EQ(1u, counts().waiting);
    EXPECT_EQ(1u, counts().failed);
    kzcat_failed_job failed;
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_get_next_failed(jobs_.get(), 0, &failed));
    EXPECT_STREQ("a.wav", failed.uri);
    EXPECT_STREQ("no sound", failed.error);
    EXPECT_STREQ("me", failed.worker);
    EXPECT_EQ(1u, failed.attempts);
    EXPECT_EQ(KZCAT_ERROR_NOT_FOUND, kzcat_jobs_get_next_failed(jobs_.get(), failed.job, &failed));
    uint64_t count = 0;
    ASSERT_EQ(KZCAT_OK, kzcat_jobs_retry(jobs_.get(), &count));
    EXPECT_EQ(1u, count);
    EXPECT_EQ(2u, counts().waiting);
}

TEST_F(DoorJobs, CallsOutOfOrderAreRefused)
{
    kzcat_job job;
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_jobs_finish(jobs_.get(), nullptr, 0, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_jobs_give_back(jobs_.get()));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_jobs_take(jobs_.get(), "me", 0, &job, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_jobs_fail(jobs_.get(), nullptr, 1, nullptr));
    const std::array<const char*, 2> files = {"a.wav", ""};
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              kzcat_jobs_add(jobs_.get(), files.data(), files.size(), 0, nullptr));
    EXPECT_EQ(0u, counts().waiting);
    const Jobs reading = open(KZCAT_ACCESS_READ);
    ASSERT_NE(nullptr, reading) << kzcat_get_error_text();
    EXPECT_EQ(KZCAT_ERROR_READ_ONLY, kzcat_jobs_add(reading.get(), files.data(), 1, 0, nullptr));
}

TEST(DoorJobsWithoutAServer, NullsAndFilesAreRefused)
{
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              kzcat_jobs_open("music.kzc", KZCAT_ACCESS_READ, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              make<Jobs>(kzcat_jobs_open, "music.kzc", uint32_t{KZCAT_ACCESS_READ}).status);
    EXPECT_NE(nullptr, std::strstr(kzcat_get_error_text(), "jobs are kept on a PostgreSQL server"));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT,
              make<Jobs>(kzcat_jobs_open, "postgresql:///music", uint32_t{7}).status);
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_jobs_get_counts(nullptr, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_jobs_retry(nullptr, nullptr));
    EXPECT_EQ(KZCAT_ERROR_INVALID_ARGUMENT, kzcat_jobs_close(nullptr));
}

} // namespace
