// Every variant of the transform against the plain one, to the bit.

#include <bit>
#include <cstdint>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/kernels/kernels.hpp"
#include "kzsdk/kernels/tables.hpp"
#include "support/kernel_variants.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::test;

class TransformVariants : public KernelVariants {};

// The orders of fingerprints, and one on either side.
class OrderOfTransformVariants : public TransformVariants {};

std::vector<std::vector<int32_t>> fixed_inputs(size_t length)
{
    Random random(14);
    std::vector<std::vector<int32_t>> inputs;
    for (const int shift : {0, 2, 17}) {
        std::vector<int32_t> noise(length);
        for (int32_t& x : noise) {
            x = static_cast<int32_t>(random.next()) >> shift;
        }
        inputs.push_back(noise);
    }
    std::vector<int32_t> extremes(length);
    for (int32_t& x : extremes) {
        x = random.next() % 2 == 0 ? std::numeric_limits<int32_t>::min()
                                   : std::numeric_limits<int32_t>::max();
    }
    inputs.push_back(extremes);
    for (const int32_t constant : {0, 1, -1, std::numeric_limits<int32_t>::min()}) {
        inputs.emplace_back(length, constant);
    }
    std::vector<int32_t> impulse(length);
    impulse[length - 3] = 1 << 30;
    inputs.push_back(impulse);
    std::vector<int32_t> ramp(length);
    for (size_t i = 0; i < length; ++i) {
        ramp[i] = static_cast<int32_t>(i * 65521U);
    }
    inputs.push_back(ramp);
    return inputs;
}

TEST_P(TransformVariants, GiveTheWordsOfThePlainFixedPointTransform)
{
    for (const int32_t order : {14, 15}) {
        for (const auto& input : fixed_inputs(size_t{1} << order)) {
            auto expected = input;
            plain().dct_fixed(expected.data(), kz::kernels::kDctCoefficients, order);
            auto actual = input;
            variant().dct_fixed(actual.data(), kz::kernels::kDctCoefficients, order);
            ASSERT_EQ(actual, expected) << "order " << order;
        }
    }
}

std::vector<std::vector<float>> float_inputs(size_t length)
{
    Random random(15);
    std::vector<std::vector<float>> inputs;
    for (const float level : {1.0F, 32768.0F, 1e-42F, 3e38F}) {
        std::vector<float> noise(length);
        for (float& x : noise) {
            x = level * static_cast<float>(random.unit());
        }
        inputs.push_back(noise);
    }
    inputs.emplace_back(length, 0.0F);
    inputs.emplace_back(length, -0.0F);
    return inputs;
}

std::vector<uint32_t> bits(const std::vector<float>& values)
{
    std::vector<uint32_t> words(values.size());
    std::memcpy(words.data(), values.data(), values.size() * sizeof(float));
    return words;
}

TEST_P(TransformVariants, GiveTheBitsOfThePlainFloatTransform)
{
    for (int32_t order = 1; order <= 16; ++order) {
        std::vector<float> factors(size_t{1} << order);
        kz::kernels::fill_dct_factors(factors);
        for (const auto& input : float_inputs(factors.size())) {
            auto expected = input;
            plain().dct_float(expected.data(), factors.data(), order);
            auto actual = input;
            variant().dct_float(actual.data(), factors.data(), order);
            ASSERT_EQ(bits(actual), bits(expected)) << "order " << order;
        }
    }
}

KZ_FOR_KERNEL_VARIANTS(TransformVariants);

} // namespace
