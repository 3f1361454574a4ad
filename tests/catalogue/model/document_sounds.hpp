/// @file
/// Sound for tests of documents: at the working rate, with the document that the library makes.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "catalogue/model/document_bands.hpp"
#include "kzsdk/stream/stream.h"
#include "support/signals.hpp"

namespace kzcat::test {

inline std::vector<float> to_floats(std::span<const int16_t> samples)
{
    return {samples.begin(), samples.end()};
}

/// The band energies of a whole signal at the working rate.
inline DocumentBands bands_of(std::span<const int16_t> samples)
{
    DocumentBandExtractor extractor;
    extractor.feed(to_floats(samples));
    return extractor.take();
}

struct Document {
    DocumentValues values{};
    std::string text;
    double signal_offset = 0; ///< seconds
};

/// What the library makes of 16-bit mono sound at the working rate.
inline Document document_of(std::span<const int16_t> samples, uint32_t algorithm)
{
    Document document;
    kz_stream_settings settings;
    kz_stream_initialize_settings(&settings);
    settings.algorithm = algorithm;
    settings.sample_rate = kWorkingRate;
    settings.channels = 1;
    kz_stream* stream = nullptr;
    uint8_t complete = 0;
    uint32_t count = 0;
    const char* text = nullptr;
    EXPECT_EQ(KZ_OK, kz_stream_create(&settings, &stream));
    EXPECT_EQ(KZ_OK,
              kz_stream_feed(stream, samples.data(), samples.size_bytes(), nullptr, &complete));
    EXPECT_EQ(KZ_OK, kz_stream_finish(stream, &complete));
    EXPECT_EQ(KZ_OK, kz_stream_get_values(stream, document.values.data(), 30, &count));
    EXPECT_EQ(KZ_OK, kz_stream_get_document(stream, &text));
    EXPECT_EQ(KZ_OK,
              kz_stream_get_signal_offset(stream, nullptr, &document.signal_offset, nullptr));
    document.text = text == nullptr ? "" : text;
    kz_stream_free(&stream);
    return document;
}

} // namespace kzcat::test
