/// @file
/// The inner loops that exist in several variants, and the choice among them.
///
/// A variant is one table of functions, compiled for one instruction set. Every variant gives the
/// same bits as the plain one for every input, the bits of NaNs apart; tests/library/kernels holds
/// all of them to that. The best one that the processor has is taken at the first use and kept.
///
/// For tests and measurements the environment variable KZSDK_KERNELS pins a variant by its name. A
/// name that the build or the processor does not support is ignored. It is read once, at the first
/// use; a host that changes its environment meanwhile races with that as with any getenv().
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "kzsdk/kernels/phase_walk.hpp"

namespace kz::kernels {

/// Makes one word of each frame of interleaved samples: the sum of its `channels` samples modulo
/// 2^32, shifted left by `shift` bits, which leaves 0 where `shift` is not 0 .. 31. Without
/// channels, or with a negative number of them, nothing is read and sums are 0. The number of
/// frames counts as unsigned.
using ToWords = void(int32_t channels, const void* input, int32_t* output, int32_t frames,
                     int32_t shift) noexcept;

/// Makes one float of each frame: the sum of its samples, rounded once where nothing else is said.
using ToFloats = void(int32_t channels, const void* input, float* output, int32_t frames) noexcept;

/// One converter for each encoding of samples.
template <class Convert>
struct Encodings {
    Convert* pcm16; ///< floats are added one by one, in order
    Convert* pcm8;  ///< bytes count as 0 .. 255, their top bit inverted; floats as 256 times that
    Convert* alaw;
    Convert* ulaw;
    Convert* alaw_running; ///< the sum is never cleared: word k is made of frames 0 to k
    Convert* ulaw_running;
};

/// What the code bytes of G.711 stand for. A-law's polarity is the opposite of the
/// recommendation's.
using SampleTable = std::array<int16_t, 256>;
extern const SampleTable kALawSamples;
extern const SampleTable kULawSamples;

/// Two moving means over the last 2^window_log2 samples: of their levels, and of the deviations of
/// the levels from their mean, none of which counts for more than max_deviation. The arrays are
/// rings, given from the oldest entry on.
struct MovingMeans {
    int32_t* levels;
    int32_t* deviations;
    int32_t level_sum;
    int32_t deviation_sum;
    int32_t window_log2;
    int32_t max_deviation;
    uint32_t limit; ///< a sum of deviations that reaches this, as an unsigned number, is not quiet
};

/// The smallest and the largest sample so far.
template <class Sample>
struct Extremes {
    Sample low;
    Sample high;
};

/// Level of a word x: bits 32 and up of (x / 2 - bottom) * scale, shifted right by `shift`, at most
/// `top`. No x is below 2 * bottom, and the scale is not negative.
struct WordLevels {
    int32_t bottom;
    int32_t scale;
    int32_t shift;
    int32_t top; ///< at most 255
};

/// Level of a value x: (x - bottom) * scale as a whole number, 0 to `top`; NaN counts as 0.
struct FloatLevels {
    float bottom;
    float scale;
    int32_t top; ///< at most 255
};

struct PhaseRows;

/// A stream of outputs whose windows all lie in one block.
struct Windows {
    const int32_t* oldest; ///< first sample of the first window
    uint32_t taps;         ///< samples of a window
    uint32_t down;
    uint32_t phase; ///< before the first output; it advances by `down`, modulo `up`, before each
};

/// A floating-point polyphase filter. Tap k of phase p belongs to the k-th newest sample of a
/// window and is taps[p * phase_stride + k * tap_stride].
struct FloatPhases {
    const float* taps;
    size_t phase_stride;
    size_t tap_stride;
    uint32_t taps_per_phase;
    uint32_t up;
    uint32_t down;
};

struct Variant {
    /// "plain", "sse41", "avx2" or "neon".
    const char* name;

    /// The transform of dct_fixed.cpp without the last scaling, 2^order words in place.
    void (*dct_fixed)(int32_t* x, const int32_t* factors, int32_t order) noexcept;

    /// The transform of dct_float.cpp without its scalings, 2^order values in place.
    void (*dct_float)(float* x, const float* factors, int32_t order) noexcept;

