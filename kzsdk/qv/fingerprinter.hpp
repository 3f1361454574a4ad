/// @file
/// The fingerprinter object from creation to result, which both twins share around the feed loop.
///
/// A twin provides what frame_pump.hpp requires, and the names of its parts' operations:
///
///     Config, FrameManager
///     create_config, destroy_config
///     make_resampler(input rate, config), destroy_resampler, reset_resampler
///     create_frame_manager, destroy_frame_manager, reset_frame_manager, get_fingerprint_size,
///     get_fingerprint, get_frame_count, get_percent_progress
///     create_detector, destroy_detector, reset_detector
///     milliseconds(object, samples), seconds(object, samples)  of samples at the working rate
#pragma once

#include <cstdint>
#include <memory>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/kernels/fxp_ops.hpp"
#include "kzsdk/qv/frame_pump.hpp"
#include "kzsdk/qv/query_document.hpp"

namespace kz::qv {

inline constexpr char kAlgorithmName[] = "Quenvar";
inline constexpr char kAlgorithmVersion[] = "1.1";

/// The operations of a fingerprinter, without state of their own: an object is the twin's record.
template <class Twin>
class Fingerprinter {
public:
    using Object = typename Twin::Object;

    /// Makes an object that is ready to be fed. On failure nothing is left and `out_object` is not
    /// touched. The configuration serves only here; the parts keep what they need of it.
    ///
    /// @return 0; KZ_QV_ERROR_INVALID_ARGUMENT; KZ_QV_ERROR_MEMORY also for an input rate that the
    ///         resampler does not support.
    static kz_status create(uint32_t sample_rate, uint32_t format, uint32_t channels,
                            Object** out_object) noexcept
    {
        if (sample_rate == 0 || !is_input_format(format) || channels < 1 || channels > 2 ||
            out_object == nullptr) {
            return KZ_QV_ERROR_INVALID_ARGUMENT;
        }
        Config* made_config = nullptr;
        const kz_status status = Twin::create_config(&made_config);
        const std::unique_ptr<Config, Destroy> config(made_config);
        if (status != KZ_OK) {
            return status;
        }
        std::unique_ptr<Object, Destroy> object(make_record<Object>().release());
        if (!object) {
            return KZ_QV_ERROR_MEMORY;
        }
        object->channel_count = channels;
        object->input_rate = sample_rate;
        object->input_format = format;
        object->frame_bytes = bytes_per_sample(format) * channels;
        make_parts(*object, *config);
        if (!has_all_parts(*object)) {
            return KZ_QV_ERROR_MEMORY;
        }
        reset(*object);
        *out_object = object.release();
        return KZ_OK;
    }

    /// Also for an object whose parts were not all made.
    static kz_status destroy(Object* object) noexcept
    {
        if (object == nullptr) {
            return KZ_QV_ERROR_INVALID_ARGUMENT;
        }
        static_cast<void>(Twin::destroy_frame_manager(object->frame_manager));
        Twin::destroy_resampler(object->resampler);
        Twin::destroy_detector(object->signal_detector);
        static_cast<void>(_kzmem_free(object->ring));
        static_cast<void>(_kzmem_free(object));
        return KZ_OK;
    }

    /// Feeds audio. The status that stops the feed loop at the frame limit does not leave here: it
    /// becomes the flag.
    static kz_status add_samples(Object* object, const void* bytes, uint32_t byte_count,
                                 uint8_t* out_complete) noexcept
    {
        if (object == nullptr || bytes == nullptr || out_complete == nullptr) {
            return KZ_QV_ERROR_INVALID_ARGUMENT;
        }
        *out_complete = 0;
        const kz_status status =
            feed<Twin>(*object, {static_cast<const uint8_t*>(bytes), byte_count});
        if (status == KZ_QV_FRAME_LIMIT_REACHED) {
            *out_complete = 1;
            return KZ_OK;
        }
        return status;
    }

    /// Makes the query document, which the caller disposes.
    static kz_status get_result(const Object* object, XMLTag** out_tree) noexcept
    {
        if (object == nullptr || out_tree == nullptr) {
            return KZ_QV_ERROR_INVALID_ARGUMENT;
        }
        const FingerprintSource source{.name = kAlgorithmName,
                                       .version = kAlgorithmVersion,
                                       .size = result_size(*object),
                                       .object = object,
                                       .extract = extract};
        return build_query_document(source, out_tree);
    }

