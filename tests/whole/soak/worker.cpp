#include "whole/soak/worker.hpp"

#include <algorithm>
#include <cstdio>

namespace kz::soak {
namespace {

constexpr uint32_t kJobs = 3; ///< of one thread

Job some_job(const std::vector<Recording>& recordings, test::Random& random)
{
    const auto& recording = recordings[random.below(static_cast<uint32_t>(recordings.size()))];
    return {recording, random.below(kCuts), random.below(3) == 0 ? Door::stream : Door::extraction};
}

kz_stream* create_stream(const Recording& recording)
{
    kz_stream_settings settings;
    static_cast<void>(kz_stream_initialize_settings(&settings));
    settings.algorithm = test::number(recording.algorithm);
    settings.sample_rate = recording.rate;
    settings.channels = recording.channels;
    kz_stream* stream = nullptr;
    static_cast<void>(kz_stream_create(&settings, &stream));
    return stream;
}

} // namespace

Job::Job(const Recording& recording, uint32_t way, Door door)
    : recording_(&recording), way_(way), cutter_(way)
{
    if (door == Door::stream) {
        stream_.reset(create_stream(recording));
    } else {
        handle_ = test::create(recording.algorithm, test::pcm16, recording.rate,
                               test::Channels{recording.channels});
    }
}

kz_status Job::feed(const int16_t* samples, uint32_t byte_count, uint8_t& complete)
{
    return stream_ != nullptr
               ? kz_stream_feed(stream_.get(), samples, byte_count, nullptr, &complete)
               : kz_fpx_fingerprint_add_audio(handle_.get(), samples, byte_count, &complete);
}

bool Job::step()
{
    const uint32_t count = std::min(cutter_.next(), recording_->frame_count() - fed_);
    uint8_t complete = 1;
    const kz_status status = feed(recording_->samples.data() + size_t{fed_} * recording_->channels,
                                  2 * count * recording_->channels, complete);
    fed_ += count;
    return status != KZ_OK || complete != 0 || fed_ == recording_->frame_count();
}

std::string Job::document() const
{
    const char* text = nullptr;
    if (stream_ != nullptr) {
        static_cast<void>(kz_stream_get_document(stream_.get(), &text));
        return text != nullptr ? text : "no document";
    }
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
