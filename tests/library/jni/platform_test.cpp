// What the front needs from the system, through the adapter that this program is linked with.

#include <condition_variable>
#include <mutex>

#include <errno.h>

#include <gtest/gtest.h>

#include "kzsdk/jni/platform/platform.hpp"
#include "platform_probe.hpp"
#include "support/allocation.hpp"

namespace {

using namespace kz::test;
using kz::platform::kLogDebug;
using kz::platform::kLogError;

TEST(PlatformLog, WritesPriorityTagAndMessage)
{
    const CapturedLog captured;
    kz::platform::log(kLogError, "FingerprintJNI", "something failed");
    kz::platform::log(kLogDebug, "Fingerprint - Native", "something else");
    EXPECT_EQ((LogLines{{6, "FingerprintJNI", "something failed"},
                        {3, "Fingerprint - Native", "something else"}}),
              captured.lines());
}

TEST(PlatformLog, PrintsAStatusInUpperCaseHexadecimal)
{
    const CapturedLog captured;
    kz::platform::log(kLogError, "tag", "error=%X", KZ_FPX_ERROR_NOT_ENOUGH_AUDIO);
    kz::platform::log(kLogError, "tag", "error=%X", 0);
    EXPECT_EQ((LogLines{{6, "tag", "error=90080602"}, {6, "tag", "error=0"}}), captured.lines());
}

TEST(PlatformLog, KeepsALineBreakAtTheEndOfAMessage)
{
    const CapturedLog captured;
    kz::platform::log(kLogError, "tag", "broken\n");
    EXPECT_EQ((LogLines{{6, "tag", "broken\n"}}), captured.lines());
}

TEST(PlatformLog, TakesTheProgramsNameForANullTag)
{
    const CapturedLog captured;
    kz::platform::log(kLogError, nullptr, "GetEnv failed!");
    EXPECT_EQ((LogLines{{6, program_invocation_short_name, "GetEnv failed!"}}), captured.lines());
}

struct Meeting {
    std::mutex mutex;
    std::condition_variable met;
    bool ran = false;
    ThreadLooks looks = {"", 0};
};

int meet(void* argument)
{
    auto& meeting = *static_cast<Meeting*>(argument);
    const std::lock_guard lock(meeting.mutex);
    meeting.looks = looks_of_this_thread();
    meeting.ran = true;
    meeting.met.notify_one();
    return 0;
}

// A system's thread name holds 15 characters.
TEST(PlatformThread, RunsUnderItsNameInTheBackground)
{
    Meeting meeting;
    std::unique_lock lock(meeting.mutex);
    ASSERT_TRUE(kz::platform::start_thread(meet, &meeting, "FingerprintThread",
                                           kz::platform::kBackgroundPriority));
    meeting.met.wait(lock, [&] { return meeting.ran; });
    EXPECT_EQ("FingerprintThre", meeting.looks.name);
    EXPECT_EQ(10, meeting.looks.priority);
}

TEST(PlatformThread, ThatCannotBeStartedIsReported)
{
    const int64_t before = live_blocks();
    const NoThreads refused;
    Meeting meeting;
    EXPECT_FALSE(kz::platform::start_thread(meet, &meeting, "name", 10));
    EXPECT_FALSE(meeting.ran);
    EXPECT_EQ(before, live_blocks());
}

} // namespace
