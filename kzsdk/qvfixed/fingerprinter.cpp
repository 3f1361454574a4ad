#include <memory>
#include <span>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/dsp/convert.h"
#include "kzsdk/dsp/fxp_ops.hpp"
#include "kzsdk/qv/frame_pump.hpp"
#include "kzsdk/qv/query_document.hpp"
#include "kzsdk/qvfixed/extract.hpp"
#include "kzsdk/qvfixed/qvfixed.h"

namespace {

using Object = kzqvfixed_fingerprinter;

constexpr char kAlgorithmName[] = "Quenvar";
constexpr char kAlgorithmVersion[] = "1.1";

// Samples are Q29 or Q30; the detector judges them in units of 2^-16 or 2^-17 of full scale.
constexpr int32_t kDetectorShift = 13;

// From this rate on, hertz with 15 fraction bits do not fit 32 bits.
constexpr uint32_t kFirstRateTooHigh = 1U << 17;

struct Destroy {
    void operator()(Object* object) const noexcept
    {
        static_cast<void>(kzqvfixed_destructor(object));
    }
    void operator()(kzqvfixed_config* config) const noexcept
    {
        static_cast<void>(kzqvfixed_config_destroy(config));
    }
};

// ---- conversion

using MonoConverter = decltype(&KZDSP_PCM8ToQ29);
using ManyConverter = decltype(&KZDSP_NChannelPCM8ToMonoQ30);

struct Converters {
    MonoConverter mono;
    MonoConverter stereo;
    ManyConverter many;
};

Converters converters_for(uint32_t format) noexcept
{
    switch (format) {
    case kz::qv::kPcm8:
        return {KZDSP_PCM8ToQ29, KZDSP_StereoPCM8ToMonoQ30, KZDSP_NChannelPCM8ToMonoQ30};
    case kz::qv::kALaw:
        return {KZDSP_ALawToQ29, KZDSP_StereoALawToMonoQ30, KZDSP_NChannelALawToMonoQ30};
    case kz::qv::kULaw:
        return {KZDSP_uLawToQ29, KZDSP_StereouLawToMonoQ30, KZDSP_NChanneluLawToMonoQ30};
    default:
        return {KZDSP_PCM16ToQ29, KZDSP_StereoPCM16ToMonoQ30, KZDSP_NChannelPCM16ToMonoQ30};
    }
}

// ---- the feed loop's view of this twin

struct Twin {
    using Object = kzqvfixed_fingerprinter;
    using Sample = FxpType;

    static void convert(Object& o, const uint8_t* bytes, uint32_t frames) noexcept
    {
        const Converters converters = converters_for(o.input_format);
        const auto count = static_cast<int32_t>(frames);
        if (o.channel_count == 1) {
            converters.mono(bytes, o.conversion_buffer, count);
        } else if (o.channel_count == 2) {
            converters.stereo(bytes, o.conversion_buffer, count);
        } else {
            converters.many(static_cast<int32_t>(o.channel_count), bytes, o.conversion_buffer,
                            count);
        }
    }

    static kz::dsp::BlockCounts resample(Object& o, std::span<const FxpType> input,
                                         std::span<FxpType> output) noexcept
    {
        kz::dsp::BlockCounts counts{};
        KZDSP_resampler_fixed_resample(
            o.resampler, input.data(), static_cast<uint32_t>(input.size()), output.data(),
            static_cast<uint32_t>(output.size()), &counts.consumed, &counts.produced);
        return counts;
    }

    static uint32_t signal_offset(Object& o, std::span<const FxpType> samples) noexcept
    {
        return kzqvfixed_signal_detector_get_signal_offset(o.signal_detector, samples.data(),
                                                           static_cast<uint32_t>(samples.size()),
                                                           kDetectorShift);
    }

    static void restart_detector(Object& o) noexcept
    {
        static_cast<void>(kzqvfixed_signal_detector_reset(o.signal_detector));
    }

    static void append_frame(Object& o, std::span<const FxpType> older,
                             std::span<const FxpType> newer) noexcept
    {
        static_cast<void>(kzqvfixed_frame_manager_append_dual_PCM_data(
            o.frame_manager, older.data(), static_cast<uint32_t>(older.size()), newer.data(),
            static_cast<uint32_t>(newer.size())));
    }

