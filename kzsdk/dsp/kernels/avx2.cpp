#include "kzsdk/dsp/kernels/variants.hpp"

#if defined(KZ_KERNELS_X86)

#include "kzsdk/dsp/kernels/simd_avx2.hpp"
#include "kzsdk/dsp/kernels/vector_kernels.hpp"

namespace kz::dsp {

constinit const Kernels kAvx2Kernels = vector_kernels<Avx2>("avx2");

} // namespace kz::dsp

#endif
