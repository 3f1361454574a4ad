/// @file
/// What the bridge needs of the Java VM: an environment for each thread, and binding native
/// methods.
///
/// A thread that was attached here is detached when it ends, by the destructor of a thread-specific
/// value.
#include "kzsdk/jni/runtime.hpp"

#include <atomic>

#include <pthread.h>

namespace android {

namespace {

constinit std::atomic<JavaVM*> java_vm{nullptr};

pthread_once_t key_once = PTHREAD_ONCE_INIT;
pthread_key_t attached_to; // the VM that this thread is to be detached from
bool key_is_there = false;

void detach(void* vm) noexcept { static_cast<JavaVM*>(vm)->DetachCurrentThread(); }

void make_key() noexcept { key_is_there = pthread_key_create(&attached_to, detach) == 0; }

/// The first argument is `void**` in a desktop's jni.h and `JNIEnv**` in Android's.
template <class Environment>
JNIEnv* attach(JavaVM& vm, jint (JavaVM::*call)(Environment**, void*)) noexcept
{
    // The full name, which the system's own thread name is too short for.
    char name[] = "FingerprintThread";
    JavaVMAttachArgs arguments = {JNI_VERSION_1_4, name, nullptr};
    Environment* environment = nullptr;
    return (vm.*call)(&environment, &arguments) == JNI_OK ? static_cast<JNIEnv*>(environment)
                                                          : nullptr;
}

} // namespace

void AndroidRuntime::setJavaVM(JavaVM* vm) noexcept { java_vm = vm; }

int AndroidRuntime::registerNativeMethods(JNIEnv* env, const char* class_name,
                                          const JNINativeMethod* methods, int count) noexcept
{
    jclass type = env->FindClass(class_name);
    if (type == nullptr) {
        return JNI_ERR;
    }
    const jint result = env->RegisterNatives(type, methods, count);
    env->DeleteLocalRef(type);
    return result;
}

JNIEnv* AndroidRuntime::getJNIEnv() noexcept
{
    JavaVM* const vm = java_vm;
    if (vm == nullptr) {
        return nullptr;
    }
    void* known = nullptr;
    if (vm->GetEnv(&known, JNI_VERSION_1_4) == JNI_OK) {
        return static_cast<JNIEnv*>(known);
    }
    // The VM cannot end before an attached thread is detached.
    pthread_once(&key_once, make_key);
    if (!key_is_there) {
        return nullptr;
    }
    JNIEnv* const env = attach(*vm, &JavaVM::AttachCurrentThreadAsDaemon);
    if (env != nullptr && pthread_setspecific(attached_to, vm) != 0) {
        vm->DetachCurrentThread();
        return nullptr;
    }
    return env;
}

} // namespace android
