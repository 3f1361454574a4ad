// The catalogue's native methods under a simulated VM: what crosses, in both directions, with
// the sanitizers watching, under which no real VM starts.

#include <algorithm>
#include <array>
#include <cstdarg>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <jni.h>

#include <gtest/gtest.h>

#include "kzcat.h"
#include "support/melody.hpp"

#define NATIVE(type, name) type Java_com_orvanta_android_kzsdk_NativeCatalogue_##name

extern "C" {
NATIVE(jbyteArray, version)(JNIEnv*, jclass);
NATIVE(jlong, open)(JNIEnv*, jclass, jbyteArray, jint);
NATIVE(void, close)(JNIEnv*, jclass, jlong);
NATIVE(void, facts)(JNIEnv*, jclass, jlong, jlongArray);
NATIVE(jlong, createBuilder)(JNIEnv*, jclass, jint, jint, jint, jboolean);
NATIVE(void, feedBuilder)(JNIEnv*, jclass, jlong, jobject, jint);
NATIVE(jlong, finishBuilder)(JNIEnv*, jclass, jlong);
NATIVE(void, freeBuilder)(JNIEnv*, jclass, jlong);
NATIVE(void, freeTrail)(JNIEnv*, jclass, jlong);
NATIVE(void, add)(JNIEnv*, jclass, jlong, jlong, jbyteArray, jlongArray, jobjectArray, jlongArray);
NATIVE(void, removeTrack)(JNIEnv*, jclass, jlong, jlong);
NATIVE(void, removeSource)(JNIEnv*, jclass, jlong, jbyteArray);
NATIVE(jlong, createQuery)(JNIEnv*, jclass, jint, jint, jint);
NATIVE(jlong, createQueryFromDocument)(JNIEnv*, jclass, jbyteArray);
NATIVE(void, feedQuery)(JNIEnv*, jclass, jlong, jobject, jint);
NATIVE(void, finishQuery)(JNIEnv*, jclass, jlong);
NATIVE(void, freeQuery)(JNIEnv*, jclass, jlong);
NATIVE(jlong, recognise)(JNIEnv*, jclass, jlong, jlong, jint, jint, jint);
NATIVE(void, summary)(JNIEnv*, jclass, jlong, jlongArray, jdoubleArray);
NATIVE(jobjectArray, match)
(JNIEnv*, jclass, jlong, jboolean, jlong, jlongArray, jdoubleArray);
NATIVE(void, freeResult)(JNIEnv*, jclass, jlong);
NATIVE(jlong, nextTrack)(JNIEnv*, jclass, jlong, jlong);
NATIVE(jlong, findSource)(JNIEnv*, jclass, jlong, jbyteArray);
NATIVE(jobjectArray, track)(JNIEnv*, jclass, jlong, jlongArray);
NATIVE(void, freeTrack)(JNIEnv*, jclass, jlong);
NATIVE(jobjectArray, verify)(JNIEnv*, jclass, jlong, jobjectArray);
NATIVE(void, merge)(JNIEnv*, jclass, jlong, jlong, jlongArray);
}

#define CALL(name) Java_com_orvanta_android_kzsdk_NativeCatalogue_##name