    static bool reached_limit(const Object& o) noexcept
    {
        return kzqvfixed_frame_manager_reached_frame_limit(o.frame_manager) != 0;
    }
};

// ---- creation

KZDSP_resampler_fixed* make_resampler(uint32_t input_rate, uint32_t working_rate) noexcept
{
    if (input_rate >= kFirstRateTooHigh) {
        return nullptr;
    }
    return KZDSP_resampler_fixed_create(input_rate << 15, working_rate * 8);
}

void make_parts(Object& o, const kzqvfixed_config& config) noexcept
{
    o.working_rate = config.sample_rate;
    o.resampler = make_resampler(o.input_rate, config.sample_rate);
    o.frame_manager = kzqvfixed_frame_manager_create(&config);
    o.frame_limit = config.frame_limit;
    o.signal_search_enabled = config.detect_signal;
    o.signal_detector =
        kzqvfixed_signal_detector_create(config.detector_window, config.detector_threshold,
                                         static_cast<int32_t>(config.detector_max_deviation));
    o.frame_length = kz::fxp::shift_left(1U, static_cast<int32_t>(config.frame_length_log2));
    o.ring = kz::make_array<FxpType>(o.frame_length).release();
    o.hop = config.frame_hop;
}

bool has_all_parts(const Object& o) noexcept
{
    return o.resampler != nullptr && o.frame_manager != nullptr && o.signal_detector != nullptr &&
           o.frame_bytes != 0 && o.ring != nullptr;
}

void reset(Object& o) noexcept
{
    KZDSP_resampler_fixed_reset(o.resampler);
    static_cast<void>(kzqvfixed_frame_manager_reset(o.frame_manager));
    static_cast<void>(kzqvfixed_signal_detector_reset(o.signal_detector));
    o.frame_start = 0;
    o.write_position = 0;
    o.searching_for_signal = o.signal_search_enabled;
    o.signal_offset = 0;
}

// ---- the result

uint32_t milliseconds(const Object& o, uint32_t samples) noexcept
{
    return samples * 1000 / (o.working_rate >> 12); // wraps
}

} // namespace

kz_status kz::qvfixed::extract_fingerprint(const void* object, uint8_t* buffer, uint32_t size,
                                           qv::FingerprintTimes& times) noexcept
{
    if (object == nullptr || buffer == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    const Object& o = *static_cast<const Object*>(object);
    if (size < kzqvfixed_frame_manager_get_fingerprint_size(o.frame_manager)) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    if (o.frame_limit != 0 && !Twin::reached_limit(o)) {
        return KZ_QV_ERROR_INCOMPLETE;
    }
    const uint32_t written = kzqvfixed_frame_manager_get_fingerprint(o.frame_manager, buffer, size);
    const uint32_t frames = kzqvfixed_frame_manager_get_frame_count(o.frame_manager);
    times.start = milliseconds(o, o.signal_offset);
    times.duration = frames == 0 ? 0 : milliseconds(o, (frames - 1) * o.hop + o.frame_length);
    return written != 0 ? KZ_OK : KZ_QV_ERROR_INCOMPLETE;
}

kz_status kzqvfixed_constructor(uint32_t /*algorithm*/, uint32_t sample_rate, uint32_t format,
                                uint32_t channels, kzqvfixed_fingerprinter** out_object) noexcept
{
    if (sample_rate == 0 || !kz::qv::is_input_format(format) || channels < 1 || channels > 2 ||
        out_object == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    kzqvfixed_config* made_config = nullptr;
    const kz_status status = kzqvfixed_config_create(&made_config);
    const std::unique_ptr<kzqvfixed_config, Destroy> config(made_config);
    if (status != KZ_OK) {
        return status;
    }
    std::unique_ptr<Object, Destroy> object(kz::make_record<Object>().release());
    if (!object) {
        return KZ_QV_ERROR_MEMORY;
    }
    object->channel_count = channels;
    object->input_rate = sample_rate;
    object->input_format = format;
    object->frame_bytes = kz::qv::bytes_per_sample(format) * channels;
    make_parts(*object, *config);
    if (!has_all_parts(*object)) {
        return KZ_QV_ERROR_MEMORY;
    }
    reset(*object);
    *out_object = object.release();
    return KZ_OK;
}

kz_status kzqvfixed_destructor(kzqvfixed_fingerprinter* object) noexcept
{
    if (object == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    static_cast<void>(kzqvfixed_frame_manager_destroy(object->frame_manager));
    KZDSP_resampler_fixed_destroy(object->resampler);
    kzqvfixed_signal_detector_destroy(object->signal_detector);
    static_cast<void>(_kzmem_free(object->ring));
    static_cast<void>(_kzmem_free(object));
    return KZ_OK;
}

kz_status kzqvfixed_add_samples(kzqvfixed_fingerprinter* object, const void* bytes,
                                uint32_t byte_count, uint8_t* out_complete) noexcept
{
    if (object == nullptr || bytes == nullptr || out_complete == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    *out_complete = 0;
    const kz_status status =
        kz::qv::feed<Twin>(*object, {static_cast<const uint8_t*>(bytes), byte_count});
    if (status == KZ_QV_FRAME_LIMIT_REACHED) {
        *out_complete = 1;
        return KZ_OK;
    }
    return status;
}

kz_status kzqvfixed_get_result(kzqvfixed_fingerprinter* object, XMLTag** out_tree) noexcept
{
    if (object == nullptr || out_tree == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    const kz::qv::FingerprintSource source{
        .name = kAlgorithmName,
        .version = kAlgorithmVersion,
        .size = kzqvfixed_frame_manager_get_fingerprint_size(object->frame_manager),
        .object = object,
        .extract = kz::qvfixed::extract_fingerprint};
    return kz::qv::build_query_document(source, out_tree);
}

kz_status kzqvfixed_get_percent_progress(const kzqvfixed_fingerprinter* object,
                                         uint32_t* out_percent) noexcept
{
    if (object == nullptr || out_percent == nullptr) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    *out_percent = kzqvfixed_frame_manager_get_percent_progress(object->frame_manager);
    return KZ_OK;
}
