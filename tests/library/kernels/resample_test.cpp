// Every variant of the fixed-point filters against the plain one, to the bit.

#include <algorithm>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"
#include "support/kernel_variants.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::kernels;
using namespace kz::test;

class ResampleVariants : public KernelVariants {};

struct Rate {
    const PhaseRows& rows;
    uint32_t down;
    uint32_t taps;
};

std::vector<Rate> polyphase_rates()
{
    return {{rows_8000, 320, 21},
            {rows_16000, 640, 30},
            {rows_24000, 320, 46},
            {rows_32000, 1280, 61},
            {rows_48000, 640, 91}};
}

std::vector<Rate> symmetric_rates() { return {{rows_22050, 2, 42}, {rows_44100, 4, 84}}; }

using Words = std::vector<int32_t>;

constexpr auto kLowest = std::numeric_limits<int32_t>::min();
constexpr auto kHighest = std::numeric_limits<int32_t>::max();

Words noise_of(size_t count, int shift, uint64_t seed)
{
    Random random(seed);
    Words words(count);
    for (int32_t& x : words) {
        x = static_cast<int32_t>(random.next()) >> shift;
    }
    return words;
}

// Noise at the levels where sums of cross products begin to wrap, and where 16 bits end; words that
// are at an end of their range; the low halves that the multiplier treats apart.
std::vector<Words> signals(size_t count)
{
    std::vector<Words> all;
    for (const int shift : {0, 1, 2, 3, 16}) {
        all.push_back(noise_of(count, shift, 20));
    }
    for (const int32_t high : {0x27cc, 0x27cd, 0x27ce, 0x3fff, 0x4000, -0x4000, -0x4001, 0x629a,
                               0x629b, -0x629b, -0x8000, 0x7fff}) {
        auto words = noise_of(count, 16, 21);
        for (int32_t& x : words) {
            x = (x & 0xffff) | (high * (1 << 16));
        }
        all.push_back(words);
    }
    for (const int32_t low : {0, 0x7fff, 0x8000, 0xffff}) {
        auto words = noise_of(count, 3, 22);
        for (int32_t& x : words) {
            x = (x & -0x10000) | low;
        }
        all.push_back(words);
    }
    auto extremes = noise_of(count, 0, 23);
    for (int32_t& x : extremes) {
        x = x < 0 ? kLowest : kHighest;
    }
    all.push_back(extremes);
    // Loud for one block, quiet for the next.
    auto burst = noise_of(count, 4, 24);
    std::copy_n(extremes.begin(), count / 3, burst.begin());
    all.push_back(burst);
    return all;
}

size_t samples_for(const Rate& rate, uint32_t outputs)
{
    return static_cast<size_t>(uint64_t{outputs} * rate.down / rate.rows.up + rate.taps + 1);
}

// The outputs, and one word beyond them that must stay untouched.
Words outputs_of(decltype(Variant::polyphase) kernel, const Rate& rate, const Words& samples,
                 uint32_t phase, uint32_t count)
{
    Words output(count + 1, 77);
    kernel(rate.rows, {samples.data(), rate.taps, rate.down, phase}, output.data(), count);
    return output;
}

TEST_P(ResampleVariants, PolyphaseFiltersMatchThePlainOnesOnAnySamples)
{
    for (const Rate& rate : polyphase_rates()) {
        constexpr uint32_t kOutputs = 1500; // several periods of the phases, and split in blocks
        for (const Words& samples : signals(samples_for(rate, kOutputs))) {
            ASSERT_EQ(outputs_of(variant().polyphase, rate, samples, 5, kOutputs),
                      outputs_of(plain().polyphase, rate, samples, 5, kOutputs))
                << "up " << rate.rows.up << ", down " << rate.down;
        }
    }
}

TEST_P(ResampleVariants, PolyphaseFiltersGiveThePlainWordsForAnyCount)
{
    for (const Rate& rate : polyphase_rates()) {
        const auto samples = noise_of(samples_for(rate, 9000), 3, 30);
        for (const uint32_t count : {1U, 2U, 3U, 146U, 147U, 148U, 440U, 441U, 442U, 881U, 882U,
                                     883U, 1029U, 2700U, 9000U}) {
            ASSERT_EQ(outputs_of(variant().polyphase, rate, samples, 0, count),
                      outputs_of(plain().polyphase, rate, samples, 0, count))
                << count << " outputs, up " << rate.rows.up << ", down " << rate.down;
        }
    }
}

TEST_P(ResampleVariants, PolyphaseFiltersMatchThePlainOnesInEveryPhase)
{
    for (const Rate& rate : polyphase_rates()) {
        for (const int shift : {0, 3}) {
            const auto samples = noise_of(samples_for(rate, 10), shift, 31);
            for (uint32_t phase = 0; phase < rate.rows.up; ++phase) {
                ASSERT_EQ(outputs_of(variant().polyphase, rate, samples, phase, 10),
                          outputs_of(plain().polyphase, rate, samples, phase, 10))
                    << "phase " << phase << ", up " << rate.rows.up << ", down " << rate.down;
            }
        }
    }
}

TEST_P(ResampleVariants, SymmetricFiltersMatchThePlainOnesOnAnySamples)
{
    for (const Rate& rate : symmetric_rates()) {
        constexpr uint32_t kOutputs = 1300;
        for (const Words& samples : signals(samples_for(rate, kOutputs))) {
            ASSERT_EQ(outputs_of(variant().symmetric, rate, samples, 0, kOutputs),
                      outputs_of(plain().symmetric, rate, samples, 0, kOutputs))
                << "down " << rate.down;
        }
    }
}

TEST_P(ResampleVariants, SymmetricFiltersGiveThePlainWordsForAnyCount)
{
    for (const Rate& rate : symmetric_rates()) {
        for (const int shift : {0, 2}) {
            for (uint32_t count = 1; count < 70; ++count) {
                // Exactly the samples that the windows hold: more must not be read.
                const auto samples =
                    noise_of(size_t{count - 1} * rate.down + rate.taps, shift, count);
                ASSERT_EQ(outputs_of(variant().symmetric, rate, samples, 0, count),
                          outputs_of(plain().symmetric, rate, samples, 0, count))
                    << count << " outputs, down " << rate.down;
            }
        }
    }
}

TEST_P(ResampleVariants, ExactSumsGiveThePlainWords)
{
    for (const PhaseRows* rows : {&rows_8000, &rows_16000, &rows_22050, &rows_24000, &rows_32000,
                                  &rows_44100, &rows_48000}) {
        for (const Words& samples : signals(rows->row_length)) {
            for (uint32_t row = 0; row < rows->up; row += 7) {
                const int32_t* taps = rows->taps + size_t{row} * rows->row_length;
                ASSERT_EQ(variant().convolve_from_bit_31(samples.data(), taps, rows->row_length),
                          plain().convolve_from_bit_31(samples.data(), taps, rows->row_length));
                ASSERT_EQ(variant().convolve_from_bit_32(samples.data(), taps, rows->row_length),
                          plain().convolve_from_bit_32(samples.data(), taps, rows->row_length));
            }
        }
    }
}

KZ_FOR_KERNEL_VARIANTS(ResampleVariants);

} // namespace
