/// @file
/// Runs the sample converter for an input's format and channel count.
#pragma once

#include <cstdint>

namespace kz::qv {

/// The numbers by which callers name the format of their samples.
enum InputFormat : uint32_t { kPcm8 = 1, kPcm16 = 2, kALaw = 3, kULaw = 4 };

constexpr bool is_input_format(uint32_t format) noexcept
{
    return format >= kPcm8 && format <= kULaw;
}

constexpr uint32_t bytes_per_sample(uint32_t format) noexcept { return format == kPcm16 ? 2 : 1; }

/// The converters of one format into samples of type Sample.
template <class Sample>
struct Converters {
    void (*mono)(const void* input, Sample* output, int32_t frames) noexcept;
    void (*stereo)(const void* input, Sample* output, int32_t frames) noexcept;
    void (*many)(int32_t channels, const void* input, Sample* output, int32_t frames) noexcept;
};

/// Converts `frames` frames of interleaved bytes into the object's conversion buffer.
///
/// @param table  Converters in the order of the formats' numbers.
template <class Object, class Sample>
void convert_frames(Object& object, const Converters<Sample> (&table)[4], const uint8_t* bytes,
                    uint32_t frames) noexcept
{
    const Converters<Sample>& converters = table[object.input_format - kPcm8];
    const auto count = static_cast<int32_t>(frames);
    if (object.channel_count == 1) {
        converters.mono(bytes, object.conversion_buffer, count);
    } else if (object.channel_count == 2) {
        converters.stereo(bytes, object.conversion_buffer, count);
    } else {
        const auto channels = static_cast<int32_t>(object.channel_count);
        converters.many(channels, bytes, object.conversion_buffer, count);
    }
}

} // namespace kz::qv
