/// @file
/// Native methods that take sound: builders of trails, and queries.
#include "bindings/java/native/java_side.hpp"

using namespace kz::java;

namespace {

kzcat_format format_of(jint format, jint rate, jint channels) noexcept
{
    return {static_cast<uint32_t>(format), static_cast<uint32_t>(rate),
            static_cast<uint32_t>(channels), 0};
}

/// Passes the first bytes of a direct buffer on.
template <class Handle>
void feed(JNIEnv* env, jlong number, jobject buffer, jint count,
          kzcat_status (*take)(Handle*, const void*, uint64_t)) noexcept
{
    const void* const bytes = env->GetDirectBufferAddress(buffer);
    if (bytes == nullptr || count < 0 || count > env->GetDirectBufferCapacity(buffer)) {
        raise(env, KZCAT_ERROR_INVALID_ARGUMENT, "The buffer is not direct, or too small.");
        return;
    }
    succeeded(env, take(handle_of<Handle>(number), bytes, static_cast<uint64_t>(count)));
}

} // namespace

KZ_JAVA_METHOD(jlong, createBuilder)
(JNIEnv* env, jclass /*type*/, jint format, jint rate, jint channels, jboolean documents)
{
    const kzcat_format samples = format_of(format, rate, channels);
    kzcat_builder_settings settings;
    kzcat_initialize_builder_settings(&settings);
    settings.documents = documents;
    kzcat_builder* builder = nullptr;
    succeeded(env, kzcat_builder_create(&samples, &settings, &builder));
    return number_of(builder);
}

KZ_JAVA_METHOD(void, feedBuilder)
(JNIEnv* env, jclass /*type*/, jlong builder, jobject buffer, jint count)
{
    feed(env, builder, buffer, count, kzcat_builder_feed);
}

KZ_JAVA_METHOD(jlong, finishBuilder)(JNIEnv* env, jclass /*type*/, jlong builder)
{
    kzcat_trail* trail = nullptr;
    succeeded(env, kzcat_builder_finish(handle_of<kzcat_builder>(builder), &trail));
    return number_of(trail);
}

KZ_JAVA_METHOD(void, freeBuilder)(JNIEnv* /*env*/, jclass /*type*/, jlong number)
{
    auto* builder = handle_of<kzcat_builder>(number);
    kzcat_builder_free(&builder);
}

KZ_JAVA_METHOD(void, freeTrail)(JNIEnv* /*env*/, jclass /*type*/, jlong number)
{
    auto* trail = handle_of<kzcat_trail>(number);
    kzcat_trail_free(&trail);
}

KZ_JAVA_METHOD(jlong, createQuery)
(JNIEnv* env, jclass /*type*/, jint format, jint rate, jint channels)
{
    const kzcat_format samples = format_of(format, rate, channels);
    kzcat_query* query = nullptr;
    succeeded(env, kzcat_query_create(&samples, &query));
    return number_of(query);
}

/// The document comes with a 0 behind it.
KZ_JAVA_METHOD(jlong, createQueryFromDocument)(JNIEnv* env, jclass /*type*/, jbyteArray document)
{
    kzcat_query* query = nullptr;
    guarded(env, [&] {
        const std::string text = bytes_of(env, document);
        succeeded(env, kzcat_query_create_from_document(
                           text.c_str(), text.empty() ? 0 : text.size() - 1, &query));
    });
    return number_of(query);
}

KZ_JAVA_METHOD(void, feedQuery)
(JNIEnv* env, jclass /*type*/, jlong query, jobject buffer, jint count)
{
    feed(env, query, buffer, count, kzcat_query_feed);
}

KZ_JAVA_METHOD(void, finishQuery)(JNIEnv* env, jclass /*type*/, jlong query)
{
    succeeded(env, kzcat_query_finish(handle_of<kzcat_query>(query)));
}

KZ_JAVA_METHOD(void, freeQuery)(JNIEnv* /*env*/, jclass /*type*/, jlong number)
{
    auto* query = handle_of<kzcat_query>(number);
    kzcat_query_free(&query);
}
