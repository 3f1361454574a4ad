#include "kzsdk/dsp/kernels/variants.hpp"

#if defined(KZ_KERNELS_NEON)

#include "kzsdk/dsp/kernels/simd_neon.hpp"
#include "kzsdk/dsp/kernels/vector_kernels.hpp"

namespace kz::dsp {

constinit const Kernels kNeonKernels = vector_kernels<Neon>("neon");

} // namespace kz::dsp

#endif
