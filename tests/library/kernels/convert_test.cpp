// Every variant of the converters against the plain one, to the bit.

#include <cstdint>
#include <cstring>
#include <limits>
#include <numeric>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/kernels/kernels.hpp"
#include "support/kernel_variants.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::kernels;
using namespace kz::test;

class ConvertVariants : public KernelVariants {};

using Bytes = std::vector<uint8_t>;

// Bytes that hold all the extremes of the encodings, and noise.
Bytes audio(size_t size)
{
    Random random(16);
    Bytes bytes(size);
    for (uint8_t& byte : bytes) {
        byte = static_cast<uint8_t>(random.next() >> 24);
    }
    const uint8_t extremes[] = {0x00, 0x80, 0x00, 0x80, 0xff, 0x7f, 0xff, 0x7f, 0xff, 0xff,
                                0x01, 0x00, 0x00, 0x00, 0x80, 0x80, 0x7f, 0x80, 0x00, 0x80,
                                0x2a, 0xaa, 0x2a, 0x2a, 0x2a, 0x2a, 0xaa, 0xaa, 0xaa, 0xaa};
    std::memcpy(bytes.data(), extremes, std::min(size, sizeof extremes));
    return bytes;
}

struct Input {
    const uint8_t* bytes;
    int32_t channels;
    int32_t frames;
    int32_t shift; ///< of words only
};

// Bits of the words, with one beyond the last that must stay untouched.
template <class Word, class Convert>
std::vector<uint32_t> bits_of(int32_t frames, const Convert& convert)
{
    std::vector<Word> output(static_cast<size_t>(frames) + 1, Word{77});
    convert(output.data());
    std::vector<uint32_t> bits(output.size());
    std::memcpy(bits.data(), output.data(), output.size() * sizeof(Word));
    return bits;
}

std::vector<uint32_t> converted(ToWords* convert, const Input& in)
{
    return bits_of<int32_t>(in.frames, [&](int32_t* output) {
        convert(in.channels, in.bytes, output, in.frames, in.shift);
    });
}

std::vector<uint32_t> converted(ToFloats* convert, const Input& in)
{
    return bits_of<float>(
        in.frames, [&](float* output) { convert(in.channels, in.bytes, output, in.frames); });
}

template <class Convert>
struct Member {
    const char* name;
    Convert* Encodings<Convert>::*of;
};

template <class Convert>
constexpr Member<Convert> kMembers[] = {
    {"pcm16", &Encodings<Convert>::pcm16},
    {"pcm8", &Encodings<Convert>::pcm8},
    {"alaw", &Encodings<Convert>::alaw},
    {"ulaw", &Encodings<Convert>::ulaw},
    {"alaw running", &Encodings<Convert>::alaw_running},
    {"ulaw running", &Encodings<Convert>::ulaw_running},
};

template <class Convert>
void expect_equal(const Encodings<Convert>& actual, const Encodings<Convert>& plain,
                  const Input& in)
{
    for (const Member<Convert>& member : kMembers<Convert>) {
        ASSERT_EQ(converted(actual.*member.of, in), converted(plain.*member.of, in))
            << member.name << ", " << in.channels << " channels, " << in.frames << " frames, shift "
            << in.shift;
    }
}

void expect_equal(const Variant& actual, const Variant& plain, const Input& in)
{
    expect_equal(actual.to_words, plain.to_words, in);
    expect_equal(actual.to_floats, plain.to_floats, in);
}

TEST_P(ConvertVariants, AreBitIdenticalForAllLengths)
{
    constexpr int32_t kMaxFrames = 70;
    const Bytes bytes = audio(2 * 9 * kMaxFrames + 3);
    for (int32_t channels = 1; channels <= 9; ++channels) {
        for (int32_t frames = 0; frames <= kMaxFrames; ++frames) {
            for (const size_t offset : {0u, 1u, 2u, 3u}) {
                expect_equal(variant(), plain(), {bytes.data() + offset, channels, frames, 14});
            }
        }
    }
}

TEST_P(ConvertVariants, AreBitIdenticalForAllShifts)
{
    const Bytes bytes = audio(2 * 5 * 40);
    for (int32_t shift = -32; shift <= 64; ++shift) {
        for (int32_t channels = 1; channels <= 5; ++channels) {
            expect_equal(variant(), plain(), {bytes.data(), channels, 40, shift});
        }
    }
}

TEST_P(ConvertVariants, AreBitIdenticalForManyChannels)
{
    constexpr int32_t kFrames = 37;
    const Bytes bytes = audio(2 * 4097 * kFrames + 1);
    for (const int32_t channels : {15, 16, 17, 31, 32, 33, 100, 255, 511, 512, 513, 1000, 4097}) {
        expect_equal(variant(), plain(), {bytes.data() + 1, channels, kFrames, 6});
    }
}

TEST_P(ConvertVariants, AreBitIdenticalOverManyBatches)
{
    const Bytes bytes = audio(2 * 100 * 301);
    for (const int32_t channels : {3, 7, 100}) {
        expect_equal(variant(), plain(), {bytes.data(), channels, 100 * 301 / channels, 12});
    }
}

TEST_P(ConvertVariants, AreBitIdenticalForEveryCode)
{
    Bytes pairs;
    for (uint32_t first = 0; first < 256; ++first) {
        for (uint32_t second = 0; second < 256; ++second) {
            pairs.push_back(static_cast<uint8_t>(first));
            pairs.push_back(static_cast<uint8_t>(second));
        }
    }
    for (const int32_t channels : {1, 2, 4, 8}) {
        const auto frames =
            static_cast<int32_t>(pairs.size() / (2 * static_cast<size_t>(channels)));
        expect_equal(variant(), plain(), {pairs.data(), channels, frames, 0});
    }
}

// A sum that is never cleared passes 2^31.
TEST_P(ConvertVariants, AreBitIdenticalAtFullScale)
{
    for (const uint8_t byte : Bytes{0x00, 0x2a, 0x7f, 0x80, 0xaa, 0xff}) {
        const Bytes bytes(2 * 513 * 300, byte);
        for (const int32_t channels : {1, 2, 4, 8, 511, 512, 513}) {
            expect_equal(variant(), plain(), {bytes.data(), channels, 300, 15});
        }
    }
}

// Floats round from 2^24 on, which 512 samples reach: with more, the order of additions counts.
TEST_P(ConvertVariants, RoundSumsOfManyLoudSamplesAlike)
{
    constexpr int32_t kFrames = 9;
    for (const int16_t sample : std::vector<int16_t>{INT16_MIN, INT16_MIN + 1, INT16_MAX}) {
        const std::vector<int16_t> samples(2000 * kFrames, sample);
        const auto* bytes = reinterpret_cast<const uint8_t*>(samples.data());
        for (const int32_t channels : {511, 512, 513, 520, 700, 1024, 2000}) {
            expect_equal(variant(), plain(), {bytes, channels, kFrames, 6});
        }
    }
}

TEST_P(ConvertVariants, ReadNothingWithoutChannels)
{
    for (const int32_t channels : {0, -1, std::numeric_limits<int32_t>::min()}) {
        const Input nothing{nullptr, channels, 20, 3};
        for (const auto& member : kMembers<ToWords>) {
            const auto words = converted(variant().to_words.*member.of, nothing);
            EXPECT_EQ(0U, std::accumulate(words.begin(), words.end() - 1, 0U)) << member.name;
        }
        expect_equal(variant(), plain(), nothing);
    }
}

KZ_FOR_KERNEL_VARIANTS(ConvertVariants);

} // namespace
