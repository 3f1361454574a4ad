// Streams: any settings, any bytes, in any cuts. Every call answers as its documentation says, the
// outcome does not depend on the cuts, and where the extraction interface takes the sound the
// document is that of one call.

#include <algorithm>
#include <memory>
#include <string>

#include "fuzz.hpp"
#include "kzsdk/abs/startup.h"
#include "kzsdk/stream/stream.h"
#include "support/signals.hpp"

namespace kz::fuzz {

namespace {

constexpr uint32_t kRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};
constexpr size_t kLongest = 3U << 20; ///< bytes of sound
constexpr size_t kUsual = 1U << 16;   ///< so that most runs are short
constexpr size_t kSeconds = 60;       ///< at a rate of 1 Hz a few KB would last for hours

struct FreeStream {
    void operator()(kz_stream* stream) const { kz_stream_free(&stream); }
};
using Stream = std::unique_ptr<kz_stream, FreeStream>;

kz_stream_settings choose_settings(Choices& choices)
{
    kz_stream_settings settings;
    EXPECT_EQ(KZ_OK, kz_stream_initialize_settings(&settings));
    settings.algorithm = choices.ConsumeBool() ? 1U : 2U;
    settings.format = choices.ConsumeIntegralInRange<uint32_t>(1, 9);
    settings.sample_rate = choices.PickValueInArray(kRates)
                           << choices.ConsumeIntegralInRange<uint32_t>(0, 4);
    settings.channels = choices.ConsumeIntegralInRange<uint32_t>(1, 8);
    if (one_in(choices, 16)) {
        // Filters for rates beyond that take long to design.
        settings.sample_rate = choices.ConsumeIntegral<uint32_t>() % 100000;
        settings.channels = choices.ConsumeIntegral<uint32_t>();
    }
    if (one_in(choices, 64)) {
        settings.algorithm = choices.ConsumeIntegral<uint32_t>();
        settings.format = choices.ConsumeIntegral<uint32_t>();
        settings.reserved[choices.ConsumeIntegralInRange<size_t>(0, 11)] =
            choices.ConsumeIntegral<uint8_t>();
    }
    return settings;
}

Stream create(const kz_stream_settings& settings, kz_status& status)
{
    kz_stream* stream = nullptr;
    status = kz_stream_create(&settings, &stream);
    EXPECT_EQ(status == KZ_OK, stream != nullptr);
    return Stream(stream);
}

/// Stretches of one byte and of noise, and bytes of the fuzzer's.
std::vector<uint8_t> choose_sound(Choices& choices, const kz_stream_settings& settings)
{
    const uint64_t bytes_per_second = uint64_t{settings.sample_rate} * settings.channels * 4;
    const auto longest = static_cast<size_t>(
        std::min<uint64_t>(one_in(choices, 32) ? kLongest : kUsual, bytes_per_second * kSeconds));
    std::vector<uint8_t> sound;
    for (auto stretches = choices.ConsumeIntegralInRange<int>(0, 12); stretches > 0; --stretches) {
        const size_t count = std::min<size_t>(choices.ConsumeIntegral<uint16_t>() * size_t{4} + 1,
                                              longest - sound.size());
        const auto value = choices.ConsumeIntegral<uint8_t>();
        test::Random random(choices.ConsumeIntegral<uint16_t>());
        switch (choices.ConsumeIntegralInRange<int>(0, 2)) {
        case 0:
            sound.insert(sound.end(), count, value);
            break;
        case 1:
            std::generate_n(std::back_inserter(sound), count,
                            [&random] { return static_cast<uint8_t>(random.next()); });
            break;
        default: {
            const auto bytes = choices.ConsumeBytes<uint8_t>(std::min<size_t>(count, 512));
            sound.insert(sound.end(), bytes.begin(), bytes.end());
        }
        }
    }
    return sound;
}

struct Outcome {
    uint64_t used = 0;
    kz_stream_state state{};
    std::string document;
};

void expect_state_in_order(const kz_stream_state& state, bool complete)
{
    EXPECT_EQ(complete, state.phase == KZ_STREAM_COMPLETE);
    EXPECT_NE(uint32_t{KZ_STREAM_FAILED}, state.phase);
    EXPECT_EQ(complete, state.missing_milliseconds == 0);
    EXPECT_EQ(complete, state.percent == 100);
    EXPECT_LE(state.missing_milliseconds, KZ_FPX_MILLISECONDS_NEEDED);
}

/// Feeds pieces of the sizes that `next_size()` gives, finishes and looks.
template <class NextSize>
Outcome outcome_of(kz_stream* stream, const std::vector<uint8_t>& sound, NextSize next_size)
{
    Outcome outcome;
    uint8_t complete = 0;
    for (size_t at = 0; at < sound.size();) {
        const size_t count = std::min<size_t>(next_size(), sound.size() - at);
        const Copy copy(sound.data() + at, count, at % 8);
        const uint8_t before = complete;
        uint64_t used = 0;
        EXPECT_EQ(KZ_OK, kz_stream_feed(stream, copy.data(), count, &used, &complete));
        EXPECT_LE(before, complete) << "complete is for good";
        EXPECT_LE(used, count);
        EXPECT_TRUE(used == count || complete == 1) << "bytes were left without need";
        outcome.used += used;
        at += count;
    }
    EXPECT_EQ(KZ_OK, kz_stream_finish(stream, &complete));
    EXPECT_EQ(KZ_OK, kz_stream_get_state(stream, &outcome.state));
    expect_state_in_order(outcome.state, complete == 1);
    const char* text = nullptr;
    EXPECT_EQ(complete == 1 ? KZ_OK : KZ_QV_ERROR_INCOMPLETE,
              kz_stream_get_document(stream, &text));
    int16_t values[30];
    uint32_t count = 0;
    EXPECT_EQ(complete == 1 ? KZ_OK : KZ_QV_ERROR_INCOMPLETE,
              kz_stream_get_values(stream, values, 30, &count));
    outcome.document = text != nullptr ? text : "";
    return outcome;
}

/// "" when it is not complete, or when the extraction interface does not take the sound as it is.
std::string document_of_one_call(const kz_stream_settings& settings,
                                 const std::vector<uint8_t>& sound)
{
    kz_fpx_handle* handle = nullptr;
    uint8_t complete = 0;
    std::string document;
    if (settings.format <= KZ_STREAM_FORMAT_ULAW &&
        kz_fpx_fingerprint_create(settings.algorithm, settings.format, settings.sample_rate,
                                  settings.channels, &handle) == KZ_OK) {
        const size_t frame_bytes =
            settings.channels * (settings.format == KZ_STREAM_FORMAT_PCM16 ? 2U : 1U);
        const size_t whole = sound.size() / frame_bytes * frame_bytes;
        kz_fpx_fingerprint_add_audio(handle, sound.data(), static_cast<uint32_t>(whole), &complete);
        char* text = nullptr;
        if (kz_fpx_fingerprint_serialize(handle, &text) == KZ_OK) {
            document = text;
        }
        kz_fpx_fingerprint_serialize_free(&text);
        kz_fpx_fingerprint_free(&handle);
    }
    return document;
}

} // namespace

