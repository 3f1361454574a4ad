// Trails and queries of sound: any format, any bytes, in any cuts. What cannot be used is refused,
// cuts do not show, and there are as many codes and frames as the samples have.

#include <algorithm>
#include <cmath>
#include <optional>
#include <stdexcept>

#include "catalogue/model/extractor.hpp"
#include "fuzz.hpp"
#include "support/signals.hpp"

namespace kz::fuzz {

namespace {

using kzcat::SoundFormat;
using Bytes = std::vector<std::byte>;

constexpr uint32_t kRates[] = {8000,  11025, 12000, 16000, 22050, 24000,  32000,
                               44056, 44100, 48000, 96000, 99999, 176400, 192000};
constexpr size_t kLongest = 200000; ///< bytes of sound
constexpr size_t kUsual = 30000;    ///< so that most runs are short
constexpr size_t kSeconds = 20;     ///< at a rate of 1 Hz a few KB would last for hours

SoundFormat choose_format(Choices& choices)
{
    SoundFormat format{choices.ConsumeIntegralInRange<uint32_t>(1, 9),
                       choices.PickValueInArray(kRates),
                       choices.ConsumeIntegralInRange<uint32_t>(1, 4)};
    if (one_in(choices, 8)) {
        format.rate = choices.ConsumeIntegralInRange<uint32_t>(0, 4000001);
    }
    if (one_in(choices, 32)) {
        format.channels = choices.ConsumeIntegralInRange<uint32_t>(0, 65536);
    }
    if (one_in(choices, 64)) {
        format.encoding = choices.ConsumeIntegral<uint32_t>();
    }
    return format;
}

/// Noise, and bytes of the fuzzer's over and over.
Bytes choose_sound(Choices& choices, const SoundFormat& format)
{
    const size_t most = one_in(choices, 16) ? kLongest : kUsual;
    const uint64_t longest = std::min<uint64_t>(most, uint64_t{format.rate} * kSeconds);
    Bytes sound(choices.ConsumeIntegralInRange<size_t>(0, static_cast<size_t>(longest)));
    test::Random random(choices.ConsumeIntegral<uint16_t>());
    const bool noisy = choices.ConsumeBool();
    const auto pattern = choices.ConsumeBytes<uint8_t>(256);
    for (size_t i = 0; i < sound.size(); ++i) {
        const uint32_t byte =
            noisy || pattern.empty() ? random.next() : pattern[i % pattern.size()];
        sound[i] = static_cast<std::byte>(byte);
    }
    return sound;
}

/// Feeds all of it in pieces of up to `most` bytes, each at an address of its own.
template <class Extractor>
void feed(Extractor& extractor, const Bytes& sound, size_t most)
{
    for (size_t at = 0; at < sound.size(); at += most) {
        const size_t count = std::min(most, sound.size() - at);
        const Copy copy(sound.data() + at, count, at % 8);
        extractor.feed(std::as_bytes(std::span(copy.data(), count)));
    }
}

kzcat::Trail trail_of(const SoundFormat& format, const Bytes& sound, size_t most)
{
    kzcat::TrailExtractor extractor(format);
    feed(extractor, sound, most);
    std::vector<kzcat::Code> codes = extractor.take_codes();
    kzcat::Trail trail = extractor.finish();
    codes.insert(codes.end(), trail.codes.begin(), trail.codes.end());
    trail.codes = std::move(codes);
    return trail;
}

kzcat::QueryBands query_of(const SoundFormat& format, const Bytes& sound, size_t most)
{
    kzcat::QueryExtractor extractor(format);
    feed(extractor, sound, most);
    return extractor.finish();
}

void check_query(const kzcat::QueryBands& whole, const kzcat::QueryBands& pieces)
{
    EXPECT_EQ(whole.samples, pieces.samples);
    EXPECT_EQ(whole.energies, pieces.energies);
    EXPECT_EQ(whole.levels, pieces.levels);
    EXPECT_EQ(whole.energies.size(), whole.frames() * kzcat::kFineBands);
    EXPECT_TRUE(std::all_of(whole.energies.begin(), whole.energies.end(),
                            [](float energy) { return energy >= 0 && std::isfinite(energy); }));
    EXPECT_TRUE(std::all_of(whole.levels.begin(), whole.levels.end(),
                            [](float level) { return level >= 0 && std::isfinite(level); }));
}

bool is_usable(const SoundFormat& format)
{
    return format.encoding >= 1 && format.encoding <= 9 && format.rate >= 1 &&
           format.rate <= 4000000 && format.channels >= 1 && format.channels <= 65535;
}

} // namespace

void run(Choices& choices)
{
    const SoundFormat format = choose_format(choices);
    const size_t most = choices.ConsumeIntegralInRange<size_t>(1, 10000);
    const Bytes sound = choose_sound(choices, format);
    try {
        const kzcat::Trail whole = trail_of(format, sound, sound.size() + 1);
        EXPECT_TRUE(is_usable(format));
        EXPECT_EQ(whole, trail_of(format, sound, most));
        EXPECT_EQ(kzcat::code_count(whole.samples), whole.codes.size());
        const auto query = query_of(format, sound, sound.size() + 1);
        EXPECT_EQ(whole.samples, query.samples);
        check_query(query, query_of(format, sound, most));
    } catch (const std::invalid_argument&) {
        EXPECT_FALSE(is_usable(format));
    }
}

} // namespace kz::fuzz
