/// @file
/// The native methods of the Java class com.orvanta.android.kzsdk.NativeStream, which a Java VM
/// finds by their names: streams of sound, for pieces of any length.
///
/// Java holds a stream as its address in 64 bits. The Java side sees to it that one thread at a
/// time uses a stream, and that it is freed once, when no call uses it any more. Sound comes in
/// direct buffers, whose bytes are read where they are. Methods return a kz_status, and put what
/// else they report into the array that they are given.
#include <array>

#include <jni.h>

#include "kzsdk/abs/version.h"
#include "kzsdk/stream/stream.h"

namespace {

kz_stream* stream_of(jlong number) noexcept
{
    return reinterpret_cast<kz_stream*>(static_cast<uintptr_t>(number));
}

template <size_t kCount>
void report(JNIEnv* env, jlongArray out, const std::array<jlong, kCount>& numbers) noexcept
{
    env->SetLongArrayRegion(out, 0, static_cast<jsize>(kCount), numbers.data());
}

jint code(kz_status status) noexcept { return static_cast<jint>(status); }

/// Null unless the buffer is direct and has these bytes.
const void* bytes_of(JNIEnv* env, jobject buffer, jint position, jint count) noexcept
{
    const auto* const first = static_cast<const uint8_t*>(env->GetDirectBufferAddress(buffer));
    const jlong capacity = env->GetDirectBufferCapacity(buffer);
    if (first == nullptr || position < 0 || count < 0 || jlong{position} + count > capacity) {
        return nullptr;
    }
    return first + position;
}

} // namespace

extern "C" {

/// out: the stream, 0 on failure.
JNIEXPORT jint JNICALL Java_com_orvanta_android_kzsdk_NativeStream_create(
    JNIEnv* env, jclass /*type*/, jint algorithm, jint format, jint rate, jint channels,
    jlongArray out)
{
    kz_stream_settings settings;
    kz_stream_initialize_settings(&settings);
    settings.algorithm = static_cast<uint32_t>(algorithm);
    settings.format = static_cast<uint32_t>(format);
    settings.sample_rate = static_cast<uint32_t>(rate);
    settings.channels = static_cast<uint32_t>(channels);
    kz_stream* stream = nullptr;
    const kz_status status = kz_stream_create(&settings, &stream);
    report(env, out, std::array{static_cast<jlong>(reinterpret_cast<uintptr_t>(stream))});
    return code(status);
}

/// out: how many of the bytes were taken; 1 when the fingerprint is complete, else 0.
JNIEXPORT jint JNICALL Java_com_orvanta_android_kzsdk_NativeStream_feed(
    JNIEnv* env, jclass /*type*/, jlong stream, jobject buffer, jint position, jint count,
    jlongArray out)
{
    const void* const bytes = bytes_of(env, buffer, position, count);
    if (bytes == nullptr) {
        return code(KZ_STREAM_ERROR_INVALID_ARGUMENT);
    }
    uint64_t used = 0;
    uint8_t complete = 0;
    const kz_status status =
        kz_stream_feed(stream_of(stream), bytes, static_cast<uint64_t>(count), &used, &complete);
    report(env, out, std::array{static_cast<jlong>(used), jlong{complete}});
    return code(status);
}

/// out: 1 when the fingerprint is complete, else 0.
JNIEXPORT jint JNICALL Java_com_orvanta_android_kzsdk_NativeStream_finish(JNIEnv* env,
                                                                          jclass /*type*/,
                                                                          jlong stream,
                                                                          jlongArray out)
{
    uint8_t complete = 0;
    const kz_status status = kz_stream_finish(stream_of(stream), &complete);
    report(env, out, std::array{jlong{complete}});
    return code(status);
}

/// out: the numbers of kz_stream_state in its order, up to the milliseconds that are missing; then
/// the start and the duration of the fingerprint in milliseconds.
JNIEXPORT jint JNICALL Java_com_orvanta_android_kzsdk_NativeStream_state(JNIEnv* env,
                                                                         jclass /*type*/,
                                                                         jlong stream,
                                                                         jlongArray out)
{
    kz_stream_state state = {};
    uint32_t start = 0;
    uint32_t duration = 0;
    kz_status status = kz_stream_get_state(stream_of(stream), &state);
    if (status == KZ_OK) {
        status = kz_stream_get_times(stream_of(stream), &start, &duration);
    }
    report(env, out,
           std::array{static_cast<jlong>(state.frames),
                      static_cast<jlong>(state.silence_milliseconds),
                      static_cast<jlong>(state.sound_milliseconds), jlong{state.phase},
                      jlong{state.percent}, jlong{state.missing_milliseconds}, jlong{start},
                      jlong{duration}});
    return code(status);
}

/// The query document; null on failure. out: the status.
JNIEXPORT jstring JNICALL Java_com_orvanta_android_kzsdk_NativeStream_document(JNIEnv* env,
                                                                               jclass /*type*/,
                                                                               jlong stream,
                                                                               jlongArray out)
{
    const char* text = nullptr;
    const kz_status status = kz_stream_get_document(stream_of(stream), &text);
    report(env, out, std::array{jlong{status}});
    return text != nullptr ? env->NewStringUTF(text) : nullptr;
}

JNIEXPORT jstring JNICALL Java_com_orvanta_android_kzsdk_NativeStream_statusText(JNIEnv* env,
                                                                                 jclass /*type*/,
                                                                                 jint status)
{
    return env->NewStringUTF(kz_status_text(static_cast<kz_status>(status)));
}

JNIEXPORT jstring JNICALL Java_com_orvanta_android_kzsdk_NativeStream_version(JNIEnv* env,
                                                                              jclass /*type*/)
{
    return env->NewStringUTF(kzsdk_get_version());
}

JNIEXPORT void JNICALL Java_com_orvanta_android_kzsdk_NativeStream_free(JNIEnv* /*env*/,
                                                                        jclass /*type*/,
                                                                        jlong number)
{
    kz_stream* stream = stream_of(number);
    kz_stream_free(&stream);
}

} // extern "C"
