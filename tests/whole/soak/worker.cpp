#include "whole/soak/worker.hpp"

#include <algorithm>
#include <cstdio>

namespace kz::soak {
namespace {

constexpr uint32_t kJobs = 3; ///< of one thread

Job some_job(const std::vector<Recording>& recordings, test::Random& random)
{
    return {recordings[random.below(static_cast<uint32_t>(recordings.size()))],
            random.below(kCuts)};
}

} // namespace

Job::Job(const Recording& recording, uint32_t way)
    : recording_(&recording), way_(way), cutter_(way),
      handle_(test::create(recording.algorithm, test::pcm16, recording.rate,
                           test::Channels{recording.channels}))
{
}

bool Job::step()
{
    const uint32_t count = std::min(cutter_.next(), recording_->frame_count() - fed_);
    uint8_t complete = 1;
    const kz_status status = kz_fpx_fingerprint_add_audio(
        handle_.get(), recording_->samples.data() + size_t{fed_} * recording_->channels,
        2 * count * recording_->channels, &complete);
    fed_ += count;
    return status != KZ_OK || complete != 0 || fed_ == recording_->frame_count();
}

std::string Job::document() const
{
    const std::string document = test::document_of(handle_.get());
    return document.empty() ? "no document" : document;
}

void work(const std::vector<Recording>& recordings, uint64_t seed, const std::atomic<bool>& stop,
          Tally& tally)
{
    test::Random random(seed);
    std::vector<Job> jobs;
    while (jobs.size() < kJobs) {
        jobs.push_back(some_job(recordings, random));
    }
    while (!stop) {
        Job& job = jobs[random.below(kJobs)];
        if (job.step()) {
            ++tally.documents;
            if (!job.is_as_alone()) {
                ++tally.wrong;
                std::printf("another document than alone: %s\n", job.recording().name.c_str());
            }
            job = some_job(recordings, random);
        } else if (random.below(500) == 0) {
            ++tally.abandoned;
            job = some_job(recordings, random);
        }
    }
}

} // namespace kz::soak
