/// @file
/// The worker: one thread that runs one job at a time and reports its end by an event.
///
/// One mutex guards all of the state and is held for the whole run of a job, the event included.
/// Both a start and a release wait until the worker has answered.
#include "kzsdk/jni/fingerprint_thread.hpp"

#include <cstring>

#include "kzsdk/jni/heap.hpp"
#include "kzsdk/jni/lock.hpp"
#include "kzsdk/jni/platform/platform.hpp"

namespace android {

using kz::jni::Lock;

FingerprintThread::FingerprintThread(jobject cookie) noexcept
    : cookie_(cookie), result_(kz::jni::make_system_array<char>(kTextSize).release())
{
    pthread_mutex_init(&mutex_, nullptr);
    pthread_cond_init(&condition_, nullptr);
    if (result_ != nullptr) {
        std::memset(result_, 0, kTextSize); // an empty text before the first job
    }
}

FingerprintThread::~FingerprintThread()
{
    release();
    pthread_cond_destroy(&condition_);
    pthread_mutex_destroy(&mutex_);
}

int32_t FingerprintThread::setEventCallback(EventCallback callback) noexcept
{
    const Lock lock(mutex_);
    callback_ = callback;
    return kOk;
}

int32_t FingerprintThread::init() noexcept
{
    job_ = kz::jni::create<Fingerprint>();
    if (job_ == nullptr || result_ == nullptr) {
        return kNoMemory;
    }
    const int32_t code = job_->init();
    if (code != kOk) {
        return code;
    }
    const Lock lock(mutex_);
    if (!kz::platform::start_thread(startThread, this, "FingerprintThread",
                                    kz::platform::kBackgroundPriority)) {
        return kNoMemory;
    }
    while (!running_) {
        wait();
    }
    state_ = kReady;
    return kOk;
}

int32_t FingerprintThread::generate(uint32_t sample_rate, int32_t channels,
                                    int32_t wave_format_code, int32_t bits_per_sample,
                                    const uint8_t* audio, uint32_t audio_length) noexcept
{
    const Lock lock(mutex_);
    const bool accepts = state_ == kReady || state_ == kLastSucceeded || state_ == kLastFailed;
    if (!accepts || exit_requested_ || job_ == nullptr) {
        return kRefused;
    }
    job_->setGenerateConfig(sample_rate, channels, wave_format_code, bits_per_sample, audio,
                            audio_length);
    state_ = kRequested;
    signal();
    return kOk;
}

void FingerprintThread::fireEvent(int32_t event, int32_t argument1, int32_t argument2) noexcept
{
    if (callback_ != nullptr) {
        callback_(event, argument1, argument2, cookie_);
    }
}

int FingerprintThread::startThread(void* self) noexcept
{
    return static_cast<FingerprintThread*>(self)->run();
}

int FingerprintThread::run() noexcept
{
    {
        const Lock lock(mutex_);
        running_ = true;
        signal();
    }
    int32_t result = kOk;
    for (;;) {
        const Lock lock(mutex_);
        // A request or an exit may have been signalled while no thread waited: it is checked for
        // before the wait. There is no loop about the wait: whatever wakes the worker runs a job.
        if (!exit_requested_ && state_ != kRequested) {
            wait();
        }
        if (exit_requested_) {
            break;
        }
        result = runJob();
    }
    acknowledgeExit(); // the last touch of this object
    return result;
}

int32_t FingerprintThread::runJob() noexcept
{
    std::memset(result_, 0, kTextSize);
    const int32_t result = job_->generate(&result_);
    state_ = result == kOk ? kLastSucceeded : kLastFailed;
    fireEvent(result == kOk ? kSucceeded : kFailed, 0, 0);
    return result;
}

void FingerprintThread::acknowledgeExit() noexcept
{
    const Lock lock(mutex_);
    exited_ = true;
    signal();
}

void FingerprintThread::withoutWorker() noexcept { acknowledgeExit(); }

void FingerprintThread::requestExit() noexcept
{
    const Lock lock(mutex_);
    exit_requested_ = true;
    signal();
}

int32_t FingerprintThread::release() noexcept
{
    const Lock lock(mutex_);
    exit_requested_ = true;
    signal();
    kz::jni::destroy(job_);
    job_ = nullptr;
    while (!exited_) {
        wait();
    }
    std::free(result_); // deliberate: the pointer is left as it is
    exited_ = false;    // so that a second call waits, and frees nothing twice
    exit_requested_ = false;
    return kOk;
}

} // namespace android
