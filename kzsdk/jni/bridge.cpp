/// @file
/// The native methods of the Java class, and the way back to Java for the events.
///
/// A Java object holds a number, not an address: the number finds a session in a registry, or
/// nothing once the session has ended. So calls may come on any thread, in any order and twice. The
/// audio of a request is copied out of the Java array and kept until the next request is accepted.
#include "kzsdk/jni/bridge.hpp"

#include <array>
#include <cstring>

#include "kzsdk/jni/codes.hpp"
#include "kzsdk/jni/fingerprint_thread.hpp"
#include "kzsdk/jni/heap.hpp"
#include "kzsdk/jni/lock.hpp"
#include "kzsdk/jni/platform/platform.hpp"
#include "kzsdk/jni/registry.hpp"
#include "kzsdk/jni/runtime.hpp"

namespace {

using android::AndroidRuntime;
using android::FingerprintThread;
using kz::jni::Lock;
using kz::platform::kLogDebug;
using kz::platform::kLogError;

constexpr char kTag[] = "FingerprintJNI";
constexpr char kClassName[] = "com/orvanta/android/kzsdk/Fingerprint";

/// Written once, when the library is loaded.
struct JavaSide {
    jclass fingerprint; ///< a global reference
    jmethodID post_event;
    jfieldID context;
};
constinit JavaSide java = {};

/// What stands behind one Java object.
struct Session : kz::jni::Registered {
    explicit Session(jobject reference) noexcept : java_object(reference), thread(reference) {}

