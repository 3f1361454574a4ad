// The native methods of Java's streams, called as a VM calls them: what they pass on, what they
// refuse, what they report. Four functions simulate the VM.

#include <algorithm>
#include <array>
#include <cstring>
#include <string>
#include <vector>

#include <jni.h>

#include <gtest/gtest.h>

#include "kzsdk/abs/version.h"
#include "kzsdk/stream/stream.h"
#include "support/allocation.hpp"
#include "support/melody.hpp"

extern "C" {
jint Java_com_orvanta_android_kzsdk_NativeStream_create(JNIEnv*, jclass, jint, jint, jint, jint,
                                                        jlongArray);
jint Java_com_orvanta_android_kzsdk_NativeStream_feed(JNIEnv*, jclass, jlong, jobject, jint, jint,
                                                      jlongArray);
jint Java_com_orvanta_android_kzsdk_NativeStream_finish(JNIEnv*, jclass, jlong, jlongArray);
jint Java_com_orvanta_android_kzsdk_NativeStream_state(JNIEnv*, jclass, jlong, jlongArray);
jstring Java_com_orvanta_android_kzsdk_NativeStream_document(JNIEnv*, jclass, jlong, jlongArray);
jstring Java_com_orvanta_android_kzsdk_NativeStream_statusText(JNIEnv*, jclass, jint);
jstring Java_com_orvanta_android_kzsdk_NativeStream_version(JNIEnv*, jclass);
void Java_com_orvanta_android_kzsdk_NativeStream_free(JNIEnv*, jclass, jlong);
}

namespace kz::test {

namespace {

constexpr jint kFixed = KZ_FPX_ALGORITHM_FIXED;
constexpr jint kPcm16 = KZ_STREAM_FORMAT_PCM16;

/// What stands for a direct buffer; without bytes, for one that is not direct.
struct Buffer {
    void* bytes;
    jlong capacity;
};

using Numbers = std::vector<jlong>;

void set_long_array_region(JNIEnv*, jlongArray array, jsize first, jsize count, const jlong* from)
{
    auto& numbers = *reinterpret_cast<Numbers*>(array);
    ASSERT_LE(static_cast<size_t>(first + count), numbers.size());
    std::copy_n(from, count, numbers.begin() + first);
}

void* direct_address(JNIEnv*, jobject buffer) { return reinterpret_cast<Buffer*>(buffer)->bytes; }

jlong direct_capacity(JNIEnv*, jobject buffer)
{
    return reinterpret_cast<Buffer*>(buffer)->capacity;
}

std::string last_text;

jstring new_string(JNIEnv*, const char* text)
{
    last_text = text;
    return reinterpret_cast<jstring>(&last_text);
}

JNINativeInterface_ functions()
{
    JNINativeInterface_ table = {};
    table.SetLongArrayRegion = set_long_array_region;
    table.GetDirectBufferAddress = direct_address;
    table.GetDirectBufferCapacity = direct_capacity;
    table.NewStringUTF = new_string;
    return table;
}

const JNINativeInterface_ table = functions();
JNIEnv environment = {&table};

jlongArray array_of(Numbers& numbers) { return reinterpret_cast<jlongArray>(&numbers); }

/// Each call puts what it reports into `out`.
struct Java {
    Numbers out = Numbers(8);
    jlong stream = 0;

    jint create(jint format = kPcm16, jint rate = 11025, jint channels = 1)
    {
        const jint status = Java_com_orvanta_android_kzsdk_NativeStream_create(
            &environment, nullptr, kFixed, format, rate, channels, array_of(out));
        stream = out[0];
        return status;
    }
    jint feed(Buffer buffer, jint position, jint count)
    {
        return Java_com_orvanta_android_kzsdk_NativeStream_feed(&environment, nullptr, stream,
                                                                reinterpret_cast<jobject>(&buffer),
                                                                position, count, array_of(out));
    }
    jint finish()
    {
        return Java_com_orvanta_android_kzsdk_NativeStream_finish(&environment, nullptr, stream,
                                                                  array_of(out));
    }
    jint state()
    {
        return Java_com_orvanta_android_kzsdk_NativeStream_state(&environment, nullptr, stream,
                                                                 array_of(out));
    }
    std::string document()
    {
        last_text.clear();
        Java_com_orvanta_android_kzsdk_NativeStream_document(&environment, nullptr, stream,
                                                             array_of(out));
        return last_text;
    }
    ~Java() { Java_com_orvanta_android_kzsdk_NativeStream_free(&environment, nullptr, stream); }
};

jint code(kz_status status) { return static_cast<jint>(status); }

Buffer buffer_of(std::vector<int16_t>& samples)
{
    return {samples.data(), static_cast<jlong>(samples.size() * 2)};
}

std::string document_of(const std::vector<int16_t>& samples)
{
    kz_stream_settings settings;
    kz_stream_initialize_settings(&settings);
    settings.sample_rate = 11025;
    settings.channels = 1;
    kz_stream* stream = nullptr;
    uint8_t complete = 0;
    const char* text = "";
    EXPECT_EQ(KZ_OK, kz_stream_create(&settings, &stream));
    EXPECT_EQ(KZ_OK,
              kz_stream_feed(stream, samples.data(), samples.size() * 2, nullptr, &complete));
    EXPECT_EQ(KZ_OK, kz_stream_get_document(stream, &text));
    std::string document = text;
    kz_stream_free(&stream);
    return document;
}

class NativeStream : public ::testing::Test {
protected:
    void SetUp() override { before_ = live_blocks(); }
    void TearDown() override { EXPECT_EQ(before_, live_blocks()) << "blocks were leaked"; }

