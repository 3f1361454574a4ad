// Band energies: how they are stored, that they are the library's, and that they give its
// documents.

#include <bit>
#include <cmath>
#include <cstring>
#include <limits>
#include <memory>

#include <gtest/gtest.h>

#include "catalogue/model/document_sounds.hpp"
#include "catalogue/model/extractor.hpp"
#include "kzsdk/abs/startup.h"
#include "kzsdk/qvfloat/qvfloat.h"

namespace {

using kzcat::decode_band_energy;
using kzcat::DocumentBandExtractor;
using kzcat::DocumentBands;
using kzcat::DocumentValues;
using kzcat::encode_band_energy;
using kzcat::kDocumentBandCount;
using kzcat::kDocumentFrame;
using kzcat::kDocumentHop;
using kzcat::test::bands_of;

struct DestroyManager {
    void operator()(QVFM* manager) const { QVFM_Destroy(manager); }
};
using Manager = std::unique_ptr<QVFM, DestroyManager>;

Manager make_manager(uint32_t frame_limit)
{
    QVConfig* config = nullptr;
    EXPECT_EQ(KZ_OK, QVConfig_Create(&config));
    config->frame_limit = frame_limit;
    Manager manager(QVFM_Create(config));
    QVConfig_Destroy(config);
    return manager;
}

class DocumentBandsTest : public testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(KZ_OK, kzinit_acquire()); }
    void TearDown() override { EXPECT_EQ(KZ_OK, kzinit_release()); }
};

TEST(DocumentBandScale, EveryNumberSurvives)
{
    for (uint32_t number = 0; number <= 64 * 256; ++number) {
        const auto stored = static_cast<uint16_t>(number);
        ASSERT_EQ(stored, encode_band_energy(decode_band_energy(stored))) << number;
    }
}

TEST(DocumentBandScale, TheNearestNumberIsTaken)
{
    kz::test::Random random(1);
    for (int i = 0; i < 100000; ++i) {
        const auto energy = static_cast<float>(std::exp2(40 * std::abs(random.unit())) - 1);
        const double steps = 256 * std::log2(double{energy} + 1);
        ASSERT_NEAR(steps, encode_band_energy(energy), 0.5001) << energy;
    }
}

TEST(DocumentBandScale, DecodesPowersOfTwo)
{
    for (uint32_t number = 0; number < 64 * 256; number += 7) {
        const double energy = std::exp2(number / 256.0) - 1;
        ASSERT_NEAR(energy, decode_band_energy(static_cast<uint16_t>(number)), energy * 1e-7);
    }
}

TEST(DocumentBandScale, WhatIsNoEnergyIsZeroOrTheMost)
{
    constexpr float kInfinite = std::numeric_limits<float>::infinity();
    EXPECT_EQ(0, encode_band_energy(0));
    EXPECT_EQ(0, encode_band_energy(-1));
    EXPECT_EQ(0, encode_band_energy(-kInfinite));
    EXPECT_EQ(0, encode_band_energy(std::numeric_limits<float>::quiet_NaN()));
    EXPECT_EQ(64 * 256, encode_band_energy(kInfinite));
    EXPECT_EQ(64 * 256, encode_band_energy(0x1p+70F));
    EXPECT_EQ(64 * 256, encode_band_energy(0x1p+64F));
    EXPECT_EQ(64 * 256, encode_band_energy(0x1.8p+64F));
    EXPECT_EQ(0x1p+64F, decode_band_energy(65535));
    EXPECT_EQ(0, decode_band_energy(0));
}

// The edges are those that the library divides the spectrum by.
TEST(DocumentBandScale, BinsAreThoseOfTheLibrary)
{
    QVConfig* config = nullptr;
    ASSERT_EQ(KZ_OK, kzinit_acquire());
    ASSERT_EQ(KZ_OK, QVConfig_Create(&config));
    const float bin = config->sample_rate / 65536;
    for (size_t band = 0; band < kDocumentBandCount; ++band) {
        const auto first = static_cast<uint32_t>(config->freq_table[2 * band] / bin);
        const auto last = static_cast<uint32_t>(config->freq_table[2 * band + 1] / bin);
        EXPECT_EQ(static_cast<float>(last - first + 1), kzcat::kDocumentBandBins[band]) << band;
    }
    QVConfig_Destroy(config);
    kzinit_release();
}

TEST_F(DocumentBandsTest, EnergiesAreThoseOfTheLibrary)
{
    const auto sound = kz::test::tune(kzcat::kWorkingRate, 1, 8);
    const auto floats = kzcat::test::to_floats(sound);
    const DocumentBands bands = bands_of(sound);
    const Manager manager = make_manager(0);
    for (size_t start = 0; start + kDocumentFrame <= floats.size(); start += kDocumentHop) {
        QVFM_AppendDualPCMData(manager.get(), floats.data() + start, kDocumentFrame, nullptr, 0);
    }
    ASSERT_EQ(bands.size(), size_t{QVFM_GetFrameCount(manager.get())} * kDocumentBandCount);
    size_t number = 0;
    for (const auto* record = manager->records; record != nullptr; record = record->next) {
        for (size_t band = 0; band < kDocumentBandCount; ++band) {
            ASSERT_EQ(encode_band_energy(record->energy[band]), bands[number++]);
        }
    }
}

