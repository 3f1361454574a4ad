// Samples of every format as 16-bit words, and many channels as one. Integers keep their upper 16
// bits; floats are scaled to 32768 and rounded to the nearest word without help of the processor's
// rounding mode, so that the words are the same whatever a caller has set.

#include "kzsdk/stream/frame_reader.hpp"

#include <algorithm>
#include <bit>
#include <cassert>
#include <cstddef>
#include <cstring>
#include <limits>

#include "kzsdk/dsp/convert.h"
#include "kzsdk/fpx/fpx.h"

namespace kz::stream {

namespace {

constexpr bool kIsLittleEndian = std::endian::native == std::endian::little;

template <class Word>
Word load(const uint8_t* bytes) noexcept
{
    Word word{};
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

// A float or a double to the nearest integer, halves to the even one; clipped at full scale; NaN
// becomes silence. Compares bits, for those of a magnitude are in order as integers are, and
// branches nowhere: compilers make vector instructions of that.
//
// @tparam Bits  The signed integer of the same size.
template <class Bits, class Float>
int16_t from_floating_point(Float sample) noexcept
{
    constexpr auto kInfinity = std::bit_cast<Bits>(std::numeric_limits<Float>::infinity());
    constexpr auto kFullScale = std::bit_cast<Bits>(Float{32768});
    constexpr auto kHalf = std::bit_cast<Bits>(Float{0.5});
    const auto bits = std::bit_cast<Bits>(sample * Float{32768}); // exact, or infinite
    const Bits magnitude = bits & std::numeric_limits<Bits>::max();
    const Bits is_number = Bits{magnitude <= kInfinity};
    const auto clipped = std::bit_cast<Float>(std::min(magnitude, kFullScale) & -is_number);
    const auto whole = static_cast<int32_t>(clipped);
    const auto rest = std::bit_cast<Bits>(clipped - static_cast<Float>(whole)); // exact
    const int32_t rounded = whole + (int32_t{rest > kHalf} | (int32_t{rest == kHalf} & whole));
    const auto sign = static_cast<int32_t>(bits >> (8 * sizeof(Bits) - 1)); // -1 or 0
    return static_cast<int16_t>(std::min((rounded ^ sign) - sign, 32767));
}

int16_t from_24_bits(const uint8_t* bytes) noexcept
{
    return load<int16_t>(kIsLittleEndian ? bytes + 1 : bytes);
}

// Calls `to_word(bytes of a sample)` for each sample.
template <uint32_t size, class ToWord>
void for_each(const uint8_t* bytes, size_t count, int16_t* words, ToWord to_word) noexcept
{
    for (size_t i = 0; i < count; ++i, bytes += size) {
        words[i] = to_word(bytes);
    }
}

void to_words(uint32_t format, const uint8_t* bytes, size_t count, int16_t* words) noexcept
{
    switch (format) {
    case KZ_STREAM_FORMAT_PCM16:
        std::memcpy(words, bytes, count * sizeof *words);
        break;
    case KZ_STREAM_FORMAT_ALAW: // the library's table has the sign inverted
        for_each<1>(bytes, count, words, [table = KZDSP_GetALawTable()](const uint8_t* code) {
            return static_cast<int16_t>(-table[*code]);
        });
        break;
    case KZ_STREAM_FORMAT_ULAW:
        for_each<1>(bytes, count, words,
                    [table = KZDSP_GetuLawTable()](const uint8_t* code) { return table[*code]; });
        break;
    case KZ_STREAM_FORMAT_PCM24:
        for_each<3>(bytes, count, words, from_24_bits);
        break;
    case KZ_STREAM_FORMAT_PCM32:
        for_each<4>(bytes, count, words, [](const uint8_t* at) {
            return static_cast<int16_t>(load<int32_t>(at) >> 16);
        });
        break;
    case KZ_STREAM_FORMAT_FLOAT32:
        for_each<4>(bytes, count, words, [](const uint8_t* at) {
            return from_floating_point<int32_t>(load<float>(at));
        });
        break;
    case KZ_STREAM_FORMAT_FLOAT64:
        for_each<8>(bytes, count, words, [](const uint8_t* at) {
            return from_floating_point<int64_t>(load<double>(at));
        });
        break;
    default: // KZ_STREAM_FORMAT_LINEAR8
        for_each<1>(bytes, count, words, [](const uint8_t* at) {
            return static_cast<int16_t>((int32_t{*at} - 128) * 256);
        });
    }
}

// In place: the sum divided by the smallest power of two that is not below the number of channels,
// rounded to the nearest, halves up. 65535 samples and the half fit 32 bits.
void mix_down(int16_t* samples, uint32_t frames, uint32_t channels) noexcept
{
    assert(channels > 2);
    const auto shift = static_cast<uint32_t>(std::bit_width(channels - 1));
    const int32_t half = int32_t{1} << (shift - 1);
    const int16_t* next = samples;
    for (uint32_t i = 0; i < frames; ++i) {
        int32_t sum = half;
        for (uint32_t c = 0; c < channels; ++c) {
            sum += *next++;
        }
        samples[i] = static_cast<int16_t>(sum >> shift);
    }
}

// What the extraction interface takes has the same number there.
bool is_taken_by_fpx(uint32_t format) noexcept { return format <= KZ_STREAM_FORMAT_ULAW; }

} // namespace

uint32_t bytes_per_sample(uint32_t format) noexcept
{
    constexpr uint8_t kBytes[] = {0, 1, 2, 1, 1, 3, 4, 4, 8, 1};
    return format < std::size(kBytes) ? kBytes[format] : 0;
}

FrameLayout layout_of(uint32_t format, uint32_t channels, bool decimated) noexcept
{
    FrameLayout layout{};
    layout.format = format;
    layout.channels = channels;
    layout.frame_bytes = bytes_per_sample(format) * channels;
    layout.goes_as_it_is = !decimated && channels <= 2 && is_taken_by_fpx(format) ? 1 : 0;
    layout.piece_format = layout.goes_as_it_is != 0 ? format : uint32_t{KZ_FPX_FORMAT_PCM16};
    layout.piece_channels = channels <= 2 ? channels : 1;
    return layout;
}

void read_frames(const FrameLayout& layout, const uint8_t* bytes, uint32_t frames,
                 int16_t* samples) noexcept
{
    to_words(layout.format, bytes, size_t{frames} * layout.channels, samples);
    if (layout.channels > layout.piece_channels) {
        mix_down(samples, frames, layout.channels);
    }
}

} // namespace kz::stream