    /// Copies the fingerprint and computes its times.
    ///
    /// @return 0; KZ_QV_ERROR_INVALID_ARGUMENT for a null pointer or a buffer below the
    ///         fingerprint's size; KZ_QV_ERROR_INCOMPLETE before the frame limit is reached, or
    ///         when memory is short.
    static kz_status extract(const void* object, uint8_t* buffer, uint32_t size,
                             FingerprintTimes& times) noexcept
    {
        if (object == nullptr || buffer == nullptr) {
            return KZ_QV_ERROR_INVALID_ARGUMENT;
        }
        const Object& o = *static_cast<const Object*>(object);
        if (size < result_size(o)) {
            return KZ_QV_ERROR_INVALID_ARGUMENT;
        }
        if (!is_complete(o)) {
            return KZ_QV_ERROR_INCOMPLETE;
        }
        const uint32_t written = Twin::get_fingerprint(o.frame_manager, buffer, size);
        times = Fingerprinter::times(o);
        return written != 0 ? KZ_OK : KZ_QV_ERROR_INCOMPLETE;
    }

    /// Bytes of the fingerprint.
    static uint32_t result_size(const Object& o) noexcept
    {
        return Twin::get_fingerprint_size(o.frame_manager);
    }

    /// Whether a result may be read. Without a frame limit it always may.
    static bool is_complete(const Object& o) noexcept
    {
        return o.frame_limit == 0 || Twin::reached_limit(o);
    }

    /// The times of the frames collected so far.
    static FingerprintTimes times(const Object& o) noexcept
    {
        const uint32_t frames = Twin::get_frame_count(o.frame_manager);
        return {.start = Twin::milliseconds(o, o.signal_offset),
                .duration =
                    frames == 0 ? 0 : Twin::milliseconds(o, (frames - 1) * o.hop + o.frame_length)};
    }

    /// A count of samples at the working rate in seconds.
    static double seconds(const Object& o, uint32_t samples) noexcept
    {
        return Twin::seconds(o, samples);
    }

    static kz_status get_percent_progress(const Object* object, uint32_t* out_percent) noexcept
    {
        if (object == nullptr || out_percent == nullptr) {
            return KZ_QV_ERROR_INVALID_ARGUMENT;
        }
        *out_percent = Twin::get_percent_progress(object->frame_manager);
        return KZ_OK;
    }

private:
    using Config = typename Twin::Config;

    struct Destroy {
        void operator()(Object* object) const noexcept { static_cast<void>(destroy(object)); }
        void operator()(Config* config) const noexcept
        {
            static_cast<void>(Twin::destroy_config(config));
        }
    };

    /// Makes the parts as far as memory allows; what is missing stays null.
    static void make_parts(Object& o, const Config& config) noexcept
    {
        o.working_rate = config.sample_rate;
        o.resampler = Twin::make_resampler(o.input_rate, config);
        o.frame_manager = Twin::create_frame_manager(&config);
        o.frame_limit = config.frame_limit;
        o.signal_search_enabled = config.detect_signal;
        o.signal_detector =
            Twin::create_detector(config.detector_window, config.detector_threshold,
                                  static_cast<int32_t>(config.detector_max_deviation));
        o.frame_length = fxp::shift_left(1U, static_cast<int32_t>(config.frame_length_log2));
        o.ring = make_array<typename Twin::Sample>(o.frame_length).release();
        o.hop = config.frame_hop;
    }

    static bool has_all_parts(const Object& o) noexcept
    {
        return o.resampler != nullptr && o.frame_manager != nullptr &&
               o.signal_detector != nullptr && o.frame_bytes != 0 && o.ring != nullptr;
    }

    /// Starts a stream: the search for the signal begins anew, and the ring is written from its
    /// start.
    static void reset(Object& o) noexcept
    {
        Twin::reset_resampler(o.resampler);
        static_cast<void>(Twin::reset_frame_manager(o.frame_manager));
        static_cast<void>(Twin::reset_detector(o.signal_detector));
        o.frame_start = 0;
        o.write_position = 0;
        o.searching_for_signal = static_cast<uint8_t>(o.signal_search_enabled);
        o.signal_offset = 0;
    }
};

} // namespace kz::qv
