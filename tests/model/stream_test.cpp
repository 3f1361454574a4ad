// The stream inside the fingerprinter, to the word: the ring of resampled samples, its positions
// and the features of every frame, however the bytes are cut.
#include "model/fingerprint.hpp"

#include <algorithm>
#include <memory>

#include <gtest/gtest.h>

#include "kzsdk/qvfixed/qvfixed.h"
#include "model/library_taps.hpp"
#include "model/material.hpp"
#include "support/allocation.hpp"

using namespace kz::model;

namespace {

struct Destroy {
    void operator()(kzqvfixed_fingerprinter* object) const { kzqvfixed_destructor(object); }
};

class Twins {
public:
    Twins(const Ratio& ratio, Format format, size_t channels)
        : model_(ratio, format, channels, library_filters(ratio))
    {
        kzqvfixed_fingerprinter* made = nullptr;
        EXPECT_EQ(KZ_OK, kzqvfixed_constructor(1, ratio.hertz, static_cast<uint32_t>(format),
                                               static_cast<uint32_t>(channels), &made));
        library_.reset(made);
        std::fill_n(made->ring, kFrameLength, 0); // the model's begins with zeros
    }

    /// True once both are complete.
    bool feed(std::span<const uint8_t> bytes)
    {
        uint8_t complete = 0;
        EXPECT_EQ(KZ_OK, kzqvfixed_add_samples(library_.get(), bytes.data(),
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
        const kzqvfixed_frame_record* record = library_->frame_manager->records;
        for (const Features& features : model_.features()) {
            ASSERT_TRUE(std::ranges::equal(features.energy, std::span(record->energy, kBands)));
            ASSERT_TRUE(
                std::ranges::equal(features.amplitude, std::span(record->amplitude, kBands)));
            record = record->next;
        }
        ASSERT_EQ(nullptr, record);
    }

    size_t signal_offset() const { return model_.signal_offset(); }

private:
    Fingerprint model_;
    std::unique_ptr<kzqvfixed_fingerprinter, Destroy> library_;
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

class Stream : public kz::test::MemoryOn {};

TEST_F(Stream, OneCallLeavesTheSameWords)
{
    for (const Ratio& ratio : kRatios) {
        for (const double seconds : {2.0, 6.1, 14.5}) {
            Twins twins(ratio, Format::pcm16, 1);
            EXPECT_EQ(seconds > 14.2, twins.feed(song(ratio.hertz, 0.5, seconds)));
            twins.compare_words();
            ASSERT_FALSE(HasFatalFailure()) << ratio.hertz << " Hz, " << seconds << " s";
        }
    }
}

TEST_F(Stream, LeadingSilenceEndsAtTheSameSample)
{
    for (const Ratio& ratio : kRatios) {
        for (const double hum : {0.001, 0.9, 2.9721, 3.4, 7.0}) {
            Twins twins(ratio, Format::pcm16, 1);
            twins.feed(song(ratio.hertz, hum, 3.0));
            twins.compare_words();
            ASSERT_FALSE(HasFatalFailure()) << ratio.hertz << " Hz, " << hum << " s";
            EXPECT_NEAR(hum * 11025, static_cast<double>(twins.signal_offset()), 130);
        }
    }
}

TEST_F(Stream, PiecesOfAnySizeLeaveTheSameWords)
{
    for (const Ratio& ratio : kRatios) {
        const std::vector<uint8_t> bytes = song(ratio.hertz, 3.2, 9.0);
        for (const uint32_t largest : {1u, 4u, 900u, 30000u}) {
            kz::test::Random random(largest + ratio.hertz);
            Twins twins(ratio, Format::pcm16, 1);
            size_t pieces = 0;
            for (std::span<const uint8_t> rest = bytes; !rest.empty();) {
                const auto piece =
                    rest.first(std::min<size_t>(rest.size(), 2 * (1 + random.below(largest))));
                twins.feed(piece);
                twins.compare_positions();
                if (++pieces % 2000 == 0) {
                    twins.compare_words();
                }
                ASSERT_FALSE(HasFatalFailure()) << ratio.hertz << " Hz, piece " << pieces;
                rest = rest.subspan(piece.size());
            }
            twins.compare_words();
            ASSERT_FALSE(HasFatalFailure()) << ratio.hertz << " Hz, up to " << largest;
        }
    }
}

TEST_F(Stream, EveryFormatLeavesTheSameWordsOfRandomBytes)
{
    kz::test::Random random(3);
    for (const Ratio& ratio : kRatios) {
        std::vector<uint8_t> bytes(ratio.hertz * 4 * 5);
        std::generate(bytes.begin(), bytes.end(),
                      [&random] { return static_cast<uint8_t>(random.next()); });
        for (const Format format : {Format::pcm8, Format::pcm16, Format::alaw, Format::ulaw}) {
            for (const size_t channels : {size_t{1}, size_t{2}}) {
                Twins twins(ratio, format, channels);
                twins.feed(
                    std::span(bytes).first(bytes.size() / 4 * bytes_per_sample(format) * channels));
                twins.compare_words();
                ASSERT_FALSE(HasFatalFailure())
                    << ratio.hertz << " Hz, format " << static_cast<int>(format);
            }
        }
    }
}

// After 38 samples of silence the signal begins one sample into a block that fills the ring: there
// is room for one sample more, and at 8000 Hz the resampler makes it from what it holds already. A
// call that produces without consuming is not the end of the input.
TEST_F(Stream, AnOutputThatNeedsNoInputDoesNotEndTheFeed)
{
    Twins twins(kRatios[0], Format::pcm16, 1);
    twins.feed(to_bytes(std::vector<int16_t>(38, 0)));
    const size_t before = twins.signal_offset();
    std::vector<int16_t> samples(32, 0);
    const std::vector<int16_t> noise = kz::test::noise(40000, 0.7, 3);
    samples.insert(samples.end(), noise.begin(), noise.end());
    twins.feed(to_bytes(samples));
    EXPECT_EQ(before + 1, twins.signal_offset());
    twins.compare_words();
}