TEST_F(DocumentBandsTest, CutsDoNotShow)
{
    const auto floats = kzcat::test::to_floats(kz::test::tune(kzcat::kWorkingRate, 1, 6));
    DocumentBandExtractor whole;
    whole.feed(floats);
    const DocumentBands expected = whole.take();
    kz::test::Random random(2);
    DocumentBandExtractor pieces;
    DocumentBands taken;
    for (size_t start = 0; start < floats.size();) {
        const size_t count = std::min<size_t>(random.below(9000), floats.size() - start);
        pieces.feed(std::span(floats).subspan(start, count));
        const DocumentBands some = pieces.take();
        taken.insert(taken.end(), some.begin(), some.end());
        start += count;
    }
    EXPECT_EQ(expected, taken);
}

TEST_F(DocumentBandsTest, AFrameForEveryHopThatIsFull)
{
    for (const size_t frames : {1U, 2U, 5U}) {
        const size_t needed = kDocumentFrame + (frames - 1) * kDocumentHop;
        const auto noise = kz::test::noise(needed, 0.1, 3);
        EXPECT_EQ(frames * kDocumentBandCount, bands_of(noise).size());
        EXPECT_EQ((frames - 1) * kDocumentBandCount,
                  bands_of(std::span(noise).first(needed - 1)).size());
    }
}

TEST_F(DocumentBandsTest, SilenceHasNoEnergy)
{
    const std::vector<int16_t> silence(kDocumentFrame);
    EXPECT_EQ(DocumentBands(kDocumentBandCount), bands_of(silence));
}

// Sound at 11025 Hz is the signal itself.
TEST_F(DocumentBandsTest, TrailExtractorsMakeThemOnRequest)
{
    const auto sound = kz::test::tune(kzcat::kWorkingRate, 1, 5);
    const kzcat::SoundFormat format{KZ_STREAM_FORMAT_PCM16, kzcat::kWorkingRate, 1};
    kzcat::TrailExtractor extractor(format, true);
    kzcat::TrailExtractor without(format);
    extractor.feed(std::as_bytes(std::span(sound)));
    without.feed(std::as_bytes(std::span(sound)));
    EXPECT_EQ(bands_of(sound), extractor.take_document_bands());
    EXPECT_TRUE(extractor.take_document_bands().empty());
    EXPECT_TRUE(without.take_document_bands().empty());
    EXPECT_EQ(without.finish(), extractor.finish());
}

// The frames are handed to the library as frame data, which then makes a document of them.
DocumentValues values_by_the_library(std::span<const uint16_t> bands, size_t first)
{
    std::vector<uint32_t> data = {1, kDocumentBandCount, kzcat::kDocumentFrames};
    for (size_t band = 0; band < kDocumentBandCount; ++band) {
        for (size_t frame = 0; frame < kzcat::kDocumentFrames; ++frame) {
            const size_t stored = first + frame * kzcat::kDocumentStride;
            const float energy = decode_band_energy(bands[stored * kDocumentBandCount + band]);
            const float amplitude = std::sqrt(energy / kzcat::kDocumentBandBins[band]);
            data.push_back(std::bit_cast<uint32_t>(energy));
            data.push_back(std::bit_cast<uint32_t>(amplitude));
        }
    }
    const Manager manager = make_manager(12);
    DocumentValues values{};
    if constexpr (std::endian::native == std::endian::big) {
        for (uint32_t& word : data) {
            word = __builtin_bswap32(word);
        }
    }
    EXPECT_EQ(1U, QVFM_AppendFrameData(manager.get(), data.data(),
                                       static_cast<uint32_t>(data.size() * sizeof data[0])));
    EXPECT_EQ(60U, QVFM_GetFingerprint(manager.get(), values.data(), 60));
    return values;
}

TEST_F(DocumentBandsTest, ValuesAreRoundedAsTheLibraryDoes)
{
    kz::test::Random random(4);
    for (const uint32_t loudest : {20U * 256, 40U * 256, 64U * 256}) {
        DocumentBands bands((kzcat::kDocumentSpan + 200) * kDocumentBandCount);
        for (uint16_t& number : bands) {
            number = static_cast<uint16_t>(random.below(loudest));
        }
        for (size_t first = 0; first <= 200; ++first) {
            ASSERT_EQ(values_by_the_library(bands, first), kzcat::document_at(bands, first));
        }
    }
}

TEST_F(DocumentBandsTest, OneBandAloneHoldsTheWhole)
{
    DocumentBands bands(kzcat::kDocumentSpan * kDocumentBandCount);
    EXPECT_EQ(DocumentValues{}, kzcat::document_at(bands, 0));
    bands[2] = 5000;
    DocumentValues expected{};
    expected[2] = expected[17] = -32768;
    EXPECT_EQ(expected, kzcat::document_at(bands, 0));
    EXPECT_EQ(expected, values_by_the_library(bands, 0));
}

// The sound begins at once, so the document's frames are those stored from the start on. What is
// left is the rounding to 1/256 octave.
TEST_F(DocumentBandsTest, DocumentsComeOutNearlyAsTheLibraryMakesThem)
{
    for (const uint64_t seed : {1U, 2U, 3U, 4U}) {
        const auto sound = kz::test::tune(kzcat::kWorkingRate, 1, 15, 0.5, seed);
        const auto document = kzcat::test::document_of(sound, KZ_FPX_ALGORITHM_FLOAT);
        EXPECT_LT(document.signal_offset, 0.002);
        const DocumentValues values = kzcat::document_at(bands_of(sound), 0);
        int32_t sum = 0;
        for (size_t i = 0; i < values.size(); ++i) {
            sum += std::abs(values[i] - document.values[i]);
        }
        EXPECT_LT(sum, 150) << "seed " << seed;
    }
}

} // namespace
