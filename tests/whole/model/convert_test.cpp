// Conversion to mono words.
#include "whole/model/convert.hpp"

#include <gtest/gtest.h>

#include "kzsdk/dsp/convert.h"
#include "support/signals.hpp"

using namespace kz::model;

namespace {

using Converter = void (*)(const void*, FxpType*, int32_t);

struct Case {
    const char* name;
    Format format;
    size_t channels;
    Converter convert;
};

constexpr Case kCases[] = {
    {"PCM8", Format::pcm8, 1, KZDSP_PCM8ToQ29},
    {"PCM8 stereo", Format::pcm8, 2, KZDSP_StereoPCM8ToMonoQ30},
    {"PCM16", Format::pcm16, 1, KZDSP_PCM16ToQ29},
    {"PCM16 stereo", Format::pcm16, 2, KZDSP_StereoPCM16ToMonoQ30},
    {"A-law", Format::alaw, 1, KZDSP_ALawToQ29},
    {"A-law stereo", Format::alaw, 2, KZDSP_StereoALawToMonoQ30},
    {"mu-law", Format::ulaw, 1, KZDSP_uLawToQ29},
    {"mu-law stereo", Format::ulaw, 2, KZDSP_StereouLawToMonoQ30},
};

std::vector<int32_t> converted(const Case& each, std::span<const uint8_t> bytes)
{
    const size_t frames = bytes.size() / (each.channels * bytes_per_sample(each.format));
    std::vector<int32_t> words(frames);
    each.convert(bytes.data(), words.data(), static_cast<int32_t>(frames));
    return words;
}

} // namespace

TEST(ModelConvert, LibraryAgreesOnEveryPairOfBytes)
{
    std::vector<uint8_t> bytes;
    for (unsigned pair = 0; pair < 65536; ++pair) {
        bytes.push_back(static_cast<uint8_t>(pair));
        bytes.push_back(static_cast<uint8_t>(pair >> 8));
    }
    for (const Case& each : kCases) {
        EXPECT_EQ(to_mono(each.format, each.channels, bytes), converted(each, bytes)) << each.name;
    }
}

TEST(ModelConvert, LibraryAgreesOnRandomBytesAtOddAddresses)
{
    kz::test::Random random(1);
    std::vector<uint8_t> bytes(40001);
    for (uint8_t& byte : bytes) {
        byte = static_cast<uint8_t>(random.next());
    }
    const auto odd = std::span<const uint8_t>(bytes).subspan(1);
    for (const Case& each : kCases) {
        EXPECT_EQ(to_mono(each.format, each.channels, odd), converted(each, odd)) << each.name;
    }
}
