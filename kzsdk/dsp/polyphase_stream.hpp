/// @file
/// What the fixed-point and the floating-point resampler share: lengths, the history and the block
/// protocol. A twin brings its record, whose fields have the same names, and its dot products.
///
/// One output is made from the newest P samples, P being the taps of one phase. Samples of earlier
/// blocks wait in `history`, those of this block lie in `input`:
///
///        history                     input
///     |......|============|       |===========|......................|
///          start         end
///            |<-pending-->|       |<--need--->|        pending + need = P
///
/// While `pending` is positive the sum runs over both pieces, newest sample first. Once the window
/// has left the history, that is emptied, and every later window lies in `input` alone.
#pragma once

#include <algorithm>
#include <cassert>
#include <cstdint>
#include <limits>
#include <span>
#include <type_traits>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/kernels/kernels.hpp"

namespace kz::dsp {

/// A length that does not fit 32 bits counts as 2^32 - 1.
constexpr uint32_t saturated_to_word(uint64_t value) noexcept
{
    return static_cast<uint32_t>(std::min<uint64_t>(value, std::numeric_limits<uint32_t>::max()));
}

/// Outputs that `count` more inputs yield at most.
template <class Resampler>
uint32_t resampled_length(const Resampler& r, uint32_t count) noexcept
{
    return saturated_to_word(uint64_t{count} * r.up / r.down);
}

/// Inputs that `count` outputs need.
template <class Resampler>
uint32_t raw_length(const Resampler& r, uint32_t count) noexcept
{
    assert(r.up != 0);
    return saturated_to_word((uint64_t{count} * r.down + r.up - 1) / r.up);
}

/// Whether samples pass unchanged. Then there are neither taps nor a history.
template <class Resampler>
bool copies(const Resampler& r) noexcept
{
    return r.up == 1 && r.down == 1;
}

/// Zeros before the first sample: half the filter in whole outputs, turned back into inputs. At
/// most length / 2 / L rounded up, half a window, so they always fit the history.
template <class Resampler>
uint32_t initial_delay(const Resampler& r) noexcept
{
    return raw_length(r, r.length / 2 / r.down);
}

/// Starts a stream.
template <class Resampler>
void restart(Resampler& r) noexcept
{
    const uint32_t delay = initial_delay(r);
    assert(delay <= r.taps_per_phase);
    r.phase = 0;
    r.history_start = 0;
    r.history_end = delay;
    std::fill_n(r.history, delay, 0);
}

/// Makes the history of a resampler whose factors and length are set, and starts a stream. False
/// when memory is short. A resampler that copies has none.
template <class Resampler>
bool make_history(Resampler& r) noexcept
{
    using Sample = std::remove_pointer_t<decltype(r.history)>;
    if (r.length != 0) {
        r.taps_per_phase = static_cast<uint32_t>((uint64_t{r.length} + r.up - 1) / r.up);
        r.history = make_array<Sample>(r.taps_per_phase).release();
        if (r.history == nullptr) {
            return false;
        }
    }
    restart(r);
    return true;
}

/// The walk of the outputs to come.
template <class Resampler>
kernels::PhaseWalk walk_of(const Resampler& r) noexcept
{
    return {r.up, r.down, r.phase};
}

/// Input samples that are still missing for the next output.
template <class Resampler>
uint32_t need(const Resampler& r) noexcept
{
    return r.taps_per_phase - (r.history_end - r.history_start);
}

/// Input samples that a call with plenty of input and room for `outputs` would consume.
template <class Resampler>
uint32_t input_for(const Resampler& r, uint32_t outputs) noexcept
{
    if (copies(r)) {
        return outputs;
    }
    return saturated_to_word(need(r) + walk_of(r).window_after(outputs));
}

/// The phase after `outputs` more outputs.
template <class Resampler>
uint32_t phase_after(const Resampler& r, uint32_t outputs) noexcept
{
    auto walk = walk_of(r);
    walk.jump(outputs);
    return walk.phase();
}

/// Samples taken from the input and written to the output.
struct BlockCounts {
    uint32_t consumed;
    uint32_t produced;
};

/// A caller's array; null counts as an array of no samples.
template <class Sample>
std::span<Sample> block(Sample* samples, uint32_t count) noexcept
{
    return {samples, samples == nullptr ? 0 : count};
}

/// The exported call of both twins: runs `resample` unless there is no resampler, and reports the
/// counts unless the caller passed null for them.
template <class Resampler, class Sample, class Resample>
void resample_call(Resampler* r, std::span<const Sample> input, std::span<Sample> output,
                   uint32_t* consumed, uint32_t* produced, Resample resample) noexcept
{
    const BlockCounts counts = r == nullptr ? BlockCounts{0, 0} : resample(*r, input, output);
    if (consumed != nullptr) {
        *consumed = counts.consumed;
    }
    if (produced != nullptr) {
        *produced = counts.produced;
    }
}

/// As many samples as there are and fit.
template <class Sample>
BlockCounts copy_block(std::span<const Sample> input, std::span<Sample> output) noexcept
{
    const auto count = static_cast<uint32_t>(std::min(input.size(), output.size()));
    std::copy_n(input.begin(), count, output.begin());
    return {count, count};
}

/// Drops the samples before `history_start` and appends `tail`: what the next block still needs.
/// That is never more than a window, so it always fits.
template <class Resampler, class Sample>
void keep_tail(Resampler& r, std::span<const Sample> tail) noexcept
{
    if (r.history_start > 0) {
        std::copy(r.history + r.history_start, r.history + r.history_end, r.history);
        r.history_end -= r.history_start;
        r.history_start = 0;
    }
    assert(r.history_end + tail.size() <= r.taps_per_phase);
    std::copy(tail.begin(), tail.end(), r.history + r.history_end);
    r.history_end += static_cast<uint32_t>(tail.size());
}

/// Moves the phase on by some outputs.
///
/// @return How many samples the window moves.
template <class Resampler>
uint64_t advance(Resampler& r, size_t outputs) noexcept
{
    auto walk = walk_of(r);
    walk.jump(outputs);
    r.phase = walk.phase();
    return walk.window();
}

/// Resamples one block: first the outputs whose windows begin in the history, then those inside the
/// block, as long as both input and room last.
///
/// @param across  (samples of the history, samples of the block, phase, outputs): all outputs whose
///                windows begin in the history; the two runs of samples follow each other.
/// @param inside  (oldest sample of the first window, phase, outputs): all outputs whose windows
///                lie inside the block.
///
/// The phase is always the one before the first output.
template <class Resampler, class Sample, class Across, class Inside>
BlockCounts resample_block(Resampler& r, std::span<const Sample> input, std::span<Sample> output,
                           Across across, Inside inside) noexcept
{
    const uint64_t available = input.size();
    const uint64_t pending = r.history_end - r.history_start;
    uint64_t needed = need(r);
    uint64_t oldest = 0; // first sample of the block that is still needed
    auto left = output;  // outputs that are not made yet
    const auto take_outputs = [&](uint64_t wanted) {
        const auto taken = left.first(static_cast<size_t>(std::min<uint64_t>(left.size(), wanted)));
        left = left.subspan(taken.size());
        return taken;
    };
    if (pending != 0 && !left.empty() && needed <= available) {
        const auto walk = walk_of(r);
        const auto outputs = take_outputs(
            std::min(walk.outputs_within(pending - 1), walk.outputs_within(available - needed)));
        across(std::span<const Sample>(r.history + r.history_start, static_cast<size_t>(pending)),
               input, r.phase, outputs);
        const uint64_t moved = advance(r, outputs.size());
        needed += moved;
        if (moved < pending) {
            r.history_start += static_cast<uint32_t>(moved);
        } else {
            oldest = moved - pending;
            r.history_start = 0;
            r.history_end = 0;
        }
    }
    if (r.history_start == r.history_end && !left.empty() && needed <= available) {
        const auto outputs = take_outputs(walk_of(r).outputs_within(available - needed));
        inside(input.data() + oldest, r.phase, outputs);
        const uint64_t moved = advance(r, outputs.size());
        needed += moved;
        oldest += moved;
    }
    const uint64_t consumed = std::min(needed, available);
    keep_tail(r,
              input.subspan(static_cast<size_t>(oldest), static_cast<size_t>(consumed - oldest)));
    return {static_cast<uint32_t>(consumed), static_cast<uint32_t>(output.size() - left.size())};
}

/// The samples of all windows that begin in a history, in one run: the pending ones and at most P
/// of the block.
template <class Sample>
class JoinedSamples {
public:
    static constexpr size_t kMaxTaps = 96;
    static constexpr size_t kPadding = 8; // for sums that are made in whole vectors

    /// @param taps  At most kMaxTaps.
    JoinedSamples(std::span<const Sample> older, std::span<const Sample> newer,
                  size_t taps) noexcept
    {
        assert(older.size() <= taps && taps <= kMaxTaps);
        auto* const end = std::copy(older.begin(), older.end(), samples_);
        std::fill_n(std::copy_n(newer.begin(), std::min(newer.size(), taps), end), kPadding, 0);
    }

    const Sample* begin() const noexcept { return samples_; }

private:
    Sample samples_[2 * kMaxTaps + kPadding];
};

} // namespace kz::dsp
