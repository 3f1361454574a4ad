// Frames to features, and features to the 30 values.
#include "whole/model/frame.hpp"

#include <memory>

#include <gtest/gtest.h>

#include "kzsdk/qvfixed/qvfixed.h"
#include "support/allocation.hpp"
#include "whole/model/ideal.hpp"
#include "whole/model/library_taps.hpp"
#include "whole/model/material.hpp"
#include "whole/model/statistics.hpp"

using namespace kz::model;

namespace {

struct Destroy {
    void operator()(kzqvfixed_frame_manager* manager) const
    {
        kzqvfixed_frame_manager_destroy(manager);
    }
    void operator()(kzqvfixed_config* config) const { kzqvfixed_config_destroy(config); }
};
using LibraryManager = std::unique_ptr<kzqvfixed_frame_manager, Destroy>;

LibraryManager unlimited_manager()
{
    kzqvfixed_config* made = nullptr;
    kzqvfixed_config_create(&made);
    const std::unique_ptr<kzqvfixed_config, Destroy> config(made);
    config->frame_limit = 0;
    return LibraryManager(kzqvfixed_frame_manager_create(config.get()));
}

void append(kzqvfixed_frame_manager* manager, std::span<const int32_t> frame, size_t first)
{
    kzqvfixed_frame_manager_append_dual_PCM_data(manager, frame.data(),
                                                 static_cast<uint32_t>(first), frame.data() + first,
                                                 static_cast<uint32_t>(frame.size() - first));
}

Features newest_features(const kzqvfixed_frame_manager* manager)
{
    const kzqvfixed_frame_record* record = manager->records;
    while (record->next != nullptr) {
        record = record->next;
    }
    Features features{};
    std::copy_n(record->energy, kBands, features.energy.begin());
    std::copy_n(record->amplitude, kBands, features.amplitude.begin());
    return features;
}

Values library_values(kzqvfixed_frame_manager* manager)
{
    Values values{};
    EXPECT_EQ(sizeof values,
              kzqvfixed_frame_manager_get_fingerprint(manager, values.data(), sizeof values));
    return values;
}

std::vector<int32_t> frame_of(const Material& material, size_t start)
{
    const auto begin = material.words.begin() + static_cast<ptrdiff_t>(start);
    return {begin, begin + kFrameLength};
}

} // namespace

class ModelFrame : public kz::test::MemoryOn {};

TEST_F(ModelFrame, LibraryFeaturesAgreeToTheWord)
{
    FrameAnalyser model(library_taps(kHalf));
    const LibraryManager manager = unlimited_manager();
    ASSERT_NE(nullptr, manager);
    auto all = materials(11025, kFrameLength);
    all.push_back({"words too quiet to equalise", random_words(kFrameLength, 5, 18)});
    all.push_back({"one click", std::vector<int32_t>(kFrameLength, 0)});
    all.back().words[12345] = 1 << 29;
    for (const GainSegment& segment : kGainRamp) { // a tone at the end of each stretch of the ramp
        const double hertz = static_cast<double>(segment.end - 2) * 11025 / 65536;
        all.push_back(
            {std::to_string(hertz) + " Hz", as_words(kz::test::sine(11025, hertz, 3.0, 0.9), 14)});
        all.back().words.resize(kFrameLength);
    }
    size_t first = 1;
    for (const Material& material : all) {
        append(manager.get(), material.words, first);
        const Features expected = model(material.words);
        const Features actual = newest_features(manager.get());
        EXPECT_EQ(expected.energy, actual.energy) << material.name;
        EXPECT_EQ(expected.amplitude, actual.amplitude) << material.name;
        first = first * 7 % kFrameLength;
    }
}

TEST_F(ModelFrame, LibraryValuesAgreeForAnyNumberOfFrames)
{
    FrameAnalyser model(library_taps(kHalf));
    for (const Material& material : materials(11025, kFrameLength + 15 * 3000)) {
        const LibraryManager manager = unlimited_manager();
        std::vector<Features> features;
        for (size_t frame = 0; frame < 14; ++frame) {
            const std::vector<int32_t> words = frame_of(material, frame * 3000);
            append(manager.get(), words, frame * 1000);
            features.push_back(model(words));
            ASSERT_EQ(condense(features), library_values(manager.get()))
                << material.name << ", " << frame + 1 << " frames";
        }
    }
}

// Frames that hardly differ: their spread is scaled by the most that the rule allows.
TEST_F(ModelFrame, LibraryValuesAgreeForFramesThatAreNearlyAlike)
{
    FrameAnalyser model(library_taps(kHalf));
    kz::test::Random random(11);
    for (const uint32_t changes : {1u, 2u, 8u, 40u, 300u, 3000u}) {
        const LibraryManager manager = unlimited_manager();
        std::vector<Features> features;
        std::vector<int32_t> words = as_words(kz::test::noise(kFrameLength, 0.5, changes), 14);
        for (size_t frame = 0; frame < 12; ++frame) {
            for (uint32_t change = 0; change < changes; ++change) {
                words[random.below(kFrameLength)] /= 2;
            }
            append(manager.get(), words, 20000);
            features.push_back(model(words));
        }
        EXPECT_EQ(condense(features), library_values(manager.get())) << changes;
    }
}

// A frame's features against plain double arithmetic. What differs is the few samples that lie on
// the edge between two levels, and the rounding of the transform. Both are lost in a busy spectrum;
// in the spectrum of a single tone they are most of what lies beside the tone.
TEST_F(ModelFrame, LibraryFeaturesStayCloseToThePlainOnes)
{
    const LibraryManager manager = unlimited_manager();
    for (const Material& material : materials(11025, kFrameLength)) {
        if (material.name == "silence") {
            continue;
        }
        append(manager.get(), material.words, 20000);
        const Features actual = newest_features(manager.get());
        const ideal::Features expected =
            ideal::analyse(ideal::Signal(material.words.begin(), material.words.end()));
        const double bound = material.name == "a sine"          ? 0.1
                             : material.name == "clipped music" ? 0.01
                                                                : 0.0005;
        for (size_t band = 0; band < kBands; ++band) {
            const double energy = expected.energy[band] * 0x1p-32;
            const double amplitude = expected.amplitude[band] * 0x1p-17;
            EXPECT_NEAR(energy, actual.energy[band], bound * energy) << material.name;
            EXPECT_NEAR(amplitude, actual.amplitude[band], bound * amplitude) << material.name;
        }
    }
}
