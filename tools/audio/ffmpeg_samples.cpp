// Decoders make samples of many kinds, in one piece or with each channel on its own.

#include "audio/ffmpeg_samples.hpp"

#include <cstdint>
#include <span>

#include "audio/ffmpeg_library.hpp"
#include "audio/samples.hpp"

namespace audio {

namespace {

AVSampleFormat packed_form(const AVFrame& frame)
{
    return ffmpeg().av_get_packed_sample_fmt(static_cast<AVSampleFormat>(frame.format));
}

/// Decoded to no more than 16 bits.
bool is_short(const AVFrame& frame)
{
    return packed_form(frame) == AV_SAMPLE_FMT_U8 || packed_form(frame) == AV_SAMPLE_FMT_S16;
}

float to_float(int32_t sample) { return static_cast<float>(sample) / 2147483648.0f; }
float to_float(float sample) { return sample; }
float to_float(double sample) { return static_cast<float>(sample); }

int16_t to_short(uint8_t sample) { return static_cast<int16_t>((sample - 128) * 256); }
int16_t to_short(int16_t sample) { return sample; }
template <class Sample>
int16_t to_short(Sample sample)
{
    return to_16_bits(to_float(sample));
}

/// Writes every sample through `convert`, channel after channel within a frame.
template <class From, class To, class Convert>
void interleave(const AVFrame& frame, To* to, Convert convert)
{
    const auto channels = static_cast<size_t>(frame.ch_layout.nb_channels);
    const auto count = static_cast<size_t>(frame.nb_samples);
    const bool apart =
        ffmpeg().av_sample_fmt_is_planar(static_cast<AVSampleFormat>(frame.format)) != 0;
    for (size_t c = 0; c < channels; ++c) {
        const auto* from =
            reinterpret_cast<const From*>(frame.extended_data[apart ? c : 0]) + (apart ? 0 : c);
        const size_t step = apart ? 1 : channels;
        for (size_t i = 0; i < count; ++i) {
            to[i * channels + c] = convert(from[i * step]);
        }
    }
}

template <class From>
void append(const AVFrame& frame, bool floats, std::vector<std::byte>& samples)
{
    const StreamFormat format = format_of(frame, floats);
    const auto channels = static_cast<size_t>(frame.ch_layout.nb_channels);
    const auto count = static_cast<size_t>(frame.nb_samples);
    const size_t before = samples.size();
    samples.resize(before + count * channels * sample_bytes(format.encoding));
    if constexpr (sizeof(From) > 2) {
        if (format.encoding == Encoding::f32) {
            interleave<From>(frame, reinterpret_cast<float*>(samples.data() + before),
                             [](From sample) { return to_float(sample); });
            return;
        }
    }
    auto* const words = reinterpret_cast<int16_t*>(samples.data() + before);
    interleave<From>(frame, words, [](From sample) { return to_short(sample); });
    if (channels > 2) {
        mix_down(std::span(words, count * channels), channels);
        samples.resize(before + count * sizeof(int16_t));
    }
}

} // namespace

StreamFormat format_of(const AVFrame& frame, bool floats)
{
    const bool as_floats = floats && !is_short(frame);
    const auto channels = static_cast<uint32_t>(frame.ch_layout.nb_channels);
    return {.rate = static_cast<uint32_t>(frame.sample_rate),
            .channels = as_floats || channels <= 2 ? channels : 1,
            .encoding = as_floats ? Encoding::f32 : Encoding::s16};
}

bool append_samples(const AVFrame& frame, bool floats, std::vector<std::byte>& samples)
{
    switch (packed_form(frame)) {
    case AV_SAMPLE_FMT_U8:
        append<uint8_t>(frame, floats, samples);
        return true;
    case AV_SAMPLE_FMT_S16:
        append<int16_t>(frame, floats, samples);
        return true;
    case AV_SAMPLE_FMT_S32:
        append<int32_t>(frame, floats, samples);
        return true;
    case AV_SAMPLE_FMT_FLT:
        append<float>(frame, floats, samples);
        return true;
    case AV_SAMPLE_FMT_DBL:
        append<double>(frame, floats, samples);
        return true;
    default:
        return false;
    }
}

} // namespace audio
