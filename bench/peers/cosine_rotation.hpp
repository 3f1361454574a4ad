/// @file
/// What turns a real Fourier transform into a cosine transform. Compiled separately for the
/// building machine's own processor, as a careful user of FFTW would.
#pragma once

#include <cstdint>

namespace kz::bench {

/// Even samples forward, then odd samples backward.
void fold(const float* input, float* folded, uint32_t length);

/// The cosine transform, twice its plain sum as FFTW has it, from the Fourier transform of the
/// folded input. `cosine[k]` and `sine[k]` are those of pi k / (2 length).
void rotate(const float* real, const float* imaginary, const float* cosine, const float* sine,
            float* output, uint32_t length);

} // namespace kz::bench
