// What a VM does not do on demand: refuse an environment, lack a class or a member. A mock of the
// VM does that; everything else is tested on a real one, in tests/bindings/java.

#include "kzsdk/jni/bridge.hpp"

#include <array>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include <errno.h>
#include <pthread.h>

#include <gtest/gtest.h>

#include "kzsdk/jni/runtime.hpp"
#include "platform_probe.hpp"
#include "scripted_core.hpp"
#include "support/allocation.hpp"

namespace {

// What the system refuses to this thread.
thread_local bool no_more_keys = false;
thread_local bool no_more_values = false;

} // namespace

extern "C" {

int __real_pthread_key_create(pthread_key_t* key, void (*at_the_end)(void*));
int __real_pthread_setspecific(pthread_key_t key, const void* value);

int __wrap_pthread_key_create(pthread_key_t* key, void (*at_the_end)(void*))
{
    return no_more_keys ? EAGAIN : __real_pthread_key_create(key, at_the_end);
}

int __wrap_pthread_setspecific(pthread_key_t key, const void* value)
{
    return no_more_values ? ENOMEM : __real_pthread_setspecific(key, value);
}

} // extern "C"

namespace {

using namespace kz::test;
using Calls = std::vector<std::string>;

/// What the VM fails at, and what was requested of it. "" for nothing.
struct Vm {
    std::string fails_at;
    Calls calls;
    int global_references = 0;
    bool answers(const std::string& call)
    {
        calls.push_back(call);
        return call != fails_at;
    }
};

Vm vm_state;
std::array<char, 4> things;

template <class Thing>
Thing thing(size_t index)
{
    return reinterpret_cast<Thing>(&things.at(index));
}

jclass find_class(JNIEnv*, const char* name)
{
    const bool again = !vm_state.calls.empty() && vm_state.fails_at == "class again" &&
                       vm_state.calls.back().starts_with("field ");
    return vm_state.answers("class " + std::string(name)) && !again ? thing<jclass>(0) : nullptr;
}

jobject new_global_reference(JNIEnv*, jobject)
{
    if (!vm_state.answers("global reference")) {
        return nullptr;
    }
    ++vm_state.global_references;
    return thing<jobject>(1);
}

void delete_global_reference(JNIEnv*, jobject reference)
{
    vm_state.global_references -= reference != nullptr;
}

void delete_local_reference(JNIEnv*, jobject) {}

jmethodID get_static_method(JNIEnv*, jclass, const char* name, const char* signature)
{
    const bool found = vm_state.answers("method " + std::string(name) + signature);
    return found ? thing<jmethodID>(2) : nullptr;
}

jfieldID get_field(JNIEnv*, jclass, const char* name, const char* signature)
{
    const bool found = vm_state.answers("field " + std::string(name) + " " + signature);
    return found ? thing<jfieldID>(3) : nullptr;
}

std::vector<void*> natives;
jint context = 0;

jint get_int(JNIEnv*, jobject, jfieldID) { return context; }

void set_int(JNIEnv*, jobject, jfieldID, jint value) { context = value; }

jsize array_length(JNIEnv*, jarray) { return 4; }

void array_region(JNIEnv*, jbyteArray, jsize, jsize length, jbyte* bytes)
{
    std::memset(bytes, 1, static_cast<size_t>(length));
}

jint register_natives(JNIEnv*, jclass, const JNINativeMethod* methods, jint count)
{
    std::string call = "natives";
    natives.clear();
    for (const JNINativeMethod* method = methods; method != methods + count; ++method) {
        call += std::string(" ") + method->name + method->signature;
        EXPECT_NE(nullptr, method->fnPtr);
        natives.push_back(method->fnPtr);
    }
    vm_state.calls.push_back(call);
    return vm_state.fails_at == "natives" ? -1 : 0;
}

JNINativeInterface_ environment_table()
{
    JNINativeInterface_ table = {};
    table.FindClass = find_class;
    table.NewGlobalRef = new_global_reference;
    table.DeleteGlobalRef = delete_global_reference;
    table.DeleteLocalRef = delete_local_reference;
    table.GetStaticMethodID = get_static_method;
    table.GetFieldID = get_field;
    table.RegisterNatives = register_natives;
    table.GetIntField = get_int;
    table.SetIntField = set_int;
    table.GetArrayLength = array_length;
    table.GetByteArrayRegion = array_region;
    return table;
}

const JNINativeInterface_ environment_functions = environment_table();
JNIEnv environment = {&environment_functions};

jint get_environment(JavaVM*, void** env, jint version)
{
    EXPECT_EQ(0x10004, version);
    const bool there = vm_state.answers("environment");
    *env = there ? &environment : nullptr;
    return there ? JNI_OK : JNI_EDETACHED;
}

jint attach_as_daemon(JavaVM*, void** env, void* arguments)
{
    const auto* const wanted = static_cast<JavaVMAttachArgs*>(arguments);
    EXPECT_STREQ("FingerprintThread", wanted->name);
    EXPECT_EQ(0x10004, wanted->version);
    if (!vm_state.answers("attach")) {
        return JNI_ERR;
    }
    *env = &environment;
    return JNI_OK;
}

jint detach(JavaVM*)
{
    vm_state.calls.emplace_back("detach");
    return JNI_OK;
}

JNIInvokeInterface_ vm_table()
{
    JNIInvokeInterface_ table = {};
    table.GetEnv = get_environment;
    table.AttachCurrentThreadAsDaemon = attach_as_daemon;
    table.DetachCurrentThread = detach;
    return table;
}

const JNIInvokeInterface_ vm_functions = vm_table();
JavaVM vm = {&vm_functions};

/// A VM to which no thread is attached.
JNIInvokeInterface_ detached_table()
{
    JNIInvokeInterface_ table = vm_table();
    table.GetEnv = [](JavaVM*, void**, jint) { return JNI_EDETACHED; };
    return table;
}

const JNIInvokeInterface_ detached_functions = detached_table();
JavaVM detached_vm = {&detached_functions};

const std::string kClass = "class com/orvanta/android/kzsdk/Fingerprint";
const std::string kMethod = "method postEventFromNative(Ljava/lang/Object;III)V";
const std::string kField = "field mNativeContext I";

class Registration : public ::testing::Test {
protected:
    void SetUp() override { vm_state = {}; }

