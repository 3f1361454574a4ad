/// @file
/// The whole road of a stream, in the same steps and to the same words as the library: conversion,
/// resampling, search for signal, frames, features, values.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "model/convert.hpp"
#include "model/detector.hpp"
#include "model/frame.hpp"
#include "model/resampler.hpp"
#include "model/statistics.hpp"

namespace kz::model {

/// The taps in Q31 that a model is to use: for the ratio itself and for the 2:1 decimator.
struct Filters {
    std::vector<int32_t> resampler;
    std::vector<int32_t> decimator;
};

class Fingerprint {
public:
    Fingerprint(const Ratio& ratio, Format format, size_t channels, const Filters& filters);

    /// Feeds whole frames of bytes, as one call. True once the fingerprint is complete.
    bool feed(std::span<const uint8_t> bytes);

    /// Nothing before the fingerprint is complete.
    std::optional<Values> values() const;

    /// Working-rate samples dropped as leading silence.
    size_t signal_offset() const { return signal_offset_; }

    /// The samples that wait for the next frame, and where in them it starts and the next one goes.
    std::span<const int32_t> ring() const { return ring_; }
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
    Counts fill(std::span<const uint8_t> bytes, std::span<int32_t> destination);
    size_t without_silence(std::span<int32_t> fresh);
    bool store(size_t produced);
    void analyse();

    Format format_;
    size_t channels_;
    Resampler resampler_;
    FrameAnalyser analyser_;
    Detector detector_;
    bool searching_ = true;
    size_t signal_offset_ = 0;
    std::vector<int32_t> ring_;
    size_t frame_start_ = 0;
    size_t write_position_ = 0;
    std::vector<Features> features_;
};

} // namespace kz::model
