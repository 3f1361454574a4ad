// Histogram equalisation, to the word, and the rule of ranks that it stands for.
#include "whole/model/equaliser.hpp"

#include <numeric>

#include <gtest/gtest.h>

#include "kzsdk/qvfixed/qvfixed.h"
#include "support/allocation.hpp"
#include "whole/model/material.hpp"

using namespace kz::model;

namespace {

std::vector<int32_t> library_equalise2(std::span<const int32_t> samples, uint32_t levels)
{
    std::vector<int32_t> output(samples.size());
    std::vector<uint32_t> histogram(levels + 1);
    kzqvfixed_hist_eq2(samples.data(), output.data(), static_cast<uint32_t>(samples.size()),
                       histogram.data(), levels);
    return output;
}

std::vector<int32_t> library_equalise_dual(std::span<const int32_t> samples, size_t first,
                                           uint32_t levels)
{
    std::vector<int32_t> output(samples.size());
    std::vector<uint32_t> histogram(levels + 1);
    kzqvfixed_hist_eq_dual(samples.data(), static_cast<uint32_t>(first), samples.data() + first,
                           static_cast<uint32_t>(samples.size() - first), output.data(),
                           static_cast<uint32_t>(samples.size()), histogram.data(), levels);
    return output;
}

} // namespace

class ModelEqualiser : public kz::test::MemoryOn {};

TEST_F(ModelEqualiser, LibraryAgreesOnFramesOfEveryKind)
{
    for (const Material& material : materials(11025, 32768)) {
        const std::vector<int32_t> expected = equalise_unless_silent(material.words, 256);
        for (const size_t first : {size_t{32768}, size_t{21504}, size_t{1}, size_t{0}}) {
            EXPECT_EQ(expected, library_equalise_dual(material.words, first, 256))
                << material.name << " cut at " << first;
        }
        EXPECT_EQ(equalise(material.words, 256), library_equalise2(material.words, 256))
            << material.name;
    }
}

TEST_F(ModelEqualiser, LibraryAgreesForAnyNumberOfLevels)
{
    for (const uint32_t levels : numbers_of_levels()) {
        for (const int shift : {0, 3, 17, 31}) {
            const std::vector<int32_t> words = random_words(700, levels, shift);
            EXPECT_EQ(equalise(words, levels), library_equalise2(words, levels)) << levels;
            EXPECT_EQ(equalise_unless_silent(words, levels),
                      library_equalise_dual(words, 300, levels))
                << levels;
        }
    }
}

TEST_F(ModelEqualiser, LibraryAgreesForEveryRangeAroundPowersOfTwo)
{
    kz::test::Random random(7);
    for (int bits = 1; bits <= 31; ++bits) {
        for (int64_t offset = -3; offset <= 3; ++offset) {
            const int64_t range = (int64_t{1} << bits) + offset;
            std::vector<int32_t> words(500);
            for (int32_t& word : words) {
                word = static_cast<int32_t>(-(int64_t{1} << 30) +
                                            random.below(static_cast<uint32_t>(range + 1)));
            }
            words[20] = word(-(int64_t{1} << 30)); // both ends of the range are there
            words[400] = word(-(int64_t{1} << 30) + range);
            EXPECT_EQ(equalise(words, 256), library_equalise2(words, 256)) << range;
            EXPECT_EQ(equalise_unless_silent(words, 256), library_equalise_dual(words, 200, 256))
                << range;
        }
    }
}

TEST_F(ModelEqualiser, AFrameComesOutAsItsRanksAboutZero)
{
    const std::vector<int32_t> words = as_words(kz::test::tune(11025, 1, 3.0), 14);
    const auto frame = std::span(words).first(32768);
    const std::vector<int32_t> equalised = library_equalise_dual(frame, 32768, 256);
    EXPECT_EQ(0, std::accumulate(equalised.begin(), equalised.end(), int64_t{0}));
    for (size_t i = 1; i < frame.size(); ++i) {
        const bool in_order = frame[i - 1] <= frame[i] ? equalised[i - 1] <= equalised[i]
                                                       : equalised[i - 1] >= equalised[i];
        ASSERT_TRUE(in_order) << i;
    }
}
