/// @file
/// The whole path of a stream, in the same steps as the library and bit-identical to it:
/// conversion, resampling, search for signal, frames, features, values.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "whole/model/convert.hpp"
#include "whole/model/detector.hpp"
#include "whole/model/float_frame.hpp"
#include "whole/model/frame.hpp"
#include "whole/model/resampler.hpp"
#include "whole/model/statistics.hpp"

namespace kz::model {

/// The taps in Q31 that a model uses: for the ratio itself and for the 2:1 decimator.
struct Filters {
    std::vector<int32_t> resampler;
    std::vector<int32_t> decimator;
};

/// What the fixed-point path does at each stage.
struct FixedStages {
    using Sample = int32_t;
    using Filters = model::Filters;
    using Resampler = model::Resampler;
    using Analyser = FrameAnalyser;
    using Features = model::Features;

    static Resampler make_resampler(const Ratio& ratio, const Filters& filters)
    {
        return {ratio, filters.resampler};
    }
    static Analyser make_analyser(const Filters& filters) { return Analyser(filters.decimator); }
    static std::vector<Sample> to_mono(Format format, size_t channels,
                                       std::span<const uint8_t> bytes)
    {
        return model::to_mono(format, channels, bytes);
    }
    static int32_t level(Sample sample) { return sample / 8192; } ///< for the detector
    static Values condense(std::span<const Features> frames) { return model::condense(frames); }
};

/// And the floating-point path; its filter is the ratio's.
struct FloatStages {
    using Sample = float;
    using Filters = std::vector<float>;
    using Resampler = FloatResampler;
    using Analyser = FloatFrameAnalyser;
    using Features = FloatFeatures;

    static Resampler make_resampler(const Ratio& ratio, const Filters& taps)
    {
        return {ratio, taps};
    }
    static Analyser make_analyser(const Filters& /*taps*/) { return {}; }
    static std::vector<Sample> to_mono(Format format, size_t channels,
                                       std::span<const uint8_t> bytes)
    {
        return to_mono_float(format, channels, bytes);
    }
    static int32_t level(Sample sample) { return static_cast<int32_t>(sample); }
    static Values condense(std::span<const Features> frames)
    {
        return model::condense_float(frames);
    }
};

template <class Stages>
class Road {
public:
    using Sample = typename Stages::Sample;
    using Features = typename Stages::Features;

    Road(const Ratio& ratio, Format format, size_t channels,
         const typename Stages::Filters& filters);

    /// Feeds whole frames of bytes, as one call. True once the fingerprint is complete.
    bool feed(std::span<const uint8_t> bytes);

    /// Nothing before the fingerprint is complete.
    std::optional<Values> values() const;

    /// Working-rate samples dropped as leading silence.
    size_t signal_offset() const { return signal_offset_; }

    /// The samples that wait for the next frame, and where in them it starts and the next one goes.
    std::span<const Sample> ring() const { return ring_; }
    size_t frame_start() const { return frame_start_; }
    size_t write_position() const { return write_position_; }

    /// Of the frames so far.
    std::span<const Features> features() const { return features_; }

private:
    struct Counts {
        size_t bytes;
        size_t samples;
    };

    bool complete() const { return features_.size() == kFrameLimit; }
    size_t room() const;
    Counts fill(std::span<const uint8_t> bytes, std::span<Sample> destination);
    size_t without_silence(std::span<Sample> fresh);
    bool store(size_t produced);
    void analyse();

    Format format_;
    size_t channels_;
    typename Stages::Resampler resampler_;
    typename Stages::Analyser analyser_;
    Detector detector_;
    bool searching_ = true;
    size_t signal_offset_ = 0;
    std::vector<Sample> ring_;
    size_t frame_start_ = 0;
    size_t write_position_ = 0;
    std::vector<Features> features_;
};

using Fingerprint = Road<FixedStages>;
using FloatFingerprint = Road<FloatStages>;

} // namespace kz::model
