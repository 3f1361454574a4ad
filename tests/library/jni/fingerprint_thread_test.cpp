// The worker, with everything below it scripted.

#include "kzsdk/jni/fingerprint_thread.hpp"

#include <array>
#include <atomic>
#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform_probe.hpp"
#include "scripted_core.hpp"
#include "support/allocation.hpp"
#include "waits.hpp"
#include "worker.hpp"

namespace {

using namespace kz::test;
using namespace std::chrono_literals;
using android::FingerprintThread;

constexpr std::array<uint8_t, 4> kAudio = {1, 2, 3, 4};

jobject cookie(size_t number)
{
    static std::array<char, 16> places;
    return reinterpret_cast<jobject>(&places.at(number));
}

int32_t request(FingerprintThread& worker, int32_t format_code = 1)
{
    return worker.generate(44100, 2, format_code, 16, kAudio.data(), kAudio.size());
}

std::string text_of(const FingerprintThread& worker)
{
    return {worker.getFingerprint(), strnlen(worker.getFingerprint(), 600)};
}

/// A job that stops in the middle until it may end.
class HeldJob {
public:
    explicit HeldJob(FingerprintThread& worker)
    {
        script().during_job = [this] {
            begun_ = true;
            while (!may_end_) {
                std::this_thread::yield();
            }
        };
        EXPECT_EQ(0, request(worker));
        while (!begun_) {
            std::this_thread::yield();
        }
    }
    void end() { may_end_ = true; }

private:
    std::atomic<bool> begun_{false};
    std::atomic<bool> may_end_{false};
};

/// Long enough for anything that is going to happen; never waited for by what passes.
constexpr auto kNever = 300ms;

class Worker : public ::testing::Test {
protected:
    void SetUp() override
    {
        script() = {};
        Events::all().clear();
    }

