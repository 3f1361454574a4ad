/// @file
/// Arrays, texts and exceptions of Java.
#include "bindings/java/native/java_side.hpp"

#include <cstring>

namespace kz::java {

void raise(JNIEnv* env, kzcat_status status, const char* text) noexcept
{
    jclass type = env->FindClass("com/orvanta/android/kzsdk/CatalogueException");
    if (type == nullptr) {
        return; // the VM's own exception is pending
    }
    jmethodID constructor = env->GetMethodID(type, "<init>", "(I[B)V");
    jbyteArray bytes = constructor != nullptr ? to_java(env, text) : nullptr;
    if (bytes == nullptr) {
        return;
    }
    jobject exception = env->NewObject(type, constructor, static_cast<jint>(status), bytes);
    if (exception != nullptr) {
        env->Throw(static_cast<jthrowable>(exception));
    }
}

bool succeeded(JNIEnv* env, kzcat_status status) noexcept
{
    if (status == KZCAT_OK) {
        return true;
    }
    raise(env, status, kzcat_get_error_text());
    return false;
}

std::string bytes_of(JNIEnv* env, jbyteArray array)
{
    if (array == nullptr) {
        return {};
    }
    const jsize size = env->GetArrayLength(array);
    std::vector<jbyte> bytes(static_cast<size_t>(size));
    env->GetByteArrayRegion(array, 0, size, bytes.data());
    return {bytes.begin(), bytes.end()};
}

jbyteArray to_java(JNIEnv* env, const char* text) noexcept
{
    if (text == nullptr) {
        return nullptr;
    }
    const auto size = static_cast<jsize>(std::strlen(text));
    jbyteArray array = env->NewByteArray(size);
    if (array != nullptr) {
        env->SetByteArrayRegion(array, 0, size, reinterpret_cast<const jbyte*>(text));
    }
    return array;
}

jobjectArray to_java(JNIEnv* env, const std::vector<const char*>& texts) noexcept
{
    jclass element = env->FindClass("[B");
    if (element == nullptr) {
        return nullptr;
    }
    jobjectArray array = env->NewObjectArray(static_cast<jsize>(texts.size()), element, nullptr);
    for (size_t i = 0; array != nullptr && i < texts.size(); ++i) {
        jbyteArray text = to_java(env, texts[i]);
        if (text == nullptr && texts[i] != nullptr) {
            return nullptr;
        }
        env->SetObjectArrayElement(array, static_cast<jsize>(i), text);
        env->DeleteLocalRef(text);
    }
    return array;
}

} // namespace kz::java
