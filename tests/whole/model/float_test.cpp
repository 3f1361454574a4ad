// The stages of the floating-point path, to the bit: conversion, filters, equaliser, transform,
// features, values.
#include "whole/model/float_frame.hpp"

#include <algorithm>
#include <array>
#include <bit>
#include <memory>

#include <gtest/gtest.h>

#include "kzsdk/dsp/convert.h"
#include "support/allocation.hpp"
#include "support/float_twin.hpp"
#include "whole/model/convert.hpp"
#include "whole/model/ideal.hpp"
#include "whole/model/material.hpp"
#include "whole/model/paths.hpp"

using namespace kz::model;

namespace {

using Samples = std::vector<float>;

/// As bits, so that zeros of different sign are different.
std::vector<uint32_t> bits(std::span<const float> samples)
{
    std::vector<uint32_t> words(samples.size());
    std::transform(samples.begin(), samples.end(), words.begin(),
                   [](float sample) { return std::bit_cast<uint32_t>(sample); });
    return words;
}

/// The word whose bytes lie from the lowest to the highest, as those of frame data do.
uint32_t little_endian(uint32_t word)
{
    const std::array<uint8_t, 4> bytes = {
        static_cast<uint8_t>(word), static_cast<uint8_t>(word >> 8),
        static_cast<uint8_t>(word >> 16), static_cast<uint8_t>(word >> 24)};
    return std::bit_cast<uint32_t>(bytes);
}

struct FloatMaterial {
    std::string name;
    Samples samples;
};

/// The integer path's kinds of frames at the scale of 16 bits, and some of their own.
std::vector<FloatMaterial> float_materials(size_t count)
{
    std::vector<FloatMaterial> all;
    for (const Material& material : materials(11025, count)) {
        Samples samples(material.words.size());
        std::transform(material.words.begin(), material.words.end(), samples.begin(),
                       [](int32_t word) { return static_cast<float>(word) / 16384; });
        all.push_back({material.name, samples});
    }
    kz::test::Random random(9);
    Samples tiny(count);
    Samples huge(count);
    for (size_t i = 0; i < count; ++i) {
        tiny[i] = static_cast<float>(random.unit() * 0.49);
        huge[i] = static_cast<float>(random.unit() * 1e9);
    }
    all.push_back({"less than a step", tiny});
    all.push_back({"beyond 16 bits", huge});
    return all;
}

Samples library_equalise(const Samples& samples, uint32_t levels)
{
    Samples output(samples.size());
    std::vector<uint32_t> histogram(levels);
    hist_eq2(samples.data(), output.data(), static_cast<uint32_t>(samples.size()), histogram.data(),
             levels);
    return output;
}

Samples library_equalise_dual(const Samples& samples, size_t first, uint32_t levels)
{
    Samples output(samples.size());
    std::vector<uint32_t> histogram(levels);
    hist_eq_dual(samples.data(), static_cast<uint32_t>(first), samples.data() + first,
                 static_cast<uint32_t>(samples.size() - first), output.data(),
                 static_cast<uint32_t>(samples.size()), histogram.data(), levels);
    return output;
}

FloatFeatures newest_features(const QVFM* manager)
{
    const QVFrameRecord* record = manager->records;
    while (record->next != nullptr) {
        record = record->next;
    }
    FloatFeatures features{};
    std::copy_n(record->energy, kBands, features.energy.begin());
    std::copy_n(record->amplitude, kBands, features.amplitude.begin());
    return features;
}

void append(QVFM* manager, std::span<const float> frame, size_t first)
{
    QVFM_AppendDualPCMData(manager, frame.data(), static_cast<uint32_t>(first),
                           frame.data() + first, static_cast<uint32_t>(frame.size() - first));
}

} // namespace

class ModelFloat : public kz::test::MemoryOn {};