    /// A worker that runs, and waits for a request.
    std::unique_ptr<FingerprintThread> started()
    {
        auto worker = std::make_unique<FingerprintThread>(cookie(0));
        EXPECT_EQ(0, worker->setEventCallback(Events::post));
        EXPECT_EQ(0, worker->init());
        return worker;
    }
};

TEST_F(Worker, RefusesARequestBeforeItsThreadRuns)
{
    FingerprintThread worker(cookie(0));
    EXPECT_EQ(-4, request(worker));
    EXPECT_EQ(0, worker.init());
    EXPECT_EQ(0, request(worker));
}

TEST_F(Worker, AnswersARequestByAnEventAndAText)
{
    const auto worker = started();
    EXPECT_EQ("", text_of(*worker)) << "before the first job";
    EXPECT_EQ(0, request(*worker));
    EXPECT_EQ(0, Events::all().wait_for(1));
    EXPECT_EQ(cookie(0), Events::all().cookie_of(0));
    EXPECT_EQ("<text/>", text_of(*worker));
    EXPECT_EQ(std::string("\1\2\3\4"), script().audio);
}

TEST_F(Worker, RunsUnderItsNameInTheBackground)
{
    ThreadLooks looks = {"", 0};
    script().during_job = [&] { looks = looks_of_this_thread(); };
    const auto worker = started();
    EXPECT_EQ(0, request(*worker));
    Events::all().wait_for(1);
    EXPECT_EQ("FingerprintThre", looks.name);
    EXPECT_EQ(10, looks.priority);
}

TEST_F(Worker, ReportsAFailedJobAndTakesTheNextRequest)
{
    const auto worker = started();
    EXPECT_EQ(0, request(*worker, 3));
    EXPECT_EQ(1, Events::all().wait_for(1));
    EXPECT_EQ(0, request(*worker));
    EXPECT_EQ(0, Events::all().wait_for(2));
}

TEST_F(Worker, LeavesAnEmptyTextAfterAFailedJob)
{
    const auto worker = started();
    EXPECT_EQ(0, request(*worker));
    Events::all().wait_for(1);
    EXPECT_EQ("<text/>", text_of(*worker));
    EXPECT_EQ(0, request(*worker, 3));
    Events::all().wait_for(2);
    EXPECT_EQ(std::string(600, '\0'), std::string(worker->getFingerprint(), 600));
}

TEST_F(Worker, ClearsTheWholeBufferBeforeAShorterText)
{
    const auto worker = started();
    script().text = std::string(600, 'x');
    EXPECT_EQ(0, request(*worker));
    Events::all().wait_for(1);
    EXPECT_EQ(std::string(600, 'x'), text_of(*worker));
    script().text = "short";
    EXPECT_EQ(0, request(*worker));
    Events::all().wait_for(2);
    EXPECT_EQ("short" + std::string(595, '\0'), std::string(worker->getFingerprint(), 600));
}

TEST_F(Worker, RefusesARequestWhileTheFirstWaitsToBegin)
{
    const uint64_t before = waits_begun();
    const auto worker = started();
    until_waits_have_begun(before + 2); // the starter's and the worker's
    {
        const LostSignals asleep;
        EXPECT_EQ(0, request(*worker));
        EXPECT_EQ(-4, request(*worker));
        EXPECT_EQ(-4, request(*worker));
    }
    wake_without_reason();
    Events::all().wait_for(1);
    EXPECT_EQ(0, request(*worker));
    Events::all().wait_for(2);
}

TEST_F(Worker, RunsWithoutAnEventCallback)
{
    FingerprintThread worker(cookie(0));
    std::atomic<bool> ran{false};
    script().during_job = [&] { ran = true; };
    EXPECT_EQ(0, worker.init());
    EXPECT_EQ(0, request(worker));
    while (!ran) {
        std::this_thread::yield();
    }
}

// Between its unlock and its next wait the worker does not wait on its condition. A request that is
// signalled there must be found all the same; many a request is made there by this test.
TEST_F(Worker, LosesNoRequestMadeTheMomentTheEventHasCome)
{
    const auto worker = started();
    for (size_t made = 1; made <= 500; ++made) {
        ASSERT_EQ(0, request(*worker)) << made;
        Events::all().wait_for(made);
    }
}

// Right after set-up the worker may not be waiting yet either.
TEST_F(Worker, LosesNoRequestMadeTheMomentItIsReady)
{
    for (size_t made = 1; made <= 200; ++made) {
        const auto worker = started();
        ASSERT_EQ(0, request(*worker)) << made;
        Events::all().wait_for(made);
    }
}

// A request made during a job waits for the mutex, and is signalled between two waits of the
// worker.
TEST_F(Worker, LosesNoRequestMadeDuringAJob)
{
    const auto worker = started();
    std::atomic<size_t> jobs{0};
    script().during_job = [&] { ++jobs; };
    size_t accepted = 0;
    while (accepted < 500) {
        accepted += request(*worker) == 0;
    }
    Events::all().wait_for(accepted);
    EXPECT_EQ(accepted, jobs);
}

TEST_F(Worker, WaitsInARequestForARunningJob)
{
    const auto worker = started();
    HeldJob job(*worker);
    std::atomic<bool> answered{false};
    std::thread second([&] {
        EXPECT_EQ(0, request(*worker));
        answered = true;
    });
    std::this_thread::sleep_for(20ms);
    EXPECT_FALSE(answered);
    job.end();
    second.join();
    Events::all().wait_for(2);
}

TEST_F(Worker, FinishesARunningJobBeforeItIsReleased)
{
    auto worker = started();
    HeldJob job(*worker);
    std::atomic<bool> released{false};
    std::thread releaser([&] {
        worker.reset();
        released = true;
        EXPECT_EQ(1U, Events::all().count());
    });
    std::this_thread::sleep_for(20ms);
    EXPECT_FALSE(released);
    job.end();
    releaser.join();
    EXPECT_EQ(0, Events::all().wait_for(1));
}

TEST_F(Worker, BeginsNoJobOnceItsExitIsRequested)
{
    const uint64_t before = waits_begun();
    const auto worker = started();
    until_waits_have_begun(before + 2);
    {
        const LostSignals asleep;
        EXPECT_EQ(0, request(*worker));
        worker->requestExit();
    }
    EXPECT_EQ(-4, request(*worker));
    wake_without_reason();
    worker->requestExit();
    EXPECT_EQ(0U, Events::all().count());
}

// A released worker has no job to describe the audio to.
TEST_F(Worker, RefusesARequestAfterItsRelease)
{
    alignas(FingerprintThread) std::array<std::byte, sizeof(FingerprintThread)> place;
    auto* const worker = new (place.data()) FingerprintThread(cookie(0));
    EXPECT_EQ(0, worker->init());
    EXPECT_EQ(0, worker->release());
    EXPECT_EQ(-4, request(*worker));
    // Not destroyed: that would be a second release.
}

TEST_F(Worker, RepeatsItsLastJobWhenWokenWithoutReason)
{
    const uint64_t before = waits_begun();
    const auto worker = started();
    EXPECT_EQ(0, request(*worker));
    Events::all().wait_for(1);
    until_waits_have_begun(before + 2);
    while (Events::all().count() < 2) {
        wake_without_reason();
        std::this_thread::yield();
    }
    EXPECT_EQ(0, Events::all().wait_for(2));
    EXPECT_EQ(std::string("\1\2\3\4"), script().audio);
}

// The configuration that it then finds is clear.
TEST_F(Worker, FailsAJobWhenWokenBeforeTheFirstRequest)
{
    const uint64_t before = waits_begun();
    const auto worker = started();
    until_waits_have_begun(before + 2);
    while (Events::all().count() < 1) {
        wake_without_reason();
        std::this_thread::yield();
    }
    EXPECT_EQ(1, Events::all().wait_for(1));
}

/// Runs a call that does not come back by itself, and sees it come back after `withoutWorker`.
void expect_release_blocks_until_acknowledged(FingerprintThread& worker)
{
    std::atomic<bool> back{false};
    const uint64_t before = waits_begun();
    std::thread releaser([&] {
        worker.release();
        back = true;
    });
    until_waits_have_begun(before + 1);
    wake_without_reason(); // waking is not acknowledging
    std::this_thread::sleep_for(kNever);
    EXPECT_FALSE(back);
    worker.withoutWorker();
    releaser.join();
}

TEST_F(Worker, ThatNeverRanIsReleasedNever)
{
    alignas(FingerprintThread) std::array<std::byte, sizeof(FingerprintThread)> place;
    expect_release_blocks_until_acknowledged(*new (place.data()) FingerprintThread(cookie(0)));
}

// This prevents a second free of the buffer.
TEST_F(Worker, WaitsForEverInASecondRelease)
{
    alignas(FingerprintThread) static std::array<std::byte, sizeof(FingerprintThread)> place;
    auto* const worker = new (place.data()) FingerprintThread(cookie(0));
    EXPECT_EQ(0, worker->init());
    const char* const text = worker->getFingerprint();
    EXPECT_EQ(0, worker->release());
    EXPECT_EQ(text, worker->getFingerprint()) << "the pointer is left as it is";
    static std::atomic<bool> back{false};
    const uint64_t before = waits_begun();
    std::thread([worker] {
        worker->release();
        back = true;
    }).detach(); // and left behind
    until_waits_have_begun(before + 1);
    std::this_thread::sleep_for(kNever);
    EXPECT_FALSE(back);
}

TEST_F(Worker, ReportsAThreadThatCannotBeStarted)
{
    const int64_t before = live_blocks();
    {
        FingerprintThread worker(cookie(0));
        {
            const NoThreads refused;
            EXPECT_EQ(-2, worker.init());
        }
        EXPECT_EQ(-4, request(worker)) << "the mutex is free, and the worker not ready";
        worker.withoutWorker();
    }
    EXPECT_EQ(before, live_blocks());
}

TEST_F(Worker, ReportsEachAllocationThatFails)
{
    for_every_failed_allocation([](auto fired) {
        std::optional<FingerprintThread> worker(cookie(0));
        const int32_t code = worker->init();
        if (fired()) {
            EXPECT_EQ(-2, code);
            EXPECT_EQ(-4, request(*worker));
            worker->withoutWorker();
        } else {
            EXPECT_EQ(0, code);
        }
    });
}

TEST_F(Worker, KeepsToItselfAmongOthers)
{
    constexpr size_t kWorkers = 8;
    constexpr int kRequests = 40;
    std::vector<std::thread> callers;
    script().during_job = nullptr;
    static std::array<std::atomic<int>, 16> events;
    for (auto& count : events) {
        count = 0;
    }
    for (size_t i = 0; i < kWorkers; ++i) {
        callers.emplace_back([i] {
            FingerprintThread worker(cookie(i));
            worker.setEventCallback([](int32_t event, int32_t, int32_t, jobject mine) {
                EXPECT_EQ(1, event);
                ++events.at(static_cast<size_t>(reinterpret_cast<char*>(mine) -
                                                reinterpret_cast<char*>(cookie(0))));
            });
            EXPECT_EQ(0, worker.init());
            for (int made = 0; made < kRequests;) {
                made += request(worker, 3) == 0; // refused before there is a handle
            }
            while (events.at(i) < kRequests) {
                std::this_thread::yield();
            }
        });
    }
    for (auto& caller : callers) {
        caller.join();
    }
    for (size_t i = 0; i < kWorkers; ++i) {
        EXPECT_EQ(kRequests, events.at(i)) << i;
    }
}

} // namespace
