// The transform: to the word in its own steps, and within its rounding of the definition.
#include "whole/model/dct.hpp"

#include <memory>

#include <gtest/gtest.h>

#include "kzsdk/dsp/dct.h"
#include "support/allocation.hpp"
#include "whole/model/equaliser.hpp"
#include "whole/model/ideal.hpp"
#include "whole/model/material.hpp"

using namespace kz::model;

namespace {

struct Destroy {
    void operator()(KZDSP_DCT_fixed* dct) const { KZDSP_DCT_fixed_destroy(dct); }
};
using LibraryDct = std::unique_ptr<KZDSP_DCT_fixed, Destroy>;

std::vector<int32_t> transformed(const KZDSP_DCT_fixed* dct, std::vector<int32_t> words)
{
    KZDSP_DCT_fixed_compute(dct, words.data(), 0);
    return words;
}

/// Bin k of (4 / L) sum of x[n] cos(pi (2n + 1) k / (2L)), by its definition.
long double defined_bin(std::span<const int32_t> x, size_t k)
{
    const size_t period = 4 * x.size();
    long double sum = 0;
    for (size_t n = 0; n < x.size(); ++n) {
        const size_t turn = (2 * n + 1) * k % period; // exact, so the angle stays small
        sum += x[n] * std::cos(2 * std::numbers::pi_v<long double> *
                               static_cast<long double>(turn) / static_cast<long double>(period));
    }
    return 4 * sum / static_cast<long double>(x.size());
}

} // namespace

class ModelDct : public kz::test::MemoryOn {};

TEST_F(ModelDct, FactorsAreThoseOfTheLibrary)
{
    for (const int order : {14, 15}) {
        const LibraryDct library(KZDSP_DCT_fixed_create(order));
        ASSERT_NE(nullptr, library);
        const std::vector<int32_t> factors = butterfly_factors(order);
        EXPECT_EQ(factors,
                  std::vector(library->coefficients, library->coefficients + library->length));
    }
    const std::vector<int32_t> factors = butterfly_factors(15);
    EXPECT_EQ(1518500224, factors[1]);
    EXPECT_EQ(581104896, factors[2]);
    EXPECT_EQ(-1402911360, factors[3]);
    EXPECT_EQ(273694432, factors[4]);
    EXPECT_EQ(131072, factors[8192]);
    EXPECT_EQ(65536, factors[16384]);
}

TEST_F(ModelDct, LibraryAgreesToTheWord)
{
    for (const int order : {14, 15}) {
        const LibraryDct library(KZDSP_DCT_fixed_create(order));
        const Dct model(order);
        const size_t length = size_t{1} << order;
        auto all = materials(11025, length);
        all.push_back({"small words", random_words(length, 7, 18)});
        all.push_back({"a constant", std::vector<int32_t>(length, 1 << 14)});
        for (const int32_t level : {(1 << 30) - 1, 1 - (1 << 30), (1 << 30) - 19695}) {
            all.push_back({"a large constant", std::vector<int32_t>(length, level)});
        }
        all.push_back({"an impulse", std::vector<int32_t>(length, 0)});
        all.back().words[0] = 1 << 20;
        for (const Material& material : all) {
            std::vector<int32_t> expected = material.words;
            model(expected);
            EXPECT_EQ(expected, transformed(library.get(), material.words))
                << material.name << ", order " << order;
        }
    }
}

TEST_F(ModelDct, DoubleTransformIsTheDefinition)
{
    const std::vector<int32_t> words = random_words(16384, 8, 3);
    const ideal::Signal bins = ideal::cosine_transform(ideal::Signal(words.begin(), words.end()));
    for (size_t k = 1; k < words.size(); k = k * 5 / 4 + 1) {
        EXPECT_NEAR(static_cast<double>(defined_bin(words, k)), bins[k], 1e-3) << k;
    }
}

// Products are rounded down, and the recursive additions gather that: bin 1 ends up low by L/2,
// bins 2, 4 and 8 by half as much each. Upwards only the factors' single precision counts.
TEST_F(ModelDct, LibraryStaysWithinItsRoundingOfTheDefinition)
{
    for (const int order : {14, 15}) {
        const LibraryDct library(KZDSP_DCT_fixed_create(order));
        const size_t length = size_t{1} << order;
        const auto points = static_cast<double>(length);
        const auto music = as_words(kz::test::tune(11025, 1, 3.0), 14);
        const auto frame = std::span(music).first(length);
        for (const std::vector<int32_t>& words : {equalise(frame, 256), random_words(length, 5, 15),
                                                  as_words(kz::test::noise(length, 1.0, 6), 0)}) {
            std::vector<double> halved(words.begin(), words.end()); // so that no sum wraps
            std::vector<int32_t> input(length);
            for (size_t i = 0; i < length; ++i) {
                input[i] = words[i] / 2;
                halved[i] = input[i];
            }
            const std::vector<int32_t> bins = transformed(library.get(), input);
            const ideal::Signal defined = ideal::cosine_transform(halved);
            for (size_t k = 1; k < length; ++k) {
                ASSERT_LE(bins[k] - defined[k], points / 32) << "bin " << k;
                ASSERT_GE(bins[k] - defined[k], -points / 2) << "bin " << k;
            }
            EXPECT_NEAR(-points / 2, bins[1] - defined[1], points / 40);
            EXPECT_NEAR(-points / 4, bins[2] - defined[2], points / 40);
            EXPECT_NEAR(-points / 8, bins[4] - defined[4], points / 40);
            EXPECT_NEAR(-points / 16, bins[8] - defined[8], points / 40);
            EXPECT_NEAR(defined[0], bins[0], 1.0);
        }
    }
}
