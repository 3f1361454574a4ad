// Every variant of the converters against the plain one, to the bit.

#include <cstdint>
#include <cstring>
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

// Bytes that hold all the extremes of both encodings, and noise.
std::vector<uint8_t> audio(size_t size)
{
    Random random(16);
    std::vector<uint8_t> bytes(size);
    for (uint8_t& byte : bytes) {
        byte = static_cast<uint8_t>(random.next());
    }
    const uint8_t extremes[] = {0x00, 0x80, 0x00, 0x80, 0xff, 0x7f, 0xff, 0x7f, 0xff, 0xff,
                                0x01, 0x00, 0x00, 0x00, 0x80, 0x80, 0x7f, 0x80, 0x00, 0x80};
    std::memcpy(bytes.data(), extremes, std::min(size, sizeof extremes));
    return bytes;
}

constexpr int32_t kMaxFrames = 70;

// Bits of the words, with one beyond the last that must stay untouched.
template <class Word>
std::vector<uint32_t> converted(Converter<Word>* convert, const uint8_t* bytes, int32_t frames,
                                int32_t shift)
{
    std::vector<Word> output(static_cast<size_t>(frames) + 1, Word{77});
    convert(bytes, output.data(), frames, shift);
    std::vector<uint32_t> bits(output.size());
    std::memcpy(bits.data(), output.data(), output.size() * sizeof(Word));
    return bits;
}

// All lengths up to several vectors and a tail, at even and odd addresses, with every shift in use.
template <class Word>
void expect_equal(Converter<Word>* actual, Converter<Word>* plain, const char* name)
{
    const auto bytes = audio(4 * kMaxFrames + 3);
    for (int32_t frames = 0; frames <= kMaxFrames; ++frames) {
        for (size_t offset = 0; offset < 4; ++offset) {
            for (const int32_t shift : {0, 8, 14, 15, 22, 23}) {
                ASSERT_EQ(converted(actual, bytes.data() + offset, frames, shift),
                          converted(plain, bytes.data() + offset, frames, shift))
                    << name << ", " << frames << " frames, shift " << shift;
            }
        }
    }
}

template <class Word>
void expect_equal(const Converters<Word>& actual, const Converters<Word>& plain)
{
    expect_equal(actual.pcm16_mono, plain.pcm16_mono, "pcm16 mono");
    expect_equal(actual.pcm16_stereo, plain.pcm16_stereo, "pcm16 stereo");
    expect_equal(actual.pcm8_mono, plain.pcm8_mono, "pcm8 mono");
    expect_equal(actual.pcm8_stereo, plain.pcm8_stereo, "pcm8 stereo");
}

TEST_P(ConvertVariants, GiveTheWordsOfThePlainConverters)
{
    expect_equal(variant().words, plain().words);
}

TEST_P(ConvertVariants, GiveTheFloatsOfThePlainConverters)
{
    expect_equal(variant().floats, plain().floats);
}

KZ_FOR_KERNEL_VARIANTS(ConvertVariants);

} // namespace