    /// Loading fails where the VM does, after these lines, the last two of which have no tag.
    static void expect_refusal(const std::string& fails_at, const LogLines& lines)
    {
        vm_state = {};
        vm_state.fails_at = fails_at;
        const CapturedLog captured;
        EXPECT_EQ(-1, JNI_OnLoad(&vm, nullptr));
        EXPECT_EQ(lines, captured.lines());
        EXPECT_EQ(0, vm_state.global_references) << "a half-made reference is left";
    }
};

const LogLine kRefused = {6, program_invocation_short_name,
                          "ERROR: failed - register_com_orvanta_android_kzsdk_Fingerprint()."};

TEST_F(Registration, AsksForClassMethodFieldAndNativesInOrder)
{
    const CapturedLog captured;
    EXPECT_EQ(0x10004, JNI_OnLoad(&vm, nullptr));
    EXPECT_EQ((Calls{"environment", kClass, "global reference", kMethod, kField, kClass,
                     "natives native_setup(Ljava/lang/Object;)I native_finalize()V "
                     "native_generate(IIII[BI)I native_getFingerprint()Ljava/lang/String; "
                     "native_release()V"}),
              vm_state.calls);
    EXPECT_EQ(LogLines{}, captured.lines());
    EXPECT_EQ(1, vm_state.global_references);
}

TEST_F(Registration, FailsWithoutAnEnvironment)
{
    expect_refusal("environment", {{6, program_invocation_short_name, "GetEnv failed!"}});
    EXPECT_EQ(Calls{"environment"}, vm_state.calls);
}

TEST_F(Registration, FailsWithoutTheClass)
{
    expect_refusal(
        kClass,
        {{6, "FingerprintJNI", "Can't find com/orvanta/android/kzsdk/Fingerprint"}, kRefused});
}

TEST_F(Registration, FailsWithoutAReferenceToTheClass)
{
    expect_refusal("global reference",
                   {{6, "FingerprintJNI", "Can't find global ref for Fingerprint."}, kRefused});
}

TEST_F(Registration, FailsWithoutTheCallback)
{
    expect_refusal(kMethod, {{6, "FingerprintJNI",
                              "Can't get static methodID for Fingerprint#postEventFromNative"},
                             kRefused});
}

TEST_F(Registration, FailsWithoutTheField)
{
    expect_refusal(kField,
                   {{6, "FingerprintJNI", "Can't find Fingerprint.mNativeContext"}, kRefused});
}

TEST_F(Registration, FailsWhereTheClassIsGoneWhenItsMethodsAreTold)
{
    expect_refusal("class again", {kRefused});
    EXPECT_EQ(kClass, vm_state.calls.back());
}

// The thread that an event comes on, which was not attached to the VM before.
TEST(Environment, IsThatOfTheThreadWhenTheVmKnowsIt)
{
    vm_state = {};
    android::AndroidRuntime::setJavaVM(&vm);
    EXPECT_EQ(&environment, android::AndroidRuntime::getJNIEnv());
    EXPECT_EQ(Calls{"environment"}, vm_state.calls);
}

TEST(Environment, IsNullWithoutAVm)
{
    vm_state = {};
    android::AndroidRuntime::setJavaVM(nullptr);
    EXPECT_EQ(nullptr, android::AndroidRuntime::getJNIEnv());
    EXPECT_EQ(Calls{}, vm_state.calls);
}

TEST(Environment, AttachesAnUnknownThreadAndDetachesItAtItsEnd)
{
    vm_state = {};
    vm_state.fails_at = "environment";
    android::AndroidRuntime::setJavaVM(&vm);
    std::thread([] {
        EXPECT_EQ(&environment, android::AndroidRuntime::getJNIEnv());
        EXPECT_EQ((Calls{"environment", "attach"}), vm_state.calls);
    }).join();
    EXPECT_EQ((Calls{"environment", "attach", "detach"}), vm_state.calls);
}

TEST(Environment, IsNullWhereTheThreadCannotBeAttached)
{
    vm_state = {};
    vm_state.fails_at = "attach";
    android::AndroidRuntime::setJavaVM(&detached_vm);
    std::thread([] { EXPECT_EQ(nullptr, android::AndroidRuntime::getJNIEnv()); }).join();
    EXPECT_EQ(Calls{"attach"}, vm_state.calls);
}

TEST(Environment, IsNullWhereTheThreadCouldNotBeDetachedLater)
{
    vm_state = {};
    android::AndroidRuntime::setJavaVM(&detached_vm);
    std::thread([] {
        no_more_values = true;
        const JNIEnv* const env = android::AndroidRuntime::getJNIEnv();
        no_more_values = false;
        EXPECT_EQ(nullptr, env);
    }).join();
    EXPECT_EQ((Calls{"attach", "detach"}), vm_state.calls);
}

// In a process of its own: the key is made once.
TEST(EnvironmentDeathTest, IsNullAndNothingAttachedWhereNoKeyCanBeMade)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const auto in_a_new_process = [] {
        vm_state = {};
        android::AndroidRuntime::setJavaVM(&detached_vm);
        no_more_keys = true;
        const JNIEnv* const env = android::AndroidRuntime::getJNIEnv();
        no_more_keys = false;
        std::exit(env == nullptr && vm_state.calls.empty() ? 0 : 1);
    };
    EXPECT_EXIT(in_a_new_process(), ::testing::ExitedWithCode(0), "");
}

