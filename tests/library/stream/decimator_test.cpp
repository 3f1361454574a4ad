// Rates above those of the fingerprinter: each halving is the 2:1 filter, block by block, and what
// comes out is the music at the lower rate.

#include <cmath>

#include "kzsdk/stream/decimator.hpp"
#include "library/stream/streams.hpp"
#include "support/allocation.hpp"

namespace kz::test {

namespace {

class Decimation : public MemoryOn {};

struct DestroyDecimator {
    void operator()(stream::Decimator* decimator) const
    {
        decimator->destroy();
        delete decimator;
    }
};
using Decimator = std::unique_ptr<stream::Decimator, DestroyDecimator>;

Decimator make(uint32_t halvings, uint32_t channels)
{
    Decimator decimator(new stream::Decimator{});
    EXPECT_TRUE(decimator->make(halvings, channels));
    return decimator;
}

// Interleaved frames through a decimator, block by block.
std::vector<int16_t> decimated(const std::vector<int16_t>& samples, uint32_t halvings,
                               uint32_t channels)
{
    const Decimator decimator = make(halvings, channels);
    std::vector<int16_t> all;
    const size_t frames = samples.size() / channels;
    for (size_t at = 0; at < frames;) {
        const auto count = static_cast<uint32_t>(std::min<size_t>(decimator->room(), frames - at));
        decimator->collect(samples.data() + at * channels, count);
        at += count;
        const auto part = decimator->decimate();
        all.insert(all.end(), part.begin(), part.end());
    }
    return all;
}

// The rule written out: Q29 words through the library's 2:1 resampler, rounded at the end.
std::vector<int16_t> by_the_rule(const std::vector<int16_t>& mono, uint32_t halvings)
{
    std::vector<KZDSP_resampler_fixed*> filters;
    for (uint32_t n = 0; n < halvings; ++n) {
        filters.push_back(KZDSP_resampler_fixed_create(2U << 15, 1U << 15));
    }
    std::vector<int16_t> all;
    for (size_t at = 0; at < mono.size(); at += 4096) {
        std::vector<int32_t> words(
            mono.begin() + static_cast<std::ptrdiff_t>(at),
            mono.begin() + static_cast<std::ptrdiff_t>(std::min(mono.size(), at + 4096)));
        std::ranges::transform(words, words.begin(), [](int32_t s) { return s * 16384; });
        for (auto* filter : filters) {
            std::vector<int32_t> next(words.size() + 1);
            uint32_t used = 0;
            uint32_t made = 0;
            for (size_t done = 0, total = 0; done < words.size(); done += used, total += made) {
                KZDSP_resampler_fixed_resample(
                    filter, words.data() + done, static_cast<uint32_t>(words.size() - done),
                    next.data() + total, static_cast<uint32_t>(next.size() - total), &used, &made);
                if (used == words.size() - done) {
                    next.resize(total + made);
                    break;
                }
            }
            words = next;
        }
        for (const int32_t word : words) {
            const double exact = word / std::exp2(14 - static_cast<int>(halvings));
            all.push_back(
                static_cast<int16_t>(std::clamp(std::floor(exact + 0.5), -32768.0, 32767.0)));
        }
    }
    std::ranges::for_each(filters, KZDSP_resampler_fixed_destroy);
    return all;
}

std::vector<int16_t> channel_of(const std::vector<int16_t>& samples, size_t channel)
{
    std::vector<int16_t> one;
    for (size_t i = channel; i < samples.size(); i += 2) {
        one.push_back(samples[i]);
    }
    return one;
}

// The largest sample once the filters are full.
int32_t peak(const std::vector<int16_t>& samples)
{
    int32_t largest = 0;
    for (size_t i = samples.size() / 4; i < samples.size(); ++i) {
        largest = std::max(largest, std::abs(int32_t{samples[i]}));
    }
    return largest;
}

} // namespace

TEST_F(Decimation, FollowsTheRuleInEveryBit)
{
    for (uint32_t halvings = 1; halvings <= stream::kMaxHalvings; ++halvings) {
        const auto mono = noise(30011, 1.0, halvings);
        EXPECT_EQ(by_the_rule(mono, halvings), decimated(mono, halvings, 1)) << halvings;
    }
}

TEST_F(Decimation, KeepsChannelsApart)
{
    const auto stereo = noise(30000, 0.9, 5);
    const auto both = decimated(stereo, 2, 2);
    for (const size_t channel : {0U, 1U}) {
        EXPECT_EQ(decimated(channel_of(stereo, channel), 2, 1), channel_of(both, channel));
    }
}

TEST_F(Decimation, KeepsWhatTheFingerprintHears)
{
    for (uint32_t halvings = 1; halvings <= stream::kMaxHalvings; ++halvings) {
        const uint32_t rate = 48000U << halvings;
        for (const double hertz : {100.0, 1000.0, 2700.0}) {
            const auto out = decimated(sine(rate, hertz, 0.5, 0.5), halvings, 1);
            EXPECT_NEAR(16384, peak(out), 164) << hertz << " Hz from " << rate;
            EXPECT_NEAR(24000, static_cast<double>(out.size()), 40);
        }
    }
}

// Sound near the lower rate would come back as low tones: at least 50 dB are taken off it.
TEST_F(Decimation, DropsWhatWouldFoldIntoTheBands)
{
    for (uint32_t halvings = 1; halvings <= stream::kMaxHalvings; ++halvings) {
        const uint32_t rate = 48000U << halvings;
        for (const double hertz : {rate / 2.0 - 300, rate / 2.0 - 2700}) {
            EXPECT_LT(peak(decimated(sine(rate, hertz, 0.5, 0.9), halvings, 1)), 93)
                << hertz << " Hz from " << rate;
        }
    }
}

// A square wave at full scale overshoots: it is clipped, not wrapped.
TEST_F(Decimation, ClipsAtFullScale)
{
    std::vector<int16_t> square(40000);
    for (size_t i = 0; i < square.size(); ++i) {
        square[i] = i / 37 % 2 == 0 ? int16_t{32767} : int16_t{-32768};
    }
    for (uint32_t halvings = 1; halvings <= stream::kMaxHalvings; ++halvings) {
        const auto out = decimated(square, halvings, 1);
        EXPECT_EQ(32767, *std::ranges::max_element(out)) << halvings;
        EXPECT_EQ(-32768, *std::ranges::min_element(out)) << halvings;
    }
}

// The filter's taps sum to less than 1 in magnitude, so no word can pass 2^29.
TEST_F(Decimation, HasNoSumThatCanWrap)
{
    const int16_t* const msb = kzdsp_get_22050_11025_fixed_coeff_msb();
    const uint16_t* const lsb = kzdsp_get_22050_11025_fixed_coeff_lsb();
    double sum = 0;
    for (uint32_t i = 0; i < kzdsp_get_22050_11025_fixed_coeff_length(); ++i) {
        sum += std::abs((msb[i] * 65536.0 + lsb[i]) / 0x1p31);
    }
    EXPECT_LT(sum / 2, 0.99) << "the filter's words come out at half level";
}

// From end to end: the document of 96000 Hz is that of the decimated words at 48000 Hz.
TEST_F(Decimation, GivesTheDocumentOfTheLowerRate)
{
    for (const uint32_t channels : {1U, 2U}) {
        const auto samples = music(96000, channels, 0.5, 15, channels);
        const Bytes sound = bytes_of(samples);
        const Stream stream =
            create(settings_of(KZ_FPX_ALGORITHM_FIXED, KZ_STREAM_FORMAT_PCM16, 96000, channels));
        EXPECT_TRUE(feed(stream.get(), sound.data(), sound.size()).complete);
        const auto lower = decimated(samples, 1, channels);
        EXPECT_EQ(document_of_one_call(KZ_FPX_ALGORITHM_FIXED, KZ_FPX_FORMAT_PCM16, 48000, channels,
                                       lower.data(), lower.size() * 2),
                  document_of(stream.get()));
    }
}

// And close to that of the same music recorded at the lower rate.
TEST_F(Decimation, ComesCloseToTheMusicAtTheLowerRate)
{
    const auto values = [](uint32_t rate) {
        const Bytes sound = bytes_of(tune(rate, 1, 15));
        const Stream stream =
            create(settings_of(KZ_FPX_ALGORITHM_FIXED, KZ_STREAM_FORMAT_PCM16, rate, 1));
        feed(stream.get(), sound.data(), sound.size());
        std::vector<int16_t> found(30);
        uint32_t count = 0;
        EXPECT_EQ(KZ_OK, kz_stream_get_values(stream.get(), found.data(), 30, &count));
        return found;
    };
    const auto native = values(48000);
    for (const uint32_t rate : {96000U, 192000U}) {
        const auto decimated_values = values(rate);
        for (size_t i = 0; i < native.size(); ++i) {
            EXPECT_NEAR(native[i], decimated_values[i], 40) << rate << " Hz, value " << i;
        }
    }
}

TEST_F(Decimation, MakesNothingOfNothing)
{
    const Decimator none = make(0, 2);
    EXPECT_EQ(nullptr, none->block);
    const Decimator some = make(2, 1);
    EXPECT_TRUE(some->decimate().empty());
}

} // namespace kz::test
