#include "kzsdk/dsp/kernels/variants.hpp"

#if defined(KZ_KERNELS_X86)

#include "kzsdk/dsp/kernels/simd_sse41.hpp"
#include "kzsdk/dsp/kernels/vector_kernels.hpp"

namespace kz::dsp {

constinit const Kernels kSse41Kernels = vector_kernels<Sse41>("sse41");

} // namespace kz::dsp

#endif
