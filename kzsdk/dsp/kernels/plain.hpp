/// @file
/// The plain loops: what the library computes, in the words that define it. They serve where no
/// faster variant does, and every other variant is tested against them.
#pragma once

#include <cstdint>

namespace kz::dsp::plain {

void dct_fixed(int32_t* x, const int32_t* factors, int32_t order) noexcept;
void dct_float(float* x, const float* factors, int32_t order) noexcept;

void pcm16_mono(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept;
void pcm16_stereo(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept;
void pcm8_mono(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept;
void pcm8_stereo(const void* input, int32_t* output, int32_t frames, int32_t shift) noexcept;
void pcm16_mono(const void* input, float* output, int32_t frames, int32_t shift) noexcept;
void pcm16_stereo(const void* input, float* output, int32_t frames, int32_t shift) noexcept;
void pcm8_mono(const void* input, float* output, int32_t frames, int32_t shift) noexcept;
void pcm8_stereo(const void* input, float* output, int32_t frames, int32_t shift) noexcept;

} // namespace kz::dsp::plain