namespace {

constexpr jint kPcm16 = KZ_STREAM_FORMAT_PCM16;
constexpr jint kRate = 11025;

/// An array of any kind, or a direct buffer.
struct Object {
    std::vector<jbyte> bytes;
    std::vector<jlong> longs;
    std::vector<jdouble> doubles;
    std::vector<Object*> elements;
    void* address = nullptr;
    jlong capacity = -1;
};

/// What a thread has made of Java, and what was thrown in it.
struct Vm {
    std::vector<std::unique_ptr<Object>> objects;
    bool is_throwing = false;
    jint status = 0;
    std::string text;
};

thread_local Vm vm;

Object* object_of(jobject reference) { return reinterpret_cast<Object*>(reference); }

template <class Reference>
Reference make(Object object)
{
    vm.objects.push_back(std::make_unique<Object>(std::move(object)));
    return reinterpret_cast<Reference>(vm.objects.back().get());
}

jbyteArray text(const std::string& text)
{
    Object object;
    object.bytes.assign(text.begin(), text.end());
    object.bytes.push_back(0);
    return make<jbyteArray>(std::move(object));
}

jlongArray longs(size_t count)
{
    Object object;
    object.longs.resize(count);
    return make<jlongArray>(std::move(object));
}

jobject buffer_of(std::vector<int16_t>& samples)
{
    Object object;
    object.address = samples.data();
    object.capacity = static_cast<jlong>(samples.size() * 2);
    return make<jobject>(std::move(object));
}

std::string text_of(jobjectArray texts, size_t place)
{
    const Object* const element = object_of(texts)->elements.at(place);
    return element == nullptr ? "(null)"
                              : std::string(element->bytes.begin(), element->bytes.end());
}

jclass find_class(JNIEnv*, const char* name)
{
    static Object type;
    EXPECT_TRUE(name == std::string("[B") ||
                name == std::string("com/orvanta/android/kzsdk/CatalogueException"));
    return reinterpret_cast<jclass>(&type);
}

jmethodID get_method(JNIEnv*, jclass type, const char* name, const char* signature)
{
    EXPECT_STREQ("<init>", name);
    EXPECT_STREQ("(I[B)V", signature);
    return reinterpret_cast<jmethodID>(type);
}

jobject new_object(JNIEnv*, jclass, jmethodID, va_list arguments)
{
    Object exception;
    exception.longs = {va_arg(arguments, jint)};
    exception.elements = {object_of(va_arg(arguments, jobject))};
    return make<jobject>(std::move(exception));
}

jint throw_it(JNIEnv*, jthrowable reference)
{
    const Object* const exception = object_of(reference);
    const auto& bytes = exception->elements.at(0)->bytes;
    vm.is_throwing = true;
    vm.status = static_cast<jint>(exception->longs.at(0));
    vm.text.assign(bytes.begin(), bytes.end());
    return 0;
}

jsize array_length(JNIEnv*, jarray array)
{
    const Object& object = *object_of(array);
    return static_cast<jsize>(std::max(object.bytes.size(), object.elements.size()));
}

template <class Number>
void copy_in(std::vector<Number>& array, jsize first, jsize count, const Number* from)
{
    ASSERT_LE(static_cast<size_t>(first + count), array.size());
    std::copy_n(from, count, array.begin() + first);
}

template <class Number>
void copy_out(const std::vector<Number>& array, jsize first, jsize count, Number* to)
{
    ASSERT_LE(static_cast<size_t>(first + count), array.size());
    std::copy_n(array.begin() + first, count, to);
}

JNINativeInterface_ functions()
{
    JNINativeInterface_ table = {};
    table.FindClass = find_class;
    table.GetMethodID = get_method;
    table.NewObjectV = new_object;
    table.Throw = throw_it;
    table.GetArrayLength = array_length;
    table.DeleteLocalRef = [](JNIEnv*, jobject) {};
    table.NewByteArray = [](JNIEnv*, jsize size) {
        Object object;
        object.bytes.resize(static_cast<size_t>(size));
        return make<jbyteArray>(std::move(object));
    };
    table.NewLongArray = [](JNIEnv*, jsize size) { return longs(static_cast<size_t>(size)); };
    table.NewObjectArray = [](JNIEnv*, jsize size, jclass, jobject) {
        Object object;
        object.elements.resize(static_cast<size_t>(size));
        return make<jobjectArray>(std::move(object));
    };
    table.SetObjectArrayElement = [](JNIEnv*, jobjectArray array, jsize place, jobject element) {
        object_of(array)->elements.at(static_cast<size_t>(place)) = object_of(element);
    };
    table.GetObjectArrayElement = [](JNIEnv*, jobjectArray array, jsize place) {
        return reinterpret_cast<jobject>(object_of(array)->elements.at(static_cast<size_t>(place)));
    };
    table.SetByteArrayRegion = [](JNIEnv*, jbyteArray array, jsize first, jsize count,
                                  const jbyte* from) {
        copy_in(object_of(array)->bytes, first, count, from);
    };
    table.GetByteArrayRegion = [](JNIEnv*, jbyteArray array, jsize first, jsize count, jbyte* to) {
        copy_out(object_of(array)->bytes, first, count, to);
    };
    table.SetLongArrayRegion = [](JNIEnv*, jlongArray array, jsize first, jsize count,
                                  const jlong* from) {
        copy_in(object_of(array)->longs, first, count, from);
    };
    table.GetLongArrayRegion = [](JNIEnv*, jlongArray array, jsize first, jsize count, jlong* to) {
        copy_out(object_of(array)->longs, first, count, to);
    };
    table.SetDoubleArrayRegion = [](JNIEnv*, jdoubleArray array, jsize first, jsize count,
                                    const jdouble* from) {
        copy_in(object_of(array)->doubles, first, count, from);
    };
    table.GetDirectBufferAddress = [](JNIEnv*, jobject buffer) {
        return object_of(buffer)->address;
    };
    table.GetDirectBufferCapacity = [](JNIEnv*, jobject buffer) {
        return object_of(buffer)->capacity;
    };
    return table;
}

const JNINativeInterface_ table = functions();
JNIEnv environment = {&table};
JNIEnv* const env = &environment;

/// The failure of the last call, which is forgotten.
std::string thrown()
{
    const std::string failure = vm.is_throwing ? std::to_string(vm.status) + " " + vm.text : "";
    vm.is_throwing = false;
    return failure;
}

std::vector<int16_t> tune(double seconds) { return kz::test::melody(kRate, 1, seconds); }

jint size_of(const std::vector<int16_t>& samples) { return static_cast<jint>(samples.size() * 2); }

/// Returns the track's id.
jlong add(jlong catalogue, std::vector<int16_t> samples, const std::string& source,
          const std::vector<std::string>& words)
{
    const jlong builder = CALL(createBuilder)(env, nullptr, kPcm16, kRate, 1, JNI_FALSE);
    CALL(feedBuilder)(env, nullptr, builder, buffer_of(samples), size_of(samples));
    const jlong trail = CALL(finishBuilder)(env, nullptr, builder);
    Object tags;
    for (const std::string& word : words) {
        tags.elements.push_back(object_of(text(word)));
    }
    Object about;
    about.longs = {-1, -1};
    const jlongArray out = longs(2);
    CALL(add)
    (env, nullptr, catalogue, trail, text(source), make<jlongArray>(std::move(about)),
     make<jobjectArray>(std::move(tags)), out);
    CALL(freeTrail)(env, nullptr, trail);
    CALL(freeBuilder)(env, nullptr, builder);
    return object_of(out)->longs[0];
}

jlong query_of(std::vector<int16_t> samples)
{
    const jlong query = CALL(createQuery)(env, nullptr, kPcm16, kRate, 1);
    CALL(feedQuery)(env, nullptr, query, buffer_of(samples), size_of(samples));
    CALL(finishQuery)(env, nullptr, query);
    return query;
}

/// The source of the best match; empty when there is none.
std::string recognise(jlong catalogue, std::vector<int16_t> clip)
{
    const jlong query = query_of(std::move(clip));
    const jlong result = CALL(recognise)(env, nullptr, catalogue, query, 1, 2, 0);
    Object reals;
    reals.doubles.resize(8);
    const auto doubles = make<jdoubleArray>(std::move(reals));
    const jlongArray integers = longs(4);
    CALL(summary)(env, nullptr, result, integers, doubles);
    std::string source;
    if (object_of(integers)->longs[1] > 0) {
        source = text_of(CALL(match)(env, nullptr, result, JNI_FALSE, 0, longs(3), doubles), 0);
    }
    CALL(freeResult)(env, nullptr, result);
    CALL(freeQuery)(env, nullptr, query);
    return source;
}

/// A catalogue in memory; nothing has been thrown at the end.
class NativeCatalogue : public ::testing::Test {
protected:
    void SetUp() override { catalogue_ = CALL(open)(env, nullptr, nullptr, KZCAT_ACCESS_CREATE); }
    void TearDown() override
    {
        CALL(close)(env, nullptr, catalogue_);
        EXPECT_EQ("", thrown());
        vm = {};
    }

