// Callers compiled long ago read these records in place: the fields stay in their order, each at
// the next offset that its type allows, with nothing in between and nothing behind.

#include <cstddef>
#include <cstdint>
#include <type_traits>

#include <gtest/gtest.h>

#include "kzsdk/kzsdk.h"
#include "whole/abi/record_layout.hpp"

namespace {

using kz::test::expect_layout;
using kz::test::Field;
using kz::test::rounded_up;

TEST(RecordLayout, OfTheStartUpConfiguration)
{
    using Record = kzconf_configuration;
    expect_layout<Record>({
        FIELD(Record, memory_arg_text),
        FIELD(Record, memory_arg),
        FIELD(Record, memory_args_present),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(rounded_up(sizeof(void*) + 16 * sizeof(uint32_t), sizeof(void*)), sizeof(Record))
        << "seventeen words where a pointer is one";
    static_assert(std::is_same_v<uint32_t, decltype(Record::memory_arg)>);
    static_assert(std::is_same_v<uint8_t, decltype(Record::memory_args_present)>);
}

TEST(RecordLayout, OfTheDynamicBuffer)
{
    using Record = kz_dyn_buf;
    expect_layout<Record>({
        FIELD(Record, data),
        FIELD(Record, length),
        FIELD(Record, capacity),
        FIELD(Record, grow_by),
    });
    static_assert(std::is_same_v<uint8_t*, decltype(Record::data)>);
    static_assert(std::is_same_v<uint32_t, decltype(Record::length)>);
}

TEST(RecordLayout, OfTheTag)
{
    using Record = XMLTag;
    expect_layout<Record>({
        FIELD(Record, name),
        FIELD(Record, data),
        FIELD(Record, attributes),
        FIELD(Record, sub_tags),
        FIELD(Record, next_sibling),
    });
    static_assert(std::is_same_v<XMLAttr*, decltype(Record::attributes)>);
    static_assert(std::is_same_v<XMLTag*, decltype(Record::sub_tags)>);
    static_assert(std::is_same_v<XMLTag*, decltype(Record::next_sibling)>);
}

TEST(RecordLayout, OfTheAttribute)
{
    using Record = XMLAttr;
    expect_layout<Record>({FIELD(Record, name), FIELD(Record, value), FIELD(Record, next)});
    static_assert(std::is_same_v<XMLAttr*, decltype(Record::next)>);
}

// The high word comes first, on every processor.
TEST(RecordLayout, OfTheLongNumbers)
{
    expect_layout<FxpTypeLong>({FIELD(FxpTypeLong, hi), FIELD(FxpTypeLong, lo)});
    expect_layout<FxpUTypeLong>({FIELD(FxpUTypeLong, hi), FIELD(FxpUTypeLong, lo)});
    static_assert(sizeof(FxpTypeLong) == 8 && sizeof(FxpUTypeLong) == 8);
    static_assert(std::is_same_v<int32_t, decltype(FxpTypeLong::hi)>);
    static_assert(std::is_same_v<uint32_t, decltype(FxpTypeLong::lo)>);
    static_assert(std::is_same_v<uint32_t, decltype(FxpUTypeLong::hi)>);
    static_assert(std::is_same_v<uint32_t, decltype(FxpUTypeLong::lo)>);
}

TEST(RecordLayout, OfTheTransform)
{
    using Record = KZDSP_DCT_fixed;
    expect_layout<Record>({
        FIELD(Record, order),
        FIELD(Record, length),
        FIELD(Record, coefficients),
        FIELD(Record, owns_coefficients),
    });
    static_assert(std::is_same_v<int32_t, decltype(Record::order)>);
}

TEST(RecordLayout, OfTheFloatTransform)
{
    using Record = KZDSP_DCT;
    expect_layout<Record>({
        FIELD(Record, order),
        FIELD(Record, length),
        FIELD(Record, coefficients),
        FIELD(Record, owns_coefficients),
    });
    static_assert(std::is_same_v<const float*, decltype(Record::coefficients)>);
}

TEST(RecordLayout, OfTheResampler)
{
    using Record = KZDSP_resampler_fixed;
    expect_layout<Record>({
        FIELD(Record, up),
        FIELD(Record, down),
        FIELD(Record, taps_per_phase),
        FIELD(Record, length),
        FIELD(Record, lsb),
        FIELD(Record, msb),
        FIELD(Record, phase),
        FIELD(Record, history),
        FIELD(Record, history_start),
        FIELD(Record, history_end),
    });
}

TEST(RecordLayout, OfTheFloatResampler)
{
    using Record = KZDSP_resampler;
    expect_layout<Record>({
        FIELD(Record, up),
        FIELD(Record, down),
        FIELD(Record, taps_per_phase),
        FIELD(Record, length),
        FIELD(Record, taps),
        FIELD(Record, owns_taps),
        FIELD(Record, phase),
        FIELD(Record, history),
        FIELD(Record, history_start),
        FIELD(Record, history_end),
    });
    static_assert(std::is_same_v<const float*, decltype(Record::taps)>);
    static_assert(std::is_same_v<uint32_t, decltype(Record::owns_taps)>);
}

TEST(RecordLayout, OfTheFingerprinterConfiguration)
{
    using Record = kzqvfixed_config;
    expect_layout<Record>({
        FIELD(Record, detect_signal),
        FIELD(Record, detector_window),
        FIELD(Record, detector_threshold),
        FIELD(Record, detector_max_deviation),
        FIELD(Record, histogram_levels),
        FIELD(Record, sample_rate),
        FIELD(Record, frame_length_log2),
        FIELD(Record, frame_hop),
        FIELD(Record, freq_table_count),
        FIELD(Record, freq_table),
        FIELD(Record, frame_limit),
        FIELD(Record, skip_frames),
        FIELD(Record, fingerprint_scale),
    });
    static_assert(std::is_same_v<uint8_t, decltype(Record::detect_signal)>);
    static_assert(std::is_same_v<int32_t*, decltype(Record::freq_table)>);
}

TEST(RecordLayout, OfTheSignalDetector)
{
    using Record = kzqvfixed_signal_detector;
    expect_layout<Record>({
        FIELD(Record, window),
        FIELD(Record, threshold),
        FIELD(Record, max_deviation),
        FIELD(Record, primed),
        FIELD(Record, level_sum),
        FIELD(Record, deviation_sum),
        FIELD(Record, position),
        FIELD(Record, levels),
        FIELD(Record, deviations),
    });
}

TEST(RecordLayout, OfTheFeatureRecord)
{
    using Record = kzqvfixed_frame_record;
    expect_layout<Record>({FIELD(Record, energy), FIELD(Record, amplitude), FIELD(Record, next)});
    static_assert(std::is_same_v<int32_t*, decltype(Record::energy)>);
    static_assert(std::is_same_v<uint32_t*, decltype(Record::amplitude)>);
}

TEST(RecordLayout, OfTheFrameManager)
{
    using Record = kzqvfixed_frame_manager;
    expect_layout<Record>({
        FIELD(Record, skip_frames),
        FIELD(Record, frame_limit),
        FIELD(Record, fingerprint_scale),
        FIELD(Record, skip_remaining),
        FIELD(Record, frame_count),
        FIELD(Record, records),
        FIELD(Record, records_tail),
        FIELD(Record, frame_length),
        FIELD(Record, frame_buffer),
        FIELD(Record, decimator),
        FIELD(Record, half_length),
        FIELD(Record, spectrum),
        FIELD(Record, dct),
        FIELD(Record, band_table_count),
        FIELD(Record, band_table),
        FIELD(Record, band_count),
        FIELD(Record, histogram_levels),
        FIELD(Record, histogram),
        FIELD(Record, fingerprint),
        FIELD(Record, fingerprint_ready),
    });
    static_assert(std::is_same_v<int16_t*, decltype(Record::fingerprint)>);
    static_assert(std::is_same_v<uint8_t, decltype(Record::fingerprint_ready)>);
}

TEST(RecordLayout, OfTheFingerprinter)
{
    using Record = kzqvfixed_fingerprinter;
    expect_layout<Record>({
        FIELD(Record, channel_count),
        FIELD(Record, input_rate),
        FIELD(Record, input_format),
        FIELD(Record, frame_bytes),
        FIELD(Record, working_rate),
        FIELD(Record, resampler),
        FIELD(Record, frame_manager),
        FIELD(Record, frame_limit),
        FIELD(Record, searching_for_signal),
        FIELD(Record, signal_search_enabled),
        FIELD(Record, signal_offset),
        FIELD(Record, signal_detector),
        FIELD(Record, conversion_buffer),
        FIELD(Record, frame_length),
        FIELD(Record, frame_start),
        FIELD(Record, write_position),
        FIELD(Record, ring),
        FIELD(Record, hop),
    });
    EXPECT_EQ(4096 * sizeof(FxpType), sizeof(Record::conversion_buffer));
}

TEST(RecordLayout, OfTheSettingsOfAStream)
{
    using Record = kz_stream_settings;
    expect_layout<Record>({
        FIELD(Record, algorithm),
        FIELD(Record, format),
        FIELD(Record, sample_rate),
        FIELD(Record, channels),
        FIELD(Record, reserved),
    });
    static_assert(sizeof(Record) == 64);
}

TEST(RecordLayout, OfTheStateOfAStream)
{
    using Record = kz_stream_state;
    expect_layout<Record>({
        FIELD(Record, frames),
        FIELD(Record, silence_milliseconds),
        FIELD(Record, sound_milliseconds),
        FIELD(Record, phase),
        FIELD(Record, percent),
        FIELD(Record, missing_milliseconds),
        FIELD(Record, partial_frame_bytes),
        FIELD(Record, reserved),
    });
    static_assert(sizeof(Record) == 64);
}

} // namespace
