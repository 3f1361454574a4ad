/// @file
/// Native methods about tracks: adding, removing, looking through them.
#include "bindings/java/native/java_side.hpp"

using namespace kz::java;

namespace {

/// The elements of an array of arrays.
std::vector<std::string> texts_of(JNIEnv* env, jobjectArray array)
{
    std::vector<std::string> texts;
    const jsize count = env->GetArrayLength(array);
    for (jsize i = 0; i < count; ++i) {
        jobject element = env->GetObjectArrayElement(array, i);
        texts.push_back(bytes_of(env, static_cast<jbyteArray>(element)));
        env->DeleteLocalRef(element);
    }
    return texts;
}

/// The number of a track's record, 0 when there was none; an exception for every other failure.
jlong record_number(JNIEnv* env, kzcat_status status, kzcat_track* track) noexcept
{
    return status == KZCAT_ERROR_NOT_FOUND || !succeeded(env, status) ? 0 : number_of(track);
}

} // namespace

KZ_JAVA_METHOD(void, add)
(JNIEnv* env, jclass /*type*/, jlong catalogue, jlong trail, jbyteArray source, jlongArray about,
 jobjectArray tags, jlongArray out)
{
    guarded(env, [&] {
        const std::string uri = bytes_of(env, source);
        const std::vector<std::string> words = texts_of(env, tags);
        std::vector<kzcat_tag> pairs;
        for (size_t i = 0; i + 1 < words.size(); i += 2) {
            pairs.push_back({words[i].c_str(), words[i + 1].c_str()});
        }
        std::array<jlong, 2> file = {};
        env->GetLongArrayRegion(about, 0, 2, file.data());
        const kzcat_new_track track = {handle_of<kzcat_trail>(trail),
                                       {uri.c_str(), file[0], file[1], nullptr},
                                       pairs.data(),
                                       pairs.size()};
        kzcat_added added = {};
        if (succeeded(env, kzcat_add(handle_of<kzcat_catalogue>(catalogue), &track, 1, &added))) {
            report(env, out, std::array{jlong{added.track}, jlong{added.is_new}});
        }
    });
}

KZ_JAVA_METHOD(void, removeTrack)(JNIEnv* env, jclass /*type*/, jlong catalogue, jlong track)
{
    succeeded(env, kzcat_remove_track(handle_of<kzcat_catalogue>(catalogue), track));
}

KZ_JAVA_METHOD(void, removeSource)(JNIEnv* env, jclass /*type*/, jlong catalogue, jbyteArray source)
{
    guarded(env, [&] {
        const std::string uri = bytes_of(env, source);
        succeeded(env, kzcat_remove_source(handle_of<kzcat_catalogue>(catalogue), uri.c_str()));
    });
}

KZ_JAVA_METHOD(jlong, nextTrack)(JNIEnv* env, jclass /*type*/, jlong catalogue, jlong after)
{
    kzcat_track* track = nullptr;
    const kzcat_status status =
        kzcat_get_next_track(handle_of<kzcat_catalogue>(catalogue), after, &track);
    return record_number(env, status, track);
}

KZ_JAVA_METHOD(jlong, getTrack)(JNIEnv* env, jclass /*type*/, jlong catalogue, jlong id)
{
    kzcat_track* track = nullptr;
    const kzcat_status status = kzcat_get_track(handle_of<kzcat_catalogue>(catalogue), id, &track);
    return record_number(env, status, track);
}

KZ_JAVA_METHOD(jlong, findSource)(JNIEnv* env, jclass /*type*/, jlong catalogue, jbyteArray source)
{
    jlong number = 0;
    guarded(env, [&] {
        const std::string uri = bytes_of(env, source);
        kzcat_track* track = nullptr;
        const kzcat_status status =
            kzcat_find_source(handle_of<kzcat_catalogue>(catalogue), uri.c_str(), &track);
        number = record_number(env, status, track);
    });
    return number;
}

KZ_JAVA_METHOD(jobjectArray, track)(JNIEnv* env, jclass /*type*/, jlong number, jlongArray integers)
{
    const auto* const track = handle_of<kzcat_track>(number);
    kzcat_track_facts facts = {};
    if (!succeeded(env, kzcat_track_get_facts(track, &facts))) {
        return nullptr;
    }
    report(env, integers,
           std::array{jlong{facts.track}, static_cast<jlong>(facts.samples),
                      jlong{facts.sample_rate}, jlong{facts.added}, jlong{facts.source_count}});
    jobjectArray array = nullptr;
    guarded(env, [&] {
        std::vector<const char*> texts;
        for (uint32_t i = 0; i < facts.source_count; ++i) {
            kzcat_source source = {};
            kzcat_track_get_source(track, i, &source);
            texts.push_back(source.uri);
        }
        for (uint32_t i = 0; i < facts.tag_count; ++i) {
            kzcat_tag tag = {};
            kzcat_track_get_tag(track, i, &tag);
            texts.push_back(tag.name);
            texts.push_back(tag.value);
        }
        array = to_java(env, texts);
    });
    return array;
}

KZ_JAVA_METHOD(void, freeTrack)(JNIEnv* /*env*/, jclass /*type*/, jlong number)
{
    auto* track = handle_of<kzcat_track>(number);
    kzcat_track_free(&track);
}