TEST_F(ModelFloat, ConvertersAgreeOnEveryPairOfBytes)
{
    struct Case {
        Format format;
        size_t channels;
        void (*convert)(const void*, float*, int32_t);
    };
    constexpr Case kCases[] = {
        {Format::pcm8, 1, KZDSP_Offset128ToFloat},
        {Format::pcm8, 2, KZDSP_StereoOffset128ToMonoFloat},
        {Format::pcm16, 1, KZDSP_ShortToFloat},
        {Format::pcm16, 2, KZDSP_StereoShortToMonoFloat},
        {Format::alaw, 1, KZDSP_ALawToFloat},
        {Format::alaw, 2, KZDSP_StereoALawToMonoFloat},
        {Format::ulaw, 1, KZDSP_uLawToFloat},
        {Format::ulaw, 2, KZDSP_StereouLawToMonoFloat},
    };
    std::vector<uint8_t> bytes;
    for (unsigned pair = 0; pair < 65536; ++pair) {
        bytes.push_back(static_cast<uint8_t>(pair));
        bytes.push_back(static_cast<uint8_t>(pair >> 8));
    }
    for (const Case& each : kCases) {
        const Samples expected = to_mono_float(each.format, each.channels, bytes);
        Samples actual(expected.size());
        each.convert(bytes.data(), actual.data(), static_cast<int32_t>(actual.size()));
        EXPECT_EQ(bits(expected), bits(actual)) << static_cast<int>(each.format);
    }
}

TEST_F(ModelFloat, RatiosAreThoseOfTheTable)
{
    for (const Ratio& ratio : kRatios) {
        const Ratio found = float_ratio(ratio.hertz);
        EXPECT_EQ(ratio.up, found.up) << ratio.hertz;
        EXPECT_EQ(ratio.down, found.down) << ratio.hertz;
    }
    for (const uint32_t hertz :
         {1u, 100u, 11024u, 11026u, 12345u, 37800u, 44056u, 96000u, 981224u}) {
        const Ratio ratio = float_ratio(hertz);
        const std::unique_ptr<KZDSP_resampler, decltype(&KZDSP_DestroyResampler)> library(
            KZDSP_CreateResampler(static_cast<float>(hertz), 11025.0f), KZDSP_DestroyResampler);
        ASSERT_NE(nullptr, library);
        EXPECT_EQ(ratio.up, library->up) << hertz;
        EXPECT_EQ(ratio.down, library->down) << hertz;
        EXPECT_EQ(ratio.length, library->length) << hertz;
    }
}

TEST_F(ModelFloat, FiltersAgreeToTheBit)
{
    for (const Ratio& ratio : FloatPath::ratios()) {
        const std::unique_ptr<KZDSP_resampler, decltype(&KZDSP_DestroyResampler)> library(
            KZDSP_CreateResampler(static_cast<float>(ratio.hertz), 11025.0f),
            KZDSP_DestroyResampler);
        ASSERT_NE(nullptr, library);
        ASSERT_EQ(ratio.length, library->length) << ratio.hertz;
        EXPECT_EQ(bits(FloatPath::filters(ratio)), bits({library->taps, library->length}))
            << ratio.hertz;
    }
}

TEST_F(ModelFloat, EqualiserAgreesOnFramesOfEveryKind)
{
    for (const FloatMaterial& material : float_materials(kFrameLength)) {
        EXPECT_EQ(bits(equalise_float(material.samples, 256)),
                  bits(library_equalise(material.samples, 256)))
            << material.name;
        const Samples expected = equalise_float_unless_silent(material.samples, 256);
        for (const size_t first : {kFrameLength, size_t{21504}, size_t{1}, size_t{0}}) {
            EXPECT_EQ(bits(expected), bits(library_equalise_dual(material.samples, first, 256)))
                << material.name << " cut at " << first;
        }
    }
}

TEST_F(ModelFloat, EqualiserAgreesForAnyNumberOfLevelsAndSamples)
{
    kz::test::Random random(4);
    for (const uint32_t levels : numbers_of_levels()) {
        for (const size_t count : {size_t{1}, size_t{7}, size_t{700}, size_t{1025}}) {
            Samples samples(count);
            std::generate(samples.begin(), samples.end(),
                          [&] { return static_cast<float>(random.unit() * 40000); });
            EXPECT_EQ(bits(equalise_float(samples, levels)),
                      bits(library_equalise(samples, levels)))
                << levels << ", " << count;
        }
    }
}

// But for the rounding, and the samples on the edge between two levels: a sine has many of the same
// value.
TEST_F(ModelFloat, EqualiserIsThatOfThePlainRule)
{
    for (const FloatMaterial& material : float_materials(kFrameLength)) {
        if (material.name == "silence" || material.name == "less than a step") {
            continue;
        }
        ideal::Signal scaled(material.samples.begin(), material.samples.end());
        for (double& sample : scaled) {
            sample *= 16384;
        }
        const ideal::Signal plain = ideal::equalise(scaled);
        const Samples actual = library_equalise(material.samples, 256);
        size_t far = 0;
        for (size_t i = 0; i < plain.size(); ++i) {
            far += std::abs(plain[i] * 0x1p-30 - actual[i]) > 0.001;
        }
        EXPECT_LE(far, kFrameLength / 20) << material.name;
    }
}

