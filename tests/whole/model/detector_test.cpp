// The search for signal, block by block.
#include "whole/model/detector.hpp"

#include <memory>

#include <gtest/gtest.h>

#include "kzsdk/qvfixed/qvfixed.h"
#include "support/allocation.hpp"
#include "whole/model/material.hpp"

using namespace kz::model;

namespace {

struct Destroy {
    void operator()(kzqvfixed_signal_detector* detector) const
    {
        kzqvfixed_signal_detector_destroy(detector);
    }
};
using LibraryDetector = std::unique_ptr<kzqvfixed_signal_detector, Destroy>;

struct Pair {
    Pair(uint32_t window, uint32_t threshold, int32_t max_deviation)
        : model(window, threshold, max_deviation),
          library(kzqvfixed_signal_detector_create(window, threshold, max_deviation))
    {
    }

    void expect_same_offset(std::span<const int32_t> block, uint32_t shift)
    {
        ASSERT_EQ(model.offset_in(block, shift),
                  kzqvfixed_signal_detector_get_signal_offset(library.get(), block.data(),
                                                              static_cast<uint32_t>(block.size()),
                                                              static_cast<int32_t>(shift)));
    }

    Detector model;
    LibraryDetector library;
};

/// Silence of `quiet` words, then the rest of a tune.
std::vector<int32_t> late_music(size_t quiet, double level)
{
    std::vector<int32_t> words = as_words(kz::test::tune(11025, 1, 1.0, level, quiet), 14);
    std::fill_n(words.begin(), quiet, 0);
    return words;
}

} // namespace

class ModelDetector : public kz::test::MemoryOn {};

TEST_F(ModelDetector, LibraryFindsTheSameStartInOneBlock)
{
    for (size_t quiet = 0; quiet < 8000; quiet += 1 + quiet / 3) {
        for (const double level : {0.01, 0.03, 0.1, 0.5, 3.0}) {
            Pair pair(128, 100, 1000);
            pair.expect_same_offset(late_music(quiet, level), 13);
        }
    }
}

TEST_F(ModelDetector, LibraryAgreesOnAllMaterialInRandomBlocks)
{
    kz::test::Random random(1);
    for (const Material& material : materials(11025, 12000)) {
        for (const uint32_t largest : {2u, 60u, 1000u}) {
            for (const uint32_t window : {1u, 2u, 7u, 128u, 1000u}) {
                Pair pair(window, 100, 1000);
                for (std::span<const int32_t> rest = material.words; !rest.empty();) {
                    const auto block =
                        rest.first(std::min<size_t>(rest.size(), random.below(largest + 1)));
                    pair.expect_same_offset(block, 13);
                    rest = rest.subspan(block.size());
                    if (random.below(50) == 0) {
                        pair.model.reset();
                        kzqvfixed_signal_detector_reset(pair.library.get());
                    }
                }
                ASSERT_FALSE(HasFatalFailure()) << material.name << ", window " << window;
            }
        }
    }
}

TEST_F(ModelDetector, LibraryAgreesAtEveryShift)
{
    for (uint32_t shift = 0; shift <= 31; ++shift) {
        Pair pair(128, 100, 1000);
        pair.expect_same_offset(random_words(2000, shift), shift);
        pair.expect_same_offset(late_music(300, 0.2), shift);
    }
}

// Levels of a few units and low thresholds: here it shows that samples and means are cut towards
// zero.
TEST_F(ModelDetector, LibraryAgreesOnTheSmallestLevels)
{
    kz::test::Random random(2);
    for (int round = 0; round < 2000; ++round) {
        const uint32_t window = 1 + random.below(40);
        Pair pair(window, random.below(4), static_cast<int32_t>(random.below(8)));
        const int shift = 12 + static_cast<int>(random.below(6)); // levels of 64 down to 2
        const std::vector<int32_t> words = random_words(200, random.next64(), shift);
        pair.expect_same_offset(std::span(words).first(random.below(100)), 13);
        pair.expect_same_offset(std::span(words).last(100), 13);
    }
}
