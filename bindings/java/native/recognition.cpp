/// @file
/// Native methods that look clips up.
#include "bindings/java/native/java_side.hpp"

using namespace kz::java;

KZ_JAVA_METHOD(jlong, recognise)
(JNIEnv* env, jclass /*type*/, jlong catalogue, jlong query, jint speeds, jint candidates,
 jint passages)
{
    kzcat_match_options options;
    kzcat_initialize_match_options(&options);
    options.speeds = static_cast<uint32_t>(speeds);
    options.candidates = static_cast<uint32_t>(candidates);
    options.passages = static_cast<uint32_t>(passages);
    kzcat_result* result = nullptr;
    succeeded(env, kzcat_recognise(handle_of<kzcat_catalogue>(catalogue),
                                   handle_of<kzcat_query>(query), &options, &result));
    return number_of(result);
}

KZ_JAVA_METHOD(void, summary)
(JNIEnv* env, jclass /*type*/, jlong result, jlongArray integers, jdoubleArray reals)
{
    kzcat_summary summary = {};
    if (succeeded(env, kzcat_result_get_summary(handle_of<kzcat_result>(result), &summary))) {
        report(env, integers,
               std::array{jlong{summary.verdict}, static_cast<jlong>(summary.match_count),
                          static_cast<jlong>(summary.candidate_count), jlong{summary.left_out}});
        report(env, reals, std::array{summary.runner_up, summary.clip_seconds});
    }
}

KZ_JAVA_METHOD(jobjectArray, match)
(JNIEnv* env, jclass /*type*/, jlong number, jboolean candidate, jlong place, jlongArray integers,
 jdoubleArray reals)
{
    const auto* const result = handle_of<kzcat_result>(number);
    const auto get = candidate != JNI_FALSE ? kzcat_result_get_candidate : kzcat_result_get_match;
    kzcat_match match = {};
    if (!succeeded(env, get(result, static_cast<uint64_t>(place), &match))) {
        return nullptr;
    }
    report(env, integers, std::array{jlong{match.track}, jlong{match.by}, jlong{match.weak}});
    report(env, reals,
           std::array{match.score, match.threshold, match.offset, match.speed, match.tempo,
                      match.pitch, match.clip_begin, match.clip_end});
    jobjectArray texts = nullptr;
    guarded(env, [&] { texts = to_java(env, {match.source, match.title, match.artist}); });
    return texts;
}

KZ_JAVA_METHOD(void, freeResult)(JNIEnv* /*env*/, jclass /*type*/, jlong number)
{
    auto* result = handle_of<kzcat_result>(number);
    kzcat_result_free(&result);
}