TEST_F(ModelFloat, TransformAgreesToTheBit)
{
    for (const int order : {1, 2, 3, 6, 11, 15}) {
        const std::unique_ptr<KZDSP_DCT, decltype(&KZDSP_DestroyDCT)> library(
            KZDSP_CreateDCT(order), KZDSP_DestroyDCT);
        ASSERT_NE(nullptr, library);
        const Samples factors = float_butterfly_factors(order);
        EXPECT_EQ(bits(factors), bits({library->coefficients, library->length}));
        const FloatDct model(order);
        for (const FloatMaterial& material : float_materials(size_t{1} << order)) {
            Samples expected = material.samples;
            model(expected);
            Samples actual = material.samples;
            KZDSP_ComputeDCT(library.get(), actual.data(), 0);
            EXPECT_EQ(bits(expected), bits(actual)) << material.name << ", order " << order;
        }
    }
}

TEST_F(ModelFloat, FeaturesAgreeToTheBit)
{
    const FloatFrameAnalyser model;
    const auto manager = kz::test::unlimited_manager<kz::test::Float>();
    size_t first = 1;
    for (const FloatMaterial& material : float_materials(kFrameLength)) {
        append(manager.get(), material.samples, first);
        const FloatFeatures expected = model(material.samples);
        const FloatFeatures actual = newest_features(manager.get());
        EXPECT_EQ(bits(expected.energy), bits(actual.energy)) << material.name;
        EXPECT_EQ(bits(expected.amplitude), bits(actual.amplitude)) << material.name;
        first = first * 7 % kFrameLength;
    }
}

TEST_F(ModelFloat, ValuesAgreeForAnyNumberOfFrames)
{
    const FloatFrameAnalyser model;
    for (const FloatMaterial& material : float_materials(kFrameLength + 15 * 3000)) {
        const auto manager = kz::test::unlimited_manager<kz::test::Float>();
        std::vector<FloatFeatures> features;
        for (size_t frame = 0; frame < 14; ++frame) {
            const auto samples = std::span(material.samples).subspan(frame * 3000, kFrameLength);
            append(manager.get(), samples, frame * 1000);
            features.push_back(model(samples));
            Values values{};
            ASSERT_EQ(60u, QVFM_GetFingerprint(manager.get(), values.data(), 60));
            ASSERT_EQ(condense_float(features), values)
                << material.name << ", " << frame + 1 << " frames";
        }
    }
}

// From features of any size, those included whose squares leave the range of single precision.
TEST_F(ModelFloat, ValuesAgreeForRandomFeatures)
{
    kz::test::Random random(12);
    for (int round = 0; round < 500; ++round) {
        const auto manager = kz::test::make_manager<kz::test::Float>([](QVConfig& config) {
            config.frame_limit = 0;
            config.frame_length_log2 = 4;
        });
        const double power = random.unit() * 60;
        std::vector<FloatFeatures> features(1 + random.below(20));
        std::vector<uint32_t> data{1, kBands, static_cast<uint32_t>(features.size())};
        for (FloatFeatures& frame : features) {
            for (size_t band = 0; band < kBands; ++band) {
                frame.energy[band] = static_cast<float>(std::abs(random.unit()) * std::exp2(power));
                frame.amplitude[band] = static_cast<float>(random.unit() * std::exp2(power));
            }
        }
        for (size_t band = 0; band < kBands; ++band) {
            for (const FloatFeatures& frame : features) {
                data.push_back(bits(frame.energy)[band]);
                data.push_back(bits(frame.amplitude)[band]);
            }
        }
        std::ranges::transform(data, data.begin(), little_endian);
        ASSERT_EQ(1u, QVFM_AppendFrameData(manager.get(), data.data(),
                                           static_cast<uint32_t>(data.size() * 4)));
        Values values{};
        ASSERT_EQ(60u, QVFM_GetFingerprint(manager.get(), values.data(), 60));
        ASSERT_EQ(condense_float(features), values) << round;
    }
}
