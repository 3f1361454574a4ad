#include "whole/model/fingerprint.hpp"

#include <algorithm>

namespace kz::model {

namespace {

constexpr size_t kChunk = 4096;

} // namespace

template <class Stages>
Road<Stages>::Road(const Ratio& ratio, Format format, size_t channels,
                   const typename Stages::Filters& filters)
    : format_(format), channels_(channels), resampler_(Stages::make_resampler(ratio, filters)),
      analyser_(Stages::make_analyser(filters)), ring_(kFrameLength, 0)
{
}

template <class Stages>
bool Road<Stages>::feed(std::span<const uint8_t> bytes)
{
    while (!bytes.empty() && !complete()) {
        const auto fresh = std::span(ring_).subspan(write_position_, room());
        const auto [consumed, produced] = fill(bytes, fresh);
        if (consumed == 0 && produced == 0) {
            break;
        }
        bytes = bytes.subspan(consumed);
        if (store(without_silence(fresh.first(produced)))) {
            analyse();
        }
    }
    return complete();
}

template <class Stages>
std::optional<Values> Road<Stages>::values() const
{
    return complete() ? std::optional(Stages::condense(features_)) : std::nullopt;
}

template <class Stages>
size_t Road<Stages>::room() const
{
    return (frame_start_ > write_position_ ? frame_start_ : ring_.size()) - write_position_;
}

/// Converts no more than the room can need, chunk by chunk, and resamples each chunk.
template <class Stages>
auto Road<Stages>::fill(std::span<const uint8_t> bytes, std::span<Sample> destination) -> Counts
{
    const size_t frame_bytes = bytes_per_sample(format_) * channels_;
    const size_t budget = raw_length(resampler_.ratio(), destination.size()) * frame_bytes;
    bytes = bytes.first(std::min(budget, bytes.size()));
    Counts done{0, 0};
    while (!bytes.empty()) {
        const size_t taken =
            std::min(kChunk * frame_bytes, bytes.size() / frame_bytes * frame_bytes);
        if (taken == 0) {
            break;
        }
        const std::vector<Sample> chunk = Stages::to_mono(format_, channels_, bytes.first(taken));
        bytes = bytes.subspan(taken);
        for (std::span<const Sample> rest = chunk; !rest.empty();) {
            const auto [consumed, produced] =
                resampler_.resample(rest, destination.subspan(done.samples));
            if (consumed == 0 && produced == 0) {
                break;
            }
            rest = rest.subspan(consumed);
            done.bytes += consumed * frame_bytes;
            done.samples += produced;
        }
    }
    return done;
}

/// While no signal was found the samples are dropped; the block in which it is found is moved down.
template <class Stages>
size_t Road<Stages>::without_silence(std::span<Sample> fresh)
{
    if (!searching_) {
        return fresh.size();
    }
    const size_t offset = detector_.offset_in(std::span<const Sample>(fresh), Stages::level);
    signal_offset_ += offset;
    if (offset < fresh.size()) {
        searching_ = false;
        std::copy(fresh.begin() + static_cast<ptrdiff_t>(offset), fresh.end(), fresh.begin());
        detector_.reset();
    }
    return fresh.size() - offset;
}

/// True when the ring holds a whole frame.
template <class Stages>
bool Road<Stages>::store(size_t produced)
{
    write_position_ += produced;
    const bool ready = write_position_ == (frame_start_ != 0 ? frame_start_ : ring_.size());
    write_position_ %= ring_.size();
    return ready;
}

template <class Stages>
void Road<Stages>::analyse()
{
    std::vector<Sample> frame(ring_);
    std::rotate(frame.begin(), frame.begin() + static_cast<ptrdiff_t>(frame_start_), frame.end());
    features_.push_back(analyser_(frame));
    frame_start_ = (frame_start_ + kFrameHop) % ring_.size();
}

template class Road<FixedStages>;
template class Road<FloatStages>;

} // namespace kz::model
