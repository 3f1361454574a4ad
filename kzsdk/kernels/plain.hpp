/// @file
/// The plain loops: what the library computes, in the words that define it. They serve where no
/// faster variant does, and every other variant is tested against them.
#pragma once

#include <cstdint>

#include "kzsdk/kernels/kernels.hpp"

namespace kz::kernels::plain {

void dct_fixed(int32_t* x, const int32_t* factors, int32_t order) noexcept;
void dct_float(float* x, const float* factors, int32_t order) noexcept;

ToWords pcm16, pcm8, alaw, ulaw, alaw_running, ulaw_running;
ToFloats pcm16, pcm8, alaw, ulaw, alaw_running, ulaw_running;

void shift_towards_zero(const int32_t* input, int32_t* output, uint32_t count,
                        int32_t shift) noexcept;
void truncate(const float* input, int32_t* output, uint32_t count) noexcept;
uint32_t pass_quiet(MovingMeans& means, const int32_t* samples, uint32_t count) noexcept;

void polyphase(const PhaseRows& rows, const Windows& windows, int32_t* output,
               uint32_t count) noexcept;
void symmetric(const PhaseRows& rows, const Windows& windows, int32_t* output,
               uint32_t count) noexcept;
int32_t convolve_from_bit_31(const int32_t* samples, const int32_t* row, uint32_t count) noexcept;
int32_t convolve_from_bit_32(const int32_t* samples, const int32_t* row, uint32_t count) noexcept;
void polyphase_floats(const FloatPhases& phases, const float* oldest, uint32_t phase, float* output,
                      uint32_t count) noexcept;

void track_word_extremes(Extremes<int32_t>& extremes, const int32_t* samples,
                         uint32_t count) noexcept;
void track_float_extremes(Extremes<float>& extremes, const float* samples, uint32_t count) noexcept;
void word_levels(const WordLevels& rule, const int32_t* samples, uint8_t* levels, uint32_t count,
                 uint32_t* histogram) noexcept;
void float_levels(const FloatLevels& rule, const float* samples, uint8_t* levels, uint32_t count,
                  uint32_t* histogram) noexcept;
void replace_levels(const void* values, const uint8_t* levels, void* output,
                    uint32_t count) noexcept;
void apply_ramp(int32_t* words, uint32_t count, int32_t gain, int32_t step) noexcept;
uint64_t sum_squares(const int32_t* words, uint32_t count) noexcept;

} // namespace kz::kernels::plain
