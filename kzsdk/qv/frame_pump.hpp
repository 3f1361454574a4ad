/// @file
/// The fingerprinters' feed loop: bytes -> mono samples -> working rate -> ring -> overlapping
/// frames.
///
/// The ring holds one frame. A frame begins at `frame_start` and is full when the writer comes
/// round to that place again; then its start moves on by the hop, which makes that much room:
///
///     |=== newer part ===|-------- room --------|===== older part =====|
///     0                write              frame_start               length
///
/// Both twins run this loop over their own object, whose fields have the same names. A twin brings
/// a `Twin` type with
///
///     Object, Sample                                       its record and its sample type
///     kConverters                                          by format, see converter_choice.hpp
///     resample(object, input, output) -> {consumed, produced}
///     signal_offset(object, samples) -> index              where the signal starts in a block
///     append_frame(object, older, newer)                   one frame, in two pieces
///     reset_detector(detector)
///     reached_limit(object) -> bool
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <span>

#include "kzsdk/abs/status.h"
#include "kzsdk/dsp/polyphase_stream.hpp"
#include "kzsdk/qv/converter_choice.hpp"

namespace kz::qv {

/// Where the ring is read and written. A frame is full when the writer has caught up with its
/// start.
struct RingPosition {
    uint32_t frame_start;
    uint32_t write;
};

/// Samples that can be stored before the frame is full or the ring's end is met.
constexpr uint32_t ring_room(RingPosition at, uint32_t length) noexcept
{
    return (at.frame_start > at.write ? at.frame_start : length) - at.write;
}

/// Moves the writer on by what was stored.
///
/// @return Whether a frame is full.
constexpr bool advance_writer(RingPosition& at, uint32_t stored, uint32_t length) noexcept
{
    at.write += stored;
    const bool full = at.write == (at.frame_start != 0 ? at.frame_start : length);
    if (at.write == length) {
        at.write = 0;
    }
    return full;
}

/// Where the frame after this one starts.
constexpr uint32_t next_frame_start(uint32_t frame_start, uint32_t hop, uint32_t length) noexcept
{
    const uint32_t next = frame_start + hop;
    return next >= length ? next - length : next;
}

/// What one step of the loop has done.
struct StepCounts {
    uint32_t bytes;   ///< consumed
    uint32_t samples; ///< produced
};

/// Converts and resamples from `bytes` until `room` samples are made or the input is used up.
///
/// Bytes are converted in chunks of the conversion buffer, and no more than the outputs are
/// expected to need. What a full room leaves of a chunk is not consumed: it is converted again in
/// the next step.
template <class Twin>
StepCounts convert_and_resample(typename Twin::Object& object, std::span<const uint8_t> bytes,
                                std::span<typename Twin::Sample> room) noexcept
{
    const uint64_t wanted =
        uint64_t{dsp::raw_length(*object.resampler, static_cast<uint32_t>(room.size()))} *
        object.frame_bytes;
    auto budget = bytes.first(static_cast<size_t>(std::min<uint64_t>(wanted, bytes.size())));
    StepCounts done{0, 0};
    while (!budget.empty()) {
        const size_t frames =
            std::min(budget.size() / object.frame_bytes, std::size(object.conversion_buffer));
        if (frames == 0) {
            break;
        }
        convert_frames(object, Twin::kConverters, budget.data(), static_cast<uint32_t>(frames));
        budget = budget.subspan(frames * object.frame_bytes);
        std::span<const typename Twin::Sample> chunk(object.conversion_buffer, frames);
        while (!chunk.empty()) {
            const auto counts = Twin::resample(object, chunk, room.subspan(done.samples));
            done.bytes += counts.consumed * object.frame_bytes;
            done.samples += counts.produced;
            chunk = chunk.subspan(counts.consumed);
            if (counts.consumed == 0 && counts.produced == 0) {
                return done; // the room is used up: what is left of the chunk is offered again
            }
        }
    }
    return done;
}

/// Drops the samples before the signal from those just stored at the write position.
///
/// @return How many remain; none while there is only silence.
template <class Twin>
uint32_t drop_silence(typename Twin::Object& object, uint32_t produced) noexcept
{
    const std::span<typename Twin::Sample> block(object.ring + object.write_position, produced);
    // A block without samples is searched too: one that comes first primes the detector with zeros.
    const uint32_t offset = Twin::signal_offset(object, block);
    object.signal_offset += offset;
    const uint32_t remaining = produced - offset;
    if (remaining != 0) {
        object.searching_for_signal = 0;
        if (offset != 0) {
            const auto sounding = block.subspan(offset);
            std::copy(sounding.begin(), sounding.end(), block.begin());
        }
        static_cast<void>(Twin::reset_detector(object.signal_detector));
    }
    return remaining;
}

/// Stores what was produced and passes the frame on if it is full.
template <class Twin>
void commit_samples(typename Twin::Object& object, uint32_t produced) noexcept
{
    RingPosition at{object.frame_start, object.write_position};
    const bool full = advance_writer(at, produced, object.frame_length);
    object.write_position = at.write;
    if (full) {
        const std::span<const typename Twin::Sample> ring(object.ring, object.frame_length);
        Twin::append_frame(object, ring.subspan(object.frame_start),
                           ring.first(object.frame_start));
        object.frame_start = next_frame_start(object.frame_start, object.hop, object.frame_length);
    }
}

/// Feeds whole frames of interleaved bytes.
///
/// @return 0 when all bytes are consumed; KZ_QV_FRAME_LIMIT_REACHED once the fingerprint is
///         complete; KZ_QV_ERROR_INVALID_ARGUMENT for a byte count that is 0 or not a whole number
///         of frames.
template <class Twin>
kz_status feed(typename Twin::Object& object, std::span<const uint8_t> bytes) noexcept
{
    if (bytes.empty() || object.frame_bytes == 0 || bytes.size() % object.frame_bytes != 0) {
        return KZ_QV_ERROR_INVALID_ARGUMENT;
    }
    if (Twin::reached_limit(object)) {
        return KZ_QV_FRAME_LIMIT_REACHED;
    }
    while (!bytes.empty()) {
        const uint32_t room =
            ring_room({object.frame_start, object.write_position}, object.frame_length);
        const auto counts =
            convert_and_resample<Twin>(object, bytes, {object.ring + object.write_position, room});
        // A step may produce without consuming, when resampling upwards; only one that does neither
        // is the end.
        if (counts.bytes == 0 && counts.samples == 0) {
            break;
        }
        bytes = bytes.subspan(counts.bytes);
        uint32_t produced = counts.samples;
        if (object.searching_for_signal != 0) {
            produced = drop_silence<Twin>(object, produced);
        }
        commit_samples<Twin>(object, produced);
        if (Twin::reached_limit(object)) {
            return KZ_QV_FRAME_LIMIT_REACHED;
        }
    }
    return KZ_OK;
}

/// Input frames that one step takes when it is offered plenty: what the resampler takes for `room`
/// outputs, but never more than that many outputs need of a stream in full flow.
template <class Resampler>
uint32_t step_frames(const Resampler& resampler, uint32_t room) noexcept
{
    return std::min(dsp::input_for(resampler, room), dsp::raw_length(resampler, room));
}

/// Frames of input that the loop's next step takes when it is offered plenty. To feed exactly this
/// many each time gives the same words as to feed everything at once.
template <class Object>
uint32_t next_step_frames(const Object& object) noexcept
{
    RingPosition at{object.frame_start, object.write_position};
    const uint32_t room = ring_room(at, object.frame_length);
    const uint32_t frames = step_frames(*object.resampler, room);
    if (frames != 0) {
        return frames;
    }
    // When upsampling, a last sample of room may need no new input: then it is the step after that.
    auto resampler = *object.resampler; // only its numbers are used
    resampler.phase = dsp::phase_after(resampler, room);
    if (advance_writer(at, room, object.frame_length)) {
        at.frame_start = next_frame_start(at.frame_start, object.hop, object.frame_length);
    }
    return step_frames(resampler, ring_room(at, object.frame_length));
}

/// No step takes more: a whole ring of room is the most there is.
template <class Object>
uint32_t largest_step_frames(const Object& object) noexcept
{
    return dsp::raw_length(*object.resampler, object.frame_length);
}

} // namespace kz::qv