    std::vector<int16_t> melody_ = melody(11025, 1, 15.0);

private:
    int64_t before_ = 0;
};

TEST_F(NativeStream, MakesTheDocumentOfTheLibrary)
{
    Java java;
    ASSERT_EQ(KZ_OK, java.create());
    const Buffer buffer = buffer_of(melody_);
    const auto size = static_cast<jint>(buffer.capacity);
    java.out[1] = 0;
    for (jint done = 0; done < size && java.out[1] == 0; done += 1001) {
        ASSERT_EQ(KZ_OK, java.feed(buffer, done, std::min(1001, size - done)));
    }
    EXPECT_EQ(1, java.out[1]) << "complete";
    EXPECT_EQ(document_of(melody_), java.document());
    EXPECT_EQ(jlong{KZ_OK}, java.out[0]);
}

TEST_F(NativeStream, ReportsHowFarItIs)
{
    Java java;
    ASSERT_EQ(KZ_OK, java.create());
    ASSERT_EQ(KZ_OK, java.feed(buffer_of(melody_), 0, 2 * 11025 * 5));
    EXPECT_EQ((Numbers{2 * 11025 * 5, 0}), Numbers(java.out.begin(), java.out.begin() + 2));
    ASSERT_EQ(KZ_OK, java.finish());
    EXPECT_EQ(0, java.out[0]);
    ASSERT_EQ(KZ_OK, java.state());
    EXPECT_EQ(11025 * 5, java.out[0]);
    EXPECT_EQ(jlong{KZ_STREAM_TOO_SHORT}, java.out[3]);
    EXPECT_GT(java.out[4], 0);
    EXPECT_LT(java.out[4], 100);
    EXPECT_GT(java.out[5], 9000) << "milliseconds are missing";
    EXPECT_EQ("", java.document());
    EXPECT_EQ(jlong{KZ_QV_ERROR_INCOMPLETE}, java.out[0]);
    EXPECT_EQ(code(KZ_STREAM_ERROR_FINISHED), java.feed(buffer_of(melody_), 0, 2));
}

TEST_F(NativeStream, RefusesWhatIsOutsideTheBuffer)
{
    Java java;
    ASSERT_EQ(KZ_OK, java.create());
    const Buffer buffer = {melody_.data(), 100};
    const jint refused = code(KZ_STREAM_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(refused, java.feed(buffer, 0, 101));
    EXPECT_EQ(refused, java.feed(buffer, 99, 2));
    EXPECT_EQ(refused, java.feed(buffer, -1, 1));
    EXPECT_EQ(refused, java.feed(buffer, 0, -1));
    EXPECT_EQ(refused, java.feed(buffer, INT32_MAX, INT32_MAX));
    EXPECT_EQ(KZ_OK, java.feed(buffer, 100, 0));
    EXPECT_EQ(KZ_OK, java.feed(buffer, 0, 100));
}

TEST_F(NativeStream, RefusesABufferThatIsNotDirect)
{
    Java java;
    ASSERT_EQ(KZ_OK, java.create());
    EXPECT_EQ(code(KZ_STREAM_ERROR_INVALID_ARGUMENT), java.feed({nullptr, -1}, 0, 0));
}

TEST_F(NativeStream, ReportsWhatCannotBeCreated)
{
    for (const auto& [format, rate, channels, status] :
         {std::tuple{99, 11025, 1, KZ_STREAM_ERROR_FORMAT},
          std::tuple{kPcm16, 12345, 1, KZ_STREAM_ERROR_RATE},
          std::tuple{kPcm16, -1, 1, KZ_STREAM_ERROR_RATE},
          std::tuple{kPcm16, 11025, 0, KZ_STREAM_ERROR_CHANNELS}}) {
        Java java;
        EXPECT_EQ(code(status), java.create(format, rate, channels));
        EXPECT_EQ(0, java.stream);
    }
}

TEST_F(NativeStream, HasTheSentenceOfEachStatus)
{
    Java_com_orvanta_android_kzsdk_NativeStream_statusText(&environment, nullptr,
                                                           code(KZ_STREAM_ERROR_RATE));
    EXPECT_EQ(kz_status_text(KZ_STREAM_ERROR_RATE), last_text);
}

TEST_F(NativeStream, NamesTheVersionOfTheLibrary)
{
    Java_com_orvanta_android_kzsdk_NativeStream_version(&environment, nullptr);
    EXPECT_EQ(kzsdk_get_version(), last_text);
}

TEST_F(NativeStream, SurvivesEveryFailingAllocation)
{
    for_every_failed_allocation([&](auto fired) {
        Java java;
        const jint created = java.create();
        EXPECT_EQ(created == KZ_OK, java.stream != 0);
        if (created != KZ_OK) {
            EXPECT_TRUE(fired());
            return;
        }
        const Buffer buffer = buffer_of(melody_);
        const jint fed = java.feed(buffer, 0, static_cast<jint>(buffer.capacity));
        EXPECT_TRUE(fed == KZ_OK || fired());
        EXPECT_TRUE(!java.document().empty() || fired());
    });
}

} // namespace

} // namespace kz::test
