// Sound files come as 16-bit PCM, since no rate of theirs is accepted as it is; headerless sound
// comes in any encoding.

#include "audio/mono.hpp"

#include <cstring>
#include <memory>
#include <span>

#include "audio/input.hpp"
#include "audio/rate_converter.hpp"

namespace audio {

namespace {

constexpr size_t kBlock = 16384; ///< frames

/// ITU-T G.711, A-law: 13 bits of magnitude in eight segments, scaled to 16 bits.
int from_alaw(unsigned byte)
{
    const unsigned word = byte ^ 0x55U;
    const unsigned segment = word >> 4 & 7U;
    const unsigned step = word & 15U;
    const unsigned size = segment == 0 ? step << 4 | 8U : ((step << 4) + 0x108U) << (segment - 1U);
    return (word & 0x80U) != 0 ? static_cast<int>(size) : -static_cast<int>(size);
}

/// ITU-T G.711, mu-law.
int from_ulaw(unsigned byte)
{
    const unsigned word = byte ^ 0xFFU;
    const unsigned size = (((word & 15U) << 3) + 0x84U) << (word >> 4 & 7U);
    const int magnitude = static_cast<int>(size) - 0x84;
    return (word & 0x80U) != 0 ? -magnitude : magnitude;
}

template <class Number>
Number number_at(const std::byte* bytes)
{
    Number number;
    std::memcpy(&number, bytes, sizeof number);
    return number;
}

float to_float(const std::byte* sample, Encoding encoding)
{
    const auto byte = std::to_integer<unsigned>(*sample);
    switch (encoding) {
    case Encoding::u8:
        return static_cast<float>(static_cast<int>(byte) - 128) / 128;
    case Encoding::alaw:
        return static_cast<float>(from_alaw(byte)) / 32768;
    case Encoding::ulaw:
        return static_cast<float>(from_ulaw(byte)) / 32768;
    case Encoding::f32:
        return number_at<float>(sample);
    case Encoding::s16:
        break;
    }
    return static_cast<float>(number_at<int16_t>(sample)) / 32768;
}

/// Appends the mean of the channels of each frame.
void append(std::vector<float>& samples, std::span<const std::byte> frames,
            const StreamFormat& format)
{
    const size_t size = sample_bytes(format.encoding);
    for (size_t at = 0; at < frames.size(); at += format.frame_bytes()) {
        float sum = 0;
        for (size_t channel = 0; channel < format.channels; ++channel) {
            sum += to_float(frames.data() + at + channel * size, format.encoding);
        }
        samples.push_back(sum / static_cast<float>(format.channels));
    }
}

bool is_to_be_converted(const StreamFormat& format)
{
    return format.encoding == Encoding::s16 && format.rate > kMonoRate;
}

} // namespace

Mono read_mono(const std::string& path, const std::optional<StreamFormat>& raw,
               const Section& section)
{
    const Request request = {
        .raw = raw, .section = section, .accepts_rate = [](uint32_t) { return false; }};
    Input input(path, request);
    std::unique_ptr<Source> source = input.open().source;
    if (is_to_be_converted(source->format())) {
        source = std::make_unique<RateConverter>(std::move(source), kMonoRate);
    }
    const StreamFormat format = source->format();
    Mono mono = {.samples = {}, .rate = format.rate};
    std::vector<std::byte> block(kBlock * format.frame_bytes());
    for (size_t got = kBlock; got == kBlock;) {
        got = source->read(block);
        append(mono.samples, std::span(block).first(got * format.frame_bytes()), format);
    }
    return mono;
}

} // namespace audio
