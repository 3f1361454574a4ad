// In the place of libkzsdk: a library of another version.
#include <jni.h>

extern "C" JNIEXPORT jstring JNICALL
Java_com_orvanta_android_kzsdk_NativeStream_version(JNIEnv* env, jclass /*type*/)
{
    return env->NewStringUTF("0.9.7");
}
