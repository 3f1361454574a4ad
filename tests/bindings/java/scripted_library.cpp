// What a Java test directs: the script below the worker, the platform, and the worker's condition.

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>

#include <jni.h>

#include "kzsdk/jni/platform/platform.hpp"
#include "library/jni/scripted_core.hpp"
#include "library/jni/waits.hpp"

namespace {

using kz::test::script;

std::mutex mutex;
std::condition_variable changed;
bool holding = false;
int held_jobs = 0;
std::string logged;
std::atomic<bool> threads_allowed{true};
uint64_t waits_before = 0;

void stand_still()
{
    std::unique_lock lock(mutex);
    ++held_jobs;
    changed.notify_all();
    changed.wait(lock, [] { return !holding; });
    --held_jobs;
}

jstring to_java(JNIEnv* env, const std::string& text) { return env->NewStringUTF(text.c_str()); }

} // namespace

void kz::platform::log(LogPriority priority, const char* tag, const char* format,
                       uint32_t value) noexcept
{
    char message[256];
    std::snprintf(message, sizeof message, format, value);
    const std::lock_guard lock(mutex);
    logged +=
        std::to_string(priority) + " " + (tag != nullptr ? tag : "(null)") + ": " + message + "\n";
}

bool kz::platform::start_thread(int (*entry)(void*), void* argument, const char* /*name*/,
                                int32_t /*priority*/) noexcept
{
    if (!threads_allowed) {
        return false;
    }
    std::thread([=] { entry(argument); }).detach();
    return true;
}

#define SCRIPT(type, name)                                                                         \
    extern "C" JNIEXPORT type JNICALL Java_com_orvanta_android_kzsdk_Script_##name

SCRIPT(void, reset)(JNIEnv*, jclass)
{
    script() = {};
    script().during_job = stand_still;
    threads_allowed = true;
    waits_before = kz::test::waits_begun();
    kz::test::lose_signals(false);
    const std::lock_guard lock(mutex);
    holding = false;
    logged.clear();
}

SCRIPT(void, text)(JNIEnv* env, jclass, jstring text)
{
    const char* const bytes = env->GetStringUTFChars(text, nullptr);
    script().text = bytes;
    env->ReleaseStringUTFChars(text, bytes);
}

SCRIPT(void, threads)(JNIEnv*, jclass, jboolean allowed) { threads_allowed = allowed; }

SCRIPT(void, signals)(JNIEnv*, jclass, jboolean arrive) { kz::test::lose_signals(!arrive); }

SCRIPT(void, wake)(JNIEnv*, jclass) { kz::test::wake_without_reason(); }

SCRIPT(void, awaitWaits)(JNIEnv*, jclass, jlong count)
{
    kz::test::until_waits_have_begun(waits_before + static_cast<uint64_t>(count));
}

SCRIPT(void, hold)(JNIEnv*, jclass, jboolean hold)
{
    const std::lock_guard lock(mutex);
    holding = hold;
    changed.notify_all();
}

SCRIPT(void, awaitHeldJob)(JNIEnv*, jclass)
{
    std::unique_lock lock(mutex);
    changed.wait(lock, [] { return held_jobs != 0; });
}

SCRIPT(jbyteArray, audio)(JNIEnv* env, jclass)
{
    const std::string& audio = script().audio;
    const auto size = static_cast<jsize>(audio.size());
    jbyteArray bytes = env->NewByteArray(size);
    env->SetByteArrayRegion(bytes, 0, size, reinterpret_cast<const jbyte*>(audio.data()));
    return bytes;
}

SCRIPT(jstring, format)(JNIEnv* env, jclass)
{
    return to_java(env, std::to_string(script().rate) + " " + std::to_string(script().channels) +
                            " " + std::to_string(script().format));
}

SCRIPT(jstring, log)(JNIEnv* env, jclass)
{
    const std::lock_guard lock(mutex);
    return to_java(env, logged);
}
