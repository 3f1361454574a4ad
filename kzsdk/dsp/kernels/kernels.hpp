/// @file
/// The inner loops that exist in several variants, and the choice among them.
///
/// A variant is one table of functions, compiled for one instruction set. Every variant gives the
/// same words as the plain one for every input; tests/dsp/kernels holds all of them to that. The
/// best one that the processor has is taken at the first use and kept.
///
/// For tests and measurements the environment variable KZSDK_KERNELS pins a variant by its name.
/// A name that the build or the processor does not know is ignored.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace kz::dsp {

/// Makes one word of each frame of interleaved bytes: the sum of the channels, shifted left by
/// 0 .. 31 bits. The number of frames counts as unsigned.
template <class Word>
using Converter = void(const void* input, Word* output, int32_t frames, int32_t shift) noexcept;

template <class Word>
struct Converters {
    Converter<Word>* pcm16_mono;
    Converter<Word>* pcm16_stereo;
    Converter<Word>* pcm8_mono; ///< bytes count as 0 .. 255, their top bit inverted
    Converter<Word>* pcm8_stereo;
};

struct Kernels {
    /// "plain", "sse41", "avx2" or "neon".
    const char* name;

    /// The transform of dct_fixed.cpp without the last scaling, 2^order words in place.
    void (*dct_fixed)(int32_t* x, const int32_t* factors, int32_t order) noexcept;

    /// The transform of dct_float.cpp without its scalings, 2^order values in place.
    void (*dct_float)(float* x, const float* factors, int32_t order) noexcept;

    Converters<int32_t> words;
    Converters<float> floats;
};

/// The variant that all of the library uses.
const Kernels& kernels() noexcept;

/// The variants of this build that this processor can run, the plain one first, the best one last.
struct RunnableKernels {
    std::array<const Kernels*, 3> tables{};
    size_t count = 0;

    const Kernels* const* begin() const noexcept { return tables.data(); }
    const Kernels* const* end() const noexcept { return tables.data() + count; }
};

RunnableKernels runnable_kernels() noexcept;

extern const Kernels kPlainKernels;

} // namespace kz::dsp
