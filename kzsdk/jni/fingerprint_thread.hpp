/// @file
/// Runs fingerprint jobs on a thread of its own and reports each by an event.
#pragma once

#include <cstdint>

#include <jni.h>
#include <pthread.h>

#include "kzsdk/jni/codes.hpp"
#include "kzsdk/jni/fingerprint.hpp"

namespace android {

/// A worker: one job object, one thread, one result buffer.
///
/// Order of calls: constructor, setEventCallback, init, then generate() any number of times, each
/// accepted request being answered by one event; then the destructor or, in its stead, nothing.
///
/// Threads: one mutex guards everything, and is held through a job and through its event. So
/// generate() and release() wait for a running job, and neither may be called from the event of the
/// same worker: it would wait for itself.
class FingerprintThread {
public:
    /// Called on the worker's thread, the mutex being held. The arguments are 0.
    using EventCallback = void (*)(int32_t event, int32_t argument1, int32_t argument2,
                                   jobject cookie);

    enum State : int32_t {
        kConstructed = 0,
        kReady = 2,
        kRequested = 3,
        kLastSucceeded = 4,
        kLastFailed = 5,
    };

    /// @param cookie  Handed back with every event; neither looked at nor released.
    explicit FingerprintThread(jobject cookie) noexcept;

    /// release(), with all that is said there.
    ~FingerprintThread();
    FingerprintThread(const FingerprintThread&) = delete;
    FingerprintThread& operator=(const FingerprintThread&) = delete;

    /// Null switches events off. Waits for a running job. Returns kOk.
    int32_t setEventCallback(EventCallback callback) noexcept;

    /// Starts the thread and comes back when it runs. To be called once.
    ///
    /// @return kOk; kNoMemory when there is no memory or no thread: then the worker must be given
    ///         back by withoutWorker() and the destructor.
    int32_t init() noexcept;

    /// Requests a job. See Fingerprint::setGenerateConfig() for the arguments.
    ///
    /// @param audio  Not copied: stays valid until the event has come, and after it until the next
    ///               accepted request or release(), as a thread may wake up without reason and then
    ///               repeats its last job.
    /// @return kOk; kRefused before init(), while a request waits to be begun, and after
    /// requestExit() or
    ///         release().
    int32_t generate(uint32_t sample_rate, int32_t channels, int32_t wave_format_code,
                     int32_t bits_per_sample, const uint8_t* audio, uint32_t audio_length) noexcept;

    /// The result buffer of kTextSize bytes, without lock or copy: to be read between an event and
    /// the next request. Dangles after release().
    const char* getFingerprint() const noexcept { return result_; }

    void fireEvent(int32_t event, int32_t argument1, int32_t argument2) noexcept;

    /// The thread's entry.
    static int startThread(void* self) noexcept;

    /// Stops the worker and comes back when it has acknowledged that. A running job is finished
    /// before, and reported; a request that was not begun is dropped.
    ///
    /// Without a running worker nothing acknowledges it, and this waits for ever: so it does when
    /// init() was not called or failed, and when called a second time, the destructor's call
    /// included.
    ///
    /// @return kOk.
    int32_t release() noexcept;

    /// Has no further job begun. Comes back when none runs and the last event has been handled.
    void requestExit() noexcept;

    /// Acknowledges in place of a worker that never ran, so that release() comes back.
    void withoutWorker() noexcept;

private:
    int run() noexcept;
    int32_t runJob() noexcept;
    void acknowledgeExit() noexcept;
    void wait() noexcept { pthread_cond_wait(&condition_, &mutex_); }
    void signal() noexcept { pthread_cond_signal(&condition_); }

    State state_ = kConstructed;
    EventCallback callback_ = nullptr;
    jobject cookie_;
    pthread_mutex_t mutex_;
    pthread_cond_t condition_; // requests to the worker, acknowledgements from it
    bool exit_requested_ = false;
    Fingerprint* job_ = nullptr;
    char* result_;
    // A wait may end without a reason. By these two a starter and a stopper see that there was one.
    bool running_ = false;
    bool exited_ = false;
};

} // namespace android