void run(Choices& choices)
{
    const kz_stream_settings settings = choose_settings(choices);
    kz_status status = KZ_OK;
    const Stream whole = create(settings, status);
    if (!whole) {
        EXPECT_NE(KZ_STREAM_ERROR_FAILED, status);
        EXPECT_NE(KZ_STREAM_ERROR_MEMORY, status);
        return;
    }
    const Stream cut = create(settings, status);
    ASSERT_EQ(KZ_OK, status);
    const auto sound = choose_sound(choices, settings);
    const uint32_t usual = choices.ConsumeIntegralInRange<uint32_t>(1, 100000);
    const Outcome expected = outcome_of(whole.get(), sound, [&] { return sound.size(); });
    const Outcome found = outcome_of(cut.get(), sound, [&]() -> size_t {
        return choices.remaining_bytes() > 0 ? choices.ConsumeIntegral<uint16_t>() + 1U : usual;
    });
    EXPECT_EQ(expected.used, found.used);
    EXPECT_EQ(0, std::memcmp(&expected.state, &found.state, sizeof found.state));
    EXPECT_EQ(expected.document, found.document);
    const std::string one_call = document_of_one_call(settings, sound);
    if (!one_call.empty()) {
        EXPECT_EQ(one_call, found.document);
    }
}

} // namespace kz::fuzz
