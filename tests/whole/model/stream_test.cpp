// The stream inside the fingerprinter, to the word: the ring of resampled samples, its positions
// and the features of every frame, however the bytes are cut.
#include "whole/model/fingerprint.hpp"

#include <algorithm>
#include <type_traits>

#include <gtest/gtest.h>

#include "support/twins.hpp"
#include "whole/model/material.hpp"
#include "whole/model/paths.hpp"

using namespace kz::model;

namespace {

template <class Path>
using Library =
    std::conditional_t<std::is_same_v<Path, FixedPath>, kz::test::Fixed, kz::test::Float>;

template <class Path>
class Twins {
public:
    Twins(const Ratio& ratio, Format format, size_t channels)
        : model_(ratio, format, channels, Path::filters(ratio)),
          library_(kz::test::make_fingerprinter<Library<Path>>(
              kz::test::Format{static_cast<uint32_t>(format)}, ratio.hertz,
              kz::test::Channels{static_cast<uint32_t>(channels)}))
    {
        std::fill_n(library_->ring, kFrameLength, 0); // the model's begins with zeros
    }

    /// True once both are complete.
    bool feed(std::span<const uint8_t> bytes)
    {
        uint8_t complete = 0;
        EXPECT_EQ(KZ_OK,
                  Library<Path>::add_samples(library_.get(), bytes.data(),
                                             static_cast<uint32_t>(bytes.size()), &complete));
        EXPECT_EQ(model_.feed(bytes), complete != 0);
        return complete != 0;
    }

    void compare_positions() const
    {
        ASSERT_EQ(model_.signal_offset(), library_->signal_offset);
        ASSERT_EQ(model_.write_position(), library_->write_position);
        ASSERT_EQ(model_.frame_start(), library_->frame_start);
        ASSERT_EQ(model_.features().size(), library_->frame_manager->frame_count);
    }

    void compare_words() const
    {
        compare_positions();
        ASSERT_TRUE(std::ranges::equal(model_.ring(), std::span(library_->ring, kFrameLength)));
        const auto* record = library_->frame_manager->records;
        for (const auto& features : model_.features()) {
            ASSERT_TRUE(std::ranges::equal(features.energy, std::span(record->energy, kBands)));
            ASSERT_TRUE(
                std::ranges::equal(features.amplitude, std::span(record->amplitude, kBands)));
            record = record->next;
        }
        ASSERT_EQ(nullptr, record);
    }

    size_t signal_offset() const { return model_.signal_offset(); }

private:
    typename Path::Road model_;
    kz::test::OwnedObject<Library<Path>> library_;
};

/// A hum too low to count, then noise.
std::vector<uint8_t> song(uint32_t rate, double hum, double seconds)
{
    std::vector<int16_t> samples = kz::test::sine(rate, 30, hum, 0.0012);
    const std::vector<int16_t> noise =
        kz::test::noise(static_cast<size_t>(seconds * rate), 0.7, rate);
    samples.insert(samples.end(), noise.begin(), noise.end());
    return to_bytes(samples);
}

} // namespace

template <class Path>
class Stream : public kz::test::MemoryOn {
};
TYPED_TEST_SUITE(Stream, Paths, PathNames);

TYPED_TEST(Stream, OneCallLeavesTheSameWords)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        for (const double seconds : {2.0, 6.1, 14.5}) {
            Twins<TypeParam> twins(ratio, Format::pcm16, 1);
            EXPECT_EQ(seconds > 14.2, twins.feed(song(ratio.hertz, 0.5, seconds)));
            twins.compare_words();
            ASSERT_FALSE(this->HasFatalFailure()) << ratio.hertz << " Hz, " << seconds << " s";
        }
    }
}

TYPED_TEST(Stream, LeadingSilenceEndsAtTheSameSample)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        for (const double hum : {0.001, 0.9, 2.9721, 3.4, 7.0}) {
            Twins<TypeParam> twins(ratio, Format::pcm16, 1);
            twins.feed(song(ratio.hertz, hum, 3.0));
            twins.compare_words();
            ASSERT_FALSE(this->HasFatalFailure()) << ratio.hertz << " Hz, " << hum << " s";
            EXPECT_NEAR(hum * 11025, static_cast<double>(twins.signal_offset()), 130);
        }
    }
}

TYPED_TEST(Stream, PiecesOfAnySizeLeaveTheSameWords)
{
    for (const Ratio& ratio : TypeParam::ratios()) {
        const std::vector<uint8_t> bytes = song(ratio.hertz, 3.2, 9.0);
        for (const uint32_t largest : {1u, 4u, 900u, 30000u}) {
            kz::test::Random random(largest + ratio.hertz);
            Twins<TypeParam> twins(ratio, Format::pcm16, 1);
            size_t pieces = 0;
            for (std::span<const uint8_t> rest = bytes; !rest.empty();) {
                const auto piece =
                    rest.first(std::min<size_t>(rest.size(), 2 * (1 + random.below(largest))));
                twins.feed(piece);
                twins.compare_positions();
                if (++pieces % 2000 == 0) {
                    twins.compare_words();
                }
                ASSERT_FALSE(this->HasFatalFailure()) << ratio.hertz << " Hz, piece " << pieces;
                rest = rest.subspan(piece.size());
            }
            twins.compare_words();
            ASSERT_FALSE(this->HasFatalFailure()) << ratio.hertz << " Hz, up to " << largest;
        }
    }
}

TYPED_TEST(Stream, EveryFormatLeavesTheSameWordsOfRandomBytes)
{
    kz::test::Random random(3);
    for (const Ratio& ratio : TypeParam::ratios()) {
        std::vector<uint8_t> bytes(ratio.hertz * 4 * 5);
        std::generate(bytes.begin(), bytes.end(),
                      [&random] { return static_cast<uint8_t>(random.next()); });
        for (const Format format : {Format::pcm8, Format::pcm16, Format::alaw, Format::ulaw}) {
            for (const size_t channels : {size_t{1}, size_t{2}}) {
                Twins<TypeParam> twins(ratio, format, channels);
                twins.feed(
                    std::span(bytes).first(bytes.size() / 4 * bytes_per_sample(format) * channels));
                twins.compare_words();
                ASSERT_FALSE(this->HasFatalFailure())
                    << ratio.hertz << " Hz, format " << static_cast<int>(format);
            }
        }
    }
}

// After 38 samples of silence the signal begins one sample into a block that fills the ring: there
// is room for one sample more, and at 8000 Hz the resampler makes it from what it holds already. A
// call that produces without consuming is not the end of the input.
TYPED_TEST(Stream, AnOutputThatNeedsNoInputDoesNotEndTheFeed)
{
    Twins<TypeParam> twins(kRatios[0], Format::pcm16, 1);
    twins.feed(to_bytes(std::vector<int16_t>(38, 0)));
    const size_t before = twins.signal_offset();
    std::vector<int16_t> samples(32, 0);
    const std::vector<int16_t> noise = kz::test::noise(40000, 0.7, 3);
    samples.insert(samples.end(), noise.begin(), noise.end());
    twins.feed(to_bytes(samples));
    EXPECT_EQ(before + 1, twins.signal_offset());
    twins.compare_words();
}