    jobject java_object; ///< a global reference, the cookie of the events
    pthread_mutex_t requests = PTHREAD_MUTEX_INITIALIZER; ///< guards `audio`
    kz::jni::system_owned<jbyte[]> audio;                 ///< of the request that was accepted last
    FingerprintThread thread; ///< last, so that it ends before its audio does
};

constinit kz::jni::Registry sessions;

/// Guards the exchange of a number in a Java object for another.
pthread_mutex_t context_mutex = PTHREAD_MUTEX_INITIALIZER;

jint context_of(JNIEnv* env, jobject self) noexcept { return env->GetIntField(self, java.context); }

jint exchange_context(JNIEnv* env, jobject self, jint number) noexcept
{
    const Lock lock(context_mutex);
    const jint before = context_of(env, self);
    env->SetIntField(self, java.context, number);
    return before;
}

/// Leaves a number alone that another set-up has put there meanwhile.
void clear_context(JNIEnv* env, jobject self, jint number) noexcept
{
    const Lock lock(context_mutex);
    if (context_of(env, self) == number) {
        env->SetIntField(self, java.context, 0);
    }
}

void end_session(JNIEnv* env, jint number) noexcept
{
    auto* const session = static_cast<Session*>(sessions.claim(number));
    if (session == nullptr) {
        return;
    }
    session->thread.requestExit(); // the event of a running job still finds its text
    sessions.remove(*session);
    jobject reference = session->java_object;
    kz::jni::destroy(session);
    env->DeleteGlobalRef(reference);
}

/// A session that cannot end while this lives.
class PinnedSession {
public:
    PinnedSession(JNIEnv* env, jobject self) noexcept
        : session_(static_cast<Session*>(sessions.pin(context_of(env, self))))
    {
    }
    ~PinnedSession()
    {
        if (session_ != nullptr) {
            sessions.unpin(*session_);
        }
    }
    PinnedSession(const PinnedSession&) = delete;
    PinnedSession& operator=(const PinnedSession&) = delete;
    explicit operator bool() const noexcept { return session_ != nullptr; }
    Session* operator->() const noexcept { return session_; }

private:
    Session* session_;
};

void post_event(int32_t event, int32_t argument1, int32_t argument2, jobject cookie) noexcept
{
    JNIEnv* const env = AndroidRuntime::getJNIEnv();
    if (env == nullptr) {
        kz::platform::log(kLogError, kTag,
                          "fingerprint_eventcallback: No JNI env for Fingerprint event callback, "
                          "can't post event.");
        return;
    }
    env->CallStaticVoidMethod(java.fingerprint, java.post_event, cookie, event, argument1,
                              argument2);
    if (env->ExceptionCheck() != JNI_FALSE) {
        env->ExceptionDescribe();
        env->ExceptionClear();
    }
}

int32_t start(FingerprintThread& thread) noexcept
{
    int32_t code = thread.setEventCallback(post_event);
    if (code != android::kOk) {
        kz::platform::log(kLogDebug, kTag, "native_setup: set callback event error");
        return code;
    }
    code = thread.init();
    if (code != android::kOk) {
        kz::platform::log(kLogDebug, kTag, "native_setup: init error");
    }
    return code;
}

jint com_orvanta_android_kzsdk_Fingerprint_native_setup(JNIEnv* env, jobject self,
                                                        jobject weak_this) noexcept
{
    jobject reference = env->NewGlobalRef(weak_this);
    if (reference == nullptr && weak_this != nullptr) {
        return android::kNoMemory;
    }
    auto* const session = kz::jni::create<Session>(reference);
    if (session == nullptr) {
        env->DeleteGlobalRef(reference);
        return android::kNoMemory;
    }
    const int32_t code = start(session->thread);
    if (code != android::kOk) {
        kz::platform::log(kLogDebug, kTag, "native_setup error");
        session->thread.withoutWorker(); // it never ran: nothing else would end the wait for it
        kz::jni::destroy(session);       // deliberate: the reference is kept
        return code;
    }
    // What an earlier set-up of this object left is ended; it would be out of reach.
    end_session(env, exchange_context(env, self, sessions.add(*session)));
    return android::kOk;
}

/// Leaves the number where it is: it finds nothing any more.
void com_orvanta_android_kzsdk_Fingerprint_native_finalize(JNIEnv* env, jobject self) noexcept
{
    end_session(env, context_of(env, self));
}

void com_orvanta_android_kzsdk_Fingerprint_native_release(JNIEnv* env, jobject self) noexcept
{
    const jint number = context_of(env, self);
    end_session(env, number);
    clear_context(env, self, number);
}

jint com_orvanta_android_kzsdk_Fingerprint_native_generate(JNIEnv* env, jobject self,
                                                           jint sample_rate, jint channels,
                                                           jint format_code, jint bits_per_sample,
                                                           jbyteArray array, jint length) noexcept
{
    if (array == nullptr || length <= 0 || length > env->GetArrayLength(array)) {
        return android::kBadAudio;
    }
    const PinnedSession session(env, self);
    if (!session) {
        return android::kRefused;
    }
    // Java may move, change or drop the array while the job runs.
    auto audio = kz::jni::make_system_array<jbyte>(static_cast<size_t>(length));
    if (!audio) {
        return android::kNoMemory;
    }
    env->GetByteArrayRegion(array, 0, length, audio.get());
    const Lock lock(session->requests);
    const int32_t code = session->thread.generate(
        static_cast<uint32_t>(sample_rate), channels, format_code, bits_per_sample,
        reinterpret_cast<const uint8_t*>(audio.get()), static_cast<uint32_t>(length));
    if (code == android::kOk) {
        session->audio = std::move(audio); // only the new audio is used now: the old is freed
    }
    return code;
}

jstring com_orvanta_android_kzsdk_Fingerprint_native_getFingerprint(JNIEnv* env,
                                                                    jobject self) noexcept
{
    const PinnedSession session(env, self);
    if (!session) {
        return nullptr;
    }
    // No lock: the worker holds its mutex while it reports, and Java fetches the text from there.
    std::array<char, android::kTextSize + 1> text = {}; // a text that fills the buffer has no end
    std::memcpy(text.data(), session->thread.getFingerprint(), android::kTextSize);
    return env->NewStringUTF(text.data());
}

/// A desktop's jni.h takes names that may be written to, Android's takes constant ones.
template <class Function>
JNINativeMethod method(const char* name, const char* signature, Function* function) noexcept
{
    return {const_cast<char*>(name), const_cast<char*>(signature),
            reinterpret_cast<void*>(function)};
}

int register_methods(JNIEnv* env) noexcept
{
    const std::array methods = {
        method("native_setup", "(Ljava/lang/Object;)I",
               com_orvanta_android_kzsdk_Fingerprint_native_setup),
        method("native_finalize", "()V", com_orvanta_android_kzsdk_Fingerprint_native_finalize),
        method("native_generate", "(IIII[BI)I",
               com_orvanta_android_kzsdk_Fingerprint_native_generate),
        method("native_getFingerprint", "()Ljava/lang/String;",
               com_orvanta_android_kzsdk_Fingerprint_native_getFingerprint),
        method("native_release", "()V", com_orvanta_android_kzsdk_Fingerprint_native_release),
    };
    return AndroidRuntime::registerNativeMethods(env, kClassName, methods.data(),
                                                 static_cast<int>(methods.size()));
}

/// Null, or what could not be found.
const char* find_java_side(JNIEnv* env) noexcept
{
    jclass type = env->FindClass(kClassName);
    if (type == nullptr) {
        return "Can't find com/orvanta/android/kzsdk/Fingerprint";
    }
    java.fingerprint = static_cast<jclass>(env->NewGlobalRef(type));
    env->DeleteLocalRef(type);
    if (java.fingerprint == nullptr) {
        return "Can't find global ref for Fingerprint.";
    }
    java.post_event =
        env->GetStaticMethodID(java.fingerprint, "postEventFromNative", "(Ljava/lang/Object;III)V");
    if (java.post_event == nullptr) {
        return "Can't get static methodID for Fingerprint#postEventFromNative";
    }
    java.context = env->GetFieldID(java.fingerprint, "mNativeContext", "I");
    return java.context == nullptr ? "Can't find Fingerprint.mNativeContext" : nullptr;
}

void forget_java_side(JNIEnv* env) noexcept
{
    env->DeleteGlobalRef(java.fingerprint); // null does nothing
    java = {};
}

} // namespace

int register_com_orvanta_android_kzsdk_Fingerprint(JNIEnv* env) noexcept
{
    java = {};
    const char* const missing = find_java_side(env);
    if (missing != nullptr) {
        kz::platform::log(kLogError, kTag, missing);
        forget_java_side(env);
        return -1;
    }
    const int result = register_methods(env);
    if (result < 0) {
        forget_java_side(env);
    }
    return result;
}

// Declared in jni.h, for C and for export.
jint JNI_OnLoad(JavaVM* vm, void* /*reserved*/)
{
    void* env = nullptr;
    if (vm->GetEnv(&env, JNI_VERSION_1_4) != JNI_OK) {
        kz::platform::log(kLogError, nullptr, "GetEnv failed!");
        return -1;
    }
    AndroidRuntime::setJavaVM(vm);
    if (register_com_orvanta_android_kzsdk_Fingerprint(static_cast<JNIEnv*>(env)) < 0) {
        kz::platform::log(kLogError, nullptr,
                          "ERROR: failed - register_com_orvanta_android_kzsdk_Fingerprint().");
        return -1;
    }
    return JNI_VERSION_1_4;
}
