/// @file
/// What Android's own runtime offers to native code, over any Java VM.
#pragma once

#include <jni.h>

namespace android {

class AndroidRuntime {
public:
    AndroidRuntime() = delete;

    /// To be called before getJNIEnv() is, and with the same VM each time.
    static void setJavaVM(JavaVM* vm) noexcept;

    /// Binds native methods to a class. Negative on failure, an exception then being pending.
    static int registerNativeMethods(JNIEnv* env, const char* class_name,
                                     const JNINativeMethod* methods, int count) noexcept;

    /// The calling thread's environment. A thread that is new to the VM is attached to it, as a
    /// daemon, which does not keep the VM from ending, and detached when it ends. Null when that
    /// fails.
    static JNIEnv* getJNIEnv() noexcept;
};

} // namespace android
