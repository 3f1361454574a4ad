// The extraction interface: any configuration, any sound, in any pieces. Every call answers as its
// documentation says, and the document depends neither on where the bytes lie nor on the handle.

#include <algorithm>
#include <optional>

#include "fuzz.hpp"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"

namespace kz::fuzz {

namespace {

constexpr uint32_t kFixedRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};
constexpr uint32_t kOtherRates[] = {0, 1, 1000, 4000, 11024, 12345, 44056, 96000, 192000};
constexpr size_t kLongest = 3U << 20; ///< bytes of sound, so that every fingerprint gets complete
constexpr size_t kUsual = 1U << 16;   ///< so that most runs are short
constexpr size_t kSeconds = 60;       ///< at a rate of 1 Hz a few KB would last for hours

struct Job {
    test::Algorithm algorithm;
    test::Format format;
    uint32_t rate;
    test::Channels channels;

    uint32_t frame_bytes() const { return number(channels) * (format == test::pcm16 ? 2 : 1); }
    bool is_valid() const
    {
        const bool known = std::ranges::find(kFixedRates, rate) != std::end(kFixedRates);
        return (algorithm == test::fixed ? known : algorithm == test::floating) &&
               format >= test::pcm8 && format <= test::ulaw && rate != 0 &&
               (channels == test::mono || channels == test::stereo);
    }
    kz_status create(kz_fpx_handle** handle) const
    {
        return test::create(algorithm, format, rate, channels, handle);
    }
};

Job choose_job(Choices& choices)
{
    Job job{choices.ConsumeBool() ? test::fixed : test::floating,
            test::Format{choices.ConsumeIntegralInRange<uint32_t>(1, 4)},
            choices.PickValueInArray(kFixedRates),
            test::Channels{choices.ConsumeIntegralInRange<uint32_t>(1, 2)}};
    if (one_in(choices, 4)) {
        job.rate = choices.PickValueInArray(kOtherRates);
    }
    if (one_in(choices, 32)) {
        job = {test::Algorithm{choices.ConsumeIntegral<uint32_t>()},
               test::Format{choices.ConsumeIntegral<uint32_t>()}, 8000,
               test::Channels{choices.ConsumeIntegral<uint32_t>()}};
    }
    return job;
}

/// Sound of one kind; one byte of a sample after the other, whatever the format.
void add_stretch(Choices& choices, std::vector<uint8_t>& sound, size_t longest)
{
    const size_t count = std::min<size_t>(choices.ConsumeIntegral<uint16_t>() * size_t{4} + 1,
                                          longest - sound.size());
    const auto value = choices.ConsumeIntegral<uint8_t>();
    test::Random random(choices.ConsumeIntegral<uint16_t>());
    switch (choices.ConsumeIntegralInRange<int>(0, 3)) {
    case 0: // silence of the format, or a constant
        sound.insert(sound.end(), count, value);
        break;
    case 1: // noise
        std::generate_n(std::back_inserter(sound), count,
                        [&] { return static_cast<uint8_t>(random.next()); });
        break;
    case 2: // noise in the low byte, so quiet at 16 bits, and steps
        for (size_t i = 0; i < count; ++i) {
            sound.push_back(static_cast<uint8_t>(i % 2 == 0 ? random.next() : i / 64 % 2 * value));
        }
        break;
    default: {
        const auto bytes = choices.ConsumeBytes<uint8_t>(std::min<size_t>(count, 512));
        sound.insert(sound.end(), bytes.begin(), bytes.end());
    }
    }
}

std::vector<uint8_t> choose_sound(Choices& choices, const Job& job)
{
    const size_t longest =
        std::min(one_in(choices, 32) ? kLongest : kUsual, kSeconds * job.rate * job.frame_bytes());
    std::vector<uint8_t> sound;
    for (auto stretches = choices.ConsumeIntegralInRange<int>(0, 12); stretches > 0; --stretches) {
        add_stretch(choices, sound, longest);
    }
    return sound;
}

/// Bytes in each call.
std::vector<uint32_t> choose_pieces(Choices& choices, size_t size, uint32_t frame_bytes)
{
    const uint32_t usual = choices.ConsumeIntegralInRange<uint32_t>(1, 100000);
    std::vector<uint32_t> pieces;
    for (size_t left = size / frame_bytes; left > 0;) {
        const uint32_t frames =
            choices.remaining_bytes() > 0 ? choices.ConsumeIntegral<uint16_t>() + 1U : usual;
        const size_t taken = std::min<size_t>(left, frames);
        pieces.push_back(static_cast<uint32_t>(taken * frame_bytes));
        left -= taken;
    }
    return pieces;
}

void expect_refused_calls(kz_fpx_handle* handle, const Job& job)
{
    uint8_t complete = 7;
    const uint8_t bytes[4] = {};
    EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
              kz_fpx_fingerprint_add_audio(handle, bytes, 0, &complete));
    if (job.frame_bytes() > 1) {
        EXPECT_EQ(KZ_QV_ERROR_INVALID_ARGUMENT,
                  kz_fpx_fingerprint_add_audio(handle, bytes, 1, &complete));
    }
    EXPECT_NE(KZ_OK, kz_fpx_fingerprint_add_audio(handle, nullptr, 4, &complete));
}

std::string serialized(kz_fpx_handle* handle, bool complete)
{
    char* text = nullptr;
    const kz_status status = kz_fpx_fingerprint_serialize(handle, &text);
    EXPECT_EQ(complete ? KZ_OK : KZ_QV_ERROR_INCOMPLETE, status);
    EXPECT_EQ(complete, text != nullptr);
    std::string document = text != nullptr ? text : "";
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&text));
    EXPECT_EQ(nullptr, text);
    return document;
}

std::string document_of(kz_fpx_handle* handle, const std::vector<uint8_t>& sound,
                        const std::vector<uint32_t>& pieces, size_t offset)
{
    size_t at = 0;
    uint8_t complete = 0;
    for (const uint32_t piece : pieces) {
        const uint8_t before = complete;
        const Copy copy(sound.data() + at, piece, offset);
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(handle, copy.data(), piece, &complete));
        EXPECT_LE(before, complete) << "complete is for good";
        at += piece;
    }
    return serialized(handle, complete != 0);
}

} // namespace

void run(Choices& choices)
{
    const Job job = choose_job(choices);
    kz_fpx_handle* handle = nullptr;
    const kz_status status = job.create(&handle);
    ASSERT_EQ(job.is_valid(), status == KZ_OK);
    ASSERT_EQ(job.is_valid(), handle != nullptr);
    if (handle == nullptr) {
        return;
    }
    if (one_in(choices, 8)) {
        expect_refused_calls(handle, job);
    }
    const size_t offset = choices.ConsumeIntegralInRange<size_t>(0, 7);
    const auto sound = choose_sound(choices, job);
    const auto pieces = choose_pieces(choices, sound.size(), job.frame_bytes());
    const std::string document = document_of(handle, sound, pieces, offset);
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
    if (!document.empty()) {
        EXPECT_TRUE(document.starts_with("<?xml"));
        ASSERT_EQ(KZ_OK, job.create(&handle));
        EXPECT_EQ(document, document_of(handle, sound, pieces, 0));
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle));
    }
    EXPECT_EQ(nullptr, handle);
}

} // namespace kz::fuzz
