// The C interface: jobs for workers.

#include <algorithm>

#include "catalogue/handles.hpp"

namespace {

using namespace kzcat;

Access to_access(uint32_t access)
{
    require(access >= KZCAT_ACCESS_READ && access <= KZCAT_ACCESS_CREATE,
            "the access is none of KZCAT_ACCESS_...; pass one of these");
    return access == KZCAT_ACCESS_READ    ? Access::read
           : access == KZCAT_ACCESS_WRITE ? Access::write
                                          : Access::create;
}

void require_jobs(const kzcat_jobs* jobs)
{
    require(jobs != nullptr, "the jobs are null; pass open ones");
}

void require_attempts(uint32_t attempts)
{
    require(attempts >= 1 && attempts <= 1000, "the number of attempts is not within 1 .. 1000");
}

} // namespace

kzcat_status kzcat_jobs_open(const char* url, uint32_t access, kzcat_jobs** out_jobs) noexcept
{
    return guarded([=] {
        clear_place(out_jobs);
        require(url != nullptr, "the URL is null; pass that of a catalogue on a server");
        *out_jobs = new kzcat_jobs{open_jobs(url, to_access(access)), {}, {}};
    });
}

kzcat_status kzcat_jobs_close(kzcat_jobs** jobs_ref) noexcept { return free_handle(jobs_ref); }

kzcat_status kzcat_jobs_add(kzcat_jobs* jobs, const char* const* uris, uint64_t count,
                            uint8_t again, uint64_t* out_added) noexcept
{
    return guarded([=] {
        if (out_added != nullptr) {
            *out_added = 0;
        }
        require_jobs(jobs);
        require(uris != nullptr || count == 0, "the files are null; pass some, or a count of 0");
        std::vector<std::string> all;
        for (const char* const uri : std::span(uris, static_cast<size_t>(count))) {
            require(uri != nullptr && *uri != 0, "a file has no path; pass one");
            all.emplace_back(uri);
        }
        const uint64_t added = jobs->whole->add(all, again != 0);
        if (out_added != nullptr) {
            *out_added = added;
        }
    });
}

kzcat_status kzcat_jobs_take(kzcat_jobs* jobs, const char* worker, uint32_t attempts,
                             kzcat_job* out_job, uint8_t* out_are_left) noexcept
{
    return guarded([=] {
        require_jobs(jobs);
        require(worker != nullptr && out_job != nullptr,
                "the worker's name or the record for the job is null; pass both");
        require_attempts(attempts);
        *out_job = {};
        auto job = jobs->whole->take(worker, attempts);
        if (out_are_left != nullptr) {
            *out_are_left = job || jobs->whole->are_left() ? 1 : 0;
        }
        if (!job) {
            throw Failure(KZCAT_ERROR_NOT_FOUND, "there is no job to take; add some");
        }
        jobs->taken = *std::move(job);
        out_job->job = jobs->taken.id;
        out_job->uri = jobs->taken.uri.c_str();
        out_job->attempt = static_cast<uint32_t>(jobs->taken.attempt);
    });
}

kzcat_status kzcat_jobs_finish(kzcat_jobs* jobs, const kzcat_new_track* track, int64_t known,
                               kzcat_added* out_added) noexcept
{
    return guarded([=] {
        if (out_added != nullptr) {
            *out_added = {};
        }
        require_jobs(jobs);
        std::vector<NewTrack> tracks;
        if (track != nullptr) {
            tracks.push_back(to_new_track(*track));
        }
        const auto added = jobs->whole->finish(tracks, known);
        if (out_added != nullptr && !added.empty()) {
            *out_added = {.track = added.front().track,
                          .is_new = added.front().is_new ? 1U : 0U,
                          .reserved = 0};
        }
    });
}

kzcat_status kzcat_jobs_fail(kzcat_jobs* jobs, const char* reason, uint32_t attempts,
                             uint8_t* out_for_good) noexcept
{
    return guarded([=] {
        require_jobs(jobs);
        require(reason != nullptr, "the reason is null; pass a sentence");
        require_attempts(attempts);
        const bool for_good = jobs->whole->fail(reason, attempts);
        if (out_for_good != nullptr) {
            *out_for_good = for_good ? 1 : 0;
        }
    });
}

kzcat_status kzcat_jobs_give_back(kzcat_jobs* jobs) noexcept
{
    return guarded([=] {
        require_jobs(jobs);
        jobs->whole->give_back();
    });
}

kzcat_status kzcat_jobs_get_counts(kzcat_jobs* jobs, kzcat_job_counts* out_counts) noexcept
{
    return guarded([=] {
        require_jobs(jobs);
        require(out_counts != nullptr, "the record for the counts is null; pass one");
        *out_counts = {};
        const JobCounts counts = jobs->whole->counts();
        out_counts->waiting = counts.waiting;
        out_counts->running = counts.running;
        out_counts->lost = counts.lost;
        out_counts->done = counts.done;
        out_counts->failed = counts.failed;
        out_counts->done_lately = counts.done_lately;
    });
}

kzcat_status kzcat_jobs_get_next_failed(kzcat_jobs* jobs, int64_t after,
                                        kzcat_failed_job* out_job) noexcept
{
    return guarded([=] {
        require_jobs(jobs);
        require(out_job != nullptr, "the record for the job is null; pass one");
        *out_job = {};
        auto job = jobs->whole->next_failed(after);
        if (!job) {
            throw Failure(KZCAT_ERROR_NOT_FOUND, "no other job has failed");
        }
        jobs->visited = *std::move(job);
        out_job->job = jobs->visited.id;
        out_job->uri = jobs->visited.uri.c_str();
        out_job->error = jobs->visited.error.c_str();
        out_job->worker = jobs->visited.worker.c_str();
        out_job->attempts = static_cast<uint32_t>(jobs->visited.attempts);
    });
}

kzcat_status kzcat_jobs_retry(kzcat_jobs* jobs, uint64_t* out_count) noexcept
{
    return guarded([=] {
        if (out_count != nullptr) {
            *out_count = 0;
        }
        require_jobs(jobs);
        const uint64_t count = jobs->whole->retry();
        if (out_count != nullptr) {
            *out_count = count;
        }
    });
}
