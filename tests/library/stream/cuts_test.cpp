// The stream's promise: the same sound gives the same document to the bit, however it is cut, and
// where the extraction interface takes the sound it is the document of one call.

#include "library/stream/streams.hpp"
#include "support/allocation.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kFixed = KZ_FPX_ALGORITHM_FIXED;
constexpr uint32_t kFloat = KZ_FPX_ALGORITHM_FLOAT;
constexpr uint32_t kRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};
constexpr double kSilences[] = {0, 0.013, 2.9, 7.3};

struct Outcome {
    std::string document;
    uint64_t used = 0;
    kz_stream_state state{};
};

void expect_equal(const Outcome& a, const Outcome& b)
{
    EXPECT_EQ(a.document, b.document);
    EXPECT_EQ(a.used, b.used) << "where the stream ended depends on the cuts";
    EXPECT_EQ(0, std::memcmp(&a.state, &b.state, sizeof a.state));
}

// Feeds pieces of the sizes that `next_size(random)` gives, and finishes.
template <class NextSize>
Outcome run(const kz_stream_settings& settings, const Bytes& sound, NextSize next_size)
{
    const Stream stream = create(settings);
    Outcome outcome;
    bool complete = false;
    for (size_t at = 0; at < sound.size() && !complete;) {
        const size_t count = std::min<size_t>(next_size(), sound.size() - at);
        // A copy of its own: a read beside it is seen, and it starts at any address.
        const Bytes piece(sound.begin() + static_cast<std::ptrdiff_t>(at),
                          sound.begin() + static_cast<std::ptrdiff_t>(at + count));
        const Taken taken = feed(stream.get(), piece.data(), count);
        outcome.used += taken.used;
        complete = taken.complete;
        at += count;
    }
    EXPECT_EQ(finish(stream.get()), state_of(stream.get()).phase == KZ_STREAM_COMPLETE);
    outcome.document = document_of(stream.get());
    outcome.state = state_of(stream.get());
    return outcome;
}

Outcome run_whole(const kz_stream_settings& settings, const Bytes& sound)
{
    return run(settings, sound, [&] { return sound.size(); });
}

// From single bytes to several seconds, mixed.
Outcome run_at_random(const kz_stream_settings& settings, const Bytes& sound, uint64_t seed)
{
    Random random(seed);
    return run(settings, sound, [&random]() -> size_t {
        const uint32_t kind = random.below(64);
        if (kind < 8) {
            return random.below(9);
        }
        return kind < 60 ? random.below(1U << 14) : random.below(1U << 21);
    });
}

// 16-bit sound in another format: in a wider one so that it comes back as it was; one of bytes gets
// the upper ones, which are noise of another kind.
Bytes in_format(const std::vector<int16_t>& samples, uint32_t format)
{
    std::vector<int32_t> words(samples.begin(), samples.end());
    Bytes bytes;
    switch (format) {
    case KZ_STREAM_FORMAT_PCM24:
        for (const int32_t word : words) {
            const int32_t wide = word * 256 + (word & 0xff);
            uint8_t raw[4];
            std::memcpy(raw, &wide, 4);
            const size_t first = std::endian::native == std::endian::little ? 0 : 1;
            bytes.insert(bytes.end(), raw + first, raw + first + 3);
        }
        return bytes;
    case KZ_STREAM_FORMAT_PCM32:
        std::ranges::transform(words, words.begin(), [](int32_t w) { return w * 65536 + 40000; });
        return bytes_of(words);
    case KZ_STREAM_FORMAT_FLOAT32: {
        std::vector<float> floats(samples.begin(), samples.end());
        std::ranges::transform(floats, floats.begin(), [](float s) { return s / 32768; });
        return bytes_of(floats);
    }
    case KZ_STREAM_FORMAT_FLOAT64: {
        std::vector<double> doubles(samples.begin(), samples.end());
        std::ranges::transform(doubles, doubles.begin(), [](double s) { return s / 32768; });
        return bytes_of(doubles);
    }
    case KZ_STREAM_FORMAT_PCM16:
        return bytes_of(samples);
    default:
        std::ranges::transform(words, std::back_inserter(bytes),
                               [](int32_t w) { return static_cast<uint8_t>(w >> 8); });
        return bytes;
    }
}

class Cuts : public ::testing::TestWithParam<uint32_t> {
protected:
    void SetUp() override
    {
        ASSERT_EQ(KZ_OK, kzinit_acquire()); // for the extraction interface
        before_ = live_blocks();
    }
    void TearDown() override
    {
        EXPECT_EQ(before_, live_blocks()) << "blocks were leaked";
        EXPECT_EQ(KZ_OK, kzinit_release());
    }

private:
    int64_t before_ = 0;
};

} // namespace

