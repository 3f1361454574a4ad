/// @file
/// What the native methods of the Java class NativeCatalogue share: numbers for handles, arrays and
/// texts from and to Java, failures.
///
/// Java holds a handle as its address in 64 bits, and sees to it that each is freed once, when no
/// call uses it any more. A method that fails throws a CatalogueException, and what it returns is
/// ignored.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include <jni.h>

#include "kzcat.h"

/// Declares a native method, which the VM finds by its name.
#define KZ_JAVA_METHOD(type, name)                                                                 \
    extern "C" JNIEXPORT type JNICALL Java_com_orvanta_android_kzsdk_NativeCatalogue_##name

namespace kz::java {

template <class Handle>
Handle* handle_of(jlong number) noexcept
{
    return reinterpret_cast<Handle*>(static_cast<uintptr_t>(number));
}

template <class Handle>
jlong number_of(Handle* handle) noexcept
{
    return static_cast<jlong>(reinterpret_cast<uintptr_t>(handle));
}

/// True for success; otherwise an exception is pending, with the library's sentence.
bool succeeded(JNIEnv* env, kzcat_status status) noexcept;

/// Has a CatalogueException pending.
void raise(JNIEnv* env, kzcat_status status, const char* text) noexcept;

/// Runs what may be short of memory; then a CatalogueException is pending.
template <class Work>
void guarded(JNIEnv* env, Work work) noexcept
{
    try {
        work();
    } catch (const std::exception&) {
        raise(env, KZCAT_ERROR_MEMORY, kzcat_status_text(KZCAT_ERROR_MEMORY));
    }
}

/// The bytes of an array; empty for null. Texts come with a 0 behind them.
std::string bytes_of(JNIEnv* env, jbyteArray array);

/// A copy; null for null, and when memory is short, an exception then being pending.
jbyteArray to_java(JNIEnv* env, const char* text) noexcept;

/// Null when memory is short, an exception then being pending.
jobjectArray to_java(JNIEnv* env, const std::vector<const char*>& texts) noexcept;

template <size_t kCount>
void report(JNIEnv* env, jlongArray out, const std::array<jlong, kCount>& numbers) noexcept
{
    env->SetLongArrayRegion(out, 0, static_cast<jsize>(kCount), numbers.data());
}

template <size_t kCount>
void report(JNIEnv* env, jdoubleArray out, const std::array<jdouble, kCount>& numbers) noexcept
{
    env->SetDoubleArrayRegion(out, 0, static_cast<jsize>(kCount), numbers.data());
}

} // namespace kz::java
