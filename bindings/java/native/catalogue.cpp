/// @file
/// Native methods about a catalogue as a whole: opening, closing, care.
#include "bindings/java/native/java_side.hpp"

using namespace kz::java;

KZ_JAVA_METHOD(jbyteArray, version)(JNIEnv* env, jclass /*type*/)
{
    return to_java(env, KZCAT_JAVA_VERSION);
}

KZ_JAVA_METHOD(jlong, open)(JNIEnv* env, jclass /*type*/, jbyteArray path, jint access)
{
    kzcat_catalogue* catalogue = nullptr;
    guarded(env, [&] {
        const std::string text = bytes_of(env, path);
        succeeded(env, kzcat_open(path != nullptr ? text.c_str() : nullptr,
                                  static_cast<uint32_t>(access), nullptr, &catalogue));
    });
    return number_of(catalogue);
}

KZ_JAVA_METHOD(void, close)(JNIEnv* /*env*/, jclass /*type*/, jlong number)
{
    auto* catalogue = handle_of<kzcat_catalogue>(number);
    kzcat_close(&catalogue);
}

KZ_JAVA_METHOD(void, facts)(JNIEnv* env, jclass /*type*/, jlong catalogue, jlongArray out)
{
    kzcat_facts facts = {};
    if (succeeded(env, kzcat_get_facts(handle_of<kzcat_catalogue>(catalogue), 0, &facts))) {
        report(env, out,
               std::array{static_cast<jlong>(facts.tracks), static_cast<jlong>(facts.codes)});
    }
}

namespace {

struct Faults {
    std::vector<jlong> tracks;
    std::vector<std::string> texts;
    bool lost = false; ///< memory was short for one
};

void keep_fault(void* context, int64_t track, const char* text)
{
    auto& faults = *static_cast<Faults*>(context);
    try {
        faults.texts.emplace_back(text);
        faults.tracks.push_back(track);
    } catch (const std::exception&) {
        faults.lost = true;
    }
}

jobjectArray to_java(JNIEnv* env, const Faults& faults, jobjectArray out_tracks)
{
    const auto count = static_cast<jsize>(faults.tracks.size());
    jlongArray tracks = env->NewLongArray(count);
    if (tracks == nullptr) {
        return nullptr;
    }
    env->SetLongArrayRegion(tracks, 0, count, faults.tracks.data());
    env->SetObjectArrayElement(out_tracks, 0, tracks);
    std::vector<const char*> texts;
    for (const std::string& text : faults.texts) {
        texts.push_back(text.c_str());
    }
    return kz::java::to_java(env, texts);
}

} // namespace

KZ_JAVA_METHOD(jobjectArray, verify)
(JNIEnv* env, jclass /*type*/, jlong catalogue, jobjectArray out_tracks)
{
    jobjectArray texts = nullptr;
    guarded(env, [&] {
        Faults faults;
        const kzcat_status status = kzcat_verify(handle_of<kzcat_catalogue>(catalogue), keep_fault,
                                                 nullptr, &faults, nullptr);
        if (faults.lost) {
            throw std::bad_alloc();
        }
        if (succeeded(env, status)) {
            texts = to_java(env, faults, out_tracks);
        }
    });
    return texts;
}

KZ_JAVA_METHOD(void, merge)
(JNIEnv* env, jclass /*type*/, jlong catalogue, jlong other, jlongArray out)
{
    kzcat_merged merged = {};
    if (succeeded(env, kzcat_merge(handle_of<kzcat_catalogue>(catalogue),
                                   handle_of<kzcat_catalogue>(other), nullptr, nullptr, &merged))) {
        report(env, out,
               std::array{static_cast<jlong>(merged.tracks_new),
                          static_cast<jlong>(merged.tracks_known),
                          static_cast<jlong>(merged.tracks_damaged)});
    }
}