// The rates of the extraction interface x its formats x mono and stereo x leading silence.
TEST_P(Cuts, NeverShowAndAreThoseOfOneCall)
{
    const uint32_t algorithm = GetParam();
    uint64_t seed = algorithm;
    for (const uint32_t rate : kRates) {
        for (const double silence : kSilences) {
            const auto format = static_cast<uint32_t>(1 + ++seed % 4);
            const auto channels = static_cast<uint32_t>(1 + seed / 4 % 2);
            const auto samples = music(rate, channels, silence, 15, seed);
            const Bytes sound = in_format(samples, format);
            const auto settings = settings_of(algorithm, format, rate, channels);
            const Outcome whole = run_whole(settings, sound);
            EXPECT_EQ(
                document_of_one_call(algorithm, format, rate, channels, sound.data(), sound.size()),
                whole.document)
                << rate << " Hz, format " << format;
            EXPECT_NE("", whole.document);
            expect_equal(whole, run_at_random(settings, sound, seed));
        }
    }
}

// Wider formats of the same sound give the document of the 16-bit one, whatever the cuts.
TEST_P(Cuts, NeverShowInWiderFormats)
{
    const uint32_t algorithm = GetParam();
    uint64_t seed = 100 + algorithm;
    for (const uint32_t format :
         {KZ_STREAM_FORMAT_PCM16, KZ_STREAM_FORMAT_PCM24, KZ_STREAM_FORMAT_PCM32,
          KZ_STREAM_FORMAT_FLOAT32, KZ_STREAM_FORMAT_FLOAT64}) {
        for (const double silence : {0.0, 3.7}) {
            const uint32_t rate = kRates[++seed % std::size(kRates)];
            const auto channels = static_cast<uint32_t>(1 + seed % 2);
            const auto samples = music(rate, channels, silence, 15, seed);
            const Bytes sound = in_format(samples, format);
            const auto settings = settings_of(algorithm, format, rate, channels);
            const Outcome cut = run_at_random(settings, sound, seed);
            EXPECT_EQ(document_of_one_call(algorithm, KZ_FPX_FORMAT_PCM16, rate, channels,
                                           samples.data(), samples.size() * 2),
                      cut.document)
                << rate << " Hz, format " << format;
            expect_equal(run_whole(settings, sound), cut);
        }
    }
}

// Channels that are mixed down and rates that are decimated: frames longer than many pieces.
TEST_P(Cuts, NeverShowInManyChannelsAndHighRates)
{
    const uint32_t algorithm = GetParam();
    uint64_t seed = 200 + algorithm;
    struct Kind {
        uint32_t rate, channels, format;
    };
    for (const Kind& kind :
         {Kind{8000, 3, KZ_STREAM_FORMAT_PCM16}, Kind{11025, 6, KZ_STREAM_FORMAT_PCM24},
          Kind{22050, 8, KZ_STREAM_FORMAT_FLOAT32}, Kind{16000, 5, KZ_STREAM_FORMAT_ALAW},
          Kind{64000, 1, KZ_STREAM_FORMAT_PCM16}, Kind{88200, 2, KZ_STREAM_FORMAT_PCM24},
          Kind{96000, 2, KZ_STREAM_FORMAT_FLOAT32}, Kind{176400, 1, KZ_STREAM_FORMAT_ULAW},
          Kind{192000, 3, KZ_STREAM_FORMAT_PCM16}}) {
        for (const double silence : {0.0, 3.7}) {
            const auto samples = music(kind.rate, kind.channels, silence, 15, ++seed);
            const Bytes sound = in_format(samples, kind.format);
            const auto settings = settings_of(algorithm, kind.format, kind.rate, kind.channels);
            const Outcome whole = run_whole(settings, sound);
            EXPECT_NE("", whole.document) << kind.rate;
            expect_equal(whole, run_at_random(settings, sound, seed));
        }
    }
}

// The same where the sound ends too early: state and all.
TEST_P(Cuts, NeverShowInStreamsThatEndEarly)
{
    Random random(GetParam());
    for (int round = 0; round < 24; ++round) {
        const uint32_t rate = kRates[random.below(std::size(kRates))] * (round < 20 ? 1U : 2U);
        const uint32_t channels = 1 + random.below(3);
        const double silence = random.below(3) * 2.1;
        auto sound = bytes_of(music(rate, channels, silence, random.below(14000) / 1000.0, 7));
        sound.resize(sound.size() - std::min<size_t>(sound.size(), random.below(7)));
        const auto settings = settings_of(GetParam(), KZ_STREAM_FORMAT_PCM16, rate, channels);
        const Outcome whole = run_whole(settings, sound);
        EXPECT_EQ("", whole.document);
        EXPECT_EQ(sound.size() % (2U * channels), whole.state.partial_frame_bytes);
        expect_equal(whole, run_at_random(settings, sound, 1000U + random.below(1000)));
    }
}

INSTANTIATE_TEST_SUITE_P(Of, Cuts, ::testing::Values(kFixed, kFloat), [](const auto& tested) {
    return std::string(tested.param == kFixed ? "Fixed" : "Float");
});

} // namespace kz::test