jint set_up()
{
    const auto setup = reinterpret_cast<jint (*)(JNIEnv*, jobject, jobject)>(natives.at(0));
    return setup(&environment, thing<jobject>(0), thing<jobject>(0));
}

jint request()
{
    const auto generate =
        reinterpret_cast<jint (*)(JNIEnv*, jobject, jint, jint, jint, jint, jbyteArray, jint)>(
            natives.at(2));
    return generate(&environment, thing<jobject>(0), 44100, 2, 1, 16, thing<jbyteArray>(0), 4);
}

void release()
{
    reinterpret_cast<void (*)(JNIEnv*, jobject)>(natives.at(4))(&environment, thing<jobject>(0));
}

TEST(SetUp, WithoutAThreadIsLoggedAndKeepsItsReference)
{
    vm_state = {};
    ASSERT_EQ(0x10004, JNI_OnLoad(&vm, nullptr));
    vm_state.global_references = 0;
    context = 7;
    const int64_t before = live_blocks();
    const CapturedLog captured;
    {
        const NoThreads refused;
        EXPECT_EQ(-2, set_up());
    }
    EXPECT_EQ((LogLines{{3, "FingerprintJNI", "native_setup: init error"},
                        {3, "FingerprintJNI", "native_setup error"}}),
              captured.lines());
    EXPECT_EQ(7, context) << "the field is not set";
    EXPECT_EQ(1, vm_state.global_references);
    EXPECT_EQ(before, live_blocks());
    context = 0;
}