    jlong catalogue_ = 0;
};

TEST_F(NativeCatalogue, RecognisesWhatWasAdded)
{
    auto whole = tune(40);
    EXPECT_EQ(1, add(catalogue_, whole, "tune.wav", {"title", "A tune"}));
    const std::vector<int16_t> clip(whole.begin() + 15 * kRate, whole.begin() + 25 * kRate);
    EXPECT_EQ("tune.wav", recognise(catalogue_, clip));
    EXPECT_EQ("", recognise(catalogue_, std::vector<int16_t>(kRate)));
}

TEST_F(NativeCatalogue, PassesTracksWithSourcesAndTags)
{
    add(catalogue_, tune(20), "tune.wav", {"title", "A \xC3\xB6 tune", "artist", ""});
    const jlong record = CALL(nextTrack)(env, nullptr, catalogue_, 0);
    const jlongArray numbers = longs(5);
    const jobjectArray texts = CALL(track)(env, nullptr, record, numbers);
    CALL(freeTrack)(env, nullptr, record);
    EXPECT_EQ(1, object_of(numbers)->longs[0]);
    EXPECT_EQ(kRate, object_of(numbers)->longs[2]);
    EXPECT_EQ(1, object_of(numbers)->longs[4]);
    EXPECT_EQ("tune.wav title A \xC3\xB6 tune artist ",
              text_of(texts, 0) + " " + text_of(texts, 1) + " " + text_of(texts, 2) + " " +
                  text_of(texts, 3) + " " + text_of(texts, 4));
    EXPECT_EQ(0, CALL(nextTrack)(env, nullptr, catalogue_, 1));
    EXPECT_EQ(0, CALL(findSource)(env, nullptr, catalogue_, text("none")));
    EXPECT_EQ("", thrown()) << "what is not there is no failure";
}

TEST_F(NativeCatalogue, NamesItsVersion)
{
    const Object& version = *object_of(CALL(version)(env, nullptr));
    EXPECT_EQ(KZCAT_JAVA_VERSION, std::string(version.bytes.begin(), version.bytes.end()));
}

TEST_F(NativeCatalogue, ThrowsTheSentenceOfTheLibrary)
{
    EXPECT_EQ(0, CALL(open)(env, nullptr, text("/nowhere/a.kzc"), KZCAT_ACCESS_READ));
    EXPECT_EQ(std::to_string(KZCAT_ERROR_CANNOT_OPEN) + " " + kzcat_get_error_text(), thrown());
    CALL(removeTrack)(env, nullptr, catalogue_, 5);
    EXPECT_EQ(std::to_string(KZCAT_ERROR_NOT_FOUND) + " " + kzcat_get_error_text(), thrown());
    CALL(removeSource)(env, nullptr, catalogue_, text("none"));
    EXPECT_EQ(std::to_string(KZCAT_ERROR_NOT_FOUND) + " " + kzcat_get_error_text(), thrown());
    EXPECT_EQ(0, CALL(createQueryFromDocument)(env, nullptr, text("<none/>")));
    EXPECT_EQ(std::to_string(KZCAT_ERROR_NOT_READABLE) + " " + kzcat_get_error_text(), thrown());
    EXPECT_EQ(0, CALL(createQuery)(env, nullptr, 99, kRate, 1));
    EXPECT_EQ(std::to_string(KZCAT_ERROR_FORMAT) + " " + kzcat_get_error_text(), thrown());
    CALL(merge)(env, nullptr, catalogue_, catalogue_, longs(3));
    EXPECT_NE("", thrown());
}

TEST_F(NativeCatalogue, ReadsNothingBehindABuffer)
{
    auto samples = tune(1);
    const jlong query = CALL(createQuery)(env, nullptr, kPcm16, kRate, 1);
    for (const jint count : {size_of(samples) + 1, -1}) {
        CALL(feedQuery)(env, nullptr, query, buffer_of(samples), count);
        EXPECT_NE("", thrown());
    }
    CALL(feedQuery)(env, nullptr, query, make<jobject>({}), 0);
    EXPECT_NE("", thrown()) << "a buffer that is not direct";
    CALL(freeQuery)(env, nullptr, query);
}

TEST_F(NativeCatalogue, ListsNoFaultsWhereThereAreNone)
{
    add(catalogue_, tune(10), "tune.wav", {});
    Object out;
    out.elements.resize(1);
    const auto tracks = make<jobjectArray>(std::move(out));
    EXPECT_EQ(0U, object_of(CALL(verify)(env, nullptr, catalogue_, tracks))->elements.size());
    EXPECT_EQ(0U, object_of(tracks)->elements.at(0)->longs.size());
}

TEST_F(NativeCatalogue, ServesThreadsAtOnce)
{
    const auto whole = tune(30);
    add(catalogue_, whole, "tune.wav", {});
    const std::vector<int16_t> clip(whole.begin() + 5 * kRate, whole.begin() + 15 * kRate);
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] {
            for (int turn = 0; turn < 3; ++turn) {
                const std::string name = std::to_string(i) + "-" + std::to_string(turn);
                EXPECT_GT(add(catalogue_, tune(2 + i + 0.25 * turn), name, {}), 0);
                EXPECT_EQ("tune.wav", recognise(catalogue_, clip));
            }
            EXPECT_EQ("", thrown());
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    const jlongArray facts = longs(2);
    CALL(facts)(env, nullptr, catalogue_, facts);
    EXPECT_EQ(13, object_of(facts)->longs[0]);
}

} // namespace
