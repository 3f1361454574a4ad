// The header for C++ over libkzsdk: the same documents as the C interface, from any container, and
// failures as values or as exceptions.

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <fstream>
#include <string>
#include <type_traits>
#include <vector>

#include <gtest/gtest.h>

#include "bindings/cpp/document_digest.hpp"
#include "kzsdk/kzsdk.hpp"
#include "support/melody.hpp"

namespace {

using Samples = std::vector<int16_t>;

constexpr uint32_t kRate = 44100;

std::string golden(const std::string& beginning)
{
    std::ifstream in(KZ_GOLDEN_DOCUMENTS);
    for (std::string line; std::getline(in, line);) {
        if (line.compare(0, beginning.size(), beginning) == 0) {
            return line.substr(beginning.size());
        }
    }
    return "no such line: " + beginning;
}

Samples music(double seconds = 15) { return kz::test::melody(kRate, 2, seconds); }

TEST(CppFingerprint, IsTheGoldenDocument)
{
    const auto found = kz::fingerprint_of(music(), kRate, 2).value();
    EXPECT_EQ(golden("fixed 44100 2 s16 music "), kz::test::document_digest(found.document));
    EXPECT_EQ(30U, found.values.size());
    EXPECT_NEAR(14.21, found.duration, 0.001);
    EXPECT_LT(found.offset, 0.1);
}

TEST(CppFingerprint, IsTheSameFromEveryContainer)
{
    const Samples samples = music();
    const auto expected = kz::fingerprint_of(samples, kRate, 2).value();
    std::vector<float> floats;
    std::vector<int32_t> integers;
    for (const int16_t sample : samples) {
        floats.push_back(static_cast<float>(sample) / 32768.0F);
        integers.push_back(sample * 65536);
    }
    const kz::sound pointed(samples.data(), samples.size());
    const kz::sound bytes(reinterpret_cast<const char*>(samples.data()), samples.size() * 2);
    const kz::format format{KZ_STREAM_FORMAT_PCM16, kRate, 2};
    EXPECT_EQ(expected.document, kz::fingerprint_of(floats, kRate, 2)->document);
    EXPECT_EQ(expected.document, kz::fingerprint_of(integers, kRate, 2)->document);
    EXPECT_EQ(expected.document, kz::fingerprint_of(pointed, kRate, 2)->document);
    EXPECT_EQ(expected.document, kz::fingerprint_of(bytes, format)->document);
}

TEST(CppFingerprint, IsADistanceFromAnother)
{
    const auto one = kz::fingerprint_of(music(), kRate, 2).value();
    auto other = one;
    EXPECT_EQ(0.0, kz::distance(one, other));
    other.values[3] = static_cast<int16_t>(other.values[3] + 15);
    other.values[4] = static_cast<int16_t>(other.values[4] - 15);
    EXPECT_EQ(1.0, kz::distance(one, other));
    other.values.pop_back();
    EXPECT_TRUE(std::isnan(kz::distance(one, other)));
}

TEST(CppStream, TakesPiecesOfAnyLength)
{
    const Samples samples = music();
    auto stream = kz::stream::create({KZ_STREAM_FORMAT_PCM16, kRate, 2}).value();
    bool complete = false;
    for (size_t at = 0; !complete && at < samples.size(); at += 1001) {
        const size_t count = std::min<size_t>(1001, samples.size() - at);
        complete = stream.feed({samples.data() + at, count}).value();
    }
    EXPECT_TRUE(stream.finish().value());
    EXPECT_EQ(100U, stream.state()->percent);
    EXPECT_EQ(kz::fingerprint_of(samples, kRate, 2)->document, stream.get()->document);
}

TEST(CppStream, RefusesSamplesOfAnotherType)
{
    auto stream = kz::stream::create({KZ_STREAM_FORMAT_PCM16, kRate, 2}).value();
    const auto fed = stream.feed(std::vector<float>(100));
    ASSERT_FALSE(fed.has_value());
    EXPECT_EQ(KZ_STREAM_ERROR_INVALID_ARGUMENT, fed.error().status());
    EXPECT_EQ(0U, stream.state()->frames);
}

TEST(CppStream, TakesSinglesForFormatsOfOneByte)
{
    const std::vector<uint8_t> singles(100);
    const std::vector<char> bytes(100);
    for (const uint32_t encoding : {KZ_STREAM_FORMAT_LINEAR8, KZ_STREAM_FORMAT_PCM8,
                                    KZ_STREAM_FORMAT_ALAW, KZ_STREAM_FORMAT_ULAW}) {
        auto stream = kz::stream::create({encoding, kRate, 1}).value();
        EXPECT_TRUE(stream.feed(singles).has_value()) << encoding;
    }
    for (const uint32_t encoding :
         {KZ_STREAM_FORMAT_PCM16, KZ_STREAM_FORMAT_PCM24, KZ_STREAM_FORMAT_PCM32,
          KZ_STREAM_FORMAT_FLOAT32, KZ_STREAM_FORMAT_FLOAT64}) {
        auto stream = kz::stream::create({encoding, kRate, 1}).value();
        EXPECT_FALSE(stream.feed(singles).has_value()) << encoding;
        EXPECT_TRUE(stream.feed(bytes).has_value()) << encoding;
        EXPECT_TRUE(stream.feed(std::vector<std::byte>(100)).has_value()) << encoding;
    }
}

TEST(CppStream, FailsOnceItWasMovedFrom)
{
    static_assert(!std::is_copy_constructible_v<kz::stream>);
    static_assert(std::is_nothrow_move_constructible_v<kz::stream>);
    auto one = kz::stream::create({KZ_STREAM_FORMAT_PCM16, kRate, 2}).value();
    auto other = std::move(one);
    EXPECT_TRUE(other.feed(music(1)).has_value());
    EXPECT_EQ(nullptr, one.handle()); // NOLINT(bugprone-use-after-move)
    EXPECT_EQ(KZ_STREAM_ERROR_INVALID_ARGUMENT, one.finish().error().status());
}

TEST(CppResult, IsAValueOrASentence)
{
    const auto failed = kz::fingerprint_of(music(1), kRate, 2);
    EXPECT_FALSE(failed);
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, failed.error().status());
    EXPECT_STREQ(kz_status_text(KZ_QV_ERROR_INCOMPLETE), failed.error().what());
    EXPECT_EQ(KZ_OK, kz::fingerprint_of(music(), kRate, 2).error().status());
}

TEST(CppResult, ThrowsByChoice)
{
    try {
        static_cast<void>(kz::fingerprint_of(music(1), 12345, 2).value());
        FAIL() << "no such rate";
    } catch (const kz::error& failure) {
        EXPECT_EQ(KZ_STREAM_ERROR_RATE, failure.status());
    }
    EXPECT_THROW(kz::result<void>(kz::error(1, "text")).value(), kz::error);
    EXPECT_NO_THROW(kz::result<void>().value());
    EXPECT_EQ(7, kz::result<int>(kz::error(1, "text")).value_or(7));
}

TEST(CppLibrary, HasAVersion) { EXPECT_EQ(KZSDK_VERSION, kz::version()); }

} // namespace