    Encodings<ToWords> to_words;
    Encodings<ToFloats> to_floats;

    /// Divides by 2^shift, 0 <= shift <= 31, towards zero.
    void (*shift_towards_zero)(const int32_t* input, int32_t* output, uint32_t count,
                               int32_t shift) noexcept;

    /// kz::to_int32 of each value.
    void (*truncate)(const float* input, int32_t* output, uint32_t count) noexcept;

    /// Takes samples into both means until one might not be quiet, or fewer are left than the
    /// variant takes at a time.
    ///
    /// @return How many were taken; the means are as they are after these, and the rings are not
    ///         moved on.
    uint32_t (*pass_quiet)(MovingMeans& means, const int32_t* samples, uint32_t count) noexcept;

    /// Makes `count` outputs of a polyphase filter, the direct rule of resampler_fixed.cpp.
    void (*polyphase)(const PhaseRows& rows, const Windows& windows, int32_t* output,
                      uint32_t count) noexcept;

    /// Makes `count` outputs of one of the two symmetric filters, `down` being 2 or 4.
    void (*symmetric)(const PhaseRows& rows, const Windows& windows, int32_t* output,
                      uint32_t count) noexcept;

    /// The sum of bits 31 to 62, or 32 to 63, of the exact products of a row of taps and as many
    /// samples.
    int32_t (*convolve_from_bit_31)(const int32_t* samples, const int32_t* row,
                                    uint32_t count) noexcept;
    int32_t (*convolve_from_bit_32)(const int32_t* samples, const int32_t* row,
                                    uint32_t count) noexcept;

    /// Makes `count` outputs of a polyphase filter, each in the order of add_products(), from
    /// windows that all lie in one block. `oldest` is the first sample of the first window, `phase`
    /// the one before the first output.
    void (*polyphase_floats)(const FloatPhases& phases, const float* oldest, uint32_t phase,
                             float* output, uint32_t count) noexcept;

    /// Moves the extremes apart where samples lie beyond them. NaN is passed over.
    void (*track_word_extremes)(Extremes<int32_t>& extremes, const int32_t* samples,
                                uint32_t count) noexcept;
    void (*track_float_extremes)(Extremes<float>& extremes, const float* samples,
                                 uint32_t count) noexcept;

    /// Writes the level of each sample and adds how often each occurs to `histogram`, which has
    /// an entry for every level up to the rule's top. The levels may be written over the samples,
    /// from the first on.
    void (*word_levels)(const WordLevels& rule, const int32_t* samples, uint8_t* levels,
                        uint32_t count, uint32_t* histogram) noexcept;
    void (*float_levels)(const FloatLevels& rule, const float* samples, uint8_t* levels,
                         uint32_t count, uint32_t* histogram) noexcept;

    /// Writes the value of each level, both values and output being of 32 bits, whatever their
    /// type. Levels may lie in the first quarter of the output: it is written from the end.
    void (*replace_levels)(const void* values, const uint8_t* levels, void* output,
                           uint32_t count) noexcept;

    /// Multiplies each word by a gain that grows by `step` from word to word: 4 times the product's
    /// upper 32 bits, which are truncated towards zero.
    void (*apply_ramp)(int32_t* words, uint32_t count, int32_t gain, int32_t step) noexcept;

    /// The sum of the squares, each shifted right by 16 bits; modulo 2^64.
    uint64_t (*sum_squares)(const int32_t* words, uint32_t count) noexcept;
};

/// Adds the products of samples, walked backwards from the newest, and taps, walked forwards, to
/// `sum` one by one. The order of the additions is part of the result, so there is only this one.
float add_products(float sum, const float* newest, const float* taps, size_t count,
                   size_t stride) noexcept;

/// The variant that all of the library uses.
const Variant& active() noexcept;

/// The variants of this build that this processor can run, the plain one first, the best one last.
struct RunnableVariants {
    std::array<const Variant*, 3> tables{};
    size_t count = 0;

    const Variant* const* begin() const noexcept { return tables.data(); }
    const Variant* const* end() const noexcept { return tables.data() + count; }
};

RunnableVariants runnable_variants() noexcept;

extern const Variant kPlainVariant;

} // namespace kz::kernels