TEST(SetUp, ReportsEachAllocationThatFails)
{
    vm_state = {};
    ASSERT_EQ(0x10004, JNI_OnLoad(&vm, nullptr));
    const CapturedLog captured;
    for_every_failed_allocation([&](auto fired) {
        const jint code = set_up();
        EXPECT_EQ(fired() ? -2 : 0, code);
        EXPECT_EQ(code == 0, context != 0);
        release();
    });
}

TEST(SetUp, ReportsThatNoReferenceCanBeMade)
{
    vm_state = {};
    ASSERT_EQ(0x10004, JNI_OnLoad(&vm, nullptr));
    vm_state.fails_at = "global reference";
    EXPECT_EQ(-2, set_up());
    EXPECT_EQ(0, context);
}

TEST(Request, WithoutMemoryIsRefusedAndTheWorkerStaysReady)
{
    script() = {};
    vm_state = {};
    ASSERT_EQ(0x10004, JNI_OnLoad(&vm, nullptr));
    ASSERT_EQ(0, set_up());
    {
        const AllocationFault fault(1);
        EXPECT_EQ(-2, request());
    }
    android::AndroidRuntime::setJavaVM(nullptr); // nowhere to post the event to
    EXPECT_EQ(0, request());
    release();
}

// A worker goes on without its VM, and logs it.
TEST(Environment, ThatIsMissingIsLoggedWithTheEvent)
{
    script() = {};
    vm_state = {};
    ASSERT_EQ(0x10004, JNI_OnLoad(&vm, nullptr));
    vm_state.fails_at = "attach";
    android::AndroidRuntime::setJavaVM(&detached_vm);
    const CapturedLog captured;
    EXPECT_EQ(0, set_up());
    EXPECT_EQ(0, request());
    while (captured.lines().empty()) {
        std::this_thread::yield();
    }
    release();
    EXPECT_EQ((LogLines{{6, "FingerprintJNI",
                         "fingerprint_eventcallback: No JNI env for Fingerprint event callback, "
                         "can't post event."}}),
              captured.lines());
    EXPECT_EQ(0, context);
}

TEST_F(Registration, FailsWhenTheNativeMethodsCannotBeBound)
{
    expect_refusal("natives", {kRefused});
}

} // namespace
