/// @file
/// The walk of a polyphase filter from output to output.
///
/// Each output advances the phase by `down` modulo `up`, reads the taps of the new phase, and then
/// moves its window by as many samples as the phase passed multiples of `up`:
///
///     t = phase + down      phase = t % up      window += t / up
///
/// The phase advances before the taps are read and the window moves after, so each output is up to
/// one input sample off its ideal time. This is how the streams of this library are defined.
///
/// Everything here is inlined by force: the files of the variants must not bring functions that the
/// linker could take for use elsewhere.
#pragma once

#include <cstdint>

namespace kz::kernels {

class PhaseWalk {
public:
    /// @param up, down  At most 2^31.
    /// @param phase     The phase before the first output, below `up`.
    [[gnu::always_inline]] constexpr PhaseWalk(uint32_t up, uint32_t down, uint32_t phase) noexcept
        : up_(up), down_(down), window_step_(down / up), phase_step_(down % up), phase_(phase)
    {
    }

    /// First sample of the next output's window, counted from that of the first output.
    [[gnu::always_inline]] constexpr uint64_t window() const noexcept { return window_; }

    /// The phase before the next output.
    [[gnu::always_inline]] constexpr uint32_t phase() const noexcept { return phase_; }

    /// The phase whose taps the next output is made of.
    [[gnu::always_inline]] constexpr uint32_t tap_phase() const noexcept
    {
        const uint32_t t = phase_ + phase_step_;
        return t < up_ ? t : t - up_;
    }

    /// Moves on by one output.
    [[gnu::always_inline]] constexpr void advance() noexcept
    {
        const uint32_t next = tap_phase();
        window_ += window_step_ + (next < phase_ ? 1 : 0);
        phase_ = next;
    }

    /// Moves on by `outputs` outputs.
    [[gnu::always_inline]] constexpr void jump(uint64_t outputs) noexcept
    {
        const uint64_t t = phase_ + outputs * down_;
        window_ += t / up_;
        phase_ = static_cast<uint32_t>(t % up_);
    }

    /// Samples by which the window has moved after `outputs` more outputs.
    [[gnu::always_inline]] constexpr uint64_t window_after(uint64_t outputs) const noexcept
    {
        return window_ + (phase_ + outputs * down_) / up_;
    }

    /// Outputs whose windows begin at most `samples` samples after that of the next output.
    [[gnu::always_inline]] constexpr uint64_t outputs_within(uint64_t samples) const noexcept
    {
        return ((samples + 1) * up_ - 1 - phase_) / down_ + 1;
    }

private:
    uint32_t up_;
    uint32_t down_;
    uint32_t window_step_;
    uint32_t phase_step_;
    uint32_t phase_;
    uint64_t window_ = 0;
};

} // namespace kz::kernels
