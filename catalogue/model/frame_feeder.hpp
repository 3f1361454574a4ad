/// @file
/// Sound of any format as overlapping frames at the working rate.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/model/frame_analyser.hpp"
#include "catalogue/model/profile.hpp"
#include "catalogue/model/rate_converter.hpp"
#include "catalogue/model/sound_reader.hpp"

namespace kzcat {

/// Cuts a stream of bytes into frames, one every `hop` samples of the working rate.
class FrameFeeder {
public:
    /// Throws std::invalid_argument with a sentence when the format cannot be used.
    FrameFeeder(const SoundFormat& format, uint32_t hop);

    /// Calls `take(frame)` for every frame that the bytes complete, and `hear(samples)` for every
    /// piece of the signal at the working rate.
    template <class Take, class Hear>
    void feed(std::span<const std::byte> bytes, Take take, Hear hear)
    {
        while (!bytes.empty()) {
            const size_t before = samples_.size();
            converter_.convert(reader_.read(bytes), samples_);
            total_ += samples_.size() - before;
            hear(std::span<const float>(samples_).subspan(before));
            take_frames(take);
        }
    }

    /// Samples at the working rate so far.
    uint64_t samples() const { return total_; }

private:
    template <class Take>
    void take_frames(Take& take)
    {
        size_t begin = 0;
        for (; samples_.size() - begin >= kFrameLength; begin += hop_) {
            take(Frame(samples_.data() + begin, kFrameLength));
        }
        samples_.erase(samples_.begin(), samples_.begin() + static_cast<std::ptrdiff_t>(begin));
    }

    SoundReader reader_;
    RateConverter converter_;
    uint32_t hop_;
    std::vector<float> samples_; ///< from the beginning of the next frame on
    uint64_t total_ = 0;
};

} // namespace kzcat
